// kovactl: what an operator does with a host, and what a developer does with a report.

#include <CLI/CLI.hpp>
#include <functional>
#include <iostream>

#include "agentd/http/HttpClient.h"
#include "host/HostError.h"
#include "host/Text.h"
#include "kovactl/ConfigCommand.h"
#include "kovactl/Connection.h"
#include "kovactl/DisksCommand.h"
#include "kovactl/ExitStatus.h"
#include "kovactl/GroupsCommand.h"
#include "kovactl/HostCommands.h"
#include "kovactl/replay/ReplayRunner.h"
#include "otxctl/sim/HostDescriptionError.h"

namespace {

using Kovactl::ExitStatus;

// What the command line asked for; run after all of it was understood.
using Action = std::function<ExitStatus()>;

struct Options {
  Kovactl::GlobalOptions global;
  std::vector<std::string> names;
  Kovactl::ImportOptions importing;
  std::string checkFile;
  std::string replayFile;
  std::string replayLevel = "trivia";
};

void AddGlobalOptions(CLI::App& cli, Kovactl::GlobalOptions& global) {
  auto* const agent =
      cli.add_option("--agent", global.agent, "Agent to ask: unix:PATH")->capture_default_str();
  cli.add_option("--host", global.runtime.hostFile,
                 "Host description to work on in this process, without an agent")
      ->excludes(agent);
  cli.add_flag("--save", global.runtime.save, "Write changes back to the host description");
  cli.add_option("-o,--output", global.output, "How to print: table, json or soap")
      ->check(CLI::IsMember({"table", "json", "soap"}))
      ->capture_default_str();
  cli.add_option("--log-level", global.logLevel, "With --host, what the plug-in logs to standard error")
      ->capture_default_str();
  cli.add_option("--plugin", global.runtime.pluginFile, "The plug-in, if it is not beside the program");
}

void AddDisks(CLI::App& cli, Options& options, Action& action) {
  auto* const command =
      cli.add_subcommand("disks", "List disks: kind, size, state, and why one cannot be used");
  command->add_option("DISK", options.names, "Canonical names; none: every disk");
  command->callback([&] {
    action = [&] {
      const auto connection = Kovactl::Connect(options.global);
      return Kovactl::RunDisks(*connection, options.names, options.global.output, std::cout, std::cerr);
    };
  });
}

using Report = ExitStatus (*)(const Kovactl::Connection&, const std::string& output, std::ostream& out,
                              std::ostream& err);

// A command that asks for one thing and prints it.
void AddReport(CLI::App& cli, const char* name, const char* what, Report report, Options& options,
               Action& action) {
  cli.add_subcommand(name, what)->callback([&options, &action, report] {
    action = [&options, report] {
      return report(*Kovactl::Connect(options.global), options.global.output, std::cout, std::cerr);
    };
  });
}

void AddHost(CLI::App& cli, Options& options, Action& action) {
  auto* const host = cli.add_subcommand("host", "Make and check host descriptions");
  host->require_subcommand(1);
  auto* const importer =
      host->add_subcommand("import", "Describe the machine that `lsblk --json -O -b` was run on");
  importer->add_option("FILE", options.importing.file, "Output of lsblk; - for standard input")->required();
  importer->add_option("--name", options.importing.name, "Name of the host")->capture_default_str();
  importer->add_option("--minimum-bytes", options.importing.minimumDiskBytes, "Smaller disks are too small")
      ->check(CLI::NonNegativeNumber)
      ->capture_default_str();
  importer->add_option("--write", options.importing.output, "File to write instead of standard output");
  importer->callback(
      [&] { action = [&] { return Kovactl::RunHostImport(options.importing, std::cin, std::cout); }; });
  auto* const check = host->add_subcommand("check", "Check a host description");
  check->add_option("FILE", options.checkFile, "Host description")->required();
  check->callback([&] { action = [&] { return Kovactl::RunHostCheck(options.checkFile, std::cout); }; });
}

void AddReplay(CLI::App& cli, Options& options, Action& action) {
  CLI::App* const command =
      cli.add_subcommand("replay", "Run a log of requests through the plug-in, bare (with --host)");
  command->add_option("REQUESTS", options.replayFile, "One JSON object per line; - for standard input")
      ->required();
  command->add_option("--log-level", options.replayLevel, "What the answers show of the plug-in's log")
      ->capture_default_str();
  command->callback([&, command] {
    // The common option, before the command's name, means the same.
    const CLI::Option* const own = command->get_option("--log-level");
    const CLI::Option* const common = cli.get_option("--log-level");
    const bool useCommon = own->count() == 0 && common->count() != 0;
    action = [&options, useCommon] {
      const std::string& level = useCommon ? options.global.logLevel : options.replayLevel;
      return Kovactl::RunReplay(options.global.runtime, options.replayFile, Kovactl::LevelOf(level), std::cin,
                                std::cout);
    };
  });
}

ExitStatus Run(const Action& action) {
  try {
    return action();
  } catch (const Agentd::ConnectionError& error) {
    std::cerr << "kovactl: " << Host::Printable(error.what())
              << "\nStart one with `agentd`, or work on a description with --host FILE.\n";
    return ExitStatus::Unreachable;
  } catch (const std::exception& error) {
    // What is left: files, descriptions, names and options that cannot be used.
    std::cerr << "kovactl: " << Host::Printable(error.what()) << "\n";
    return ExitStatus::BadInput;
  }
}

}  // namespace

int main(int argc, char** argv) {
  CLI::App cli("Look at a KOVA host and change it", "kovactl");
  cli.require_subcommand(0, 1);  // a word that is no command is then named in the refusal
  cli.fallthrough();
  Options options;
  Action action;
  AddGlobalOptions(cli, options.global);
  AddDisks(cli, options, action);
  AddReport(cli, "groups", "List disk groups: disks, kind, size, mounted or not", &Kovactl::RunGroups,
            options, action);
  AddReport(cli, "config", "Show cluster, network and fault domain", &Kovactl::RunConfig, options, action);
  AddHost(cli, options, action);
  AddReplay(cli, options, action);
  try {
    cli.parse(argc, argv);
  } catch (const CLI::ParseError& error) {
    return static_cast<int>(cli.exit(error) == 0 ? ExitStatus::Done : ExitStatus::BadInput);
  }
  if (!action) {
    std::cerr << cli.help();
    return static_cast<int>(ExitStatus::BadInput);
  }
  const ExitStatus status = Run(action);
  std::cout.flush();
  return static_cast<int>(std::cout ? status : ExitStatus::BadInput);
}
