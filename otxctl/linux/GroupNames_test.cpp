#include "otxctl/linux/GroupNames.h"

#include <gtest/gtest.h>

#include <set>

namespace OtxCtl::Linux {
namespace {

TEST(GroupNames, AreShortAndOfTheirUuid) {
  const std::string uuid = "01234567-89ab-4cde-8f01-23456789abcd";
  EXPECT_EQ(VolumeGroupName(uuid), "kova_0123456789ab");
  EXPECT_EQ(DataVolumeName(uuid), "data_0123456789ab");
  EXPECT_EQ(CacheVolumeName(uuid), "data_0123456789ab_cache");
}

TEST(GroupNames, ANewUuidIsOneOfVersionFourAndAnotherEachTime) {
  std::set<std::string> seen;
  for (int i = 0; i < 100; ++i) {
    const std::string uuid = NewUuid();
    ASSERT_EQ(uuid.size(), 36U);
    EXPECT_EQ(uuid.find_first_not_of("0123456789abcdef-"), std::string::npos) << uuid;
    for (const std::size_t dash : {8, 13, 18, 23}) {
      EXPECT_EQ(uuid[dash], '-') << uuid;
    }
    EXPECT_EQ(uuid[14], '4') << uuid;
    EXPECT_NE(std::string("89ab").find(uuid[19]), std::string::npos) << uuid;
    EXPECT_TRUE(seen.insert(uuid).second) << uuid;
  }
}

}  // namespace
}  // namespace OtxCtl::Linux
