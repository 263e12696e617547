// A logger that keeps its lines, to be looked at as level, format and arguments.
//
// A logger and its children share one journal and one level, but not their lifetimes: a child may outlive
// the logger it came from. Safe from any thread.
#pragma once

#include <atomic>
#include <exception>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "tessa/Logger.h"

namespace TestSupport {

struct LogLine {
  std::string logger;  // the name of the child that wrote it; empty for the logger itself
  Tessa::Service::LogLevel level = Tessa::Service::LogLevel::None;
  std::string format;                  // as it was given, with its placeholders
  std::vector<std::string> arguments;  // printed
};

// For people: level, format and arguments in one line.
std::ostream& operator<<(std::ostream& out, const LogLine& line);

class RecordingLogger final : public Tessa::Service::Logger {
 public:
  explicit RecordingLogger(Tessa::Service::LogLevel level = Tessa::Service::LogLevel::Trivia);
  ~RecordingLogger() override;

  Tessa::Service::LogLevel GetLevel() const noexcept override;
  void CreateChild(const std::string& name, Tessa::Ref<Tessa::Service::Logger>& child) override;
  void Write(Tessa::Service::LogLevel level, std::string_view format,
             std::span<const Tessa::Service::LogArgument> arguments) override;

  // Also the level of the children.
  void SetLevel(Tessa::Service::LogLevel level);
  // From now on CreateChild calls this, which should throw, instead of making a child.
  void SetChildFailure(std::function<void()> failure);
  // Called when this logger, or any child, is destroyed, with its name.
  void SetEndObserver(std::function<void(const std::string& name)> observer);

  std::vector<LogLine> Lines() const;
  // The lines of one level only.
  std::vector<LogLine> Lines(Tessa::Service::LogLevel level) const;
  std::vector<std::string> ChildNames() const;
  void Clear();

 private:
  struct Journal;
  RecordingLogger(std::shared_ptr<Journal> journal, std::string name);

  const std::shared_ptr<Journal> _journal;
  const std::string _name;
};

}  // namespace TestSupport
