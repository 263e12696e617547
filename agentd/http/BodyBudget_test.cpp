#include "agentd/http/BodyBudget.h"

#include <gtest/gtest.h>

#include <optional>
#include <thread>
#include <vector>

namespace Agentd {
namespace {

TEST(BodyBudget, IsSharedByAllUntilItIsUsedUp) {
  BodyBudget budget;
  BodyBudget::Share first(budget, 100);
  BodyBudget::Share second(budget, 100);
  EXPECT_TRUE(first.Hold(60));
  EXPECT_FALSE(second.Hold(41));
  EXPECT_EQ(budget.Held(), 60u) << "a refused share holds nothing";
  EXPECT_TRUE(second.Hold(40));
  EXPECT_EQ(budget.Held(), 100u);
}

TEST(BodyBudget, AShareGrowsAndNeverShrinks) {
  BodyBudget budget;
  BodyBudget::Share share(budget, 100);
  EXPECT_TRUE(share.Hold(10));
  EXPECT_TRUE(share.Hold(30));
  EXPECT_TRUE(share.Hold(20));
  EXPECT_EQ(budget.Held(), 30u);
  EXPECT_FALSE(share.Hold(101));
  EXPECT_EQ(budget.Held(), 30u);
}

TEST(BodyBudget, GetsBackWhatAShareHeldWhereverItWent) {
  BodyBudget budget;
  {
    std::optional<BodyBudget::Share> share(std::in_place, budget, 100);
    EXPECT_TRUE(share->Hold(50));
    const BodyBudget::Share moved = std::move(*share);
    share.reset();
    EXPECT_EQ(budget.Held(), 50u);
  }
  EXPECT_EQ(budget.Held(), 0u);
}

TEST(BodyBudget, SomeMayHaveLessThanOthers) {
  BodyBudget budget;
  BodyBudget::Share small(budget, 25);
  BodyBudget::Share large(budget, 100);
  EXPECT_FALSE(small.Hold(26));
  EXPECT_TRUE(large.Hold(75));
  EXPECT_FALSE(small.Hold(1)) << "more is held already than it may";
  EXPECT_TRUE(large.Hold(100));
}

TEST(BodyBudget, IsNeverOverdrawnByManyAtOnce) {
  BodyBudget budget;
  std::atomic<int> held{0};
  std::vector<std::thread> threads;
  std::vector<std::optional<BodyBudget::Share>> shares(8);
  for (auto& share : shares) {
    threads.emplace_back([&] {
      share.emplace(budget, 1000);
      for (std::size_t bytes = 1; bytes <= 400 && share->Hold(bytes); ++bytes) {
        ++held;
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_EQ(held, 1000);
  EXPECT_EQ(budget.Held(), 1000u);
}

}  // namespace
}  // namespace Agentd
