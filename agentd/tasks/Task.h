// One disk-changing request, from the moment the agent takes it on.
#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "host/Answer.h"
#include "orbis/Any.h"

namespace Agentd {

// What is said of an id that no task has.
inline constexpr std::string_view noSuchTask = "no task of that id; those that ended long ago are forgotten";

enum class TaskState {
  Waiting,  // for the requests before it
  Running,
  Done,  // and the others: it has ended, with that outcome
  Partly,
  Failed,
};

// The state of one that has ended, and back.
TaskState StateAfter(Host::Outcome outcome);
Host::Outcome OutcomeIn(TaskState ended);

struct Task {
  std::string id;     // made by the agent; the kernel knows the request by it
  std::string label;  // the client's own, may be empty
  std::string operation;
  TaskState state = TaskState::Waiting;
  Orbis::DateTime created;
  std::optional<Orbis::DateTime> started;
  std::optional<Orbis::DateTime> ended;
  int percent = 0;               // as the kernel last reported
  std::string step;              // what it was doing then
  Host::Answer answer;           // once it has ended; its result as the plug-in wrote it
  bool resultForgotten = false;  // the answer had a result, which was too large to be kept for long
};

// "waiting", "running", "done", "partly", "failed".
const char* NameOf(TaskState state);

// Appends the task as a JSON object; `withResult` for the result of one that has ended, which may be long.
void WriteJson(const Task& task, bool withResult, std::string& out);

}  // namespace Agentd
