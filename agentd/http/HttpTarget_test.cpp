#include "agentd/http/HttpTarget.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace Agentd {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

TEST(HttpTarget, WithoutParametersIsAPath) {
  const auto target = ParseTarget("/api/v1/disks");
  ASSERT_TRUE(target);
  EXPECT_EQ(target->path, "/api/v1/disks");
  EXPECT_THAT(target->parameters, IsEmpty());
}

TEST(HttpTarget, KeepsParametersInOrder) {
  const auto target = ParseTarget("/d?names=naa.2&other=x&names=naa.1");
  ASSERT_TRUE(target);
  EXPECT_THAT(target->parameters,
              ElementsAre(Pair("names", "naa.2"), Pair("other", "x"), Pair("names", "naa.1")));
  EXPECT_THAT(target->ValuesOf("names"), ElementsAre("naa.2", "naa.1"));
  EXPECT_THAT(target->ValuesOf("missing"), IsEmpty());
}

TEST(HttpTarget, DecodesEscapesEverywhere) {
  const auto target = ParseTarget("/%41%2f?n%61me=a%20b%26%3d%C3%9f");
  ASSERT_TRUE(target);
  EXPECT_EQ(target->path, "/A/");
  EXPECT_THAT(target->parameters, ElementsAre(Pair("name", "a b&=ß")));
}

TEST(HttpTarget, TakesBytesThatShouldHaveBeenEscapedAsTheyAre) {
  const auto target = ParseTarget("/|?names=\"a|{b}\xC3\x9F#[c]");
  ASSERT_TRUE(target);
  EXPECT_EQ(target->path, "/|");
  EXPECT_THAT(target->ValuesOf("names"), ElementsAre("\"a|{b}\xC3\x9F#[c]"));
}

TEST(HttpTarget, TakesAPlusForAPlus) {
  EXPECT_EQ(ParseTarget("/?names=a+b")->ValuesOf("names").front(), "a+b");
}

TEST(HttpTarget, SplitsAtTheFirstEqualsSign) {
  EXPECT_THAT(ParseTarget("/?a=b=c&d&=e")->parameters,
              ElementsAre(Pair("a", "b=c"), Pair("d", ""), Pair("", "e")));
}

TEST(HttpTarget, PassesOverNothingBetweenAmpersands) {
  EXPECT_THAT(ParseTarget("/?&&a=b&")->parameters, ElementsAre(Pair("a", "b")));
  EXPECT_THAT(ParseTarget("/?")->parameters, IsEmpty());
}

class BrokenEscape : public testing::TestWithParam<const char*> {};

TEST_P(BrokenEscape, IsNoTarget) {
  EXPECT_FALSE(ParseTarget(GetParam()));
}

INSTANTIATE_TEST_SUITE_P(Targets, BrokenEscape,
                         testing::Values("/%", "/%4", "/%4x", "/%x4", "/% 4", "/%-4", "/?a=%", "/?%zz=a",
                                         "/?a&b=%f"));

}  // namespace
}  // namespace Agentd
