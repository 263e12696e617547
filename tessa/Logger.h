// Loggers, levels and the one way to write a line.
//
// A line is a format with positional placeholders "%1" to "%9" and its arguments. Nothing is printed
// unless the logger's level lets the line through, and then only by the sink: a logger is given format
// and arguments apart, so that a test can look at both.
//
// Threads: a logger may be used from any thread.
#pragma once

#include <concepts>
#include <span>
#include <string>
#include <string_view>
#include <variant>

#include "tessa/Object.h"
#include "tessa/Ref.h"

namespace Tessa::Service {

// In increasing detail; a logger lets through what is at most its own level.
enum class LogLevel : int { None = 0, Error = 2, Warning = 4, Info = 8, Verbose = 16, Trivia = 32 };

// Something that prints itself when it is needed: a text, a number, or any object with
// `void PrintTo(std::string&) const`. Refers to what it prints, so it lives no longer than the statement
// that logs it.
class TESSA_API LogArgument {
 public:
  LogArgument(std::string_view text) noexcept : _value(text) {}
  LogArgument(const std::string& text) noexcept : _value(std::string_view(text)) {}
  LogArgument(const char* text) noexcept : _value(std::string_view(text != nullptr ? text : "(null)")) {}
  template <std::signed_integral T>
  LogArgument(T number) noexcept : _value(static_cast<long long>(number)) {}
  template <std::unsigned_integral T>
  LogArgument(T number) noexcept : _value(static_cast<unsigned long long>(number)) {}
  template <class T>
  requires requires(const T& value, std::string& out) { value.PrintTo(out); }
  LogArgument(const T& lazy) noexcept
      : _value(Lazy{&lazy, [](const void* object, std::string& out) {
                      static_cast<const T*>(object)->PrintTo(out);
                    }}) {}

  // Appends the text. Throws for want of memory only.
  void PrintTo(std::string& out) const;
  std::string ToString() const;

 private:
  struct Lazy {
    const void* object;
    void (*print)(const void*, std::string&);
  };
  std::variant<std::string_view, long long, unsigned long long, Lazy> _value;
};

class TESSA_API Logger : public ObjectImpl {
 public:
  virtual LogLevel GetLevel() const noexcept = 0;

  // Fills `child` with a logger whose lines are marked with the name.
  virtual void CreateChild(const std::string& name, Ref<Logger>& child) = 0;

  // The sink: called with lines that have passed the level test. Must not throw.
  virtual void Write(LogLevel level, std::string_view format, std::span<const LogArgument> arguments) = 0;

 protected:
  ~Logger() override;
};

// Replaces each placeholder by its argument, in one pass: what an argument prints is never expanded
// again. A placeholder without an argument stays as it stands.
TESSA_API std::string FormatMessage(std::string_view format, std::span<const LogArgument> arguments);

// The name of a level, "error" to "trivia", and back. Levels between two names take the lower one's.
TESSA_API std::string_view LevelName(LogLevel level) noexcept;
TESSA_API bool ParseLevel(std::string_view text, LogLevel& level) noexcept;

// The process's logger, or null before the host program has installed one.
TESSA_API Ref<Logger> GetDefaultLogger();
TESSA_API void SetDefaultLogger(Ref<Logger> logger);

// Writes one line if the logger's level lets it through. The level is tested before anything is
// printed.
template <class... Args>
void LogInternal(Logger& logger, LogLevel level, std::string_view format, const Args&... args) {
  if (logger.GetLevel() < level) {
    return;
  }
  if constexpr (sizeof...(args) == 0) {
    logger.Write(level, format, {});
  } else {
    const LogArgument arguments[] = {LogArgument(args)...};
    logger.Write(level, format, arguments);
  }
}

template <class... Args>
void LogInternal(const Ref<Logger>& logger, LogLevel level, std::string_view format, const Args&... args) {
  LogInternal(*logger, level, format, args...);
}

}  // namespace Tessa::Service
