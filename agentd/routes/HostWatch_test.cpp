#include "agentd/routes/HostWatch.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <future>
#include <stdexcept>

#include "agentd/tasks/QueryQueue.h"
#include "agentd/testing/RunningServer.h"
#include "agentd/testing/ScriptedHost.h"

namespace Agentd {
namespace {

using std::chrono::seconds;
using Testing::ScriptedHost;

class HostWatchTest : public testing::Test {
 protected:
  // In units that a failed test can print.
  std::vector<std::size_t> Counts() const {
    const std::optional<HostCounts> last = _watch.Last();
    if (!last) {
      return {};
    }
    return {last->disksInUse, last->disksEligible, last->disksIneligible, last->groupsMounted,
            last->groupsUnmounted};
  }
  std::size_t Asked() const { return _host.api.Asked().size(); }

  ScriptedHost _host;
  std::chrono::steady_clock::time_point _now{};
  QueryQueue _queries{{.atOnce = 1, .waiting = 1}};
  HostWatch _watch{_host.api, _queries, [this] { return _now; }};
};

TEST_F(HostWatchTest, KnowsNothingBeforeTheHostWasAsked) {
  EXPECT_FALSE(_watch.Last());
  EXPECT_EQ(Asked(), 0u);
}

TEST_F(HostWatchTest, CountsDisksAndGroupsByState) {
  _host.Tell({"inUse", "inUse", "inUse", "eligible", "eligible", "ineligible"}, {true, false, true, true});
  _watch.Refresh(0);
  EXPECT_THAT(Counts(), testing::ElementsAre(3, 2, 1, 3, 1));
}

TEST_F(HostWatchTest, TellsHowOldItsKnowledgeIs) {
  _watch.Refresh(0);
  EXPECT_EQ(_watch.Last()->age, seconds(0));
  _now += seconds(7);
  EXPECT_EQ(_watch.Last()->age, seconds(7));
}

TEST_F(HostWatchTest, AsksAgainOnlyWhenItsKnowledgeIsNoLongerFresh) {
  _watch.Refresh(0);
  const std::size_t once = Asked();
  _now += HostWatch::freshTime - seconds(1);
  _watch.Refresh(0);
  EXPECT_EQ(Asked(), once);
  _now += seconds(1);
  _host.Tell({"eligible"}, {});
  _watch.Refresh(0);
  EXPECT_EQ(Asked(), 2 * once);
  EXPECT_THAT(Counts(), testing::ElementsAre(0, 1, 0, 0, 0));
  EXPECT_EQ(_watch.Last()->age, seconds(0));
}

TEST_F(HostWatchTest, IsNoLongerFreshAfterAChange) {
  _watch.Refresh(7);
  const std::size_t once = Asked();
  _watch.Refresh(7);
  EXPECT_EQ(Asked(), once);
  _watch.Refresh(8);
  EXPECT_EQ(Asked(), 2 * once);
  _watch.Refresh(8);
  EXPECT_EQ(Asked(), 2 * once);
}

TEST_F(HostWatchTest, KeepsWhatItKnewWhenTheHostCannotTell) {
  _host.Tell({"inUse"}, {true});
  _watch.Refresh(0);
  _now += HostWatch::freshTime;
  _host.api.onQuery = [] { throw std::runtime_error("the kernel broke"); };
  _watch.Refresh(0);
  _host.api.onQuery = {};
  _host.fault = Tessa::MakeRef<Orbis::Fault::SystemError>("no");
  _watch.Refresh(0);
  EXPECT_THAT(Counts(), testing::ElementsAre(1, 0, 0, 1, 0));
  EXPECT_EQ(_watch.Last()->age, HostWatch::freshTime);
  EXPECT_EQ(_queries.Now().ended.Of(Host::Outcome::Failed), 2u);
}

TEST_F(HostWatchTest, IsAQueryLikeAnyOtherAndAsksOnceAtATime) {
  Testing::Gate gate;
  const auto slow = std::async(std::launch::async, [&] {
    _queries.Run([&gate] {
      gate.Enter();
      return Host::Outcome::Done;
    });
  });
  gate.WaitUntilEntered();
  _watch.Refresh(0);
  _watch.Refresh(0);
  EXPECT_EQ(_queries.Now().waiting, 1u) << "it waits for its place, and is not asked for twice";
  EXPECT_EQ(Asked(), 0u);
  gate.Open();
  slow.wait();
  EXPECT_TRUE(_watch.Last());
}

TEST_F(HostWatchTest, GivesUpWhenTooManyQueriesWaitAndTriesAgainLater) {
  Testing::Gate gate;
  const auto slow = std::async(std::launch::async, [&] {
    _queries.Run([&gate] {
      gate.Enter();
      return Host::Outcome::Done;
    });
  });
  gate.WaitUntilEntered();
  _queries.Run([] { return Host::Outcome::Done; });  // takes the one place to wait
  _watch.Refresh(0);
  gate.Open();
  slow.wait();
  EXPECT_FALSE(_watch.Last());
  _watch.Refresh(0);
  EXPECT_TRUE(_watch.Last());
}

}  // namespace
}  // namespace Agentd
