#include "agentd/tasks/QueryQueue.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <future>
#include <vector>

#include "agentd/testing/RunningServer.h"
#include "nox/Faults.h"
#include "orbis/Types.h"

namespace Agentd {
namespace {

using testing::ElementsAre;
using Testing::Gate;
using testing::IsEmpty;

// A query that does this and comes to that.
QueryQueue::Query Done(std::function<void()> work, Host::Outcome outcome = Host::Outcome::Done) {
  return [work = std::move(work), outcome] {
    work();
    return outcome;
  };
}

// A query that runs on a thread of its own until it is let go.
class SlowQuery {
 public:
  explicit SlowQuery(QueryQueue& queue)
      : _run(std::async(std::launch::async, [this, &queue] { queue.Run(Done([this] { _gate.Enter(); })); })) {
    _gate.WaitUntilEntered();
  }
  void LetGo() {
    _gate.Open();
    _run.get();
  }

 private:
  Gate _gate;
  std::future<void> _run;
};

TEST(QueryQueue, RunsAQueryOnTheCallingThread) {
  QueryQueue queue;
  std::thread::id thread;
  queue.Run(Done([&thread] { thread = std::this_thread::get_id(); }));
  EXPECT_EQ(thread, std::this_thread::get_id());
  EXPECT_EQ(queue.Now().running, 0u);
}

TEST(QueryQueue, AQueryThatFindsNoPlaceHoldsUpNobody) {
  QueryQueue queue({.atOnce = 2, .waiting = 4});
  SlowQuery first(queue);
  SlowQuery second(queue);
  std::vector<int> ran;
  queue.Run(Done([&ran] { ran.push_back(1); }));
  queue.Run(Done([&ran] { ran.push_back(2); }));
  EXPECT_THAT(ran, IsEmpty());
  EXPECT_EQ(queue.Now().running, 2u);
  EXPECT_EQ(queue.Now().waiting, 2u);

  first.LetGo();
  EXPECT_THAT(ran, ElementsAre(1, 2)) << "by the thread whose query ended, in order";
  EXPECT_EQ(queue.Now().running, 1u);
  EXPECT_EQ(queue.Now().waiting, 0u);
  second.LetGo();
  EXPECT_EQ(queue.Now().running, 0u);
}

TEST(QueryQueue, APlaceThatHasBecomeFreeIsTaken) {
  QueryQueue queue({.atOnce = 1, .waiting = 1});
  int ran = 0;
  queue.Run(Done([&ran] { ++ran; }));
  queue.Run(Done([&ran] { ++ran; }));
  EXPECT_EQ(ran, 2);
}

TEST(QueryQueue, MoreThanMayWaitAreRefusedAndNotRun) {
  QueryQueue queue({.atOnce = 1, .waiting = 1});
  SlowQuery slow(queue);
  int ran = 0;
  queue.Run(Done([&ran] { ++ran; }));
  try {
    queue.Run(Done([&ran] { ran += 10; }));
    FAIL() << "it was taken on";
  } catch (const Nox::Fault::Busy::Exception& refused) {
    const auto& busy = dynamic_cast<const Nox::Fault::Busy&>(*refused.GetFault());
    EXPECT_GT(busy.GetRetryAfterSeconds(), 0);
    EXPECT_EQ((*busy.GetFaultMessage())[0]->GetMessage(),
              "The agent has 1 queries waiting; try again later.");
  }
  slow.LetGo();
  EXPECT_EQ(ran, 1);
}

TEST(QueryQueue, RunsAtMostSoManyAtOnceWhoeverAsks) {
  constexpr int queries = 200;
  QueryQueue queue({.atOnce = 3, .waiting = 8 * queries});
  std::atomic<int> running{0};
  std::atomic<int> tooMany{0};
  std::atomic<int> ran{0};
  const auto query = [&] {
    tooMany += ++running > 3 ? 1 : 0;
    std::this_thread::yield();
    --running;
    ++ran;
    return Host::Outcome::Done;
  };
  std::vector<std::future<void>> clients;
  for (int client = 0; client < 8; ++client) {
    clients.push_back(std::async(std::launch::async, [&] {
      for (int i = 0; i < queries; ++i) {
        queue.Run(query);
      }
    }));
  }
  for (auto& client : clients) {
    client.get();
  }
  EXPECT_EQ(ran, 8 * queries) << "whoever ends runs those that wait, so none is left";
  EXPECT_EQ(tooMany, 0);
}

TEST(QueryQueue, CountsWhatQueriesCameTo) {
  QueryQueue queue;
  queue.Run(Done([] {}));
  queue.Run(Done([] {}, Host::Outcome::Failed));
  queue.Run(Done([] {}));
  const OutcomeCounts ended = queue.Now().ended;
  EXPECT_EQ(ended.Of(Host::Outcome::Done), 2u);
  EXPECT_EQ(ended.Of(Host::Outcome::Partly), 0u);
  EXPECT_EQ(ended.Of(Host::Outcome::Failed), 1u);
}

TEST(QueryQueue, IsIdleWhenTheLastQueryHasEnded) {
  QueryQueue queue;
  EXPECT_TRUE(queue.WaitUntilIdle(std::chrono::milliseconds(0)));
  SlowQuery slow(queue);
  EXPECT_FALSE(queue.WaitUntilIdle(std::chrono::milliseconds(0)));
  auto idle = std::async(std::launch::async, [&queue] { return queue.WaitUntilIdle(std::chrono::hours(1)); });
  slow.LetGo();
  EXPECT_TRUE(idle.get());
}

}  // namespace
}  // namespace Agentd
