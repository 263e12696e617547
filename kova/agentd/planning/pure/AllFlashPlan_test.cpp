#include "kova/agentd/planning/pure/AllFlashPlan.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace Kovasvc::Planning {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

TEST(IsFlash, HoldsForCacheAndForCapacity) {
  EXPECT_TRUE(IsFlash(true, false));
  EXPECT_TRUE(IsFlash(false, true));
  EXPECT_TRUE(IsFlash(true, true));
  EXPECT_FALSE(IsFlash(false, false));
}

TEST(TakenForCapacity, IsEveryFlashDiskThatIsNoCacheDisk) {
  EXPECT_THAT(TakenForCapacity({false, true, false, true, false}), ElementsAre(0, 2, 4));
  EXPECT_THAT(TakenForCapacity({true, true}), IsEmpty());
  EXPECT_THAT(TakenForCapacity({}), IsEmpty());
}

}  // namespace
}  // namespace Kovasvc::Planning
