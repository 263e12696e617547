#include "host/Machine.h"

namespace Host {

Machine::~Machine() = default;

std::shared_ptr<void> Machine::HoldLook() {
  return nullptr;
}

std::vector<DataVolume> Machine::GetDataVolumes() {
  return {};
}

Simulation* Machine::GetSimulation() noexcept {
  return nullptr;
}

}  // namespace Host
