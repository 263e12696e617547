#include "machines/Machines.h"

#include "host/HostError.h"
#include "machines/LinuxMachine.h"
#include "machines/SimulatedMachine.h"

namespace Machines {

std::unique_ptr<Host::Machine> MakeMachine(const MachineOptions& options) {
  if (options.host != thisMachine) {
    if (options.dryRun) {
      throw Host::HostError(
          "--dry-run is for the disks of this machine (--host linux); other hosts have none");
    }
    return std::make_unique<SimulatedMachine>(options);
  }
  if (options.save) {
    throw Host::HostError("--save is for hosts that are described in a file; this machine is not");
  }
  return std::make_unique<LinuxMachine>(options);
}

Host::MachineFactory MachineOf(const MachineOptions& options) {
  return [options] { return MakeMachine(options); };
}

}  // namespace Machines
