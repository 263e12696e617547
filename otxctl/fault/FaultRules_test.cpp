#include "otxctl/fault/FaultRules.h"

#include <gtest/gtest.h>

#include "kova/agentd/include/HostCtlException.h"

namespace OtxCtl::Fault {
namespace {

using std::chrono::milliseconds;

FaultRule Throwing(const std::string& operation, int call, const std::string& message) {
  return {operation, call, "KovaStorageException", message, "naa.1", 0};
}

FaultRule Waiting(const std::string& operation, int call, int delayMs) {
  return {operation, call, "", "", "", delayMs};
}

TEST(CallCounter, CountsEachOperationByItself) {
  CallCounter counter;
  EXPECT_EQ(counter.Next("QueryDisks"), 1);
  EXPECT_EQ(counter.Next("QueryDisks"), 2);
  EXPECT_EQ(counter.Next("RemoveDisk"), 1);
  EXPECT_EQ(counter.Next("QueryDisks"), 3);
}

TEST(FaultRules, ARuleFitsItsCallOfItsOperationOnly) {
  const std::vector<FaultRule> rules = {Throwing("RemoveDisk", 2, "second")};
  EXPECT_FALSE(EffectOf(rules, "RemoveDisk", 1).thrown);
  EXPECT_TRUE(EffectOf(rules, "RemoveDisk", 2).thrown);
  EXPECT_FALSE(EffectOf(rules, "RemoveDisk", 3).thrown);
  EXPECT_FALSE(EffectOf(rules, "RemoveDiskMapping", 2).thrown);
}

TEST(FaultRules, CallZeroMeansEveryCall) {
  const std::vector<FaultRule> rules = {Throwing("RemoveDisk", 0, "always")};
  EXPECT_TRUE(EffectOf(rules, "RemoveDisk", 1).thrown);
  EXPECT_TRUE(EffectOf(rules, "RemoveDisk", 1000).thrown);
}

TEST(FaultRules, TheFirstFittingRuleWithAnExceptionCounts) {
  const std::vector<FaultRule> rules = {Waiting("RemoveDisk", 0, 5), Throwing("RemoveDisk", 1, "first"),
                                        Throwing("RemoveDisk", 0, "second"), Waiting("RemoveDisk", 0, 50)};
  const FaultEffect effect = EffectOf(rules, "RemoveDisk", 1);
  ASSERT_TRUE(effect.thrown);
  EXPECT_EQ(effect.thrown->message, "first");
  EXPECT_EQ(effect.delay, milliseconds(5));
}

TEST(FaultRules, DelaysAloneAddUpAndThrowNothing) {
  const FaultEffect effect =
      EffectOf({Waiting("RemoveDisk", 1, 5), Waiting("RemoveDisk", 0, 7)}, "RemoveDisk", 1);
  EXPECT_FALSE(effect.thrown);
  EXPECT_EQ(effect.delay, milliseconds(12));
  EXPECT_NO_THROW(ApplyEffect({}));
}

TEST(FaultRules, SufferingThrowsWhatTheRuleSays) {
  FaultEffect effect;
  effect.thrown = Throwing("RemoveDisk", 0, "broken");
  try {
    ApplyEffect(effect);
    FAIL();
  } catch (const HostCtl::Lib::KovaStorageException& exception) {
    EXPECT_STREQ(exception.what(), "broken");
    EXPECT_EQ(exception.GetDiskName(), "naa.1");
  }
}

}  // namespace
}  // namespace OtxCtl::Fault
