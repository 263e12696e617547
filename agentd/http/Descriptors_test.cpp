#include "agentd/http/Descriptors.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/resource.h>

#include <stdexcept>

namespace Agentd {
namespace {

using testing::AllOf;
using testing::HasSubstr;

// Puts the limit back.
class Descriptors : public testing::Test {
 protected:
  Descriptors() { getrlimit(RLIMIT_NOFILE, &_before); }
  ~Descriptors() override { setrlimit(RLIMIT_NOFILE, &_before); }

  static rlim_t Current() {
    rlimit now{};
    getrlimit(RLIMIT_NOFILE, &now);
    return now.rlim_cur;
  }
  void Lower(rlim_t soft) const {
    const rlimit lower{soft, _before.rlim_max};
    ASSERT_EQ(setrlimit(RLIMIT_NOFILE, &lower), 0);
  }

  rlimit _before{};
};

TEST_F(Descriptors, TheLimitIsRaisedToWhatIsNeededAndNoFurther) {
  Lower(100);
  RequireDescriptors(200);
  EXPECT_EQ(Current(), 200u);
}

TEST_F(Descriptors, ALimitThatIsHighEnoughStays) {
  Lower(100);
  RequireDescriptors(100);
  EXPECT_EQ(Current(), 100u);
}

TEST_F(Descriptors, MoreThanTheProcessMayHaveIsRefusedWithBothNumbers) {
  if (_before.rlim_max == RLIM_INFINITY) {
    GTEST_SKIP() << "there is no limit here";
  }
  const std::string most = std::to_string(_before.rlim_max);
  const std::string more = std::to_string(_before.rlim_max + 1);
  try {
    RequireDescriptors(_before.rlim_max + 1);
    FAIL() << "there are as many";
  } catch (const std::runtime_error& refused) {
    EXPECT_THAT(refused.what(), AllOf(HasSubstr(most), HasSubstr(more)));
  }
  EXPECT_EQ(Current(), _before.rlim_cur);
}

}  // namespace
}  // namespace Agentd
