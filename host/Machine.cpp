#include "host/Machine.h"

namespace Host {

Machine::~Machine() = default;

std::shared_ptr<void> Machine::HoldLook() {
  return nullptr;
}

Simulation* Machine::GetSimulation() noexcept {
  return nullptr;
}

}  // namespace Host
