#include "otxctl/linux/Commands.h"

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <thread>

#include "otxctl/linux/FileDescriptor.h"

namespace OtxCtl::Linux {
namespace {

using Clock = std::chrono::steady_clock;

constexpr std::size_t longestOutput = std::size_t{64} << 20;

[[noreturn]] void Fail(const std::string& program, const std::string& why) {
  throw CommandFailed(program + " " + why);
}

struct Pipe {
  FileDescriptor read;
  FileDescriptor write;

  explicit Pipe(const std::string& program) {
    std::array<int, 2> ends{};
    if (pipe2(ends.data(), O_CLOEXEC) != 0) {
      Fail(program, std::string("cannot be run: ") + std::strerror(errno));
    }
    read = FileDescriptor(ends[0]);
    write = FileDescriptor(ends[1]);
  }
};

class SpawnActions {
 public:
  SpawnActions(int output, int errors) {
    posix_spawn_file_actions_init(&_actions);
    posix_spawn_file_actions_addopen(&_actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
    posix_spawn_file_actions_adddup2(&_actions, output, STDOUT_FILENO);
    posix_spawn_file_actions_adddup2(&_actions, errors, STDERR_FILENO);
  }
  ~SpawnActions() { posix_spawn_file_actions_destroy(&_actions); }
  SpawnActions(const SpawnActions&) = delete;
  SpawnActions& operator=(const SpawnActions&) = delete;

  const posix_spawn_file_actions_t* Get() const { return &_actions; }

 private:
  posix_spawn_file_actions_t _actions{};
};

pid_t Spawn(const std::vector<std::string>& command, const SpawnActions& actions) {
  std::vector<std::string> copy = command;
  std::vector<char*> arguments;
  for (std::string& argument : copy) {
    arguments.push_back(argument.data());
  }
  arguments.push_back(nullptr);
  std::string path = "PATH=/usr/sbin:/usr/bin:/sbin:/bin";
  std::string locale = "LC_ALL=C";
  const std::array<char*, 3> environment = {path.data(), locale.data(), nullptr};
  pid_t child = 0;
  const int error = posix_spawn(&child, command.front().c_str(), actions.Get(), nullptr, arguments.data(),
                                environment.data());
  if (error != 0) {
    Fail(command.front(), std::string("cannot be run: ") + std::strerror(error));
  }
  return child;
}

// Reads what there is; false at the end.
bool ReadSome(const FileDescriptor& from, std::string& into) {
  std::array<char, 64 * 1024> chunk;
  const ssize_t count = Uninterrupted([&] { return read(from.Get(), chunk.data(), chunk.size()); });
  if (count <= 0) {
    return false;
  }
  into.append(chunk.data(), static_cast<std::size_t>(count));
  return into.size() <= longestOutput;
}

int MillisecondsUntil(Clock::time_point end) {
  const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(end - Clock::now()).count();
  return left < 0 ? 0 : static_cast<int>(left);
}

// Both outputs to their ends; false if that is not reached in time.
bool ReadAll(const FileDescriptor& output, const FileDescriptor& errors, Clock::time_point end,
             CommandResult& result) {
  std::array<pollfd, 2> waiting = {{{output.Get(), POLLIN, 0}, {errors.Get(), POLLIN, 0}}};
  while (waiting[0].fd >= 0 || waiting[1].fd >= 0) {
    const int ready = poll(waiting.data(), waiting.size(), MillisecondsUntil(end));
    if (ready == 0 || (ready < 0 && errno != EINTR)) {
      return false;
    }
    if (ready > 0 && waiting[0].revents != 0 && !ReadSome(output, result.output)) {
      waiting[0].fd = -1;
    }
    if (ready > 0 && waiting[1].revents != 0 && !ReadSome(errors, result.errors)) {
      waiting[1].fd = -1;
    }
  }
  return true;
}

bool WaitFor(pid_t child, Clock::time_point end, int& status) {
  while (Uninterrupted([&] { return waitpid(child, &status, WNOHANG); }) == 0) {
    if (Clock::now() >= end) {
      return false;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
  return true;
}

// Whoever is waited for by nobody stays in the table of processes until this one ends; a thread that waits
// costs less than that.
void Abandon(pid_t child) {
  kill(child, SIGTERM);
  std::thread([child] { Uninterrupted([child] { return waitpid(child, nullptr, 0); }); }).detach();
}

}  // namespace

bool SystemCommands::Has(const std::string& program) {
  return access(program.c_str(), X_OK) == 0;
}

CommandResult SystemCommands::Run(const std::vector<std::string>& command) {
  const std::string& program = command.front();
  const auto end = Clock::now() + _limit;
  Pipe output(program);
  Pipe errors(program);
  const pid_t child = Spawn(command, SpawnActions(output.write.Get(), errors.write.Get()));
  output.write = FileDescriptor();
  errors.write = FileDescriptor();
  CommandResult result;
  int status = 0;
  if (!ReadAll(output.read, errors.read, end, result) || !WaitFor(child, end, status)) {
    Abandon(child);
    Fail(program, "has not ended in time and was asked to; process " + std::to_string(child) +
                      " may still be running");
  }
  result.status = WIFSIGNALED(status) ? 128 + WTERMSIG(status) : WEXITSTATUS(status);
  return result;
}

}  // namespace OtxCtl::Linux
