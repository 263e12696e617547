// The words of the command line, one file per family of commands.
//
// While the line is read, nothing happens yet: a command that is found leaves what is to be done, and main()
// does it once all of the line was understood.
#pragma once

#include <CLI/CLI.hpp>
#include <functional>
#include <memory>

#include "kovactl/Change.h"
#include "kovactl/Connection.h"
#include "kovactl/ExitStatus.h"
#include "kovactl/change/ChangeCommand.h"

namespace Kovactl {

struct CommandLine {
  GlobalOptions global;
  std::function<ExitStatus()> action;  // empty until a command was found
};

void AddGlobalOptions(CLI::App& app, CommandLine& line);
void AddReportCommands(CLI::App& app, CommandLine& line);         // disks, groups, config, tasks
void AddChangeCommands(CLI::App& app, CommandLine& line);         // add .. claim
void AddPlanCommands(CLI::App& app, CommandLine& line);           // plan add .. plan claim
void AddSimCommands(CLI::App& app, CommandLine& line);            // sim set ..
void AddHostCommands(CLI::App& app, CommandLine& line);           // host import, host check
void AddCapacityFlashCommands(CLI::App& app, CommandLine& line);  // capacity-flash set, clear
void AddReplayCommand(CLI::App& app, CommandLine& line);

ChangeOptions OptionsOf(const GlobalOptions& global);

// Makes the change that a command was given; throws BadInput where its arguments do not go together.
using MakeChange = std::function<ChangeRef()>;

// Adds one command per change to `parent`, each handed to `take` with what makes its change.
void AddChanges(CLI::App& parent, const std::function<void(CLI::App& command, const MakeChange& make)>& take);

}  // namespace Kovactl
