#include "host/LogSink.h"
#include "tessa/text/Escape.h"

#include <spdlog/sinks/stdout_sinks.h>
#include <spdlog/spdlog.h>

#include <memory>
#include <string>
#include <utility>

namespace Host {
namespace {

using Tessa::Ref;
using Tessa::Service::LogArgument;
using Tessa::Service::Logger;
using Tessa::Service::LogLevel;

spdlog::level::level_enum ToSpdlog(LogLevel level) {
  if (level <= LogLevel::Error) {
    return spdlog::level::err;
  }
  if (level <= LogLevel::Warning) {
    return spdlog::level::warn;
  }
  if (level <= LogLevel::Info) {
    return spdlog::level::info;
  }
  return level <= LogLevel::Verbose ? spdlog::level::debug : spdlog::level::trace;
}

spdlog::sink_ptr StandardError() {
  // Never destroyed: lines are still written while the program goes down.
  static auto* const sink = new spdlog::sink_ptr(std::make_shared<spdlog::sinks::stderr_sink_mt>());
  return *sink;
}

class ConsoleLogger final : public Logger {
 public:
  ConsoleLogger(LogLevel level, std::string name) : _level(level), _logger(std::move(name), StandardError()) {
    _logger.set_level(spdlog::level::trace);
    _logger.set_pattern("%Y-%m-%dT%H:%M:%S.%e %-5l %n: %v");
    _logger.flush_on(spdlog::level::warn);
  }

  LogLevel GetLevel() const noexcept override { return _level; }

  void CreateChild(const std::string& name, Ref<Logger>& child) override {
    child = Tessa::MakeRef<ConsoleLogger>(_level, name);
  }

  void Write(LogLevel level, std::string_view format, std::span<const LogArgument> arguments) override {
    try {
      const std::string message = Tessa::Service::FormatMessage(format, arguments);
      _logger.log(ToSpdlog(level), Tessa::Escape(message));
    } catch (const std::exception&) {
      // A line that cannot be written must not stop the work it tells of.
    }
  }

 private:
  LogLevel _level;
  spdlog::logger _logger;
};

}  // namespace

Ref<Logger> MakeConsoleLogger(LogLevel level) {
  return Tessa::MakeRef<ConsoleLogger>(level, "kova");
}

void FlushLogs() noexcept {
  try {
    StandardError()->flush();
  } catch (const std::exception&) {
    // Nothing more can be done for them.
  }
}

}  // namespace Host
