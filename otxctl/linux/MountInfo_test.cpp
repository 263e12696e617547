#include "otxctl/linux/MountInfo.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace OtxCtl::Linux {
namespace {

using testing::HasSubstr;

TEST(MountInfo, EveryLineIsAMount) {
  const auto entries = ParseMountInfo(
      "27 1 254:0 / / rw,relatime - ext4 /dev/vda rw,discard\n"
      "30 27 8:17 /sub /a\\040b\\134c rw shared:1 master:2 - xfs /dev/sdb1 rw\n"
      "31 27 0:23 / /dev/shm rw - tmpfs tmpfs rw\n"
      "32 27 0:24 / /empty rw - tmpfs  rw\n");
  ASSERT_TRUE(entries.IsKnown()) << entries.WhyUnknown();
  ASSERT_EQ(entries.Get().size(), 4U);
  EXPECT_EQ(entries.Get()[0].number, "254:0");
  EXPECT_EQ(entries.Get()[0].source, "/dev/vda");
  EXPECT_EQ(entries.Get()[1].where, "/a b\\c");
  EXPECT_EQ(entries.Get()[1].type, "xfs");
  EXPECT_EQ(entries.Get()[1].source, "/dev/sdb1");
  EXPECT_EQ(entries.Get()[3].source, "");
  EXPECT_TRUE(ParseMountInfo("").Get().empty());
}

TEST(MountInfo, ALineThatIsNotUnderstoodMakesAllUnknown) {
  for (const char* const line :
       {"\n", "27 1 254:0 / /\n", "27 1 254 / / rw - ext4 /dev/vda rw\n",
        "27 1 a:0 / / rw - ext4 /dev/vda rw\n", "27 1 254:0 / / rw shared:1 ext4 /dev/vda rw\n",
        "27 1 254:0 / / rw -\n", "27 1 254:0 / / rw - ext4\n", "27 1 :0 / / rw - ext4 /dev/vda rw\n",
        "27 1 254:0 / / rw - ext4 /dev/vda rw"}) {
    EXPECT_FALSE(ParseMountInfo(line).IsKnown()) << line;
    EXPECT_FALSE(ParseMountInfo("27 1 254:0 / / rw - ext4 /dev/vda rw\n" + std::string(line)).IsKnown())
        << line;
  }
  EXPECT_THAT(ParseMountInfo("a\x1B[2J\n").WhyUnknown(),
              HasSubstr("mounts: line 1 is not understood: \"a[2J\""));
  EXPECT_THAT(ParseMountInfo("27 1").WhyUnknown(), HasSubstr("mounts: cut short in line 1"));
}

TEST(MountInfo, SwapAreasStandBelowAHeading) {
  const auto entries = ParseSwaps(
      "Filename\t\t\t\tType\t\tSize\t\tUsed\t\tPriority\n"
      "/dev/sda2                               partition\t1048572\t\t0\t\t-2\n"
      "/var/swap\\040file                       file\t\t1048572\t\t0\t\t-3\n");
  ASSERT_TRUE(entries.IsKnown()) << entries.WhyUnknown();
  ASSERT_EQ(entries.Get().size(), 2U);
  EXPECT_EQ(entries.Get()[0].source, "/dev/sda2");
  EXPECT_FALSE(entries.Get()[0].isFile);
  EXPECT_EQ(entries.Get()[1].source, "/var/swap file");
  EXPECT_TRUE(entries.Get()[1].isFile);
  EXPECT_TRUE(ParseSwaps("").Get().empty());
  EXPECT_FALSE(ParseSwaps("Filename\n/dev/sda2 zram 1 2 3\n").IsKnown());
  EXPECT_FALSE(ParseSwaps("Filename\n/dev/sda2 partition 1 2\n").IsKnown());
  EXPECT_FALSE(ParseSwaps("Filename\n/dev/sda2 partition 1 2 3").IsKnown());
}

TEST(MountInfo, OctalEscapesAreDecodedAndNothingElse) {
  EXPECT_EQ(DecodeOctal("a\\040b\\011\\012\\134\\377"), "a b\t\n\\\xFF");
  EXPECT_EQ(DecodeOctal("\\04"), "\\04");
  EXPECT_EQ(DecodeOctal("\\400\\08x\\"), "\\400\\08x\\");
  EXPECT_EQ(DecodeOctal(""), "");
}

}  // namespace
}  // namespace OtxCtl::Linux
