#include <iostream>

#include "kovactl/cli/CommandLine.h"
#include "kovactl/replay/ReplayRunner.h"

namespace Kovactl {

void AddReplayCommand(CLI::App& app, CommandLine& line) {
  struct Arguments {
    std::string file;
    std::string level = "trivia";
  };
  const auto arguments = std::make_shared<Arguments>();
  auto* const command =
      app.add_subcommand("replay", "Run a log of requests through the plug-in, bare (with --host)");
  command->add_option("REQUESTS", arguments->file, "One JSON object per line; - for standard input")
      ->required();
  command->add_option("--log-level", arguments->level, "What the answers show of the plug-in's log")
      ->capture_default_str();
  command->callback([&app, &line, command, arguments] {
    // The common option, before the command's name, means the same.
    const bool useCommon =
        command->get_option("--log-level")->count() == 0 && app.get_option("--log-level")->count() != 0;
    line.action = [&line, arguments, useCommon] {
      const std::string& level = useCommon ? line.global.logLevel : arguments->level;
      return RunReplay(line.global.machine, line.global.runtime, arguments->file, LevelOf(level), std::cin,
                       std::cout);
    };
  });
}

}  // namespace Kovactl
