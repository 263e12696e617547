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

#include "host/ManagementApi.h"
#include "host/PluginLoader.h"

namespace OtxCtl::Sim {
class SimHost;
}

namespace Host {

class KnownDisks;

class KovaService final : public ManagementApi {
 public:
  // The hooks must be those of an initialised plug-in. `simulated` is the host behind its provider, if that
  // is a simulated one, and outlives the service; DescribeHost and ChangeHost throw HostError without it.
  explicit KovaService(const PluginHooks& hooks, OtxCtl::Sim::SimHost* simulated = nullptr)
      : _hooks(hooks), _simulated(simulated) {}

  Answer Query(const Nox::Operation::Query& request) const override;
  Answer Change(const Nox::Operation::Change& request) const override;
  std::string DescribeHost() const override;
  Answer ChangeHost(const std::string& change) const override;

 private:
  OtxCtl::Sim::SimHost& SimulatedHost() const;

  PluginHooks _hooks;
  OtxCtl::Sim::SimHost* _simulated;
};

}  // namespace Host
