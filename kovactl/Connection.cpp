#include "kovactl/Connection.h"

#include <unistd.h>

#include <cstdio>
#include <stdexcept>

#include "host/KovaService.h"
#include "host/LogSink.h"
#include "kovactl/ExitStatus.h"
#include "nox/Kova.h"
#include "nox/Operations.h"
#include "tessa/Panic.h"

namespace Kovactl {
namespace {

[[noreturn]] void EndOverPanic(const char* text) {
  Host::FlushLogs();
  std::fprintf(stderr, "kovactl: the plug-in panicked: %s\n", text);
  _exit(static_cast<int>(ExitStatus::Panic));
}

void SetUpLogging(const GlobalOptions& options) {
  Tessa::Service::SetDefaultLogger(Host::MakeConsoleLogger(LevelOf(options.logLevel)));
  Tessa::SetPanicHandler(&EndOverPanic);
}

Host::HostRuntime& StartRuntime(const GlobalOptions& options) {
  Host::RuntimeOptions runtime = options.runtime;
  runtime.makeMachine = Machines::MachineOf(options.machine);
  return Host::HostRuntime::Start(runtime);
}

std::unique_ptr<Host::ManagementApi> ServiceOf(Host::HostRuntime& runtime) {
  return std::make_unique<Host::KovaService>(runtime.Hooks(), &runtime.GetMachine());
}

// The machine's own, without a plug-in.
Host::Answer TakeTwin(Host::Machine& machine) {
  try {
    const Host::Twin taken = machine.TakeTwin();
    const auto twin = Tessa::MakeRef<Nox::Kova::Host::Twin>();
    twin->SetGeneration(taken.generation);
    twin->SetDescription(taken.description);
    return {.result = twin, .fault = nullptr};
  } catch (const std::exception& failed) {
    return Host::FailedWith(failed.what());
  }
}

Host::Answer AskForTwin(const GlobalOptions& options) {
  if (options.HostsThePlugIn()) {
    return TakeTwin(*Machines::MakeMachine(options.machine));
  }
  return ConnectToAgent(options)->Query(Nox::Operation::GetTwin());
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
    SetUpLogging(options);
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

HostCopy ConnectToCopy(const GlobalOptions& options) {
  if (options.machine.save) {
    throw BadInput("a plan changes nothing, so there is nothing to --save");
  }
  SetUpLogging(options);
  const Host::Answer answer = AskForTwin(options);
  const auto* const twin = dynamic_cast<const Nox::Kova::Host::Twin*>(answer.result.Get());
  if (twin == nullptr) {
    return {.host = nullptr, .generation = "", .fault = answer.fault};
  }
  GlobalOptions copy = options;
  copy.machine = {.description = twin->GetDescription(), .waitForFaults = false};
  return {.host = ServiceOf(StartRuntime(copy)), .generation = twin->GetGeneration()};
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
