#include "otxctl/TaskScope.h"

#include <algorithm>
#include <exception>
#include <utility>

namespace OtxCtl {
namespace {

thread_local const TaskScope* innermost = nullptr;

}  // namespace

TaskScope::TaskScope(std::string id, ProgressSink sink)
    : _id(std::move(id)), _sink(std::move(sink)), _outer(innermost) {
  innermost = this;
}

TaskScope::~TaskScope() {
  innermost = _outer;
}

const TaskScope* TaskScope::Current() noexcept {
  return innermost;
}

void TaskScope::ReportProgress(int percent, std::string_view step) const {
  if (!_sink) {
    return;
  }
  try {
    _sink(std::clamp(percent, 0, 100), step);
  } catch (const std::exception&) {
    // Progress is a courtesy: a sink that fails must not end the disk operation that reports to it.
  }
}

}  // namespace OtxCtl
