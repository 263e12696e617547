// Commands that look and change nothing.

#include <iostream>

#include "agentd/client/AgentClient.h"
#include "kovactl/ConfigCommand.h"
#include "kovactl/DisksCommand.h"
#include "kovactl/GroupsCommand.h"
#include "kovactl/TasksCommand.h"
#include "kovactl/cli/CommandLine.h"

namespace Kovactl {
namespace {

void AddDisks(CLI::App& app, CommandLine& line) {
  const auto names = std::make_shared<Texts>();
  auto* const command =
      app.add_subcommand("disks", "List disks: kind, size, state, and why one cannot be used");
  command->add_option("DISK", *names, "Canonical names; none: every disk");
  command->callback([&line, names] {
    line.action = [&line, names] {
      return RunDisks(*Connect(line.global), *names, line.global.output, std::cout, std::cerr);
    };
  });
}

using Report = ExitStatus (*)(const Host::ManagementApi& host, const std::string& output, std::ostream& out,
                              std::ostream& err);

// A command that asks for one thing and prints it.
void AddReport(CLI::App& app, CommandLine& line, const char* name, const char* what, Report report) {
  app.add_subcommand(name, what)->callback([&line, report] {
    line.action = [&line, report] {
      return report(*Connect(line.global), line.global.output, std::cout, std::cerr);
    };
  });
}

void AddTasks(CLI::App& app, CommandLine& line) {
  app.add_subcommand("tasks", "List the changes that an agent was given, and what became of them")
      ->callback([&line] {
        line.action = [&line] {
          if (line.global.HostsThePlugIn() || line.global.output == "soap") {
            throw BadInput("tasks are an agent's, and printed as a table or as json");
          }
          return PrintTasks(ConnectToAgent(line.global)->Tasks(), line.global.output, std::cout);
        };
      });
}

}  // namespace

void AddReportCommands(CLI::App& app, CommandLine& line) {
  AddDisks(app, line);
  AddReport(app, line, "groups", "List disk groups: disks, kind, size, mounted or not", &RunGroups);
  AddReport(app, line, "config", "Show cluster, network and fault domain", &RunConfig);
  AddTasks(app, line);
}

}  // namespace Kovactl
