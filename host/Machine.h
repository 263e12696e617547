// The machine that a program serves: where the plug-in's provider and the agent's inventory come from.
//
// A program makes one (machines/Machines.h), and the runtime drives it (HostRuntime.h); nothing else in host/
// asks which kind it is. Another kind of machine is another class of this interface.
//
// Threads: every operation may be called from any thread.
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "nox/Fwd.h"
#include "tessa/Ref.h"

namespace HostCtl::Kova {
class KovaInfo;
}

namespace Host {

class Simulation;

// A machine as it was at one moment, in values that outlive it.
struct Twin {
  std::string generation;   // of what it told then (Generation.h)
  std::string description;  // of a simulated machine that answers like it, as its file would hold it
};

// The volume on which the data of one capacity disk of a disk group stands.
struct DataVolume {
  std::string disk;  // canonical name of the capacity disk, or what stands for it in answers if it has left
  std::string path;  // where programs find it
  std::int64_t bytes = 0;
  std::string cacheState;  // what its cache does, in words for people
};

class Machine {
 public:
  // Told that the inventory may be another one now, and asks for it itself. Called on any thread, also inside
  // an operation of a provider, but by one thread at a time. Must not throw, nor set a listener.
  using Listener = std::function<void()>;

  virtual ~Machine();

  // A new provider, of the same disks as every other one of this machine, which outlives it. Throws
  // HostCtl::Lib::HostCtlException.
  virtual std::unique_ptr<HostCtl::Kova::KovaInfo> MakeProvider() = 0;

  // What the machine has now, in an object of the caller's own; null while it cannot list anything. Throws
  // nothing: a machine that fails to look again shows what it saw last.
  virtual Tessa::Ref<Nox::Host::StorageDeviceInfo> GetInventory() = 0;

  // Takes the place of the listener before, which is not called any more once this returns. An empty one
  // takes it away.
  virtual void SetListener(Listener listener) = 0;

  // While what is handed back lives, the machine is looked at once for all that this thread asks of it; to be
  // let go by the thread that has it. Null: a look costs this machine nothing.
  virtual std::shared_ptr<void> HoldLook();

  // Looks at the machine anew, and describes a simulated one on which changes can be tried: it has the same
  // disks, verdicts, groups and configuration. Nothing is changed. Throws HostCtl::Lib::HostCtlException if
  // the machine cannot be looked at.
  virtual Twin TakeTwin() = 0;

  // The data volumes of its disk groups; none of a machine that has no such thing. Throws
  // HostCtl::Lib::HostCtlException if the machine cannot be looked at.
  virtual std::vector<DataVolume> GetDataVolumes();

  // How the machine is described and changed from outside, if it is not a real one; otherwise null. Lives as
  // long as the machine.
  virtual Simulation* GetSimulation() noexcept;
};

// Throws HostError, and what the machine's own files are refused with.
using MachineFactory = std::function<std::unique_ptr<Machine>()>;

}  // namespace Host
