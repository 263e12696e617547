#include "otxctl/disks/SignatureWords.h"

#include <gtest/gtest.h>

namespace OtxCtl::Disks {
namespace {

TEST(SignatureWords, SayWhatStandsOnADisk) {
  EXPECT_EQ(SignatureInWords("ext4", ""), "ext4 file system");
  EXPECT_EQ(SignatureInWords("ext4", "DATA"), "ext4 file system \"DATA\"");
  EXPECT_EQ(SignatureInWords("LVM2_member", ""), "LVM physical volume");
  EXPECT_EQ(SignatureInWords("crypto_LUKS", ""), "LUKS encrypted volume");
  EXPECT_EQ(SignatureInWords("linux_raid_member", "h:0"),
            "member of a RAID array (linux_raid_member) \"h:0\"");
  EXPECT_EQ(SignatureInWords("isw_raid_member", ""), "member of a RAID array (isw_raid_member)");
  EXPECT_EQ(SignatureInWords("zfs_member", "tank"), "member of a ZFS pool \"tank\"");
  EXPECT_EQ(SignatureInWords("swap", ""), "swap space");
}

TEST(SignatureWords, OneThatIsNotKnownIsToldAsItIs) {
  EXPECT_EQ(SignatureInWords("newfs", ""), "newfs signature");
}

TEST(SignatureWords, OtherDevicesStandOnMembers) {
  for (const char* const member : {"LVM2_member", "crypto_LUKS", "linux_raid_member", "ddf_raid_member",
                                   "zfs_member", "bcache", "mpath_member", "new_member"}) {
    EXPECT_TRUE(IsMemberSignature(member)) << member;
  }
  for (const char* const other : {"ext4", "swap", "", "xfs"}) {
    EXPECT_FALSE(IsMemberSignature(other)) << other;
  }
}

}  // namespace
}  // namespace OtxCtl::Disks
