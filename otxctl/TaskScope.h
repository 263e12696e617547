// The task on whose behalf the calling thread works.
//
// The plug-in calls the provider on the thread that called the hook. So a host program sets a
// TaskScope round the hook, and the provider finds the task's id and progress sink there, also in
// operations that carry no request tag.
#pragma once

#include <functional>
#include <string>
#include <string_view>

#include "kova/agentd/include/Api.h"

namespace OtxCtl {

// Told how far the work has come: 0 to 100 percent, and what is being done.
using ProgressSink = std::function<void(int percent, std::string_view step)>;

class HOSTCTL_API TaskScope {
 public:
  TaskScope(std::string id, ProgressSink sink);
  ~TaskScope();
  TaskScope(const TaskScope&) = delete;
  TaskScope& operator=(const TaskScope&) = delete;

  // The innermost scope of the calling thread, or null.
  static const TaskScope* Current() noexcept;

  const std::string& GetId() const noexcept { return _id; }
  // Does nothing without a sink.
  void ReportProgress(int percent, std::string_view step) const;

 private:
  std::string _id;
  ProgressSink _sink;
  const TaskScope* _outer;
};

}  // namespace OtxCtl
