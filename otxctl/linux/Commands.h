// Programs of the system, run for what they report.
#pragma once

#include <chrono>
#include <stdexcept>
#include <string>
#include <vector>

namespace OtxCtl::Linux {

struct CommandResult {
  int status = 0;  // as the program ended; 128 and the signal's number if one ended it
  std::string output;
  std::string errors;
};

// A program that could not be run, or has not ended in time.
class CommandFailed : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// An interface, so that tests need no programs.
class Commands {
 public:
  virtual ~Commands() = default;

  // Whether the program is there to be run.
  virtual bool Has(const std::string& program) = 0;

  // `command` begins with the program's absolute path. Throws CommandFailed. Threads: any.
  virtual CommandResult Run(const std::vector<std::string>& command) = 0;
};

// Runs them: never by a shell, with nothing to read and a clean environment in the C locale. A program that
// has not ended in time is asked to end (SIGTERM), and is not waited for.
class SystemCommands final : public Commands {
 public:
  explicit SystemCommands(std::chrono::milliseconds limit = std::chrono::seconds(60)) : _limit(limit) {}

  bool Has(const std::string& program) override;
  CommandResult Run(const std::vector<std::string>& command) override;

 private:
  const std::chrono::milliseconds _limit;
};

}  // namespace OtxCtl::Linux
