#include "agentd/tasks/Task.h"

#include <array>

#include "orbis/Scalar.h"
#include "orbis/json/JsonText.h"

namespace Agentd {
namespace {

void AppendText(const char* key, const std::string& text, std::string& out) {
  out.append(",\"").append(key).append("\":");
  Orbis::Json::AppendString(text, out);
}

void AppendTime(const char* key, const std::optional<Orbis::DateTime>& time, std::string& out) {
  if (time) {
    std::string text;
    Orbis::AppendScalar(Orbis::FieldKind::DateTime, &*time, text);
    AppendText(key, text, out);
  }
}

}  // namespace

const char* NameOf(TaskState state) {
  static constexpr std::array<const char*, 5> names = {"waiting", "running", "done", "partly", "failed"};
  return names.at(static_cast<std::size_t>(state));
}

TaskState StateAfter(Host::Outcome outcome) {
  static constexpr std::array<TaskState, 3> states = {TaskState::Done, TaskState::Partly, TaskState::Failed};
  return states.at(static_cast<std::size_t>(outcome));
}

Host::Outcome OutcomeIn(TaskState ended) {
  return ended == TaskState::Done     ? Host::Outcome::Done
         : ended == TaskState::Partly ? Host::Outcome::Partly
                                      : Host::Outcome::Failed;
}

void WriteJson(const Task& task, bool withResult, std::string& out) {
  out += "{\"id\":";
  Orbis::Json::AppendString(task.id, out);
  AppendText("label", task.label, out);
  AppendText("operation", task.operation, out);
  AppendText("state", NameOf(task.state), out);
  AppendTime("created", task.created, out);
  AppendTime("started", task.started, out);
  AppendTime("ended", task.ended, out);
  out += ",\"percent\":" + std::to_string(task.percent);
  AppendText("step", task.step, out);
  if (task.ended) {
    if (withResult) {
      out += ",\"result\":";
      WriteJsonResult(task.answer.result, out);
    }
    if (task.resultForgotten) {
      out += ",\"resultForgotten\":true";
    }
    out += ",\"fault\":";
    Host::WriteJsonFault(task.answer.fault.Get(), out);
  }
  out += "}";
}

}  // namespace Agentd
