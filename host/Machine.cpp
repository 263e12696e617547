#include "host/Machine.h"

namespace Host {

Machine::~Machine() = default;

Simulation* Machine::GetSimulation() noexcept {
  return nullptr;
}

}  // namespace Host
