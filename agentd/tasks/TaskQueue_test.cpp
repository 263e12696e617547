#include "agentd/tasks/TaskQueue.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <future>
#include <numeric>
#include <stdexcept>

#include "agentd/testing/RunningServer.h"
#include "nox/Faults.h"
#include "orbis/Any.h"
#include "orbis/Soap.h"
#include "orbis/Types.h"
#include "otxctl/TaskScope.h"

namespace Agentd {
namespace {

using Host::Answer;
using testing::ElementsAre;
using Testing::Gate;
using testing::HasSubstr;
using testing::IsEmpty;

// A time that goes on by a microsecond whenever it is asked for.
TaskQueue::Clock Ticks() {
  return [at = std::make_shared<std::atomic<std::int64_t>>(0)] {
    return Orbis::DateTime{.microseconds = ++*at};
  };
}

Answer Nothing() {
  return {};
}

// The task once it has ended.
Task Await(TaskQueue& queue, TaskQueue::Work work) {
  const auto ended = std::make_shared<std::promise<Task>>();
  queue.Submit("Op", "", std::move(work), [ended](const Task& task) { ended->set_value(task); });
  return ended->get_future().get();
}

std::vector<std::string> States(const TaskQueue& queue) {
  std::vector<std::string> states;
  for (const Task& task : queue.List()) {
    states.push_back(task.operation + " " + NameOf(task.state));
  }
  return states;
}

std::string WhyBusy(TaskQueue& queue) {
  try {
    queue.Submit("Op", "", &Nothing);
    return "taken on";
  } catch (const Nox::Fault::Busy::Exception& busy) {
    const auto& fault = dynamic_cast<const Nox::Fault::Busy&>(*busy.GetFault());
    EXPECT_GT(fault.GetRetryAfterSeconds(), 0);
    return (*fault.GetFaultMessage())[0]->GetMessage();
  }
}

TEST(TaskQueue, CarriesATaskOutAndKeepsItsAnswer) {
  TaskQueue queue({}, Ticks());
  const Task task = Await(queue, [] { return Host::FailedWith("no luck"); });
  EXPECT_EQ(task.state, TaskState::Failed);
  EXPECT_LT(task.created.microseconds, task.started->microseconds);
  EXPECT_LT(task.started->microseconds, task.ended->microseconds);
  EXPECT_EQ(dynamic_cast<const Orbis::Fault::SystemError&>(*task.answer.fault).GetReason(), "no luck");
  EXPECT_EQ(queue.Find(task.id)->answer.fault, task.answer.fault);
  EXPECT_EQ(Await(queue, &Nothing).state, TaskState::Done);
}

TEST(TaskQueue, TellsAPartFromTheWholeInStatesAndCounts) {
  TaskQueue queue;
  const auto texts = Tessa::MakeRef<Orbis::TextList>(std::vector<std::string>{"a"});
  Await(queue, &Nothing);
  Await(queue, [texts]() -> Answer { return {.result = texts, .fault = Host::FailedWith("b").fault}; });
  Await(queue, [] { return Host::FailedWith("no luck"); });
  EXPECT_THAT(States(queue), ElementsAre("Op done", "Op partly", "Op failed"));
  const OutcomeCounts ended = queue.Now().ended;
  for (const Host::Outcome outcome : OutcomeCounts::all) {
    EXPECT_EQ(ended.Of(outcome), 1u) << Host::NameOf(outcome);
  }
}

TEST(TaskQueue, TellsWhatItTookOn) {
  TaskQueue queue;
  const Task task = queue.Submit("AddDisks", "mine", &Nothing);
  EXPECT_EQ(task.operation, "AddDisks");
  EXPECT_EQ(task.label, "mine");
  EXPECT_EQ(task.state, TaskState::Waiting);
  EXPECT_FALSE(queue.Find("task-1"));
}

TEST(TaskQueue, GivesIdsThatAnotherQueueDoesNotGive) {
  TaskQueue first;
  TaskQueue second;
  const std::string one = first.Submit("Op", "", &Nothing).id;
  EXPECT_THAT(one, testing::MatchesRegex("task-[0-9a-f]{8}-1"));
  EXPECT_NE(first.Submit("Op", "", &Nothing).id, one);
  EXPECT_NE(second.Submit("Op", "", &Nothing).id, one);
}

TEST(TaskQueue, RunsOneAfterTheOtherInOrder) {
  TaskQueue queue;
  std::vector<int> order;  // guarded by there being one worker
  std::atomic<int> running{0};
  for (int i = 0; i < 20; ++i) {
    queue.Submit("Op", "", [&order, &running, i] {
      EXPECT_EQ(++running, 1);
      order.push_back(i);
      --running;
      return Answer();
    });
  }
  Await(queue, &Nothing);
  std::vector<int> expected(20);
  std::iota(expected.begin(), expected.end(), 0);
  EXPECT_EQ(order, expected);
}

TEST(TaskQueue, SetsATaskScopeThatTakesProgress) {
  TaskQueue queue;
  Gate gate;
  std::string id;
  std::promise<Task> ended;
  const Task task = queue.Submit(
      "Op", "",
      [&gate, &id] {
        id = OtxCtl::TaskScope::Current()->GetId();
        OtxCtl::TaskScope::Current()->ReportProgress(40, "formatting naa.1");
        gate.Enter();
        return Answer();
      },
      [&ended](const Task& done) { ended.set_value(done); });
  gate.WaitUntilEntered();
  const Task running = *queue.Find(task.id);
  EXPECT_EQ(running.state, TaskState::Running);
  EXPECT_EQ(running.percent, 40);
  EXPECT_EQ(running.step, "formatting naa.1");
  gate.Open();
  ended.get_future().wait();
  EXPECT_EQ(id, task.id);
}

TEST(TaskQueue, AnswersAnExceptionOfTheWorkAndGoesOn) {
  TaskQueue queue;
  const auto reasonOf = [](const Task& task) {
    return dynamic_cast<const Orbis::Fault::SystemError&>(*task.answer.fault).GetReason();
  };
  EXPECT_EQ(reasonOf(Await(queue, []() -> Answer { throw std::runtime_error("gone"); })), "gone");
  EXPECT_THAT(reasonOf(Await(queue, []() -> Answer { throw 1; })), HasSubstr("unknown"));
  EXPECT_EQ(Await(queue, &Nothing).state, TaskState::Done);
}

TEST(TaskQueue, GoesOnAfterAListenerThatFails) {
  TaskQueue queue;
  queue.Submit("Op", "", &Nothing, [](const Task&) { throw std::runtime_error("cannot be told"); });
  EXPECT_EQ(Await(queue, &Nothing).state, TaskState::Done);
}

TEST(TaskQueue, LetsAsManyWaitAsItsLimitSaysBesideTheOneThatRuns) {
  TaskQueue queue({.waiting = 2, .remembered = 10});
  Gate gate;
  queue.Submit("Slow", "", [&gate] {
    gate.Enter();
    return Answer();
  });
  gate.WaitUntilEntered();
  queue.Submit("Second", "", &Nothing);
  queue.Submit("Third", "", &Nothing);
  EXPECT_THAT(WhyBusy(queue), HasSubstr("2 changes waiting"));
  EXPECT_THAT(States(queue), ElementsAre("Slow running", "Second waiting", "Third waiting"));
  gate.Open();
  queue.Finish();
}

TEST(TaskQueue, RemembersAsManyAsItsLimitSays) {
  TaskQueue queue({.waiting = 10, .remembered = 2});
  const std::string first = Await(queue, &Nothing).id;
  Await(queue, &Nothing);
  Await(queue, &Nothing);
  EXPECT_THAT(States(queue), ElementsAre("Op done", "Op done"));
  EXPECT_FALSE(queue.Find(first));
}

TEST(TaskQueue, ClosedRefusesWhatWaitsAndWhatComesButLetsTheRunningOneEnd) {
  TaskQueue queue;
  Gate gate;
  std::vector<std::string> ended;
  std::promise<void> slowEnded;
  queue.Submit(
      "Slow", "",
      [&gate] {
        gate.Enter();
        return Answer();
      },
      [&slowEnded](const Task&) { slowEnded.set_value(); });
  gate.WaitUntilEntered();
  std::atomic<bool> begun{false};
  queue.Submit(
      "Waits", "",
      [&begun] {
        begun = true;
        return Answer();
      },
      [&ended](const Task& task) {
        EXPECT_NE(dynamic_cast<const Nox::Fault::Busy*>(task.answer.fault.Get()), nullptr);
        ended.push_back(task.operation);
      });
  queue.Close();
  EXPECT_THAT(ended, ElementsAre("Waits")) << "told at once, not when the running one has ended";
  EXPECT_THAT(WhyBusy(queue), HasSubstr("stopping"));
  EXPECT_THAT(States(queue), ElementsAre("Slow running", "Waits failed"));
  gate.Open();
  slowEnded.get_future().wait();
  queue.Finish();
  EXPECT_THAT(States(queue), ElementsAre("Slow done", "Waits failed"));
  EXPECT_FALSE(begun);
}

TEST(TaskQueue, FinishedMayBeFinishedAgain) {
  TaskQueue queue;
  queue.Finish();
  queue.Finish();
  EXPECT_THAT(queue.List(), IsEmpty());
}

TEST(TaskQueue, TakesTasksOfManyThreadsAtOnce) {
  TaskQueue queue({.waiting = 1000, .remembered = 1000});
  std::atomic<int> done{0};
  std::vector<std::future<void>> clients;
  for (int i = 0; i < 8; ++i) {
    clients.push_back(std::async(std::launch::async, [&queue, &done] {
      for (int round = 0; round < 50; ++round) {
        const Task task = Await(queue, [&done] {
          ++done;
          return Answer();
        });
        EXPECT_TRUE(queue.Find(task.id));
        EXPECT_FALSE(queue.List().empty());
      }
    }));
  }
  for (auto& client : clients) {
    client.get();
  }
  EXPECT_EQ(done, 400);
  EXPECT_EQ(queue.List().size(), 400u);
}

// A result of which the text has that many bytes.
Answer AnswerOf(std::size_t bytes) {
  std::string text;
  Orbis::SerializeObjectToSoap(Orbis::TextList(std::vector<std::string>{""}), nullptr, text);
  text.insert(text.find("</item>"), bytes - text.size(), 't');
  return {.result = Host::Result::OfText(text), .fault = nullptr};
}

TEST(TaskQueue, ForgetsTheResultsOfTheOldestWhenTheyAreLarge) {
  TaskQueue queue({.rememberedBytes = 1000});
  const Task first = Await(queue, [] { return AnswerOf(400); });
  const Task second = Await(queue, [] { return AnswerOf(600); });
  EXPECT_TRUE(queue.Find(first.id)->answer.result) << "both fit";
  const Task third = Await(queue, [] { return AnswerOf(400); });
  EXPECT_FALSE(queue.Find(first.id)->answer.result);
  EXPECT_TRUE(queue.Find(first.id)->resultForgotten);
  EXPECT_TRUE(queue.Find(second.id)->answer.result);
  const Task largest = Await(queue, [] { return AnswerOf(1001); });
  EXPECT_TRUE(largest.answer.result);
  EXPECT_TRUE(queue.Find(largest.id)->answer.result) << "whoever did not wait for it can still ask";
  EXPECT_TRUE(queue.Find(second.id)->resultForgotten);
  EXPECT_TRUE(queue.Find(third.id)->resultForgotten);
  EXPECT_EQ(queue.List().size(), 4u) << "the tasks are still known";
}

TEST(TaskQueue, CountsNoResultOfATaskThatIsForgotten) {
  TaskQueue queue({.remembered = 1, .rememberedBytes = 1000});
  Await(queue, [] { return AnswerOf(900); });
  Await(queue, [] { return AnswerOf(900); });
  const Task last = Await(queue, [] { return AnswerOf(900); });
  EXPECT_FALSE(queue.Find(last.id)->resultForgotten);
}

TEST(TaskQueue, TakesOnNoMoreBytesThanItsLimit) {
  Gate gate;
  std::promise<void> done;
  TaskQueue queue({.waitingBytes = 1000});
  queue.Submit("Slow", "", [&gate] {
    gate.Enter();
    return Answer();
  });
  gate.WaitUntilEntered();
  queue.Submit(
      "Large", "", &Nothing, [&done](const Task&) { done.set_value(); }, 2000);
  EXPECT_THROW(queue.Submit("Small", "", &Nothing, {}, 1), Nox::Fault::Busy::Exception);
  gate.Open();
  done.get_future().wait();
  EXPECT_EQ(WhyBusy(queue), "taken on") << "there is room again";
}

}  // namespace
}  // namespace Agentd
