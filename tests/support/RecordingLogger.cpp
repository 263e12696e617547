#include "tests/support/RecordingLogger.h"

#include <ostream>
#include <utility>

namespace TestSupport {

using Tessa::Service::LogArgument;
using Tessa::Service::Logger;
using Tessa::Service::LogLevel;

struct RecordingLogger::Journal {
  std::atomic<LogLevel> level;
  mutable std::mutex mutex;  // guards all below
  std::vector<LogLine> lines;
  std::vector<std::string> children;
  std::function<void()> childFailure;
  std::function<void(const std::string&)> onEnd;
};

std::ostream& operator<<(std::ostream& out, const LogLine& line) {
  out << '[' << Tessa::Service::LevelName(line.level) << "] " << line.format;
  for (const std::string& argument : line.arguments) {
    out << " | " << argument;
  }
  return out;
}

RecordingLogger::RecordingLogger(LogLevel level) : _journal(std::make_shared<Journal>()) {
  _journal->level = level;
}
RecordingLogger::RecordingLogger(std::shared_ptr<Journal> journal, std::string name)
    : _journal(std::move(journal)), _name(std::move(name)) {}
RecordingLogger::~RecordingLogger() {
  std::function<void(const std::string&)> observer;
  {
    const std::lock_guard guard(_journal->mutex);
    observer = _journal->onEnd;
  }
  if (observer) {
    observer(_name);
  }
}

LogLevel RecordingLogger::GetLevel() const noexcept {
  return _journal->level.load();
}
void RecordingLogger::SetLevel(LogLevel level) {
  _journal->level = level;
}

void RecordingLogger::SetEndObserver(std::function<void(const std::string&)> observer) {
  const std::lock_guard guard(_journal->mutex);
  _journal->onEnd = std::move(observer);
}

void RecordingLogger::SetChildFailure(std::function<void()> failure) {
  const std::lock_guard guard(_journal->mutex);
  _journal->childFailure = std::move(failure);
}

void RecordingLogger::CreateChild(const std::string& name, Tessa::Ref<Logger>& child) {
  std::function<void()> failure;
  {
    const std::lock_guard guard(_journal->mutex);
    _journal->children.push_back(name);
    failure = _journal->childFailure;
  }
  if (failure) {
    failure();
  }
  child = Tessa::Ref<Logger>(new RecordingLogger(_journal, name));
}

void RecordingLogger::Write(LogLevel level, std::string_view format, std::span<const LogArgument> arguments) {
  LogLine line{.logger = _name, .level = level, .format = std::string(format), .arguments = {}};
  for (const LogArgument& argument : arguments) {
    line.arguments.push_back(argument.ToString());
  }
  const std::lock_guard guard(_journal->mutex);
  _journal->lines.push_back(std::move(line));
}

std::vector<LogLine> RecordingLogger::Lines() const {
  const std::lock_guard guard(_journal->mutex);
  return _journal->lines;
}

std::vector<LogLine> RecordingLogger::Lines(LogLevel level) const {
  std::vector<LogLine> wanted;
  for (LogLine& line : Lines()) {
    if (line.level == level) {
      wanted.push_back(std::move(line));
    }
  }
  return wanted;
}

std::vector<std::string> RecordingLogger::ChildNames() const {
  const std::lock_guard guard(_journal->mutex);
  return _journal->children;
}

void RecordingLogger::Clear() {
  const std::lock_guard guard(_journal->mutex);
  _journal->lines.clear();
}

}  // namespace TestSupport
