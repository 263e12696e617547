#include "otxctl/linux/BlockDevices.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "otxctl/linux/testing/SystemTree.h"

namespace OtxCtl::Linux {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class BlockDevicesTest : public testing::Test {
 protected:
  SysfsReader Reader() const { return SysfsReader(_tree.Paths().sys); }
  BlockDevices Read() const { return BlockDevices(Reader()); }
  BlockDevice ReadOne(const std::string& name) const {
    const BlockDevices devices = Read();
    const BlockDevice* const device = devices.ByName(name);
    return device == nullptr ? BlockDevice() : *device;
  }

  SystemTree _tree;
};

std::vector<std::string> NamesOf(const std::vector<BlockDevice>& devices) {
  std::vector<std::string> names;
  for (const BlockDevice& device : devices) {
    names.push_back(device.name);
  }
  return names;
}

TEST_F(BlockDevicesTest, EverythingOfADiskIsRead) {
  const std::string path = _tree.AddScsiDisk("sda", {});
  _tree.Write(path + "/queue/logical_block_size", "4096\n");
  const BlockDevice disk = ReadOne("sda");
  EXPECT_EQ("sys" + disk.path, path);
  EXPECT_TRUE(disk.IsWhole());
  EXPECT_FALSE(disk.IsVirtual());
  EXPECT_TRUE(disk.number.Is("8:0"));
  EXPECT_TRUE(disk.sequence.Is("1"));
  EXPECT_TRUE(disk.bytes.Is(std::int64_t{4} << 30));
  EXPECT_TRUE(disk.isReadOnly.Is(false));
  EXPECT_TRUE(disk.isRemovable.Is(false));
  EXPECT_TRUE(disk.isHidden.Is(false));
  EXPECT_TRUE(disk.isRotational.Is(true));
  EXPECT_TRUE(disk.zones.Is("none"));
  EXPECT_TRUE(disk.blockSize.Is(4096));
  EXPECT_THAT(disk.holders.Get(), IsEmpty());
  EXPECT_THAT(disk.slaves.Get(), IsEmpty());
  EXPECT_FALSE(disk.mapping.has_value());
  EXPECT_FALSE(disk.isRaid);
  EXPECT_TRUE(disk.device.Is("/devices/pci0000:00/0000:00:05.0/virtio0/host0/target0:0:0/0:0:0:0"));
}

TEST_F(BlockDevicesTest, TheChainLeadsFromTheDiskToTheRoot) {
  _tree.AddScsiDisk("sda", {});
  const BlockDevice disk = ReadOne("sda");
  std::vector<std::string> subsystems;
  for (const Ancestor& ancestor : disk.chain.Get()) {
    subsystems.push_back(ancestor.subsystem);
  }
  EXPECT_THAT(subsystems, ElementsAre("block", "scsi", "scsi", "scsi", "virtio", "pci"));
  EXPECT_EQ(disk.chain.Get().back().path, "/devices/pci0000:00/0000:00:05.0");
}

TEST_F(BlockDevicesTest, PartitionsMappingsAndRaidsAreToldApart) {
  _tree.AddScsiDisk("sda", {});
  _tree.AddPartition("sda", "sda1");
  _tree.AddMapping("dm-0", "vg0-data", "LVM-abc", {"sda1"});
  _tree.MakeFolder(_tree.AddVirtual("md0", 512) + "/md");
  const BlockDevices devices = Read();
  EXPECT_THAT(NamesOf(devices.All()), ElementsAre("dm-0", "md0", "sda", "sda1"));
  const BlockDevice& partition = *devices.ByName("sda1");
  EXPECT_EQ(partition.parent, "sda");
  EXPECT_THAT(partition.holders.Get(), ElementsAre("dm-0"));
  EXPECT_THAT(devices.PartitionsOf(*devices.ByName("sda")), ElementsAre(&partition));
  EXPECT_THAT(devices.PartitionsOf(*devices.ByName("md0")), IsEmpty());
  EXPECT_TRUE(devices.ByName("md0")->isRaid);
  const BlockDevice& mapping = *devices.ByMapping("vg0-data");
  EXPECT_EQ(mapping.name, "dm-0");
  EXPECT_TRUE(mapping.mapping->uuid.Is("LVM-abc"));
  EXPECT_TRUE(mapping.mapping->isSuspended.Is(false));
  EXPECT_THAT(mapping.slaves.Get(), ElementsAre("sda1"));
  EXPECT_TRUE(mapping.IsVirtual());
  EXPECT_EQ(devices.ByNumber(_tree.NumberOf("sda1")), &partition);
  EXPECT_EQ(devices.ByNumber("9:9"), nullptr);
}

TEST_F(BlockDevicesTest, WhatIsMissingIsUnknownUnlessOldKernelsHaveItNot) {
  const std::string path = _tree.AddScsiDisk("sda", {});
  for (const char* const name :
       {"/size", "/ro", "/removable", "/hidden", "/queue", "/holders", "/diskseq", "/dev"}) {
    _tree.Remove(path + name);
  }
  const BlockDevice disk = ReadOne("sda");
  EXPECT_THAT(disk.bytes.WhyUnknown(), HasSubstr("/block/sda/size: does not exist"));
  EXPECT_FALSE(disk.isReadOnly.IsKnown());
  EXPECT_FALSE(disk.isRemovable.IsKnown());
  EXPECT_FALSE(disk.isRotational.IsKnown());
  EXPECT_FALSE(disk.blockSize.IsKnown());
  EXPECT_FALSE(disk.holders.IsKnown());
  EXPECT_FALSE(disk.number.IsKnown());
  EXPECT_TRUE(disk.isHidden.Is(false));
  EXPECT_TRUE(disk.zones.Is(""));
  EXPECT_TRUE(disk.sequence.Is(""));
}

TEST_F(BlockDevicesTest, HostileAttributesAreUnknown) {
  const std::string path = _tree.AddScsiDisk("sda", {});
  _tree.Remove(path + "/ro");
  _tree.MakeFolder(path + "/ro");
  _tree.Write(path + "/size", "99999999999999999");
  _tree.Write(path + "/queue/logical_block_size", "0");
  _tree.Write(path + "/queue/rotational", std::string(5000, '1'));
  _tree.Link(path + "/device", "nowhere");
  _tree.Remove(path + "/holders");
  _tree.Write(path + "/holders", "");
  _tree.Remove("sys/devices/pci0000:00/0000:00:05.0/subsystem");
  _tree.MakeFolder("sys/devices/pci0000:00/0000:00:05.0/subsystem");
  const BlockDevice disk = ReadOne("sda");
  EXPECT_THAT(disk.isReadOnly.WhyUnknown(), HasSubstr("Is a directory"));
  EXPECT_THAT(disk.bytes.WhyUnknown(), HasSubstr("larger than any disk"));
  EXPECT_FALSE(disk.blockSize.IsKnown());
  EXPECT_THAT(disk.isRotational.WhyUnknown(), HasSubstr("longer than"));
  EXPECT_FALSE(disk.device.IsKnown());
  EXPECT_FALSE(disk.holders.IsKnown());
  EXPECT_FALSE(disk.chain.IsKnown());
}

TEST_F(BlockDevicesTest, NamesThatLeadNowhereOrCannotBeShownAreTold) {
  _tree.Link("sys/class/block/sda", "../../devices/gone");
  _tree.Link("sys/class/block/sd\x1B[2J", "../../devices");
  _tree.Link("sys/class/block/sdc", "/");
  _tree.AddScsiDisk("sdd", {});
  const BlockDevices devices = Read();
  EXPECT_THAT(NamesOf(devices.All()), ElementsAre("sdd"));
  ASSERT_EQ(devices.NotRead().size(), 3U);
  std::string told;
  for (const BlockDevices::Unreadable& one : devices.NotRead()) {
    told += one.name + ": " + one.why + "\n";
  }
  EXPECT_THAT(told, HasSubstr("sda: nobody knows: "));
  EXPECT_THAT(told, HasSubstr("sd\\x1b[2J: a name that cannot be shown"));
  EXPECT_THAT(told, HasSubstr("sdc: nobody knows: "));
}

TEST_F(BlockDevicesTest, ATreeWithoutDevicesIsNotAMachineWithoutDisks) {
  _tree.Remove("sys/class/block");
  EXPECT_THAT(Read().WhyIncomplete(), HasSubstr("/class/block: does not exist"));
}

TEST_F(BlockDevicesTest, APartitionWithoutADiskBelongsToNone) {
  const std::string path = _tree.AddScsiDisk("sda", {});
  _tree.AddPartition("sda", "sda1");
  _tree.Remove("sys/class/block/sda");
  const BlockDevices devices = Read();
  EXPECT_THAT(NamesOf(devices.All()), ElementsAre("sda1"));
  EXPECT_EQ(devices.ByName("sda"), nullptr);
}

TEST_F(BlockDevicesTest, ADeviceThatAnotherOneReplacedIsGone) {
  const std::string path = _tree.AddScsiDisk("sda", {});
  const BlockDevice disk = ReadOne("sda");
  EXPECT_EQ(WhyGone(Reader(), disk), "");
  _tree.Write(path + "/diskseq", "77\n");
  EXPECT_EQ(WhyGone(Reader(), disk), "another device has taken its name");
  _tree.Write(path + "/diskseq", "1\n");
  _tree.Write(path + "/dev", "8:99\n");
  EXPECT_EQ(WhyGone(Reader(), disk), "another device has taken its name");
  _tree.Remove(path + "/dev");
  EXPECT_THAT(WhyGone(Reader(), disk), HasSubstr("nobody knows whether it is still there: "));
  _tree.Remove("sys/class/block/sda");
  EXPECT_EQ(WhyGone(Reader(), disk), "went away");
}

}  // namespace
}  // namespace OtxCtl::Linux
