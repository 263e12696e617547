#include "otxctl/sim/DefaultHost.h"

#include <gtest/gtest.h>

#include <algorithm>

#include "otxctl/sim/HostFile.h"
#include "otxctl/sim/SimRules.h"

namespace OtxCtl::Sim {
namespace {

TEST(DefaultHost, IsTheExampleFileAsItStands) {
  EXPECT_EQ(DefaultHostText(), ReadTextFile(KOVA_EXAMPLE_HOSTS "/default.json", 1 << 20));
}

TEST(DefaultHost, ShowsEveryCommonKindOfDisk) {
  const HostDescription host = DefaultHost();
  const auto count = [&host](std::int32_t state, std::int32_t reason) {
    return std::count_if(host.disks.begin(), host.disks.end(), [&](const HostDisk& disk) {
      return VerdictOn(host, disk, nullptr) == HostVerdict{state, reason};
    });
  };
  EXPECT_EQ(count(1, 0), 9);  // 2 cache disks, 6 hard disks, 1 capacity flash
  EXPECT_EQ(count(2, 2), 1);
  EXPECT_EQ(count(2, 3), 1);
  EXPECT_EQ(count(2, 5), 1);
}

}  // namespace
}  // namespace OtxCtl::Sim
