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

#include "host/Freshness.h"
#include "host/ManagementApi.h"
#include "host/PluginLoader.h"

namespace Host {

class KnownDisks;
class Simulation;

class KovaService final : public ManagementApi {
 public:
  // The hooks must be those of an initialised plug-in. `simulation` is that of the machine behind its
  // provider, if it has one, and outlives the service; DescribeHost and ChangeHost throw HostError without
  // it.
  explicit KovaService(const PluginHooks& hooks, Simulation* simulation = nullptr,
                       Freshness freshness = Freshness::OfLastChange)
      : _hooks(hooks), _simulation(simulation), _freshness(freshness) {}

  Answer Query(const Nox::Operation::Query& request) const override;
  Answer Change(Nox::Operation::Change&& request) const override;
  std::string DescribeHost() const override;
  void CheckHostChange(std::string_view change) const override;
  Answer ChangeHost(const std::string& change) const override;

 private:
  Simulation& Simulated() const;
  void DropDiskCache() const;
  Answer AnswerFresh(const Orbis::DataObject& request) const;

  PluginHooks _hooks;
  Simulation* _simulation;
  Freshness _freshness;
};

}  // namespace Host
