#include "machines/Machines.h"

#include "machines/SimulatedMachine.h"

namespace Machines {

std::unique_ptr<Host::Machine> MakeMachine(const MachineOptions& options) {
  return std::make_unique<SimulatedMachine>(options);
}

Host::MachineFactory MachineOf(const MachineOptions& options) {
  return [options] { return MakeMachine(options); };
}

}  // namespace Machines
