// kovactl: what an operator does with a host, and what a developer does with a report.

#include <iostream>

#include "agentd/client/AgentClient.h"
#include "host/Build.h"
#include "kovactl/Print.h"
#include "kovactl/cli/CommandLine.h"
#include "tessa/text/Escape.h"

namespace {

using Kovactl::CommandLine;
using Kovactl::ExitStatus;

void AddEverything(CLI::App& app, CommandLine& line) {
  Kovactl::AddGlobalOptions(app, line);
  Kovactl::AddReportCommands(app, line);
  Kovactl::AddChangeCommands(app, line);
  Kovactl::AddPlanCommands(app, line);
  Kovactl::AddSimCommands(app, line);
  Kovactl::AddHostCommands(app, line);
  Kovactl::AddCapacityFlashCommands(app, line);
  Kovactl::AddReplayCommand(app, line);
  app.footer(
      "Exit status: 0 done; 1 the host answered with a fault; 2 usage or bad input, or no consent;\n"
      "3 no agent answers, or none that can be trusted; 70 the plug-in panicked.");
}

ExitStatus Run(const CommandLine& line) {
  try {
    return line.action();
  } catch (const Agentd::RefusedByAgent& refused) {
    Kovactl::PrintFault(refused.GetFault(), std::cerr);
    return ExitStatus::Fault;
  } catch (const Agentd::AnswerError& error) {
    std::cerr << "kovactl: " << Tessa::Escape(error.what()) << "\n";
    return ExitStatus::Unreachable;
  } catch (const Agentd::ConnectionError& error) {
    std::cerr << "kovactl: " << Tessa::Escape(error.what())
              << "\nStart one with `agentd`, or work on a description with --host FILE.\n";
    return ExitStatus::Unreachable;
  } catch (const std::exception& error) {
    // What is left: files, descriptions, names and options that cannot be used.
    std::cerr << "kovactl: " << Tessa::Escape(error.what()) << "\n";
    return ExitStatus::BadInput;
  }
}

}  // namespace

int main(int argc, char** argv) {
  CLI::App app("Look at a KOVA host and change it", "kovactl");
  app.set_version_flag("--version", "kovactl " + Host::VersionLine(),
                       "Print version, build and API, and end");
  app.require_subcommand(0, 1);  // a word that is no command is then named in the refusal
  app.fallthrough();
  CommandLine line;
  AddEverything(app, line);
  try {
    app.parse(argc, argv);
  } catch (const CLI::ParseError& error) {
    return static_cast<int>(app.exit(error) == 0 ? ExitStatus::Done : ExitStatus::BadInput);
  }
  if (!line.action) {
    std::cerr << app.help();
    return static_cast<int>(ExitStatus::BadInput);
  }
  const ExitStatus status = Run(line);
  std::cout.flush();
  return static_cast<int>(std::cout ? status : ExitStatus::BadInput);
}
