// A program's half of the plug-in's world: the machine, its inventory, the registry, the kernel provider, and
// the plug-in itself, initialised.
#pragma once

#include <memory>
#include <string>

#include "host/AgentApp.h"
#include "host/Inventory.h"
#include "host/Machine.h"
#include "host/PluginLoader.h"

namespace OtxCtl::Fault {
class CallRecorder;
}

namespace Host {

struct RuntimeOptions {
  // Makes the machine to serve, once the plug-in has been found and opened.
  MachineFactory makeMachine;
  std::string pluginFile;  // empty: where FindPlugin finds it
  // Lets every exception of the provider through to the plug-in, which ends the process over those that no
  // provider may throw. Otherwise these are turned into ones that it may, and nothing is formatted while the
  // kernel cannot tell about its disks (CautiousProvider.h).
  bool bare = false;
  // Records every call of the provider, if set.
  std::shared_ptr<OtxCtl::Fault::CallRecorder> recorder;
};

// One per process, made by the main thread. The default logger and the panic handler must be set before.
// It lives until the process ends: the plug-in keeps its provider that long.
class HostRuntime {
 public:
  // Throws HostError, and what the machine's factory throws; the process is then as it was, and another start
  // may be tried. Later calls return the first one's runtime.
  static HostRuntime& Start(const RuntimeOptions& options);

  const PluginHooks& Hooks() const noexcept { return _hooks; }
  Machine& GetMachine() noexcept { return *_machine; }
  // The machine's, or null.
  Simulation* GetSimulation() noexcept { return _machine->GetSimulation(); }

 private:
  explicit HostRuntime(const RuntimeOptions& options);

  // Makes this the world that the plug-in finds, and takes it away again.
  void Install(const RuntimeOptions& options);
  void Uninstall() noexcept;
  // Brings registry and inventory in line with the machine as it is now.
  void PublishInventory();

  std::shared_ptr<Machine> _machine;
  AgentApp _app;
  Tessa::Ref<Inventory> _inventory;
  PluginHooks _hooks{};
};

}  // namespace Host
