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

class OwnHost final : public Connection {
 public:
  explicit OwnHost(const Host::PluginHooks& hooks) : _service(hooks) {}
  Host::Answer QueryDisksForKova(const std::vector<std::string>& names) const override {
    return _service.QueryDisksForKova(names);
  }
  Host::Answer GetStorageInfo() const override { return _service.GetStorageInfo(); }
  Host::Answer GetConfigInfo() const override { return _service.GetConfigInfo(); }

 private:
  Host::KovaService _service;
};

class AgentsHost final : public Connection {
 public:
  explicit AgentsHost(const std::string& url) : _client(url) {}
  Host::Answer QueryDisksForKova(const std::vector<std::string>& names) const override {
    return _client.QueryDisksForKova(names);
  }
  Host::Answer GetStorageInfo() const override { return _client.GetStorageInfo(); }
  Host::Answer GetConfigInfo() const override { return _client.GetConfigInfo(); }

 private:
  Agentd::AgentClient _client;
};

[[noreturn]] void EndOverPanic(const char* text) {
  Host::FlushLogs();
  std::fprintf(stderr, "kovactl: the plug-in panicked: %s\n", text);
  _exit(static_cast<int>(ExitStatus::Panic));
}

}  // namespace

Connection::~Connection() = default;

std::unique_ptr<Connection> Connect(const GlobalOptions& options) {
  if (!options.runtime.hostFile.empty()) {
    Tessa::Service::SetDefaultLogger(Host::MakeConsoleLogger(LevelOf(options.logLevel)));
    Tessa::SetPanicHandler(&EndOverPanic);
    return std::make_unique<OwnHost>(Host::HostRuntime::Start(options.runtime).Hooks());
  }
  if (options.runtime.save) {
    throw BadInput("--save goes with --host; an agent saves its host itself");
  }
  try {
    return std::make_unique<AgentsHost>(options.agent);
  } catch (const std::invalid_argument& refused) {
    throw BadInput(refused.what());
  }
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
