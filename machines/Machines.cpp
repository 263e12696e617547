#include "machines/Machines.h"

#include "host/HostError.h"
#include "machines/LinuxMachine.h"
#include "machines/SimulatedMachine.h"

namespace Machines {

std::unique_ptr<Host::Machine> MakeMachine(const MachineOptions& options) {
  if (options.host != thisMachine) {
    return std::make_unique<SimulatedMachine>(options);
  }
  if (options.save) {
    throw Host::HostError("--save is for hosts that are described in a file; this machine is not");
  }
  return std::make_unique<LinuxMachine>(options.settings);
}

Host::MachineFactory MachineOf(const MachineOptions& options) {
  return [options] { return MakeMachine(options); };
}

}  // namespace Machines
