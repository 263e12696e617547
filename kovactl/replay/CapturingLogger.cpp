#include "kovactl/replay/CapturingLogger.h"

#include <utility>

namespace Kovactl {

using Tessa::Ref;
using Tessa::Service::LogArgument;
using Tessa::Service::Logger;
using Tessa::Service::LogLevel;

namespace {

class ParentLogger final : public Logger {
 public:
  ParentLogger(Ref<Logger> other, Ref<CapturingLogger> child)
      : _other(std::move(other)), _child(std::move(child)) {}

  LogLevel GetLevel() const noexcept override { return _other->GetLevel(); }
  void CreateChild(const std::string&, Ref<Logger>& child) override { child = _child; }
  void Write(LogLevel level, std::string_view format, std::span<const LogArgument> arguments) override {
    _other->Write(level, format, arguments);
  }

 private:
  Ref<Logger> _other;
  Ref<CapturingLogger> _child;
};

}  // namespace

std::vector<CapturedLine> CapturingLogger::Take() {
  const std::lock_guard guard(_mutex);
  return std::exchange(_lines, {});
}

void CapturingLogger::CreateChild(const std::string&, Ref<Logger>& child) {
  child = Ref<Logger>(this);
}

void CapturingLogger::Write(LogLevel level, std::string_view format, std::span<const LogArgument> arguments) {
  CapturedLine line{level, std::string(format), {}};
  for (const LogArgument& argument : arguments) {
    line.arguments.push_back(argument.ToString());
  }
  const std::lock_guard guard(_mutex);
  _lines.push_back(std::move(line));
}

Ref<Logger> WithChild(Ref<Logger> other, Ref<CapturingLogger> child) {
  return Tessa::MakeRef<ParentLogger>(std::move(other), std::move(child));
}

}  // namespace Kovactl
