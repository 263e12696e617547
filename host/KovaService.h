// The operations of the management API, as programs call them: objects in, objects out.
//
// Every request passes the gate; only what is let in reaches the plug-in's hooks. An exception that leaves a
// hook is answered as a SystemError.
//
// Threads: any. The caller's thread does the work.
#pragma once

#include <string>
#include <vector>

#include "host/Answer.h"
#include "host/PluginLoader.h"

namespace Host {

class KovaService {
 public:
  // The hooks must be those of an initialised plug-in.
  explicit KovaService(const PluginHooks& hooks) : _hooks(hooks) {}

  // No names: every disk. The result is a list of KovaHostDiskResult.
  Answer QueryDisksForKova(const std::vector<std::string>& names) const;
  // The host's disk groups: a KovaHostConfigInfoStorageInfo.
  Answer GetStorageInfo() const;
  // Cluster, network and fault domain: a KovaHostConfigInfo.
  Answer GetConfigInfo() const;

 private:
  PluginHooks _hooks;
};

}  // namespace Host
