// A logger that keeps what the plug-in says.
#pragma once

#include <mutex>
#include <string>
#include <vector>

#include "tessa/Logger.h"
#include "tessa/Ref.h"

namespace Kovactl {

struct CapturedLine {
  Tessa::Service::LogLevel level;
  std::string format;
  std::vector<std::string> arguments;  // printed
};

// Threads: safe from any thread.
class CapturingLogger final : public Tessa::Service::Logger {
 public:
  explicit CapturingLogger(Tessa::Service::LogLevel level) : _level(level) {}

  // Hands over the lines so far and forgets them.
  std::vector<CapturedLine> Take();

  Tessa::Service::LogLevel GetLevel() const noexcept override { return _level; }
  // Children keep their lines here too.
  void CreateChild(const std::string& name, Tessa::Ref<Logger>& child) override;
  void Write(Tessa::Service::LogLevel level, std::string_view format,
             std::span<const Tessa::Service::LogArgument> arguments) override;

 private:
  Tessa::Service::LogLevel _level;
  std::mutex _mutex;
  std::vector<CapturedLine> _lines;
};

// A default logger whose own lines go to `other`, and whose every child is `child`.
Tessa::Ref<Tessa::Service::Logger> WithChild(Tessa::Ref<Tessa::Service::Logger> other,
                                             Tessa::Ref<CapturingLogger> child);

}  // namespace Kovactl
