#include "kovactl/Connection.h"

#include <unistd.h>

#include <cstdio>
#include <stdexcept>

#include "agentd/client/AgentClient.h"
#include "host/KovaService.h"
#include "host/LogSink.h"
#include "kovactl/ExitStatus.h"
#include "tessa/Panic.h"

namespace Kovactl {
namespace {

// What can be asked of a service so far; the rest of the interface says that it cannot.
template <class Service>
class SoFar final : public Host::ManagementApi {
 public:
  template <class Argument>
  explicit SoFar(const Argument& argument) : _service(argument) {}
  Host::Answer QueryDisksForKova(const std::vector<std::string>& names) const override {
    return _service.QueryDisksForKova(names);
  }
  Host::Answer GetStorageInfo() const override { return _service.GetStorageInfo(); }
  Host::Answer GetDiskGroups() const override { return _service.GetStorageInfo(); }
  Host::Answer GetConfigInfo() const override { return _service.GetConfigInfo(); }
  Host::Answer AddDisks(const Host::DiskList&) const override { return NotYet(); }
  Host::Answer AddAllEligibleDisks() const override { return NotYet(); }
  Host::Answer InitializeDisks(const Host::MappingList&) const override { return NotYet(); }
  Host::Answer UnmountDiskMapping(const Host::MappingList&) const override { return NotYet(); }
  Host::Answer RemoveDisk(const std::string&, const Host::RemovalArguments&) const override {
    return NotYet();
  }
  Host::Answer RemoveDiskMapping(const Nox::Kova::Host::DiskMapping&,
                                 const Host::RemovalArguments&) const override {
    return NotYet();
  }
  Host::Answer ClaimUnmountedDiskgroup() const override { return NotYet(); }
  std::string DescribeHost() const override { throw std::runtime_error("not built"); }
  Host::Answer ChangeHost(const std::string&) const override { return NotYet(); }

 private:
  static Host::Answer NotYet() { return Host::FailedWith("not built"); }
  Service _service;
};

[[noreturn]] void EndOverPanic(const char* text) {
  Host::FlushLogs();
  std::fprintf(stderr, "kovactl: the plug-in panicked: %s\n", text);
  _exit(static_cast<int>(ExitStatus::Panic));
}

Host::HostRuntime& StartRuntime(const GlobalOptions& options) {
  Tessa::Service::SetDefaultLogger(Host::MakeConsoleLogger(LevelOf(options.logLevel)));
  Tessa::SetPanicHandler(&EndOverPanic);
  return Host::HostRuntime::Start(options.runtime);
}

}  // namespace

std::unique_ptr<Host::ManagementApi> Connect(const GlobalOptions& options) {
  if (options.HostsThePlugIn()) {
    Host::HostRuntime& runtime = StartRuntime(options);
    return std::make_unique<Host::KovaService>(runtime.Hooks(), &runtime.SimulatedHost());
  }
  if (options.runtime.save) {
    throw BadInput("--save goes with --host; an agent saves its host itself");
  }
  try {
    return std::make_unique<SoFar<Agentd::AgentClient>>(options.agent);
  } catch (const std::invalid_argument& refused) {
    throw BadInput(refused.what());
  }
}

std::unique_ptr<Host::ManagementApi> ConnectToCopy(const GlobalOptions& options) {
  if (options.runtime.save) {
    throw BadInput("a plan changes nothing, so there is nothing to --save");
  }
  GlobalOptions copy = options;
  if (!options.HostsThePlugIn()) {
    copy.runtime.hostText = Connect(options)->DescribeHost();
  }
  Host::HostRuntime& runtime = StartRuntime(copy);
  runtime.SimulatedHost().SetWaiter([](std::chrono::milliseconds) {});
  return std::make_unique<Host::KovaService>(runtime.Hooks(), &runtime.SimulatedHost());
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
