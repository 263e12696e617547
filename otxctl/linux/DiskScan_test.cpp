#include "otxctl/linux/DiskScan.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "otxctl/linux/testing/FakeProbe.h"
#include "otxctl/linux/testing/Judged.h"
#include "otxctl/linux/testing/SystemTree.h"

namespace OtxCtl::Linux {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Pair;

class DiskScanTest : public testing::Test {
 protected:
  DiskScan Run() { return ScanDisks(_tree.Paths(), _probe); }
  std::string Verdict(const std::string& name) { return Judged(Run())[name]; }

  SystemTree _tree;
  FakeProbe _probe;
};

TEST_F(DiskScanTest, ADiskOfWhichAllIsKnownAndNothingSpeaksAgainstIsFree) {
  _tree.AddScsiDisk("sdb", {.worldWideName = "naa.2", .model = "HDD 4G", .serial = "S2"});
  _tree.AddScsiDisk("sdaa", {.serial = "S 3"});
  _tree.AddNvmeDisk("nvme0n1", {.worldWideName = "eui.1", .serial = "N1", .isFlash = true});
  const DiskScan scan = Run();
  EXPECT_THAT(Judged(scan), ElementsAre(Pair("nvme0n1", "free"), Pair("sdaa", "free"), Pair("sdb", "free")));
  EXPECT_THAT(_probe.probed, ElementsAre("nvme0n1 8:2", "sdb 8:0", "sdaa 8:1"));
  EXPECT_THAT(scan.leftOut, IsEmpty());
  EXPECT_EQ(scan.whyIncomplete, "");
  ASSERT_EQ(scan.disks.size(), 3U);
  const ScannedDisk& disk = scan.disks[1];
  EXPECT_EQ(disk.facts.kernelName, "sdb");
  EXPECT_EQ(disk.facts.canonicalName, "naa.2");
  EXPECT_EQ(disk.displayName, "LAB HDD 4G (sdb)");
  EXPECT_EQ(disk.deviceNode, _tree.Paths().dev + "/sdb");
  EXPECT_EQ(disk.deviceNumber, "8:0");
  EXPECT_EQ(disk.blockSize, 512);
  EXPECT_TRUE(disk.hasStableName);
  EXPECT_TRUE(disk.facts.isFlash.Is(false));
  EXPECT_EQ(scan.disks[2].facts.canonicalName, "t10.LAB_HDD_S_3");
  EXPECT_TRUE(scan.disks[0].facts.isFlash.Is(true));
}

TEST_F(DiskScanTest, EveryAttributeOfADiskIsNeededOrSpeaksAgainstIt) {
  using Row = std::tuple<const char*, const char*, const char*>;
  const std::vector<Row> rows = {
      {"/ro", "1\n", "read-only"},
      {"/ro", nullptr, "nobody knows: "},
      {"/removable", "1\n", "removable"},
      {"/removable", nullptr, "nobody knows: "},
      {"/size", nullptr, "nobody knows: "},
      {"/size", "-1\n", "nobody knows: "},
      {"/queue/rotational", nullptr, "nobody knows: "},
      {"/queue/logical_block_size", nullptr, "nobody knows: "},
      {"/queue/zoned", "host-managed\n", "zoned: host-managed"},
      {"/holders", nullptr, "nobody knows: "},
      {"/device/state", "offline\n", "not running: offline"},
      {"/device/state", nullptr, "nobody knows: "},
      {"/device/vpd_pg80", "\n", "nobody knows: "},
      {"/device/subsystem", nullptr, "nobody knows: it has neither"},
  };
  for (const auto& [name, text, words] : rows) {
    SystemTree tree;
    const std::string path = tree.AddScsiDisk("sda", {.serial = "S1"});
    EXPECT_EQ(Judged(ScanDisks(tree.Paths(), _probe))["sda"], "free");
    if (text == nullptr) {
      tree.Remove(path + name);
    } else {
      tree.Write(path + name, text);
    }
    EXPECT_THAT(Judged(ScanDisks(tree.Paths(), _probe))["sda"], HasSubstr(words)) << name;
  }
}

TEST_F(DiskScanTest, WhatTheProbeFindsSpeaksAgainstADisk) {
  _tree.AddScsiDisk("sda", {.serial = "S1"});
  ProbeResult& result = _probe.results.emplace("sda", EmptyDisk()).first->second;
  result.signatures = std::vector<std::string>{"ext4 file system \"DATA\"", "LVM physical volume"};
  EXPECT_EQ(Verdict("sda"), "ext4 file system \"DATA\", LVM physical volume");
  result = EmptyDisk();
  result.partitionTable = std::string("gpt");
  EXPECT_EQ(Verdict("sda"), "gpt partition table");
  result = EmptyDisk();
  result.isBusy = true;
  EXPECT_EQ(Verdict("sda"), "held by another program");
  result = ProbeResult();
  EXPECT_EQ(Verdict("sda"), "nobody knows: nobody has looked");
}

TEST_F(DiskScanTest, PartitionsMountsAndHoldersAreTold) {
  _tree.AddScsiDisk("sda", {.serial = "S1"});
  _tree.AddPartition("sda", "sda1");
  _tree.AddPartition("sda", "sda2");
  _tree.AddMapping("dm-0", "vg0-root", "LVM-abc", {"sda2"});
  _tree.AddScsiDisk("sdb", {.serial = "S2"});
  _tree.AddMapping("dm-1", "luks-home", "CRYPT-LUKS2-abc", {"sdb"});
  _tree.AddMapping("dm-2", "vg1-home", "LVM-def", {"dm-1"});
  _tree.AddScsiDisk("sdc", {.serial = "S3"});
  _tree.Mount(_tree.NumberOf("sda1"), "/dev/sda1", "/boot");
  _tree.Mount(_tree.NumberOf("dm-0"), "/dev/mapper/vg0-root", "/");
  _tree.Mount(_tree.NumberOf("dm-2"), "/dev/mapper/vg1-home", "/home");
  _tree.Mount(_tree.NumberOf("sdc"), "/dev/sdc", "/data");
  for (const char* const name : {"sda", "sdb", "sdc"}) {
    _probe.results[name] = EmptyDisk();
    _probe.results[name].isBusy = true;
  }
  _probe.results["sda"].partitionTable = std::string("dos");
  const auto judged = Judged(Run());
  EXPECT_THAT(judged,
              ElementsAre(Pair("sda",
                               "dos partition table with 2 partitions, mounted at /boot (sda1), mounted at / "
                               "(vg0-root)"),
                          Pair("sdb", "mounted at /home (vg1-home), held by luks-home (encryption)"),
                          Pair("sdc", "mounted at /data")));
}

TEST_F(DiskScanTest, TablesThatCannotBeReadLeaveNoDiskFree) {
  _tree.AddScsiDisk("sda", {.serial = "S1"});
  _tree.Write("proc/self/mountinfo", "what\n");
  EXPECT_THAT(Verdict("sda"), HasSubstr("nobody knows: mounts: line 1 is not understood"));
}

TEST_F(DiskScanTest, WhatIsNoDiskIsLeftOutWithTheReason) {
  const std::string optical = _tree.AddScsiDisk("sr0", {});
  _tree.AddVirtual("loop0", 512);
  _tree.AddMapping("dm-0", "vg0-data", "LVM-abc", {});
  const std::string reader = _tree.AddScsiDisk("sda", {});
  _tree.Write(reader + "/size", "0\n");
  _tree.Write(_tree.AddVirtioDisk("vda", {}) + "/hidden", "1\n");
  _tree.AddScsiDisk("sdb", {});
  _tree.AddPartition("sdb", "sdb1");
  _tree.Remove("sys/class/block/sdb");
  _tree.Link("sys/class/block/sdc", "nowhere");
  const DiskScan scan = Run();
  EXPECT_THAT(scan.disks, IsEmpty());
  EXPECT_THAT(WhyLeftOut(scan),
              ElementsAre(Pair("dm-0", "a mapped device: vg0-data (LVM)"), Pair("loop0", "a loop device"),
                          Pair("sda", "without a medium"), Pair("sdb1", "a partition of no disk"),
                          Pair("sdc", HasSubstr("nobody knows: ")), Pair("sr0", "an optical drive"),
                          Pair("vda", "hidden")));
  EXPECT_THAT(_probe.probed, IsEmpty());
}

TEST_F(DiskScanTest, AMachineThatCannotBeLookedAtHasNotNoDisks) {
  _tree.Remove("sys/class");
  EXPECT_THAT(Run().whyIncomplete, HasSubstr("/sys/class/block: does not exist"));
}

TEST_F(DiskScanTest, ADiskThatLeavesMeanwhileIsLeftOut) {
  for (const char* const name : {"sda", "sdb", "sdc", "sdd", "sde"}) {
    _tree.AddScsiDisk(name, {.serial = std::string("S-") + name});
  }
  _probe.results["sda"].isGone = true;
  _probe.results["sdb"].hasNoMedium = true;
  _probe.whileProbing = [&](const std::string& name) {
    if (name == "sdc") {
      _tree.Remove("sys/class/block/sdc");
    } else if (name == "sdd") {
      _tree.Write(_tree.PathOf("sdd") + "/diskseq", "99\n");
    }
  };
  const DiskScan scan = Run();
  EXPECT_THAT(Judged(scan), ElementsAre(Pair("sde", "free")));
  EXPECT_THAT(WhyLeftOut(scan),
              ElementsAre(Pair("sda", "went away"), Pair("sdb", "without a medium"), Pair("sdc", "went away"),
                          Pair("sdd", "another device has taken its name")));
}

TEST_F(DiskScanTest, WhatIsMountedMeanwhileIsSeen) {
  _tree.AddScsiDisk("sda", {.serial = "S1"});
  _probe.whileProbing = [&](const std::string&) { _tree.Mount(_tree.NumberOf("sda"), "/dev/sda", "/new"); };
  EXPECT_EQ(Verdict("sda"), "mounted at /new");
}

TEST_F(DiskScanTest, ADiskThatDoesNotRunIsNotRead) {
  const std::string path = _tree.AddScsiDisk("sda", {.serial = "S1"});
  _tree.Write(path + "/device/state", "blocked\n");
  EXPECT_THAT(Verdict("sda"),
              HasSubstr("nobody knows: what stands on sda, which is not running and not read"));
  EXPECT_THAT(_probe.probed, IsEmpty());
}

TEST_F(DiskScanTest, APartitionThatCannotBeReadIsCountedNowhere) {
  _tree.AddScsiDisk("sda", {.serial = "S1"});
  _tree.Link("sys/class/block/sda1", "nowhere");
  EXPECT_THAT(Verdict("sda"), HasSubstr("nobody knows: how many partitions sda has: not all could be read"));
}

TEST_F(DiskScanTest, DevicesThatStandOnThemselvesComeToAnEnd) {
  _tree.AddScsiDisk("sda", {.serial = "S1"});
  _tree.AddMapping("dm-0", "a", "LVM-a", {"sda"});
  _tree.AddMapping("dm-1", "b", "LVM-b", {"dm-0"});
  _tree.AddHolder("dm-1", "dm-0");
  _tree.AddHolder("sda", "sda");
  _tree.AddHolder("sda", "gone\n\x1B");
  EXPECT_EQ(Verdict("sda"), "held by a (LVM), held by gone, held by sda");
}

TEST_F(DiskScanTest, OfManyHoldersSomeAreTold) {
  _tree.AddScsiDisk("sda", {.serial = "S1"});
  for (int i = 0; i < 20; ++i) {
    const std::string number = std::to_string(i);
    _tree.AddMapping("dm-" + number, "v" + number, "LVM-" + number, {"sda"});
  }
  EXPECT_THAT(Verdict("sda"), HasSubstr("held by 12 more"));
}

TEST_F(DiskScanTest, NamesAreUniqueAndSaidToBeStableOnlyIfTheyAre) {
  _tree.AddScsiDisk("sda", {.worldWideName = "naa.1", .serial = "S1"});
  _tree.AddScsiDisk("sdb", {.worldWideName = "naa.1", .serial = "S1"});
  _tree.AddScsiDisk("sdc", {});
  const DiskScan scan = Run();
  ASSERT_EQ(scan.disks.size(), 3U);
  EXPECT_EQ(scan.disks[0].facts.canonicalName, "naa.1");
  EXPECT_EQ(scan.disks[1].facts.canonicalName, "naa.1.2");
  EXPECT_EQ(scan.disks[2].facts.canonicalName, "path.pci-0000:00:05.0-scsi-0:0:2:0");
  for (const ScannedDisk& told : scan.disks) {
    EXPECT_FALSE(told.hasStableName) << told.facts.kernelName;
  }
  EXPECT_THAT(Judged(scan)["sda"], HasSubstr("same disk as naa.1.2 (sdb)"));
}

TEST_F(DiskScanTest, ADiskInAFolderOfItsOwnHasItsNodeThere) {
  _tree.AddScsiDisk("cciss!c0d0", {.serial = "S1"});
  EXPECT_EQ(Run().disks.at(0).deviceNode, _tree.Paths().dev + "/cciss/c0d0");
}

}  // namespace
}  // namespace OtxCtl::Linux
