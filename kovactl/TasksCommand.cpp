#include "kovactl/TasksCommand.h"

#include <map>
#include <ostream>

#include "host/FaultWords.h"
#include "kovactl/Table.h"
#include "orbis/Json.h"
#include "orbis/ParseException.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/json/JsonText.h"
#include "tessa/text/Escape.h"

namespace Kovactl {
namespace {

using Orbis::Json::Kind;
using Orbis::Json::Value;

// The text of a member; empty where there is none.
std::string TextOf(const Value& task, std::string_view key) {
  const Value* const value = task.Find(key);
  return value != nullptr && value->kind == Kind::String ? value->text : "";
}

// How far a running task is, and what failed of one that did.
std::string Remark(const Value& task) {
  const Value* const fault = task.Find("fault");
  if (fault != nullptr && fault->kind == Kind::Object) {
    const auto read = Orbis::ReadJson(*fault, &Orbis::MethodFault::StaticType(), "fault");
    return Host::Explain(static_cast<const Orbis::MethodFault&>(*read));
  }
  const Value* const percent = task.Find("percent");
  if (TextOf(task, "state") != "running" || percent == nullptr || percent->kind != Kind::Integer) {
    return "";
  }
  const std::string step = TextOf(task, "step");
  return std::to_string(percent->integer) + " %" + (step.empty() ? "" : ": " + step);
}

const Value& TasksIn(const Value& root) {
  const Value* const tasks = root.Find("tasks");
  if (tasks == nullptr || tasks->kind != Kind::Array) {
    throw Orbis::ParseException("tasks", root.line, "the agent's answer holds no list of tasks");
  }
  return *tasks;
}

void PrintSummary(const std::map<std::string, int>& counts, std::size_t total, std::ostream& out) {
  out << total << (total == 1 ? " task" : " tasks");
  const char* separator = ": ";
  for (const auto& [state, count] : counts) {
    out << separator << count << " " << Tessa::Escape(state);
    separator = ", ";
  }
  out << "\n";
}

}  // namespace

ExitStatus PrintTasks(const std::string& tasks, const std::string& output, std::ostream& out) {
  if (output != "table") {
    out << tasks;
    return ExitStatus::Done;
  }
  const Value root = Orbis::Json::Parse(tasks, Orbis::Limits::OwnOutput());
  Table table({{"TASK"}, {"OPERATION"}, {"LABEL"}, {"STATE"}, {"CREATED"}, {"ENDED"}, {"REMARK"}});
  std::map<std::string, int> counts;
  for (const Value& task : TasksIn(root).items) {
    table.AddRow({TextOf(task, "id"), TextOf(task, "operation"), TextOf(task, "label"), TextOf(task, "state"),
                  TextOf(task, "created"), TextOf(task, "ended"), Remark(task)});
    ++counts[TextOf(task, "state")];
  }
  if (!counts.empty()) {
    table.Print(out);
    out << "\n";
  }
  PrintSummary(counts, TasksIn(root).items.size(), out);
  return ExitStatus::Done;
}

}  // namespace Kovactl
