#include "kova/agentd/planning/pure/AddPlan.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
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
  return {.group = {.allFlash = false, .heldBack = false}, .capacityDisks = capacityDisks};
}
HostGroup AnAllFlashGroup(std::size_t capacityDisks) {
  return {.group = {.allFlash = true, .heldBack = false}, .capacityDisks = capacityDisks};
}

// As in "new hybrid 0: 2 3".
std::vector<std::string> Groups(const AddPlan& plan) {
  std::vector<std::string> texts;
  for (const AddPlan::Group& group : plan.groups) {
    std::string text = group.isNew ? "new " : "grown ";
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
  const AddPlan plan = PlanAddition({}, {AHybridGroup(1)});
  EXPECT_THAT(plan.groups, IsEmpty());
  EXPECT_THAT(plan.leftOver, IsEmpty());
}

TEST(AddPlan, DealsCapacityDisksEvenlyToNewGroups) {
  const AddPlan plan = PlanAddition(2 * cacheDisk + 5 * hardDisk, {});
  EXPECT_THAT(Groups(plan), ElementsAre("new hybrid 0: 2 4 6", "new hybrid 1: 3 5"));
  EXPECT_THAT(plan.leftOver, testing::Each(std::nullopt));
}

TEST(AddPlan, MakesHybridGroupsBeforeAllFlashOnes) {
  const AddPlan plan = PlanAddition(1 * capacityFlash + 2 * cacheDisk + 1 * hardDisk, {});
  EXPECT_THAT(Groups(plan), ElementsAre("new hybrid 2: 3", "new all-flash 1: 0"));
}

TEST(AddPlan, NeverUsesADiskThatIsNotEligible) {
  const AddPlan plan = PlanAddition(1 * usedDisk + 1 * hardDisk, {});
  EXPECT_THAT(plan.groups, IsEmpty());
  EXPECT_THAT(plan.leftOver, ElementsAre(LeftOver::NotEligible, LeftOver::NoCacheDisk));
}

TEST(AddPlan, ExtendsTheGroupsOfTheHostWithoutANewCacheDisk) {
  const AddPlan plan = PlanAddition(2 * hardDisk, {AnAllFlashGroup(1), AHybridGroup(3), AHybridGroup(2)});
  EXPECT_THAT(Groups(plan), ElementsAre("grown hybrid 2: 0", "grown hybrid 1: 1"));
}

TEST(AddPlan, ExtendsAllFlashGroupsByCapacityFlash) {
  const AddPlan plan = PlanAddition(1 * capacityFlash, {AHybridGroup(1), AnAllFlashGroup(1)});
  EXPECT_THAT(Groups(plan), ElementsAre("grown all-flash 1: 0"));
}

TEST(AddPlan, LeavesGroupsAloneThatAreHeldBackOrWhoseCacheDiskIsUnknown) {
  HostGroup heldBack = AHybridGroup(1);
  heldBack.group.heldBack = true;
  HostGroup unknown = AHybridGroup(1);
  unknown.cacheListed = false;
  const AddPlan plan = PlanAddition(1 * hardDisk, {heldBack, unknown});
  EXPECT_THAT(plan.groups, IsEmpty());
  EXPECT_THAT(plan.leftOver, ElementsAre(LeftOver::NoCacheDisk));
}

TEST(AddPlan, LeavesACacheDiskWithoutCapacityDisks) {
  const AddPlan plan = PlanAddition(2 * cacheDisk + 1 * hardDisk, {});
  EXPECT_THAT(Groups(plan), ElementsAre("new hybrid 0: 2"));
  EXPECT_THAT(plan.leftOver, ElementsAre(std::nullopt, LeftOver::NoCapacityDisk, std::nullopt));
}

TEST(AddPlan, LeavesCapacityDisksWhenEveryGroupIsFull) {
  const AddPlan plan = PlanAddition(1 * cacheDisk + 8 * hardDisk, {});
  EXPECT_THAT(Groups(plan), ElementsAre("new hybrid 0: 1 2 3 4 5 6 7"));
  EXPECT_EQ(plan.leftOver.back(), LeftOver::GroupsFull);
}

TEST(AddPlan, LeavesCacheDisksBeyondTheMostGroups) {
  const AddPlan plan = PlanAddition(2 * cacheDisk + 1 * hardDisk, std::vector<HostGroup>(4, AHybridGroup(1)));
  EXPECT_THAT(Groups(plan), ElementsAre("new hybrid 0: 2"));
  EXPECT_THAT(plan.leftOver, ElementsAre(std::nullopt, LeftOver::TooManyGroups, std::nullopt));
}

TEST(AddPlan, SaysThatTheGroupsAreTooManyAlsoForCapacityDisks) {
  HostGroup heldBack = AHybridGroup(1);
  heldBack.group.heldBack = true;
  const AddPlan plan = PlanAddition(1 * cacheDisk + 1 * hardDisk, std::vector<HostGroup>(5, heldBack));
  EXPECT_THAT(plan.groups, IsEmpty());
  EXPECT_THAT(plan.leftOver, ElementsAre(LeftOver::TooManyGroups, LeftOver::TooManyGroups));
}

TEST(AddPlan, KeepsCapacityFlashFromHybridGroups) {
  const AddPlan plan = PlanAddition(1 * capacityFlash + 1 * hardDisk, {AHybridGroup(1)});
  EXPECT_THAT(Groups(plan), ElementsAre("grown hybrid 0: 1"));
  EXPECT_THAT(plan.leftOver, ElementsAre(LeftOver::NoCacheDisk, std::nullopt));
}

TEST(AddPlan, HasWordsForEveryReason) {
  EXPECT_STREQ(Describe(LeftOver::NotEligible), "not eligible");
  EXPECT_STREQ(Describe(LeftOver::NoCacheDisk),
               "no flash disk is free to be its cache, and no group of its kind can grow");
  EXPECT_STREQ(Describe(LeftOver::NoCapacityDisk), "no capacity disk is left for it to be the cache of");
  EXPECT_STREQ(Describe(LeftOver::GroupsFull), "every group has 7 capacity disks");
  EXPECT_STREQ(Describe(LeftOver::TooManyGroups), "a host has at most 5 groups");
}

TEST(AddPlan, HasNoWordsForWhatIsNoReason) {
  EXPECT_STREQ(Describe(static_cast<LeftOver>(99)), "");
}

}  // namespace
}  // namespace Kovasvc::Planning
