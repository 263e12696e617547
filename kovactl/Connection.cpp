#include "kovactl/Connection.h"

#include <unistd.h>

#include <cstdio>
#include <stdexcept>

#include "host/KovaService.h"
#include "host/LogSink.h"
#include "kovactl/ExitStatus.h"
#include "tessa/Panic.h"

namespace Kovactl {
namespace {

[[noreturn]] void EndOverPanic(const char* text) {
  Host::FlushLogs();
  std::fprintf(stderr, "kovactl: the plug-in panicked: %s\n", text);
  _exit(static_cast<int>(ExitStatus::Panic));
}

Host::HostRuntime& StartRuntime(const GlobalOptions& options) {
  Tessa::Service::SetDefaultLogger(Host::MakeConsoleLogger(LevelOf(options.logLevel)));
  Tessa::SetPanicHandler(&EndOverPanic);
  Host::RuntimeOptions runtime = options.runtime;
  runtime.makeMachine = Machines::MachineOf(options.machine);
  return Host::HostRuntime::Start(runtime);
}

std::unique_ptr<Host::ManagementApi> ServiceOf(Host::HostRuntime& runtime) {
  return std::make_unique<Host::KovaService>(runtime.Hooks(), &runtime.GetMachine());
}

// What an agent of that address is asked with.
Agentd::TlsClientFiles TlsFilesOf(const GlobalOptions& options) {
  Agentd::TlsClientFiles files = options.tls;
  const bool hasOwn = !files.certificate.empty() || !files.key.empty();
  if (!Agentd::ParseAgentAddress(options.agent).isTls) {
    if (hasOwn || !files.ca.empty()) {
      throw BadInput("--ca, --cert and --key go with an agent on tls:HOST:PORT; this one is " +
                     options.agent);
    }
    return {};
  }
  if (files.ca.empty()) {
    files.ca = options.usualTls.ca;
  }
  if (!hasOwn) {
    files.certificate = options.usualTls.certificate;
    files.key = options.usualTls.key;
  }
  if (files.certificate.empty() != files.key.empty()) {
    throw BadInput("a certificate goes with its key: give both --cert and --key");
  }
  return files;
}

}  // namespace

std::unique_ptr<Host::ManagementApi> Connect(const GlobalOptions& options) {
  if (options.HostsThePlugIn()) {
    return ServiceOf(StartRuntime(options));
  }
  return ConnectToAgent(options);
}

std::unique_ptr<Agentd::AgentClient> ConnectToAgent(const GlobalOptions& options) {
  if (options.machine.save) {
    throw BadInput("--save goes with --host; an agent saves its host itself");
  }
  try {
    return std::make_unique<Agentd::AgentClient>(options.agent, TlsFilesOf(options));
  } catch (const std::invalid_argument& refused) {
    throw BadInput(refused.what());
  }
}

std::unique_ptr<Host::ManagementApi> ConnectToCopy(const GlobalOptions& options) {
  if (options.machine.save) {
    throw BadInput("a plan changes nothing, so there is nothing to --save");
  }
  GlobalOptions copy = options;
  if (!options.HostsThePlugIn()) {
    copy.machine.description = Connect(options)->DescribeHost();
  }
  copy.machine.waitForFaults = false;
  return ServiceOf(StartRuntime(copy));
}

Tessa::Service::LogLevel LevelOf(const std::string& name) {
  Tessa::Service::LogLevel level{};
  if (!Tessa::Service::ParseLevel(name, level)) {
    throw BadInput("unknown log level '" + name +
                   "'; levels are none, error, warning, info, verbose, trivia");
  }
  return level;
}

}  // namespace Kovactl
