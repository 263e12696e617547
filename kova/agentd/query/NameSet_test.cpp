#include "kova/agentd/query/NameSet.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <string>
#include <vector>

namespace Kovasvc {
namespace {

using Names = std::vector<std::string>;

TEST(NameSet, OfNoNamesHoldsNone) {
  const Names none;
  NameSet names(none);
  EXPECT_TRUE(names.IsEmpty());
  EXPECT_FALSE(names.Contains(""));
  EXPECT_EQ(names.FindRepeated(), nullptr);
}

TEST(NameSet, FindsNamesInAnyOrderAndAgain) {
  const Names list = {"a", "b", "c"};
  NameSet names(list);
  EXPECT_FALSE(names.IsEmpty());
  for (const char* name : {"a", "b", "b", "a", "c", "c"}) {
    EXPECT_TRUE(names.Contains(name)) << name;
  }
  EXPECT_FALSE(names.Contains("d"));
  EXPECT_FALSE(names.Contains(""));
}

TEST(NameSet, FindsNamesThatStandBehindOneItWasNotAskedFor) {
  const Names list = {"a", "b", "c"};
  NameSet names(list);
  EXPECT_TRUE(names.Contains("b"));
  EXPECT_TRUE(names.Contains("c"));
  EXPECT_TRUE(names.Contains("a"));
}

TEST(NameSet, HoldsTheEmptyNameLikeAnyOther) {
  const Names list = {"", "a"};
  NameSet names(list);
  EXPECT_TRUE(names.Contains(""));
  EXPECT_TRUE(names.Contains(""));
}

TEST(NameSet, AnswersLikeAWalkThroughTheList) {
  const unsigned seed = std::random_device()();
  std::mt19937 random(seed);
  const auto draw = [&random] { return "n" + std::to_string(random() % 12); };
  for (int round = 0; round < 500; ++round) {
    SCOPED_TRACE("seed " + std::to_string(seed) + ", round " + std::to_string(round));
    Names list(random() % 12);
    std::generate(list.begin(), list.end(), draw);
    NameSet names(list);
    for (int question = 0; question < 20; ++question) {
      const std::string name = draw();
      ASSERT_EQ(names.Contains(name), std::find(list.begin(), list.end(), name) != list.end()) << name;
    }
    Names sorted = list;
    std::sort(sorted.begin(), sorted.end());
    const auto twin = std::adjacent_find(sorted.begin(), sorted.end());
    const std::string_view* const repeated = names.FindRepeated();
    ASSERT_EQ(repeated == nullptr, twin == sorted.end());
    if (repeated != nullptr) {
      ASSERT_EQ(*repeated, *twin);
    }
  }
}

}  // namespace
}  // namespace Kovasvc
