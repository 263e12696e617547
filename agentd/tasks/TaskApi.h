// A host's management API as its agent offers it: with what the agent itself knows, its tasks.
//
// Threads: any. The host and the queue outlive it.
#pragma once

#include <utility>

#include "host/ManagementApi.h"

namespace Agentd {

class TaskQueue;

class TaskApi final : public Host::ManagementApi {
 public:
  TaskApi(const Host::ManagementApi& host, const TaskQueue& tasks) : _host(host), _tasks(tasks) {}

  Host::Answer Query(const Nox::Operation::Query& request) const override;
  Host::Answer Change(Nox::Operation::Change&& request) const override {
    return _host.Change(std::move(request));
  }
  std::string DescribeHost() const override { return _host.DescribeHost(); }
  void CheckHostChange(std::string_view change) const override { _host.CheckHostChange(change); }
  Host::Answer ChangeHost(const std::string& change) const override { return _host.ChangeHost(change); }

 private:
  const Host::ManagementApi& _host;
  const TaskQueue& _tasks;
};

}  // namespace Agentd
