// The operations of the management API on the host of this process.
//
// Every request passes the gate; only what is let in reaches the plug-in's hooks. An exception that leaves a
// hook is answered as a SystemError. Where an operation takes a request tag, that is the id of the calling
// thread's task (OtxCtl::TaskScope), or empty.
//
// Threads: queries from any; changing operations from one thread at a time, so that the host is still what
// the gate saw when the plug-in works on it. The caller's thread does the work.
#pragma once

#include <string>
#include <string_view>

#include "host/ManagementApi.h"
#include "host/PluginLoader.h"

namespace Host {

class KnownDisks;
class Machine;
class Simulation;

class KovaService final : public ManagementApi {
 public:
  // The hooks must be those of an initialised plug-in. `machine` is the one behind its provider, if it is
  // known, and outlives the service. A simulated one changes only by what is asked for here, and may be
  // described and changed; of any other, each request looks at the disks anew, for they are plugged, mounted
  // and written by others. DescribeHost and ChangeHost throw HostError without a simulated one.
  explicit KovaService(const PluginHooks& hooks, Machine* machine = nullptr);

  Answer Query(const Nox::Operation::Query& request) const override;
  Answer Change(Nox::Operation::Change&& request) const override;
  std::string DescribeHost() const override;
  void CheckHostChange(std::string_view change) const override;
  Answer ChangeHost(const std::string& change) const override;

 private:
  Simulation& Simulated() const;
  void DropDiskCache() const;
  bool ChangesByItself() const noexcept { return _machine != nullptr && _simulation == nullptr; }

  PluginHooks _hooks;
  Machine* _machine;
  Simulation* _simulation;
};

}  // namespace Host
