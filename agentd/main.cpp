// The host agent: loads the plug-in, gives it a host, and answers for it over sockets.

#include <unistd.h>

#include <CLI/CLI.hpp>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iostream>

#include "agentd/ListenOptions.h"
#include "agentd/Trace.h"
#include "agentd/http/HttpServer.h"
#include "agentd/routes/Refusals.h"
#include "agentd/routes/Routes.h"
#include "agentd/tasks/TaskQueue.h"
#include "host/Build.h"
#include "host/HostRuntime.h"
#include "host/KovaService.h"
#include "host/LogSink.h"
#include "machines/Machines.h"
#include "tessa/Panic.h"

namespace {

constexpr std::chrono::seconds lastQueryTime(10);  // for a query at work that no client waits for
constexpr int unfinishedStatus = 1;                // stopped while requests were still handled

struct Options {
  Machines::MachineOptions machine;
  Host::RuntimeOptions runtime;
  Agentd::ListenOptions listen;
  std::string readyFile;
  std::string logLevel = "info";
  std::string traceFile;
};

void AddOptions(CLI::App& cli, Options& options) {
  cli.set_version_flag("--version", "agentd " + Host::VersionLine(), "Print version, build and API, and end");
  cli.add_option(
      "--host", options.machine.host,
      "Host to serve: linux for this machine, or a host description; without one, an example host is "
      "served");
  cli.add_option("--settings", options.machine.settings,
                 "What no kernel knows of this machine: cluster, fault domain, networks, capacity flash")
      ->capture_default_str();
  cli.add_flag("--save", options.machine.save, "Write every change of the host back to its description");
  cli.add_option("--ready-file", options.readyFile,
                 "File to write the addresses to, a line each, once they are answered on");
  cli.add_option("--log-level", options.logLevel, "none, error, warning, info, verbose, trivia")
      ->capture_default_str();
  cli.add_option("--trace", options.traceFile,
                 "File to append one JSON line per call of the kernel provider to");
  cli.add_option("--plugin", options.runtime.pluginFile, "The plug-in, if it is not beside the program");
  options.listen.AddTo(cli);
}

[[noreturn]] void EndOverPanic(const char* text) {
  Host::FlushLogs();
  std::fprintf(stderr, "agentd: panic: %s\n", text);
  std::abort();
}

// Whole or not at all: whoever waits for the file may read it as soon as it is there.
void WriteReadyFile(const std::string& path, const std::vector<Agentd::HttpAddress>& addresses) {
  if (path.empty()) {
    return;
  }
  const std::string unfinished = path + ".new";
  std::ofstream file(unfinished);
  for (const Agentd::HttpAddress& address : addresses) {
    file << address.Text() << "\n";
  }
  if (!file.flush() || std::rename(unfinished.c_str(), path.c_str()) != 0) {
    throw std::runtime_error("cannot write the ready file " + path);
  }
}

void SetUpLogging(const Options& options) {
  Tessa::Service::LogLevel level{};
  if (!Tessa::Service::ParseLevel(options.logLevel, level)) {
    throw std::runtime_error("unknown log level '" + options.logLevel +
                             "'; levels are none, error, warning, info, verbose, trivia");
  }
  Tessa::Service::SetDefaultLogger(Host::MakeConsoleLogger(level));
  Tessa::SetPanicHandler(&EndOverPanic);
}

void Log(Tessa::Service::LogLevel level, const char* format, const std::string& argument = {}) {
  Tessa::Service::LogInternal(Tessa::Service::GetDefaultLogger(), level, format, argument);
}

void Serve(Options& options) {
  using Tessa::Service::LogLevel;
  const Agentd::HttpOptions http = options.listen.Read();
  SetUpLogging(options);
  if (!options.traceFile.empty()) {
    options.runtime.recorder = Agentd::TraceTo(options.traceFile);
  }
  options.machine.alone = true;
  options.runtime.makeMachine = Machines::MachineOf(options.machine);
  Host::HostRuntime& runtime = Host::HostRuntime::Start(options.runtime);
  const Host::KovaService service(runtime.Hooks(), &runtime.GetMachine());
  Agentd::TaskQueue tasks;
  Agentd::Router router(service, tasks);
  Agentd::HttpServer server(
      http,
      [&router](const Agentd::HttpRequest& request, const Agentd::HttpResponder& responder) {
        router.Serve(request, responder);
      },
      [&router](const Agentd::HttpRequest& head) { return router.Admit(head); });
  server.OnRefusal(&Agentd::EncodeRefusal);
  router.OnLoad([&server] { return server.Now(); });
  server.OnStopping([&tasks] { tasks.Close(); });
  WriteReadyFile(options.readyFile, server.Addresses());
  for (const Agentd::HttpAddress& address : server.Addresses()) {
    Log(LogLevel::Info, "Answering on %1", address.Text());
  }
  const bool isDrained = server.Run();
  tasks.Finish();  // whatever the time: a change is never left in its middle
  if (!isDrained || !router.WaitUntilIdle(lastQueryTime)) {
    // A handler hangs, and may never come back: nothing that it could still use is taken down.
    Log(LogLevel::Warning, "Stopped with requests unfinished");
    Host::FlushLogs();
    _exit(unfinishedStatus);
  }
  Log(LogLevel::Info, "Stopped");
}

}  // namespace

int main(int argc, char** argv) {
  CLI::App cli("The KOVA host agent", "agentd");
  Options options;
  AddOptions(cli, options);
  try {
    cli.parse(argc, argv);
  } catch (const CLI::ParseError& error) {
    return cli.exit(error) == 0 ? 0 : 2;
  }
  std::signal(SIGPIPE, SIG_IGN);  // whoever read the log may go; the agent stays
  try {
    Serve(options);
    return 0;
  } catch (const std::exception& exception) {
    std::cerr << "agentd: " << exception.what() << "\n";
    return 2;
  }
}
