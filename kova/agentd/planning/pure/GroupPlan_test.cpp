#include "kova/agentd/planning/pure/GroupPlan.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <string>
#include <vector>

#include "tests/support/Seed.h"

namespace Kovasvc::Planning {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

using Candidates = std::vector<Candidate>;
using testing::Each;

constexpr Candidate cacheDisk = {.isCache = true};
constexpr Candidate capacityDisk = {};  // as a disk is unless somebody says otherwise

Candidates operator*(std::size_t count, const Candidate& candidate) {
  return Candidates(count, candidate);
}
Candidates operator+(Candidates left, const Candidates& right) {
  left.insert(left.end(), right.begin(), right.end());
  return left;
}

// A listed group of the host that may be extended.
HostGroup AGroup(std::size_t capacityDisks, std::string_view name = "") {
  return {.capacityDisks = capacityDisks, .cacheDisk = name, .cacheListed = true};
}

// As in "new 0: 2 3".
std::vector<std::string> Groups(const GroupPlan& plan) {
  std::vector<std::string> texts;
  for (const GroupPlan::Group& group : plan.groups) {
    std::string text = (group.isNew ? "new " : "grown ") + std::to_string(group.cache) + ":";
    for (const std::size_t disk : group.capacity) {
      text += " " + std::to_string(disk);
    }
    texts.push_back(text);
  }
  return texts;
}

TEST(IsFlash, HoldsForCacheAndForCapacity) {
  EXPECT_TRUE(IsFlash(true, false));
  EXPECT_TRUE(IsFlash(false, true));
  EXPECT_TRUE(IsFlash(true, true));
  EXPECT_FALSE(IsFlash(false, false));
}

TEST(AssignRoles, TellsFlashDisksFromCapacityDisksInOrder) {
  const Roles roles = AssignRoles({capacityDisk, cacheDisk, capacityDisk, cacheDisk}, 0);
  EXPECT_THAT(roles.heads, ElementsAre(1, 3));
  EXPECT_THAT(roles.capacity, ElementsAre(0, 2));
  EXPECT_THAT(roles.dropped, IsEmpty());
}

TEST(AssignRoles, TakesTheFirstFlashDisksUpToFiveGroupsAltogether) {
  EXPECT_THAT(AssignRoles(6 * cacheDisk, 0).dropped, ElementsAre(5));
  EXPECT_THAT(AssignRoles(5 * cacheDisk, 0).dropped, IsEmpty());
  const Roles besideThree = AssignRoles(3 * cacheDisk, 3);
  EXPECT_THAT(besideThree.heads, ElementsAre(0, 1));
  EXPECT_THAT(besideThree.dropped, ElementsAre(2));
  EXPECT_THAT(AssignRoles(2 * cacheDisk, 5).heads, IsEmpty());
  EXPECT_THAT(AssignRoles(1 * cacheDisk, 6).heads, IsEmpty());
}

TEST(ExtendableGroups, AreThoseOfTheKindThatAreNotHeldBack) {
  const std::vector<HostGroup> groups = {
      {.allFlash = false}, {.allFlash = true}, {.allFlash = false, .heldBack = true}, {.allFlash = false}};
  EXPECT_THAT(ExtendableGroups(groups, false), ElementsAre(0, 3));
  EXPECT_THAT(ExtendableGroups(groups, true), ElementsAre(1));
  EXPECT_THAT(ExtendableGroups({}, false), IsEmpty());
}

TEST(ExtendableGroups, AreHybridAndNotHeldBackUnlessTheyAreCalledOtherwise) {
  EXPECT_THAT(ExtendableGroups({HostGroup()}, false), ElementsAre(0));
  EXPECT_THAT(ExtendableGroups({HostGroup()}, true), IsEmpty());
}

TEST(HostGroup, IsEmptyAndNotListedUnlessItIsCalledOtherwise) {
  EXPECT_EQ(HostGroup().capacityDisks, 0u);
  EXPECT_FALSE(HostGroup().cacheListed);
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

TEST(ExtendsHostGroups, HoldsWhenNoCandidateMayHeadANewGroup) {
  const std::vector<HostGroup> one(1, AGroup(1));
  const std::vector<HostGroup> five(5, AGroup(1));
  EXPECT_TRUE(ExtendsHostGroups(2 * capacityDisk, one));
  EXPECT_FALSE(ExtendsHostGroups(2 * capacityDisk + 1 * cacheDisk, one));
  EXPECT_TRUE(ExtendsHostGroups(1 * cacheDisk, five));
  EXPECT_TRUE(ExtendsHostGroups({}, one));
}

TEST(ExtendsHostGroups, DoesNotHoldOfAHostWithoutGroups) {
  EXPECT_FALSE(ExtendsHostGroups(2 * capacityDisk, {}));
}

TEST(GroupPlan, IsEmptyWithoutCandidates) {
  const GroupPlan plan = PlanGroups({}, {AGroup(1)}, false);
  EXPECT_THAT(plan.groups, IsEmpty());
  EXPECT_THAT(plan.leftOver, IsEmpty());
  EXPECT_FALSE(plan.limitReached);
}

TEST(GroupPlan, NamesCandidatesByTheirPlaces) {
  EXPECT_THAT(Groups(PlanGroups(1 * capacityDisk + 2 * cacheDisk + 2 * capacityDisk, {}, false)),
              ElementsAre("new 1: 0 4", "new 2: 3"));
}

TEST(GroupPlan, ExtendsOnlyListedGroupsOfItsKind) {
  HostGroup unlisted = AGroup(0);
  unlisted.cacheListed = false;
  HostGroup allFlash = AGroup(0, "flash");
  allFlash.allFlash = true;
  const std::vector<HostGroup> groups = {unlisted, allFlash, AGroup(3, "a"), AGroup(2, "b")};
  EXPECT_THAT(Groups(PlanGroups(2 * capacityDisk, groups, false)), ElementsAre("grown 3: 0", "grown 2: 1"));
  EXPECT_THAT(Groups(PlanGroups(2 * capacityDisk, groups, true)), ElementsAre("grown 1: 0 1"));
}

TEST(GroupPlan, HeadsOneGroupByACacheDiskThatIsThereTwice) {
  const int disk = 0;
  const int other = 0;
  const Candidates candidates = {{.isCache = true, .disk = &disk},
                                 {.isCache = true, .disk = &other},
                                 {.isCache = true, .disk = &disk},
                                 capacityDisk,
                                 capacityDisk,
                                 capacityDisk,
                                 capacityDisk};
  const GroupPlan plan = PlanGroups(candidates, {}, false);
  EXPECT_THAT(Groups(plan), ElementsAre("new 0: 3 5 6", "new 1: 4"));
  EXPECT_THAT(plan.leftOver, Each(std::nullopt));
}

TEST(GroupPlan, KeepsCandidatesApartOfWhichNobodySaysThatTheyAreOneDisk) {
  EXPECT_THAT(Groups(PlanGroups(2 * cacheDisk + 2 * capacityDisk, {}, false)),
              ElementsAre("new 0: 2", "new 1: 3"));
}

TEST(GroupPlan, ExtendsOneGroupWhereTheKernelHasACacheDiskTwice) {
  const std::vector<HostGroup> groups = {AGroup(1, "a"), AGroup(1, "b"), AGroup(1, "a")};
  EXPECT_THAT(Groups(PlanGroups(4 * capacityDisk, groups, false)),
              ElementsAre("grown 0: 0 2 3", "grown 1: 1"));
}

bool LimitReached(const Candidates& candidates, const std::vector<HostGroup>& groups = {}) {
  return PlanGroups(candidates, groups, false).limitReached;
}

TEST(LimitReached, SpeaksOnlyOfAPlanThatCameOutEmpty) {
  EXPECT_FALSE(LimitReached(1 * cacheDisk + 9 * capacityDisk))
      << "two disks are left, but a group was planned";
  EXPECT_FALSE(LimitReached(6 * cacheDisk + 10 * capacityDisk));
}

TEST(LimitReached, IsFalseWithoutCapacityDisks) {
  EXPECT_FALSE(LimitReached(6 * cacheDisk));
  EXPECT_FALSE(LimitReached({}));
}

TEST(LimitReached, IsTrueWhenCacheDisksWereDroppedOrGroupsAreFull) {
  HostGroup heldBack = AGroup(1);
  heldBack.heldBack = true;
  EXPECT_TRUE(LimitReached(1 * cacheDisk + 1 * capacityDisk, std::vector<HostGroup>(5, heldBack)));
  EXPECT_TRUE(LimitReached(1 * capacityDisk, {AGroup(7, "a"), AGroup(7, "b")}));
}

TEST(LimitReached, IsFalseWhenThereIsSimplyNoCacheDisk) {
  EXPECT_FALSE(LimitReached(3 * capacityDisk));
}

TEST(LeftOver, HasWordsForEveryReason) {
  EXPECT_EQ(Describe(LeftOver::NotEligible), "not eligible");
  EXPECT_EQ(Describe(LeftOver::NoCacheDisk),
            "no flash disk is free to be its cache, and no group of its kind can grow");
  EXPECT_EQ(Describe(LeftOver::NoCapacityDisk), "no capacity disk is left for it to be the cache of");
  EXPECT_EQ(Describe(LeftOver::GroupsFull), "every group has 7 capacity disks");
  EXPECT_EQ(Describe(LeftOver::TooManyGroups), "a host has at most 5 groups");
}

TEST(LeftOver, HasNoWordsForWhatIsNoReason) {
  EXPECT_EQ(Describe(static_cast<LeftOver>(99)), "");
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
