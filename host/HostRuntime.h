// A program's half of the plug-in's world: the host, its inventory, the registry, the kernel provider, and
// the plug-in itself, initialised.
#pragma once

#include <unistd.h>

#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "host/AgentApp.h"
#include "host/Inventory.h"
#include "host/PluginLoader.h"
#include "otxctl/sim/HostFile.h"
#include "otxctl/sim/SimHost.h"

namespace OtxCtl::Fault {
class CallRecorder;
}

namespace Host {

struct RuntimeOptions {
  std::string hostFile;  // empty: the embedded example host
  // The host's description itself, instead of a file; it is never saved.
  std::optional<std::string> hostText;
  bool save = false;  // write every change of the host back to its file
  // What makes a saved host last; where that fails, the default logger is warned.
  OtxCtl::Sim::HostFileWriter::FolderSync syncFolder = &fsync;
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
  // Throws HostError, HostFileError or HostDescriptionError; the process is then as it was, and another
  // start may be tried. Later calls return the first one's runtime.
  static HostRuntime& Start(const RuntimeOptions& options);

  const PluginHooks& Hooks() const noexcept { return _hooks; }
  OtxCtl::Sim::SimHost& SimulatedHost() noexcept { return *_host; }

 private:
  explicit HostRuntime(const RuntimeOptions& options);

  void LoadHost(const RuntimeOptions& options);
  void Save(const OtxCtl::Sim::HostDescription& changed) const;
  // Makes this the world that the plug-in finds, and takes it away again.
  void Install(const RuntimeOptions& options);
  void Uninstall() noexcept;
  // Brings registry and inventory in line with the host as it is now.
  void PublishInventory();

  std::optional<OtxCtl::Sim::HostFileWriter> _writer;
  std::shared_ptr<OtxCtl::Sim::SimHost> _host;
  AgentApp _app;
  Tessa::Ref<Inventory> _inventory;
  PluginHooks _hooks{};
};

}  // namespace Host
