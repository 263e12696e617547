// Commands that change disk groups, and what they are given.

#include <unistd.h>

#include <iostream>

#include "kovactl/change/ChangeCommand.h"
#include "kovactl/cli/CommandLine.h"

namespace Kovactl {
namespace {

void AddAdd(CLI::App& parent, const auto& take) {
  struct Arguments {
    Texts disks;
    bool all = false;
  };
  const auto arguments = std::make_shared<Arguments>();
  auto* const command = parent.add_subcommand("add", "Make disk groups of disks, or extend groups by them");
  auto* const disks = command->add_option("DISK", arguments->disks, "Canonical names");
  command->add_flag("--all", arguments->all, "Every eligible disk of the host")->excludes(disks);
  take(*command, [arguments] {
    if (!arguments->all && arguments->disks.empty()) {
      throw BadInput("name the disks to add, or give --all for every eligible disk");
    }
    return arguments->all ? AddEveryEligibleDisk() : AddTheseDisks(arguments->disks);
  });
}

void AddInit(CLI::App& parent, const auto& take) {
  struct Arguments {
    std::string cacheDisk;
    Texts capacityDisks;
  };
  const auto arguments = std::make_shared<Arguments>();
  auto* const command = parent.add_subcommand("init", "Make exactly one disk group");
  command->add_option("--ssd", arguments->cacheDisk, "The cache disk")->required();
  command->add_option("--disk", arguments->capacityDisks, "The capacity disks")->required();
  take(*command, [arguments] { return MakeGroup(arguments->cacheDisk, arguments->capacityDisks); });
}

// What the kernel is handed with a removal.
void AddRemovalOptions(CLI::App& command, RemovalOptions& options) {
  command.add_option("--pass-through", options.passThrough, "Text handed to the kernel as it is");
  command.add_option("--option-text", options.text, "Text of the kernel's removal options");
  command.add_option("--option-first", options.first, "Their first number")->capture_default_str();
  command.add_option("--option-second", options.second, "Their second number")->capture_default_str();
}

using MakeRemoval = ChangeRef (*)(std::string disk, RemovalOptions options);

void AddRemoval(CLI::App& parent, const auto& take, const char* name, const char* what, const char* argument,
                const char* argumentIs, MakeRemoval makeRemoval) {
  struct Arguments {
    std::string disk;
    RemovalOptions removal;
  };
  const auto arguments = std::make_shared<Arguments>();
  auto* const command = parent.add_subcommand(name, what);
  command->add_option(argument, arguments->disk, argumentIs)->required();
  AddRemovalOptions(*command, arguments->removal);
  take(*command, [arguments, makeRemoval] { return makeRemoval(arguments->disk, arguments->removal); });
}

void AddUnmount(CLI::App& parent, const auto& take) {
  const auto cacheDisks = std::make_shared<Texts>();
  auto* const command = parent.add_subcommand("unmount", "Take disk groups out of use, erasing nothing");
  command->add_option("SSD", *cacheDisks, "Their cache disks")->required();
  take(*command, [cacheDisks] { return UnmountGroups(*cacheDisks); });
}

Consent ConsentOf(bool given) {
  if (given) {
    return Consent::Given();
  }
  return isatty(STDIN_FILENO) == 1 ? Consent::AskedFor(std::cin, std::cerr) : Consent::OfNobody();
}

}  // namespace

ChangeOptions OptionsOf(const GlobalOptions& global) {
  const bool isDescribed = global.HostsThePlugIn() && global.machine.host != Machines::thisMachine;
  return {.output = global.output,
          .forgotten = isDescribed && !global.machine.save,
          .dryRun = static_cast<bool>(global.machine.dryRun)};
}

void AddChanges(CLI::App& parent,
                const std::function<void(CLI::App& command, const MakeChange& make)>& take) {
  AddAdd(parent, take);
  AddInit(parent, take);
  AddRemoval(parent, take, "remove", "Take one disk out of its group; a cache disk takes its group along",
             "DISK", "Canonical name; kova:UUID for a disk that has left", &RemoveOneDisk);
  AddRemoval(parent, take, "remove-group", "Take a whole disk group out of the service", "SSD",
             "The group's cache disk", &RemoveGroup);
  AddUnmount(parent, take);
  take(*parent.add_subcommand("claim", "Mount every disk group that is not mounted"), &ClaimGroups);
}

void AddChangeCommands(CLI::App& app, CommandLine& line) {
  AddChanges(app, [&line](CLI::App& command, const MakeChange& make) {
    if (command.get_name() == "claim") {
      command.callback([&line] {
        line.action = [&line] {
          return RunClaim(*Connect(line.global), OptionsOf(line.global), std::cout, std::cerr);
        };
      });
      return;
    }
    const auto yes = std::make_shared<bool>(false);
    command.add_flag("-y,--yes", *yes, "Do not ask before data is destroyed");
    command.callback([&line, make, yes] {
      line.action = [&line, make, yes] {
        const ChangeRef change = make();
        return RunChange(*Connect(line.global), *change, ConsentOf(*yes), OptionsOf(line.global), std::cout,
                         std::cerr);
      };
    });
  });
}

}  // namespace Kovactl
