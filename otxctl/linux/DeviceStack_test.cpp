#include "otxctl/linux/DeviceStack.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "otxctl/linux/testing/SystemTree.h"

namespace OtxCtl::Linux {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class DeviceStackTest : public testing::Test {
 protected:
  DeviceStackTest() { _tree.AddScsiDisk("sda", {}); }

  // What the question comes to of a device, as the tree is now.
  template <typename Question>
  auto Ask(Question question, const std::string& name = "sda") const {
    const SysfsReader reader(_tree.Paths().sys);
    const BlockDevices devices(reader);
    const MountTable mounts(_tree.Paths(), devices);
    return question(DeviceStack(devices, mounts), devices, *devices.ByName(name));
  }
  bool IsClaimed() const {
    return Ask([](const DeviceStack& stack, const BlockDevices&, const BlockDevice& device) {
      return stack.IsClaimed(device);
    });
  }
  Disks::Fact<std::int32_t> Partitions() const {
    return Ask([](const DeviceStack&, const BlockDevices& devices, const BlockDevice& device) {
      return CountPartitions(devices, device);
    });
  }

  SystemTree _tree;
};

TEST_F(DeviceStackTest, ADiskIsClaimedByWhatStandsOnIt) {
  EXPECT_FALSE(IsClaimed());
  _tree.AddPartition("sda", "sda1");
  EXPECT_FALSE(IsClaimed());
  _tree.AddMapping("dm-0", "vg0-data", "LVM-abc", {"sda1"});
  EXPECT_TRUE(IsClaimed());
}

TEST_F(DeviceStackTest, ADiskIsClaimedByItsMounts) {
  _tree.AddPartition("sda", "sda1");
  _tree.Mount(_tree.NumberOf("sda1"), "/dev/sda1", "/boot");
  EXPECT_TRUE(IsClaimed());
}

TEST_F(DeviceStackTest, ADiskIsClaimedByItsHolders) {
  _tree.AddHolder("sda", "md0");
  EXPECT_TRUE(IsClaimed());
}

TEST_F(DeviceStackTest, PartitionsAreThoseOfTheKernelAndOfDeviceMapper) {
  EXPECT_TRUE(Partitions().Is(0));
  _tree.AddPartition("sda", "sda1");
  _tree.AddMapping("dm-0", "sda2", "part2-mpath-3600", {"sda"});
  EXPECT_TRUE(Partitions().Is(2));
  _tree.Remove(_tree.PathOf("sda") + "/holders");
  EXPECT_FALSE(Partitions().IsKnown());
}

TEST_F(DeviceStackTest, MountsAreFoundHoweverHighTheyStand) {
  const auto mounts = [](const DeviceStack& stack, const BlockDevices&, const BlockDevice& device) {
    return stack.MountsOn(device);
  };
  _tree.AddPartition("sda", "sda1");
  _tree.AddMapping("dm-0", "crypt", "CRYPT-1", {"sda1"});
  _tree.AddMapping("dm-1", "vg-data", "LVM-1", {"dm-0"});
  EXPECT_THAT(Ask(mounts).Get(), IsEmpty());
  _tree.Mount(_tree.NumberOf("dm-1"), "/dev/mapper/vg-data", "/data");
  EXPECT_THAT(Ask(mounts).Get(), ElementsAre("/data (vg-data)"));
  EXPECT_THAT(Ask(mounts, "dm-1").Get(), ElementsAre("/data"));
  _tree.Remove(_tree.PathOf("dm-0") + "/dev");
  EXPECT_FALSE(Ask(mounts).IsKnown());
}

}  // namespace
}  // namespace OtxCtl::Linux
