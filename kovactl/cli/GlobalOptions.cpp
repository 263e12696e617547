#include <cstdlib>

#include "kovactl/cli/CommandLine.h"

namespace Kovactl {
namespace {

constexpr const char* agentVariable = "KOVA_AGENT";

}  // namespace

void AddGlobalOptions(CLI::App& app, CommandLine& line) {
  GlobalOptions& global = line.global;
  const char* const usualAgent = std::getenv(agentVariable);
  if (usualAgent != nullptr && *usualAgent != '\0') {
    global.agent = usualAgent;
  }
  auto* const agent =
      app.add_option("--agent", global.agent,
                     "Agent to ask: unix:PATH or tcp:ADDRESS:PORT; the environment's KOVA_AGENT unless given")
          ->capture_default_str();
  app.add_option("--host", global.runtime.hostFile,
                 "Host description to work on in this process, without an agent")
      ->excludes(agent);
  app.add_flag("--save", global.runtime.save, "With --host, write changes back to the host description");
  app.add_option("-o,--output", global.output, "How to print: table, json or soap")
      ->check(CLI::IsMember({"table", "json", "soap"}))
      ->capture_default_str();
  app.add_option("--log-level", global.logLevel, "With --host, what the plug-in logs to standard error")
      ->capture_default_str();
  app.add_option("--plugin", global.runtime.pluginFile, "The plug-in, if it is not beside the program");
}

}  // namespace Kovactl
