// Commands that make and check host descriptions.

#include "kovactl/sim/HostCommands.h"

#include <iostream>

#include "kovactl/cli/CommandLine.h"

namespace Kovactl {
namespace {

void AddImport(CLI::App& host, CommandLine& line) {
  const auto options = std::make_shared<ImportOptions>();
  auto* const command =
      host.add_subcommand("import", "Describe the machine that `lsblk --json -O -b` was run on");
  command->add_option("FILE", options->file, "Output of lsblk; - for standard input")->required();
  command->add_option("--name", options->name, "Name of the host")->capture_default_str();
  command->add_option("--minimum-bytes", options->minimumDiskBytes, "Smaller disks are too small")
      ->check(CLI::NonNegativeNumber)
      ->capture_default_str();
  command->add_option("--write", options->output, "File to write instead of standard output");
  command->callback([&line, options] {
    line.action = [options] { return RunHostImport(*options, std::cin, std::cout, std::cerr); };
  });
}

void AddCheck(CLI::App& host, CommandLine& line) {
  const auto file = std::make_shared<std::string>();
  auto* const command = host.add_subcommand("check", "Check a host description");
  command->add_option("FILE", *file, "Host description")->required();
  command->callback([&line, file] { line.action = [file] { return RunHostCheck(*file, std::cout); }; });
}

}  // namespace

void AddHostCommands(CLI::App& app, CommandLine& line) {
  auto* const host = app.add_subcommand("host", "Make and check host descriptions");
  host->require_subcommand(1);
  AddImport(*host, line);
  AddCheck(*host, line);
}

}  // namespace Kovactl
