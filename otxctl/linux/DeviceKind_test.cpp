#include "otxctl/linux/DeviceKind.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "otxctl/linux/testing/SystemTree.h"

namespace OtxCtl::Linux {
namespace {

using testing::HasSubstr;

class DeviceKindTest : public testing::Test {
 protected:
  BlockDevice Read(const std::string& name) const {
    const BlockDevices devices(_reader);
    return *devices.ByName(name);
  }
  std::string Why(const std::string& name) const { return WhyLeftOut(_reader, Read(name)); }

  SystemTree _tree;
  SysfsReader _reader{_tree.Paths().sys};
};

TEST_F(DeviceKindTest, DisksAreLeftIn) {
  _tree.AddScsiDisk("sda", {});
  _tree.AddNvmeDisk("nvme0n1", {});
  _tree.AddVirtioDisk("vda", {});
  _tree.AddVirtual("mmcblk0", 512);
  _tree.AddVirtual("nbd0", 512);
  _tree.AddVirtual("mdx", 512);
  _tree.AddMapping("dm-0", "mpatha", "mpath-36000", {"sda"});
  for (const char* const name : {"sda", "nvme0n1", "vda", "mmcblk0", "nbd0", "mdx", "dm-0"}) {
    EXPECT_EQ(Why(name), "") << name;
  }
}

TEST_F(DeviceKindTest, WhatStandsOnDisksIsNone) {
  const std::vector<std::pair<std::string, std::string>> rows = {
      {"loop0", "a loop device"},
      {"ram0", "memory"},
      {"zram0", "memory"},
      {"md127", "a RAID array"},
      {"bcache0", "a cached device"},
      {"fd0", "a floppy drive"},
      {"sr0", "an optical drive"},
      {"mmcblk0boot0", "an area of a memory card"},
      {"mmcblk0rpmb", "an area of a memory card"},
  };
  for (const auto& [name, why] : rows) {
    _tree.AddVirtual(name, 512);
    EXPECT_EQ(Why(name), why) << name;
  }
  _tree.MakeFolder(_tree.AddVirtual("odd", 512) + "/md");
  EXPECT_EQ(Why("odd"), "a RAID array");
}

TEST_F(DeviceKindTest, MappedDevicesAreNone) {
  const std::string path = _tree.AddMapping("dm-0", "vg0-data", "LVM-abc", {});
  EXPECT_EQ(Why("dm-0"), "a mapped device: vg0-data (LVM)");
  _tree.Remove(path + "/dm/uuid");
  EXPECT_THAT(Why("dm-0"), HasSubstr("nobody knows what it maps: "));
}

TEST_F(DeviceKindTest, DevicesOfOtherKindsAreNone) {
  const std::string path = _tree.AddScsiDisk("sda", {});
  const std::string device = path.substr(0, path.rfind("/block/"));
  _tree.Write(device + "/type", "5\n");
  EXPECT_EQ(Why("sda"), "an optical drive");
  _tree.Remove(device + "/type");
  EXPECT_THAT(Why("sda"), HasSubstr("nobody knows: "));
  _tree.Write(device + "/type", "0\n");
  _tree.Write(path + "/size", "0\n");
  EXPECT_EQ(Why("sda"), "without a medium");
  _tree.Remove(path + "/size");
  EXPECT_EQ(Why("sda"), "") << "a disk of an unknown size is one";
  _tree.Write(path + "/hidden", "1\n");
  EXPECT_EQ(Why("sda"), "hidden");
  _tree.Write(path + "/hidden", "x\n");
  EXPECT_THAT(Why("sda"), HasSubstr("nobody knows: "));
  _tree.Remove(path + "/hidden");
  _tree.Remove(path + "/dev");
  EXPECT_THAT(Why("sda"), HasSubstr("/dev: does not exist"));
}

TEST_F(DeviceKindTest, HoldersAreToldInWords) {
  const std::vector<std::pair<std::string, std::string>> rows = {
      {"LVM-abc", "x (LVM)"},         {"CRYPT-LUKS2-abc", "x (encryption)"}, {"mpath-abc", "x (multipath)"},
      {"DMRAID-abc", "x (RAID)"},     {"part1-mpath-abc", "x (partition)"},  {"", "x (device-mapper)"},
      {"stuff", "x (device-mapper)"},
  };
  for (const auto& [uuid, words] : rows) {
    _tree.AddMapping("dm-0", "x", uuid, {});
    EXPECT_EQ(InWords(Read("dm-0")), words);
  }
  _tree.AddMapping("dm-0", "a\x1B[2J\nb\"\xFF", "LVM-", {});
  EXPECT_EQ(InWords(Read("dm-0")), "a[2Jb\"\xEF\xBF\xBD (LVM)");
  _tree.Remove("sys/devices/virtual/block/dm-0/dm/name");
  EXPECT_EQ(InWords(Read("dm-0")), "dm-0 (LVM)");
  _tree.MakeFolder(_tree.AddVirtual("md0", 512) + "/md");
  _tree.AddVirtual("bcache0", 512);
  EXPECT_EQ(InWords(Read("md0")), "md0 (RAID)");
  EXPECT_EQ(InWords(Read("bcache0")), "bcache0");
}

}  // namespace
}  // namespace OtxCtl::Linux
