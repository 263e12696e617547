#include "tessa/Logger.h"

#include <array>
#include <charconv>
#include <mutex>

namespace Tessa::Service {
namespace {

struct NamedLevel {
  std::string_view name;
  LogLevel level;
};
constexpr std::array<NamedLevel, 6> namedLevels = {{
    {"none", LogLevel::None},
    {"error", LogLevel::Error},
    {"warning", LogLevel::Warning},
    {"info", LogLevel::Info},
    {"verbose", LogLevel::Verbose},
    {"trivia", LogLevel::Trivia},
}};

struct DefaultLogger {
  std::mutex mutex;
  Ref<Logger> logger;
};

// Never destroyed: lines are still written while statics go down.
DefaultLogger& TheDefaultLogger() {
  static DefaultLogger* const holder = new DefaultLogger;
  return *holder;
}

}  // namespace

void LogArgument::PrintTo(std::string& out) const {
  if (const auto* text = std::get_if<std::string_view>(&_value)) {
    out.append(*text);
  } else if (const auto* number = std::get_if<long long>(&_value)) {
    out.append(std::to_string(*number));
  } else if (const auto* count = std::get_if<unsigned long long>(&_value)) {
    out.append(std::to_string(*count));
  } else if (const auto* lazy = std::get_if<Lazy>(&_value)) {
    lazy->print(lazy->object, out);
  }
}

std::string LogArgument::ToString() const {
  std::string text;
  PrintTo(text);
  return text;
}

Logger::~Logger() = default;

std::string FormatMessage(std::string_view format, std::span<const LogArgument> arguments) {
  std::string text;
  text.reserve(format.size() + 16 * arguments.size());
  for (std::size_t at = 0; at < format.size(); ++at) {
    const bool placeholder =
        format[at] == '%' && at + 1 < format.size() && format[at + 1] >= '1' && format[at + 1] <= '9';
    const std::size_t index = placeholder ? static_cast<std::size_t>(format[at + 1] - '1') : 0;
    if (placeholder && index < arguments.size()) {
      arguments[index].PrintTo(text);
      ++at;
    } else {
      text.push_back(format[at]);
    }
  }
  return text;
}

std::string_view LevelName(LogLevel level) noexcept {
  std::string_view name = namedLevels.front().name;
  for (const NamedLevel& named : namedLevels) {
    if (named.level <= level) {
      name = named.name;
    }
  }
  return name;
}

bool ParseLevel(std::string_view text, LogLevel& level) noexcept {
  for (const NamedLevel& named : namedLevels) {
    if (named.name == text) {
      level = named.level;
      return true;
    }
  }
  int number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (text.empty() || error != std::errc() || end != text.data() + text.size() || number < 0) {
    return false;
  }
  level = static_cast<LogLevel>(number);
  return true;
}

Ref<Logger> GetDefaultLogger() {
  DefaultLogger& holder = TheDefaultLogger();
  const std::lock_guard guard(holder.mutex);
  return holder.logger;
}

void SetDefaultLogger(Ref<Logger> logger) {
  DefaultLogger& holder = TheDefaultLogger();
  const std::lock_guard guard(holder.mutex);
  std::swap(holder.logger, logger);
}

}  // namespace Tessa::Service
