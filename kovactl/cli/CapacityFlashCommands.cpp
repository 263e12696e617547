// Which flash disks are for the capacity tier.

#include <iostream>

#include "kovactl/CapacityFlashCommand.h"
#include "kovactl/cli/CommandLine.h"

namespace Kovactl {
namespace {

// The settings are a file of the machine whose disks they are about.
void CheckIsHere(const GlobalOptions& global) {
  if (!global.HostsThePlugIn() && global.agent.compare(0, 5, "unix:") != 0) {
    throw BadInput("capacity-flash writes a file of the agent's machine: run it there");
  }
}

void Add(CLI::App& parent, CommandLine& line, const char* name, const char* what, bool isMarked) {
  const auto options = std::make_shared<CapacityFlashOptions>();
  options->isMarked = isMarked;
  auto* const command = parent.add_subcommand(name, what);
  command->add_option("DISK", options->disk, "Canonical name")->required();
  command->callback([&line, options] {
    line.action = [&line, options] {
      CheckIsHere(line.global);
      options->settings = line.global.machine.settings;
      options->output = line.global.output;
      return RunCapacityFlash(*Connect(line.global), *options, std::cout);
    };
  });
}

}  // namespace

void AddCapacityFlashCommands(CLI::App& app, CommandLine& line) {
  auto* const command =
      app.add_subcommand("capacity-flash", "Say which flash disks of this machine are for the capacity tier");
  command->require_subcommand(1);
  Add(*command, line, "set", "Mark a flash disk for capacity", true);
  Add(*command, line, "clear", "Take the mark away: it is for cache again", false);
}

}  // namespace Kovactl
