// The machines that programs can serve, by what their users ask for.
//
// The one place that knows which kinds there are: simulated ones, and the machine that the program runs on. A
// further kind is a folder or a file beside this one, and its line in MakeMachine.
#pragma once

#include <functional>
#include <optional>
#include <string>

#include "host/Machine.h"

namespace Machines {

// What --host takes for the machine that the program runs on; a file of that name is "./linux".
inline constexpr const char* thisMachine = "linux";

// As --host, --save and --settings give it.
struct MachineOptions {
  std::string host = {};  // thisMachine, or file of a host description; empty: the embedded example host
  // The description itself, instead of a file; it is never saved.
  std::optional<std::string> description = std::nullopt;
  bool save = false;                             // write every change of the host back to its file
  std::string settings = "/etc/kova/host.json";  // of this machine (HostSettingsFile.h)
  // Of this machine: no other program may change its disks while this one lives (an agent).
  bool alone = false;
  // Of this machine: given each command that would change a disk, in place of running it.
  std::function<void(const std::string& command)> dryRun = {};
  bool waitForFaults = true;  // whether delays that the host has on demand are waited for
};

// Throws Host::HostError, OtxCtl::Sim::HostFileError or OtxCtl::Sim::HostDescriptionError.
std::unique_ptr<Host::Machine> MakeMachine(const MachineOptions& options);

// The same for a runtime, which makes its machine itself.
Host::MachineFactory MachineOf(const MachineOptions& options);

}  // namespace Machines
