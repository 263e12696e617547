#include "otxctl/linux/MountTable.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "otxctl/linux/testing/SystemTree.h"

namespace OtxCtl::Linux {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class MountTableTest : public testing::Test {
 protected:
  MountTableTest() {
    _tree.AddScsiDisk("sda", {});
    _tree.AddPartition("sda", "sda1");
    _tree.AddScsiDisk("sdb", {});
    _tree.AddMapping("dm-0", "vg0-data", "LVM-abc", {"sdb"});
  }

  Disks::Fact<MountTable::Places> Of(const std::string& name) const {
    const SysfsReader reader(_tree.Paths().sys);
    const BlockDevices devices(reader);
    return MountTable(_tree.Paths(), devices).MountsOf(*devices.ByName(name));
  }
  void Swap(const std::string& lines) {
    _tree.Write("proc/swaps", "Filename Type Size Used Priority\n" + lines);
  }

  SystemTree _tree;
};

TEST_F(MountTableTest, MountsAreFoundByDeviceNumber) {
  _tree.Mount(_tree.NumberOf("sda1"), "/dev/root", "/boot");
  _tree.Mount(_tree.NumberOf("sda1"), "/dev/sda1", "/mnt/a\\040b\\012\x1B[2J\xFF");
  _tree.Mount(_tree.NumberOf("sda1"), "/dev/sda1", "/boot");
  _tree.Mount("0:23", "tmpfs", "/dev/shm", "tmpfs");
  EXPECT_THAT(Of("sda1").Get(), ElementsAre("/boot", "/mnt/a b[2J\xEF\xBF\xBD"));
  EXPECT_THAT(Of("sda").Get(), IsEmpty());
  EXPECT_THAT(Of("sdb").Get(), IsEmpty());
}

TEST_F(MountTableTest, FileSystemsWithNumbersOfTheirOwnAreFoundBySource) {
  _tree.Mount("0:42", "/dev/sda", "/data", "btrfs");
  _tree.Mount("0:43", "/dev/mapper/vg0-data", "/lv", "btrfs");
  _tree.Mount("0:44", "/dev/disk/by-id/x", "/id", "fuse.some");
  _tree.Mount("0:45", "/dev/sda1:/dev/sdb", "/both", "bcachefs");
  _tree.Mount("0:46", "/dev/fuse", "/fuse", "fuse");
  _tree.Write("dev/sda1", "");
  _tree.Link("dev/disk/by-id/x", "../../sda1");
  EXPECT_THAT(Of("sda").Get(), ElementsAre("/data"));
  EXPECT_THAT(Of("dm-0").Get(), ElementsAre("/lv"));
  EXPECT_THAT(Of("sda1").Get(), ElementsAre("/id", "/both"));
  EXPECT_THAT(Of("sdb").Get(), ElementsAre("/both"));
}

TEST_F(MountTableTest, AMountOfNobodyKnowsWhichDiskIsOfAnyDisk) {
  for (const char* const source : {"/dev/gone", "none", "/dev/sda:/dev/gone", "/dev/../etc"}) {
    SystemTree tree;
    tree.AddScsiDisk("sda", {});
    tree.Mount("0:42", source, "/data", "btrfs");
    const SysfsReader reader(tree.Paths().sys);
    const BlockDevices devices(reader);
    const auto mounts = MountTable(tree.Paths(), devices).MountsOf(*devices.ByName("sda"));
    EXPECT_THAT(mounts.WhyUnknown(), HasSubstr("which disk is mounted at \"/data\": ")) << source;
  }
}

TEST_F(MountTableTest, SwapAreasCountAsMounts) {
  Swap("/dev/sda1 partition 1 0 -2\n/dev/dm-0\\040(deleted) partition 1 0 -3\n/swapfile file 1 0 -4\n");
  EXPECT_THAT(Of("sda1").Get(), ElementsAre("[SWAP]"));
  EXPECT_THAT(Of("dm-0").Get(), ElementsAre("[SWAP]"));
  EXPECT_THAT(Of("sdb").Get(), IsEmpty());
  Swap("/dev/gone partition 1 0 -2\n");
  EXPECT_THAT(Of("sdb").WhyUnknown(), HasSubstr("which disk is swapped to: \"/dev/gone\" leads to none"));
}

TEST_F(MountTableTest, AKernelWithoutSwappingHasNoTable) {
  _tree.Remove("proc/swaps");
  EXPECT_THAT(Of("sdb").Get(), IsEmpty());
  _tree.MakeFolder("proc/swaps");
  EXPECT_FALSE(Of("sdb").IsKnown());
}

TEST_F(MountTableTest, TheFirstProcessMayHaveMountedMore) {
  _tree.Link("proc/self/ns/mnt", "mnt:[2]");
  _tree.Mount(_tree.NumberOf("sda1"), "/dev/sda1", "/boot");
  _tree.Write("proc/1/mountinfo", "9 1 " + _tree.NumberOf("sdb") + " / /host rw - ext4 /dev/sdb rw\n");
  EXPECT_THAT(Of("sda1").Get(), ElementsAre("/boot"));
  EXPECT_THAT(Of("sdb").Get(), ElementsAre("/host"));
}

TEST_F(MountTableTest, WithoutTheViewOfTheFirstProcessNothingIsKnown) {
  EXPECT_TRUE(Of("sdb").IsKnown()) << "the same view: one table is enough";
  _tree.Remove("proc/1/ns/mnt");
  EXPECT_THAT(Of("sdb").WhyUnknown(), HasSubstr("/proc/1/mountinfo: does not exist"));
  _tree.MakeFolder("proc/1/mountinfo");
  EXPECT_THAT(Of("sdb").WhyUnknown(), HasSubstr("/proc/1/mountinfo: Is a directory"));
}

TEST_F(MountTableTest, ATableThatCannotBeReadLeavesNothingKnown) {
  _tree.Write("proc/self/mountinfo", "27 1 254:0 / / rw ext4\n");
  EXPECT_THAT(Of("sdb").WhyUnknown(), HasSubstr("mounts: line 1 is not understood"));
  _tree.Remove("proc/self/mountinfo");
  EXPECT_THAT(Of("sdb").WhyUnknown(), HasSubstr("/proc/self/mountinfo: does not exist"));
}

TEST_F(MountTableTest, ADiskWithoutANumberMayBeMounted) {
  _tree.Remove(_tree.PathOf("sdb") + "/dev");
  EXPECT_FALSE(Of("sdb").IsKnown());
}

TEST_F(MountTableTest, OfThousandsOfMountsSomeAreTold) {
  for (int i = 0; i < 50; ++i) {
    _tree.Mount(_tree.NumberOf("sdb"), "/dev/sdb", "/m" + std::to_string(i));
  }
  EXPECT_EQ(Of("sdb").Get().size(), 8U);
}

}  // namespace
}  // namespace OtxCtl::Linux
