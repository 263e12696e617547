// Programs that report what a test says.
#pragma once

#include <functional>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "otxctl/linux/Commands.h"

namespace OtxCtl::Linux {

class FakeCommands : public Commands {
 public:
  // By the command's name, "pvs"; what has none ends with status 5.
  struct Results {
    std::map<std::string, CommandResult> of;
    std::vector<std::vector<std::string>> commands;  // that were run
    bool areThere = true;
    bool hang = false;
    // Asked before the table, if it is there; what it hands back is the result.
    std::function<std::optional<CommandResult>(const std::vector<std::string>&)> answer;
  };

  explicit FakeCommands(Results& results) : _results(results) {}

  bool Has(const std::string&) override { return _results.areThere; }

  CommandResult Run(const std::vector<std::string>& command) override {
    _results.commands.push_back(command);
    if (_results.hang) {
      throw CommandFailed(command.at(0) + " has not ended in time");
    }
    if (_results.answer) {
      if (const auto result = _results.answer(command)) {
        return *result;
      }
    }
    const auto found = _results.of.find(command.at(1));
    return found == _results.of.end() ? CommandResult{5, "", "no such group"} : found->second;
  }

 private:
  Results& _results;
};

}  // namespace OtxCtl::Linux
