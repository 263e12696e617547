// The host that a command works on: an agent's, or one hosted by this very process.
#pragma once

#include <memory>
#include <string>

#include "agentd/client/AgentClient.h"
#include "host/HostRuntime.h"
#include "host/ManagementApi.h"
#include "machines/Machines.h"
#include "tessa/Logger.h"

namespace Kovactl {

// What all commands share.
struct GlobalOptions {
  std::string agent = "unix:/run/kova/agentd.sock";
  Agentd::TlsClientFiles tls;        // as they were given; for an agent that is asked by TLS
  Agentd::TlsClientFiles usualTls;   // in place of what was not given
  Machines::MachineOptions machine;  // with a host file, the command hosts the plug-in itself
  Host::RuntimeOptions runtime;
  std::string output = "table";  // table, json or soap
  std::string logLevel = "warning";

  bool HostsThePlugIn() const noexcept { return !machine.host.empty(); }
};

// Throws BadInput, and what starting the runtime throws. An agent is not called yet. Once per process.
std::unique_ptr<Host::ManagementApi> Connect(const GlobalOptions& options);

// The options' agent, not called yet. Throws BadInput.
std::unique_ptr<Agentd::AgentClient> ConnectToAgent(const GlobalOptions& options);

struct HostCopy {
  std::unique_ptr<Host::ManagementApi> host;       // null: there is none
  std::string generation;                          // of what it is a copy of
  Tessa::Ref<Orbis::MethodFault> fault = nullptr;  // why there is none
};

// A copy of the options' host, simulated in this process: what is done to it is forgotten, and delays that
// it has on demand are not waited for. The host itself is only looked at. Throws as Connect does. Once per
// process, and instead of Connect.
HostCopy ConnectToCopy(const GlobalOptions& options);

// The level of that name; throws BadInput.
Tessa::Service::LogLevel LevelOf(const std::string& name);

}  // namespace Kovactl
