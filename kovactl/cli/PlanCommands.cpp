// Commands that show what a change would do.

#include "kovactl/plan/PlanCommand.h"

#include <iostream>

#include "kovactl/Print.h"
#include "kovactl/cli/CommandLine.h"

namespace Kovactl {

void AddPlanCommands(CLI::App& app, CommandLine& line) {
  auto* const plan = app.add_subcommand(
      "plan", "Show what a change would do, on a simulated copy of the host; changes nothing");
  plan->require_subcommand(1);
  const auto allDisks = std::make_shared<bool>(false);
  plan->add_flag("--all-disks", *allDisks, "Name every disk that would be left over, not only count them");
  AddChanges(*plan, [&line, allDisks](CLI::App& command, const MakeChange& make) {
    command.callback([&line, make, allDisks] {
      line.action = [&line, make, allDisks] {
        if (line.global.output == "soap") {
          throw BadInput("a plan is printed as a table or as json");
        }
        const ChangeRef change = make();
        const HostCopy copy = ConnectToCopy(line.global);
        if (!copy.host) {
          PrintFault(*copy.fault, std::cerr);
          return ExitStatus::Fault;
        }
        return RunPlan(*copy.host, *change,
                       {.generation = copy.generation, .output = line.global.output, .allDisks = *allDisks},
                       std::cout, std::cerr);
      };
    });
  });
}

}  // namespace Kovactl
