#include <cstdlib>
#include <iostream>

#include "kovactl/cli/CommandLine.h"

namespace Kovactl {
namespace {

// The value of a variable of the environment, unless there is none.
void ReadVariable(const char* name, std::string& value) {
  const char* const found = std::getenv(name);
  if (found != nullptr && *found != '\0') {
    value = found;
  }
}

void AddTlsOptions(CLI::App& app, GlobalOptions& global, CLI::Option* host) {
  ReadVariable("KOVA_AGENT_CA", global.usualTls.ca);
  ReadVariable("KOVA_AGENT_CERT", global.usualTls.certificate);
  ReadVariable("KOVA_AGENT_KEY", global.usualTls.key);
  app.add_option(
         "--ca", global.tls.ca,
         "With tls:HOST:PORT, CA of the agent's certificate, PEM; otherwise KOVA_AGENT_CA, or any that "
         "this machine trusts")
      ->excludes(host);
  app.add_option("--cert", global.tls.certificate,
                 "With tls:HOST:PORT, certificate to show the agent, with its chain, PEM; otherwise "
                 "KOVA_AGENT_CERT, or none")
      ->excludes(host);
  app.add_option("--key", global.tls.key, "Its key, PEM; otherwise KOVA_AGENT_KEY")->excludes(host);
}

}  // namespace

void AddGlobalOptions(CLI::App& app, CommandLine& line) {
  GlobalOptions& global = line.global;
  ReadVariable("KOVA_AGENT", global.agent);
  auto* const agent =
      app.add_option(
             "--agent", global.agent,
             "Agent to ask: unix:PATH, tls:HOST:PORT or tcp:ADDRESS:PORT; the environment's KOVA_AGENT "
             "unless given")
          ->capture_default_str();
  auto* const host =
      app.add_option("--host", global.machine.host,
                     "linux for this machine, or a host description: to work on in this process, "
                     "without an agent")
          ->excludes(agent);
  AddTlsOptions(app, global, host);
  app.add_option("--settings", global.machine.settings,
                 "Of this machine, what no kernel knows: cluster, networks, capacity flash")
      ->capture_default_str();
  app.add_flag_callback(
         "--dry-run",
         [&global] {
           global.machine.dryRun = [](const std::string& command) { std::cout << command << std::endl; };
         },
         "With --host linux, print the commands that would change disks, and run none")
      ->needs(host);
  app.add_flag("--save", global.machine.save, "With --host, write changes back to the host description");
  app.add_option("-o,--output", global.output, "How to print: table, json or soap")
      ->check(CLI::IsMember({"table", "json", "soap"}))
      ->capture_default_str();
  app.add_option("--log-level", global.logLevel, "With --host, what the plug-in logs to standard error")
      ->capture_default_str();
  app.add_option("--plugin", global.runtime.pluginFile, "The plug-in, if it is not beside the program");
}

}  // namespace Kovactl
