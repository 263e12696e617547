#include "kova/agentd/planning/pure/AddPlan.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <string_view>
#include <vector>

namespace Kovasvc::Planning {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr OfferedDisk hardDisk = {.eligible = true};
constexpr OfferedDisk cacheDisk = {.eligible = true, .isSsd = true};
constexpr OfferedDisk capacityFlash = {.eligible = true, .isSsd = true, .capacityFlash = true};
constexpr OfferedDisk usedDisk = {.eligible = false, .isSsd = true};

std::vector<OfferedDisk> operator*(std::size_t count, OfferedDisk disk) {
  return std::vector<OfferedDisk>(count, disk);
}
std::vector<OfferedDisk> operator+(std::vector<OfferedDisk> left, const std::vector<OfferedDisk>& right) {
  left.insert(left.end(), right.begin(), right.end());
  return left;
}

HostGroup AHybridGroup(std::size_t capacityDisks) {
  return {.capacityDisks = capacityDisks, .cacheListed = true};
}
HostGroup AnAllFlashGroup(std::size_t capacityDisks) {
  return {.allFlash = true, .capacityDisks = capacityDisks, .cacheListed = true};
}

// The plan of these, by whatever names.
AddPlan Plan(std::vector<OfferedDisk> disks, std::vector<HostGroup> groups) {
  static const std::vector<std::string> names = {"0", "1", "2", "3", "4", "5", "6", "7", "8", "9"};
  static const std::vector<std::string> groupNames = {"g0", "g1", "g2", "g3", "g4"};
  for (std::size_t i = 0; i < disks.size(); ++i) {
    disks[i].name = names.at(i);
  }
  for (std::size_t i = 0; i < groups.size(); ++i) {
    groups[i].cacheDisk = groupNames.at(i);
  }
  return PlanAddition(disks, groups);
}

// As in "new hybrid 0: 2 3"; a group of the host by its place among those.
std::vector<std::string> Groups(const AddPlan& plan) {
  std::vector<std::string> texts;
  for (const AddPlan::Group& group : plan.groups) {
    std::string text = group.way == AddPlan::Way::Made       ? "new "
                       : group.way == AddPlan::Way::Extended ? "grown "
                                                             : "mounted ";
    text += group.allFlash ? "all-flash " : "hybrid ";
    text += std::to_string(group.cache) + ":";
    for (const std::size_t disk : group.capacity) {
      text += " " + std::to_string(disk);
    }
    texts.push_back(text);
  }
  return texts;
}

TEST(AddPlan, OfNoDisksIsEmpty) {
  const AddPlan plan = Plan({}, {AHybridGroup(1)});
  EXPECT_THAT(plan.groups, IsEmpty());
  EXPECT_THAT(plan.leftOver, IsEmpty());
}

TEST(AddPlan, DealsCapacityDisksEvenlyToNewGroups) {
  const AddPlan plan = Plan(2 * cacheDisk + 5 * hardDisk, {});
  EXPECT_THAT(Groups(plan), ElementsAre("new hybrid 0: 2 4 6", "new hybrid 1: 3 5"));
  EXPECT_THAT(plan.leftOver, testing::Each(std::nullopt));
}

TEST(AddPlan, MakesHybridGroupsBeforeAllFlashOnes) {
  const AddPlan plan = Plan(1 * capacityFlash + 2 * cacheDisk + 1 * hardDisk, {});
  EXPECT_THAT(Groups(plan), ElementsAre("new hybrid 2: 3", "new all-flash 1: 0"));
}

TEST(AddPlan, NeverUsesADiskThatIsNotEligible) {
  const AddPlan plan = Plan(1 * usedDisk + 1 * hardDisk, {});
  EXPECT_THAT(plan.groups, IsEmpty());
  EXPECT_THAT(plan.leftOver, ElementsAre(LeftOver::NotEligible, LeftOver::NoCacheDisk));
}

TEST(AddPlan, ExtendsTheGroupsOfTheHostWithoutANewCacheDisk) {
  const AddPlan plan = Plan(2 * hardDisk, {AnAllFlashGroup(1), AHybridGroup(3), AHybridGroup(2)});
  EXPECT_THAT(Groups(plan), ElementsAre("grown hybrid 2: 0", "grown hybrid 1: 1"));
}

TEST(AddPlan, ExtendsAllFlashGroupsByCapacityFlash) {
  const AddPlan plan = Plan(1 * capacityFlash, {AHybridGroup(1), AnAllFlashGroup(1)});
  EXPECT_THAT(Groups(plan), ElementsAre("grown all-flash 1: 0"));
}

TEST(AddPlan, LeavesGroupsAloneThatAreHeldBackOrWhoseCacheDiskIsUnknown) {
  HostGroup heldBack = AHybridGroup(1);
  heldBack.heldBack = true;
  HostGroup unknown = AHybridGroup(1);
  unknown.cacheListed = false;
  const AddPlan plan = Plan(1 * hardDisk, {heldBack, unknown});
  EXPECT_THAT(plan.groups, IsEmpty());
  EXPECT_THAT(plan.leftOver, ElementsAre(LeftOver::NoCacheDisk));
}

TEST(AddPlan, LeavesACacheDiskWithoutCapacityDisks) {
  const AddPlan plan = Plan(2 * cacheDisk + 1 * hardDisk, {});
  EXPECT_THAT(Groups(plan), ElementsAre("new hybrid 0: 2"));
  EXPECT_THAT(plan.leftOver, ElementsAre(std::nullopt, LeftOver::NoCapacityDisk, std::nullopt));
}

TEST(AddPlan, LeavesCapacityDisksWhenEveryGroupIsFull) {
  const AddPlan plan = Plan(1 * cacheDisk + 8 * hardDisk, {});
  EXPECT_THAT(Groups(plan), ElementsAre("new hybrid 0: 1 2 3 4 5 6 7"));
  EXPECT_EQ(plan.leftOver.back(), LeftOver::GroupsFull);
}

TEST(AddPlan, LeavesCacheDisksBeyondTheMostGroups) {
  const AddPlan plan = Plan(2 * cacheDisk + 1 * hardDisk, std::vector<HostGroup>(4, AHybridGroup(1)));
  EXPECT_THAT(Groups(plan), ElementsAre("new hybrid 0: 2"));
  EXPECT_THAT(plan.leftOver, ElementsAre(std::nullopt, LeftOver::TooManyGroups, std::nullopt));
}

TEST(AddPlan, SaysThatTheGroupsAreTooManyAlsoForCapacityDisks) {
  HostGroup heldBack = AHybridGroup(1);
  heldBack.heldBack = true;
  const AddPlan plan = Plan(1 * cacheDisk + 1 * hardDisk, std::vector<HostGroup>(5, heldBack));
  EXPECT_THAT(plan.groups, IsEmpty());
  EXPECT_THAT(plan.leftOver, ElementsAre(LeftOver::TooManyGroups, LeftOver::TooManyGroups));
}

TEST(AddPlan, KeepsCapacityFlashFromHybridGroups) {
  const AddPlan plan = Plan(1 * capacityFlash + 1 * hardDisk, {AHybridGroup(1)});
  EXPECT_THAT(Groups(plan), ElementsAre("grown hybrid 0: 1"));
  EXPECT_THAT(plan.leftOver, ElementsAre(LeftOver::NoCacheDisk, std::nullopt));
}

// ---- named disks

HostGroup Headed(std::string_view name, HostGroup group) {
  group.cacheDisk = name;
  return group;
}
OfferedDisk Named(std::string_view name, OfferedDisk disk) {
  disk.name = name;
  return disk;
}
OfferedDisk Unmounted(std::string_view name, bool isSsd, std::size_t group) {
  return {.name = name, .isSsd = isSsd, .unmounted = true, .group = group};
}

TEST(NamedAddPlan, MountsTheGroupsOfItsDisksBetweenHybridAndAllFlashOnes) {
  const std::vector<OfferedDisk> disks = {Unmounted("g1", true, 1), Unmounted("c1", false, 1),
                                          Named("s", cacheDisk),    Named("h", hardDisk),
                                          Named("t", cacheDisk),    Named("f", capacityFlash)};
  const std::vector<HostGroup> groups = {Headed("g0", AHybridGroup(1)), Headed("g1", AHybridGroup(2))};
  const AddPlan plan = PlanNamedAddition(disks, groups, {"g1", "c1", "s", "h", "t", "f"});
  EXPECT_THAT(Groups(plan), ElementsAre("new hybrid 4: 3", "mounted hybrid 1: 1", "new all-flash 2: 5"));
  EXPECT_THAT(plan.leftOver, testing::Each(std::nullopt));
  EXPECT_FALSE(plan.repeated);
}

TEST(NamedAddPlan, MountsNoGroupOfWhichItHasOnlyCapacityDisks) {
  const AddPlan plan = PlanNamedAddition({Unmounted("c1", false, 0), Unmounted("f1", true, 0)},
                                         {Headed("g0", AHybridGroup(2))}, {"c1", "f1"});
  EXPECT_THAT(plan.groups, IsEmpty());
  EXPECT_THAT(plan.leftOver, testing::Each(LeftOver::NotEligible));
}

TEST(NamedAddPlan, MountsNoGroupThatIsMounted) {
  const AddPlan plan =
      PlanNamedAddition({{.name = "g0", .isSsd = true, .group = 0}}, {Headed("g0", AHybridGroup(2))}, {"g0"});
  EXPECT_THAT(plan.groups, IsEmpty());
}

TEST(NamedAddPlan, MountsNoGroupByACacheDiskThatIsNoFlashDisk) {
  const AddPlan plan =
      PlanNamedAddition({Unmounted("g0", false, 0)}, {Headed("g0", AHybridGroup(2))}, {"g0"});
  EXPECT_THAT(plan.groups, IsEmpty());
}

TEST(AddPlan, OfEveryDiskMountsNothing) {
  const AddPlan plan = PlanAddition({Unmounted("g0", true, 0)}, {Headed("g0", AHybridGroup(1))});
  EXPECT_THAT(plan.groups, IsEmpty());
}

TEST(NamedAddPlan, MakesNothingOfANameThatIsRepeatedAtOnce) {
  const std::vector<OfferedDisk> disks = {Named("s", cacheDisk), Named("h", hardDisk), Named("i", hardDisk)};
  const AddPlan plan = PlanNamedAddition(disks, {}, {"s", "s", "h"});
  EXPECT_EQ(plan.repeated, "h") << "the name behind as many as there are without repeats";
  EXPECT_THAT(plan.groups, IsEmpty());
  EXPECT_THAT(plan.leftOver, testing::Each(std::nullopt)) << "without the repeat they would be used";
}

TEST(NamedAddPlan, MindsNoRepeatWithAnotherNameBetween) {
  const std::vector<OfferedDisk> disks = {Named("s", cacheDisk), Named("h", hardDisk)};
  const AddPlan plan = PlanNamedAddition(disks, {}, {"h", "s", "h"});
  EXPECT_FALSE(plan.repeated);
  EXPECT_THAT(Groups(plan), ElementsAre("new hybrid 0: 1"));
}

TEST(NamedAddPlan, MindsNoRepeatOfADiskThatAllFlashGroupsTake) {
  const std::vector<OfferedDisk> disks = {Named("s", cacheDisk), Named("f", capacityFlash)};
  EXPECT_FALSE(PlanNamedAddition(disks, {}, {"s", "s", "f", "f"}).repeated);
}

TEST(NamedAddPlan, MindsNoRepeatOfTheCacheDiskOfAnAllFlashGroupThatGrows) {
  const std::vector<HostGroup> groups = {Headed("g", AnAllFlashGroup(1))};
  EXPECT_FALSE(PlanNamedAddition({Named("f", capacityFlash)}, groups, {"g", "g", "f"}).repeated);
}

TEST(NamedAddPlan, MindsARepeatedNameThatTheKernelDoesNotKnow) {
  EXPECT_EQ(PlanNamedAddition({}, {}, {"nobody", "nobody"}).repeated, "nobody");
}

TEST(FindRepeatedNeighbour, TellsTheNameBehindAsManyAsThereAreWithoutRepeats) {
  EXPECT_EQ(FindRepeatedNeighbour({"a", "b", "b"}), 2u);
  EXPECT_EQ(FindRepeatedNeighbour({"a", "a", "b"}), 2u);
  EXPECT_EQ(FindRepeatedNeighbour({"a", "a", "a", "b"}), 2u);
}

TEST(FindRepeatedNeighbour, MindsOnlyNeighbours) {
  EXPECT_EQ(FindRepeatedNeighbour({"a", "b", "a"}), std::nullopt);
  EXPECT_EQ(FindRepeatedNeighbour({}), std::nullopt);
}

#ifndef NDEBUG
TEST(NamedAddPlanDeath, TakesNoDiskOfAGroupThatTheHostLacks) {
  EXPECT_DEATH(PlanNamedAddition({Unmounted("g0", true, 1)}, {Headed("g0", AHybridGroup(1))}, {"g0"}),
               "group");
}
#endif

// ---- limits

TEST(AddPlan, StopsAtTheLimitOfOneKindOnlyWithoutAnyGroup) {
  const std::vector<HostGroup> full = {AHybridGroup(7)};
  const AddPlan stopped = Plan(1 * hardDisk, full);
  EXPECT_TRUE(stopped.hybridLimit);
  EXPECT_FALSE(stopped.allFlashLimit);
  EXPECT_TRUE(stopped.StopsAtLimit());
  const AddPlan other = Plan(1 * hardDisk + 1 * capacityFlash, {AHybridGroup(7), AnAllFlashGroup(1)});
  EXPECT_TRUE(other.hybridLimit);
  EXPECT_FALSE(other.StopsAtLimit());
}

TEST(AddPlan, StopsAtTheLimitOfAllFlashGroups) {
  const AddPlan plan = Plan(1 * capacityFlash, {AnAllFlashGroup(7)});
  EXPECT_TRUE(plan.allFlashLimit);
  EXPECT_FALSE(plan.hybridLimit);
  EXPECT_TRUE(plan.StopsAtLimit());
}

TEST(AddPlan, StopsAtNoLimitWhereThereIsNothingToPlan) {
  EXPECT_FALSE(Plan(1 * hardDisk, {}).StopsAtLimit());
}

}  // namespace
}  // namespace Kovasvc::Planning
