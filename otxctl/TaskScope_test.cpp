#include "otxctl/TaskScope.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>
#include <thread>
#include <utility>
#include <vector>

namespace OtxCtl {
namespace {

using testing::ElementsAre;
using testing::Pair;

TEST(TaskScope, IsNullOutsideOfAnyScope) {
  EXPECT_EQ(TaskScope::Current(), nullptr);
}

TEST(TaskScope, TheInnermostScopeCountsAndTheOuterOneComesBack) {
  const TaskScope outer("t1", {});
  {
    const TaskScope inner("t2", {});
    EXPECT_EQ(TaskScope::Current()->GetId(), "t2");
  }
  EXPECT_EQ(TaskScope::Current()->GetId(), "t1");
}

TEST(TaskScope, BelongsToItsThreadAlone) {
  const TaskScope scope("t1", {});
  const TaskScope* elsewhere = &scope;
  std::thread([&elsewhere] { elsewhere = TaskScope::Current(); }).join();
  EXPECT_EQ(elsewhere, nullptr);
}

TEST(TaskScope, HandsProgressToItsSinkWithinZeroAndHundred) {
  std::vector<std::pair<int, std::string>> seen;
  const TaskScope scope("t1",
                        [&seen](int percent, std::string_view step) { seen.emplace_back(percent, step); });
  scope.ReportProgress(-5, "start");
  scope.ReportProgress(50, "half");
  scope.ReportProgress(120, "end");
  EXPECT_THAT(seen, ElementsAre(Pair(0, "start"), Pair(50, "half"), Pair(100, "end")));
}

TEST(TaskScope, ReportsNothingWithoutASink) {
  const TaskScope scope("t1", {});
  EXPECT_NO_THROW(scope.ReportProgress(10, "step"));
}

TEST(TaskScope, ASinkThatFailsDoesNotDisturbTheWork) {
  const TaskScope scope("t1", [](int, std::string_view) { throw std::runtime_error("client is gone"); });
  EXPECT_NO_THROW(scope.ReportProgress(10, "step"));
}

}  // namespace
}  // namespace OtxCtl
