#include "agentd/tasks/TaskApi.h"

#include "agentd/tasks/TaskQueue.h"
#include "host/Refusal.h"
#include "nox/Kova.h"
#include "nox/Operations.h"
#include "nox/Tasks.h"

namespace Agentd {
namespace {

namespace Op = Nox::Operation;
using GroupResults = Orbis::DataArray<Nox::Kova::Host::DiskMapResult>;
using Tessa::MakeRef;
using Tessa::Ref;

Ref<Nox::Task> ObjectOf(const Task& task) {
  const auto object = MakeRef<Nox::Task>();
  object->SetId(task.id);
  object->SetLabel(task.label);
  object->SetOperation(task.operation);
  object->SetState(NameOf(task.state));
  object->SetCreated(task.created);
  object->SetStarted(task.started);
  object->SetEnded(task.ended);
  object->SetPercent(task.percent);
  object->SetStep(task.step);
  object->SetFault(task.answer.fault);
  if (task.resultForgotten) {
    object->SetResultForgotten(true);
  }
  return object;
}

Host::Answer AllOf(const TaskQueue& tasks) {
  const auto list = MakeRef<Orbis::DataArray<Nox::Task>>();
  for (const Task& task : tasks.List()) {
    list->Append(ObjectOf(task));
  }
  return {.result = list, .fault = nullptr};
}

Host::Answer OneOf(const TaskQueue& tasks, const std::string& id) {
  const std::optional<Task> task = tasks.Find(id);
  if (!task) {
    Host::RefuseWith("id", std::string(noSuchTask));
  }
  const Ref<Nox::Task> object = ObjectOf(*task);
  object->SetResult(Ref<GroupResults>(dynamic_cast<GroupResults*>(task->answer.result.Get())));
  return {.result = object, .fault = nullptr};
}

}  // namespace

Host::Answer TaskApi::Query(const Op::Query& request) const {
  if (dynamic_cast<const Op::GetTasks*>(&request) != nullptr) {
    return AllOf(_tasks);
  }
  if (const auto* const one = dynamic_cast<const Op::GetTask*>(&request)) {
    return OneOf(_tasks, one->GetId());
  }
  return _host.Query(request);
}

}  // namespace Agentd
