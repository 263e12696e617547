// What every machine's inventory says of a logical unit alike.
#pragma once

#include <optional>
#include <string>

#include "nox/Fwd.h"

namespace Machines {

// Its names and its kind; `deviceName` is what the host calls it. Its operational state is "ok".
void SetUnit(Nox::Host::ScsiLun& unit, const std::string& canonicalName, const std::string& deviceName,
             const std::string& kind);

// An optional field of the API: unset rather than empty.
std::optional<std::string> UnlessEmpty(const std::string& text);

}  // namespace Machines
