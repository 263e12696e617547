#include "machines/InventoryUnits.h"

#include <vector>

#include "nox/Host.h"
#include "orbis/Types.h"

namespace Machines {

using Nox::Host::ScsiLun;

void SetUnit(ScsiLun& unit, const std::string& canonicalName, const std::string& deviceName,
             const std::string& kind) {
  unit.SetDeviceName(deviceName);
  unit.SetDeviceType(kind);
  unit.SetUuid(canonicalName);
  unit.SetCanonicalName(canonicalName);
  unit.SetLunType(kind);
  unit.SetOperationalState(Tessa::MakeRef<Orbis::TextList>(std::vector<std::string>{ScsiLun::STATE_OK}));
}

std::optional<std::string> UnlessEmpty(const std::string& text) {
  return text.empty() ? std::nullopt : std::optional(text);
}

}  // namespace Machines
