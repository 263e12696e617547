#include "agentd/tasks/Task.h"

#include <gtest/gtest.h>

#include "orbis/Types.h"

namespace Agentd {
namespace {

std::string Json(const Task& task, bool withResult = true) {
  std::string text;
  WriteJson(task, withResult, text);
  return text;
}

Task AWaitingTask() {
  Task task;
  task.id = "task-1";
  task.operation = "AddDisks";
  task.label = "the \"new\" disks";
  task.created = {.microseconds = 1'700'000'000'000'000};
  return task;
}

TEST(Task, ThatWaitsHasNeitherTimesNorAnAnswer) {
  EXPECT_EQ(Json(AWaitingTask()),
            R"({"id":"task-1","label":"the \"new\" disks","operation":"AddDisks","state":"waiting",)"
            R"("created":"2023-11-14T22:13:20Z","percent":0,"step":""})");
}

TEST(Task, ThatRunsTellsHowFarItHasCome) {
  Task task = AWaitingTask();
  task.state = TaskState::Running;
  task.started = {.microseconds = 1'700'000'001'000'000};
  task.percent = 50;
  task.step = "formatting";
  EXPECT_EQ(Json(task),
            R"({"id":"task-1","label":"the \"new\" disks","operation":"AddDisks","state":"running",)"
            R"("created":"2023-11-14T22:13:20Z","started":"2023-11-14T22:13:21Z","percent":50,)"
            R"("step":"formatting"})");
}

TEST(Task, ThatHasEndedCarriesItsAnswer) {
  Task task = AWaitingTask();
  task.label.clear();
  task.state = TaskState::Failed;
  task.started = task.ended = task.created;
  task.answer.fault = Tessa::MakeRef<Orbis::Fault::SystemError>("no");
  task.answer.result = Tessa::MakeRef<Orbis::TextList>(std::vector<std::string>{"a"});
  const std::string fault = R"("fault":{"@type":"SystemError","reason":"no"}})";
  const std::string rest =
      R"({"id":"task-1","label":"","operation":"AddDisks","state":"failed","created":"2023-11-14T22:13:20Z",)"
      R"("started":"2023-11-14T22:13:20Z","ended":"2023-11-14T22:13:20Z","percent":0,"step":"",)";
  EXPECT_EQ(Json(task), rest + R"("result":["a"],)" + fault);
  EXPECT_EQ(Json(task, false), rest + fault);
  task.answer = {};
  task.state = TaskState::Done;
  EXPECT_TRUE(Json(task).find(R"("result":null,"fault":null})") != std::string::npos);
  task.resultForgotten = true;
  EXPECT_TRUE(Json(task).find(R"("result":null,"resultForgotten":true,"fault":null})") != std::string::npos);
}

TEST(Task, EndsInTheStateOfItsOutcome) {
  for (const Host::Outcome outcome : {Host::Outcome::Done, Host::Outcome::Partly, Host::Outcome::Failed}) {
    EXPECT_EQ(NameOf(StateAfter(outcome)), Host::NameOf(outcome));
  }
}

TEST(Task, StatesHaveNames) {
  EXPECT_STREQ(NameOf(TaskState::Waiting), "waiting");
  EXPECT_STREQ(NameOf(TaskState::Running), "running");
  EXPECT_STREQ(NameOf(TaskState::Done), "done");
  EXPECT_STREQ(NameOf(TaskState::Partly), "partly");
  EXPECT_STREQ(NameOf(TaskState::Failed), "failed");
}

}  // namespace
}  // namespace Agentd
