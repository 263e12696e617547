#include "kova/agentd/disks/NameList.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <string>
#include <vector>

#include "tests/support/Seed.h"

namespace Kovasvc {
namespace {

using Names = std::vector<std::string>;

TEST(NameList, OfNoNamesHoldsNone) {
  const Names none;
  NameList names(none);
  EXPECT_TRUE(names.IsEmpty());
  EXPECT_FALSE(names.Contains(""));
  EXPECT_EQ(FindRepeated({}), nullptr);
}

TEST(NameList, FindsNamesInAnyOrderAndAgain) {
  const Names list = {"a", "b", "c"};
  NameList names(list);
  EXPECT_FALSE(names.IsEmpty());
  EXPECT_EQ(names.Size(), 3U);
  for (const char* name : {"a", "b", "b", "a", "c", "c"}) {
    EXPECT_TRUE(names.Contains(name)) << name;
  }
  EXPECT_FALSE(names.Contains("d"));
  EXPECT_FALSE(names.Contains(""));
}

TEST(NameList, FindsNamesThatStandBehindOneItWasNotAskedFor) {
  const Names list = {"a", "b", "c"};
  NameList names(list);
  EXPECT_TRUE(names.Contains("b"));
  EXPECT_TRUE(names.Contains("c"));
  EXPECT_TRUE(names.Contains("a"));
}

TEST(NameList, HoldsTheEmptyNameLikeAnyOther) {
  const Names list = {"", "a"};
  NameList names(list);
  EXPECT_TRUE(names.Contains(""));
  EXPECT_TRUE(names.Contains(""));
}

TEST(NameList, KeepsRepeats) {
  const Names list = {"a", "b", "a"};
  NameList names(list);
  EXPECT_EQ(names.Size(), 3U);
  for (const char* name : {"a", "b", "a", "a", "b"}) {
    EXPECT_TRUE(names.Contains(name)) << name;
  }
}

TEST(FindRepeated, GivesTheFirstByBytesWhereverItStands) {
  EXPECT_EQ(FindRepeated({"a", "b", "c"}), nullptr);
  const std::vector<std::string_view> names = {"z", "m", "z", "a", "m"};
  ASSERT_NE(FindRepeated(names), nullptr);
  EXPECT_EQ(*FindRepeated(names), "m");
}

TEST(NameList, AnswersLikeAWalkThroughTheList) {
  const TestSupport::Seed seed;
  std::mt19937 random(seed.Value());
  const auto draw = [&random] { return "n" + std::to_string(random() % 12); };
  for (int round = 0; round < 500; ++round) {
    SCOPED_TRACE("round " + std::to_string(round));
    Names list(random() % 12);
    std::generate(list.begin(), list.end(), draw);
    NameList names(list);
    for (int question = 0; question < 20; ++question) {
      const std::string name = draw();
      ASSERT_EQ(names.Contains(name), std::find(list.begin(), list.end(), name) != list.end()) << name;
    }
    Names sorted = list;
    std::sort(sorted.begin(), sorted.end());
    const auto twin = std::adjacent_find(sorted.begin(), sorted.end());
    const std::vector<std::string_view> views(list.begin(), list.end());
    const std::string_view* const repeated = FindRepeated(views);
    ASSERT_EQ(repeated == nullptr, twin == sorted.end());
    if (repeated != nullptr) {
      ASSERT_EQ(*repeated, *twin);
    }
  }
}

}  // namespace
}  // namespace Kovasvc
