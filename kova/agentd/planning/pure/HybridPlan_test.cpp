#include "kova/agentd/planning/pure/HybridPlan.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <random>

#include "tests/support/Seed.h"

namespace Kovasvc::Planning {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

std::vector<bool> Ssds(std::size_t ssds, std::size_t capacity) {
  std::vector<bool> candidates(ssds, true);
  candidates.insert(candidates.end(), capacity, false);
  return candidates;
}

TEST(AssignRoles, TellsFlashDisksFromCapacityDisksInOrder) {
  const Roles roles = AssignRoles({false, true, false, true}, 0);
  EXPECT_THAT(roles.ssds, ElementsAre(1, 3));
  EXPECT_THAT(roles.capacity, ElementsAre(0, 2));
  EXPECT_THAT(roles.dropped, IsEmpty());
}

TEST(AssignRoles, TakesTheFirstFlashDisksUpToFiveGroupsAltogether) {
  EXPECT_THAT(AssignRoles(Ssds(6, 0), 0).dropped, ElementsAre(5));
  EXPECT_THAT(AssignRoles(Ssds(5, 0), 0).dropped, IsEmpty());
  const Roles besideThree = AssignRoles(Ssds(3, 0), 3);
  EXPECT_THAT(besideThree.ssds, ElementsAre(0, 1));
  EXPECT_THAT(besideThree.dropped, ElementsAre(2));
  EXPECT_THAT(AssignRoles(Ssds(2, 0), 5).ssds, IsEmpty());
  EXPECT_THAT(AssignRoles(Ssds(1, 0), 6).ssds, IsEmpty());
}

TEST(ExtendableGroups, AreThoseOfTheKindThatAreNotHeldBack) {
  const std::vector<ExistingGroup> groups = {
      {.allFlash = false}, {.allFlash = true}, {.allFlash = false, .heldBack = true}, {.allFlash = false}};
  EXPECT_THAT(ExtendableGroups(groups, false), ElementsAre(0, 3));
  EXPECT_THAT(ExtendableGroups(groups, true), ElementsAre(1));
  EXPECT_THAT(ExtendableGroups({}, false), IsEmpty());
}

TEST(ExtendableGroups, AreHybridAndNotHeldBackUnlessTheyAreCalledOtherwise) {
  EXPECT_THAT(ExtendableGroups({ExistingGroup()}, false), ElementsAre(0));
  EXPECT_THAT(ExtendableGroups({ExistingGroup()}, true), IsEmpty());
}

TEST(DealCapacityDisks, GoesRoundTheEntriesInOrder) {
  const Deal deal = DealCapacityDisks({0, 0}, 5);
  ASSERT_EQ(deal.shares.size(), 2u);
  EXPECT_THAT(deal.shares[0].disks, ElementsAre(0, 2, 4));
  EXPECT_THAT(deal.shares[1].disks, ElementsAre(1, 3));
  EXPECT_FALSE(deal.groupsFull);
}

TEST(DealCapacityDisks, FillsTheEmptiestFirst) {
  const Deal deal = DealCapacityDisks({3, 1}, 3);
  ASSERT_EQ(deal.shares.size(), 2u);
  EXPECT_EQ(deal.shares[0].entry, 1u) << "the entry that received the first disk comes first";
  EXPECT_THAT(deal.shares[0].disks, ElementsAre(0, 1));
  EXPECT_EQ(deal.shares[1].entry, 0u);
  EXPECT_THAT(deal.shares[1].disks, ElementsAre(2));
}

TEST(DealCapacityDisks, EndsWhenEveryEntryIsFull) {
  const Deal deal = DealCapacityDisks({7, 5}, 4);
  ASSERT_EQ(deal.shares.size(), 1u);
  EXPECT_EQ(deal.shares[0].entry, 1u);
  EXPECT_THAT(deal.shares[0].disks, ElementsAre(0, 1));
  EXPECT_TRUE(deal.groupsFull);
}

TEST(DealCapacityDisks, IsNotFullWhenTheLastDiskJustFits) {
  EXPECT_FALSE(DealCapacityDisks({0}, 7).groupsFull);
  EXPECT_TRUE(DealCapacityDisks({0}, 8).groupsFull);
}

TEST(DealCapacityDisks, LeavesAnEntryAloneThatHasMoreThanItMay) {
  const Deal deal = DealCapacityDisks({9}, 1);
  EXPECT_THAT(deal.shares, IsEmpty());
  EXPECT_TRUE(deal.groupsFull);
}

TEST(DealCapacityDisks, DealsNothingWithoutEntries) {
  const Deal deal = DealCapacityDisks({}, 3);
  EXPECT_THAT(deal.shares, IsEmpty());
  EXPECT_FALSE(deal.groupsFull);
}

bool LimitReached(const std::vector<bool>& candidates, std::size_t existing,
                  const std::vector<std::size_t>& counts) {
  const Roles roles = AssignRoles(candidates, existing);
  return IsLimitReached(roles, DealCapacityDisks(counts, roles.capacity.size()));
}

TEST(IsLimitReached, SpeaksOnlyOfAPlanThatCameOutEmpty) {
  EXPECT_FALSE(LimitReached(Ssds(1, 9), 0, {0})) << "two disks are left, but a group was planned";
  EXPECT_FALSE(LimitReached(Ssds(6, 10), 0, {0, 0, 0, 0, 0}));
}

TEST(IsLimitReached, IsFalseWithoutCapacityDisks) {
  EXPECT_FALSE(LimitReached(Ssds(6, 0), 0, {0, 0, 0, 0, 0}));
  EXPECT_FALSE(LimitReached({}, 0, {}));
}

TEST(IsLimitReached, IsTrueWhenFlashDisksWereDroppedOrGroupsAreFull) {
  EXPECT_TRUE(LimitReached(Ssds(1, 1), 5, {}));
  EXPECT_TRUE(LimitReached(Ssds(0, 1), 2, {7, 7}));
}

TEST(IsLimitReached, IsFalseWhenThereIsSimplyNoFlashDisk) {
  EXPECT_FALSE(LimitReached(Ssds(0, 3), 0, {}));
}

// The dealing as it is told: sort the tally by count, keeping the order of equals, and serve the first.
Deal DealBySorting(const std::vector<std::size_t>& counts, std::size_t disks) {
  struct Entry {
    std::size_t index;
    std::size_t count;
  };
  std::vector<Entry> tally;
  for (std::size_t i = 0; i < counts.size(); ++i) {
    tally.push_back({i, counts[i]});
  }
  Deal deal;
  for (std::size_t disk = 0; disk < disks && !tally.empty(); ++disk) {
    std::vector<Entry> sorted = tally;
    std::stable_sort(sorted.begin(), sorted.end(),
                     [](const Entry& left, const Entry& right) { return left.count < right.count; });
    if (sorted.front().count >= 7) {
      deal.groupsFull = true;
      break;
    }
    const std::size_t entry = sorted.front().index;
    ++tally[entry].count;
    auto share = std::find_if(deal.shares.begin(), deal.shares.end(),
                              [&](const Deal::Share& known) { return known.entry == entry; });
    if (share == deal.shares.end()) {
      share = deal.shares.insert(deal.shares.end(), {entry, {}});
    }
    share->disks.push_back(disk);
  }
  return deal;
}

TEST(DealCapacityDisks, AgreesWithSortingTheTallyForEveryDisk) {
  const TestSupport::Seed seed;
  std::mt19937 random(seed.Value());
  for (int round = 0; round < 2000; ++round) {
    std::vector<std::size_t> counts(random() % 6);
    for (std::size_t& count : counts) {
      count = random() % 9;
    }
    const std::size_t disks = random() % 40;
    const Deal deal = DealCapacityDisks(counts, disks);
    const Deal wanted = DealBySorting(counts, disks);
    ASSERT_EQ(deal.groupsFull, wanted.groupsFull) << "round " << round;
    ASSERT_EQ(deal.shares.size(), wanted.shares.size()) << "round " << round;
    for (std::size_t i = 0; i < deal.shares.size(); ++i) {
      ASSERT_EQ(deal.shares[i].entry, wanted.shares[i].entry) << "round " << round;
      ASSERT_EQ(deal.shares[i].disks, wanted.shares[i].disks) << "round " << round;
    }
  }
}

}  // namespace
}  // namespace Kovasvc::Planning
