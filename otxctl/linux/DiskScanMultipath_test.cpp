#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "otxctl/linux/DiskScan.h"
#include "otxctl/linux/testing/FakeProbe.h"
#include "otxctl/linux/testing/Judged.h"
#include "otxctl/linux/testing/SystemTree.h"

namespace OtxCtl::Linux {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::Pair;

class DiskScanMultipath : public testing::Test {
 protected:
  // Two paths to one disk, joined.
  DiskScanMultipath() {
    _sda = _tree.AddScsiDisk("sda", sameDisk);
    _sdb = _tree.AddScsiDisk("sdb", sameDisk);
    _map = _tree.AddMapping("dm-0", "mpatha", "mpath-3600", {"sda", "sdb"});
    for (const char* const name : {"sda", "sdb"}) {
      _probe.results[name] = EmptyDisk();
      _probe.results[name].isBusy = true;
    }
  }

  DiskScan Run() { return ScanDisks(_tree.Paths(), _probe); }
  std::map<std::string, std::string> Verdicts() { return Judged(Run()); }

  static inline const TestDisk sameDisk = {.worldWideName = "naa.1", .serial = "S1"};
  SystemTree _tree;
  FakeProbe _probe;
  std::string _sda;
  std::string _sdb;
  std::string _map;
};

TEST_F(DiskScanMultipath, TheMapIsTheDiskAndItsPathsLeadToIt) {
  const DiskScan scan = Run();
  EXPECT_THAT(Judged(scan),
              ElementsAre(Pair("mpatha", "free"), Pair("sda", "a path of the multipath device mpatha"),
                          Pair("sdb", "a path of the multipath device mpatha")));
  EXPECT_THAT(_probe.probed, ElementsAre("dm-0 8:2")) << "paths are not read";
  ASSERT_EQ(scan.disks.size(), 3U);
  const auto map = std::find_if(scan.disks.begin(), scan.disks.end(),
                                [](const ScannedDisk& disk) { return disk.facts.kernelName == "mpatha"; });
  EXPECT_EQ(map->facts.canonicalName, "naa.1");
  EXPECT_TRUE(map->hasStableName);
  EXPECT_EQ(map->displayName, "LAB HDD (mpatha)");
  EXPECT_EQ(map->deviceNode, _tree.Paths().dev + "/dm-0");
  EXPECT_EQ(map->deviceNumber, "8:2");
}

TEST_F(DiskScanMultipath, WhatStandsOnTheMapIsItsOwn) {
  _tree.AddMapping("dm-1", "vg0-data", "LVM-abc", {"dm-0"});
  _tree.Mount(_tree.NumberOf("dm-1"), "/dev/mapper/vg0-data", "/data");
  _probe.results["dm-0"] = EmptyDisk();
  _probe.results["dm-0"].signatures = std::vector<std::string>{"LVM physical volume"};
  _probe.results["dm-0"].isBusy = true;
  const auto verdicts = Verdicts();
  EXPECT_EQ(verdicts.at("mpatha"),
            "LVM physical volume, mounted at /data (vg0-data), held by vg0-data (LVM)");
  EXPECT_EQ(verdicts.at("sda"),
            "LVM physical volume, mounted at /data (vg0-data), a path of the multipath device mpatha");
}

TEST_F(DiskScanMultipath, PartitionsOfTheMapAreMappedToo) {
  _tree.AddMapping("dm-1", "mpatha-part1", "part1-mpath-3600", {"dm-0"});
  EXPECT_EQ(Verdicts().at("mpatha"), "1 partition");
}

TEST_F(DiskScanMultipath, ForeignHoldersOfAPathAreTold) {
  _tree.AddMapping("dm-1", "vg0-data", "LVM-abc", {"sda"});
  EXPECT_THAT(Verdicts().at("sda"), HasSubstr("held by vg0-data (LVM)"));
}

TEST_F(DiskScanMultipath, WhoUsesAPathUsesTheDiskBehindTheMap) {
  _tree.AddMapping("dm-1", "vault", "CRYPT-PLAIN-vault", {"sdb"});
  EXPECT_EQ(Verdicts().at("mpatha"), "held by vault (encryption)");
}

TEST_F(DiskScanMultipath, PartitionsOfAPathAreOnTheDiskBehindTheMap) {
  _tree.AddMapping("dm-1", "sdb-part1", "part1-sdb", {"sdb"});
  EXPECT_EQ(Verdicts().at("mpatha"), "1 partition");
}

TEST_F(DiskScanMultipath, TheMapIsOnlyAsGoodAsItsPaths) {
  _tree.Write(_sdb + "/ro", "1\n");
  EXPECT_EQ(Verdicts().at("mpatha"), "read-only");
  _tree.Write(_sdb + "/ro", "0\n");
  _tree.Remove(_sdb + "/removable");
  EXPECT_THAT(Verdicts().at("mpatha"), HasSubstr("nobody knows: "));
  _tree.Write(_sdb + "/removable", "0\n");
  _tree.MakeFolder("sys/devices/pci0000:00/0000:00:05.0/virtio0/host0/fc_host");
  EXPECT_EQ(Verdicts().at("mpatha"), "not local: fc");
}

TEST_F(DiskScanMultipath, PathsToDifferentDisksMakeNobodyKnowWhichItIs) {
  _tree.Write(_sdb + "/device/wwid", "naa.2\n");
  EXPECT_THAT(Verdicts().at("mpatha"),
              HasSubstr("nobody knows: which disk dm-0 is: its paths lead to different ones"));
}

TEST_F(DiskScanMultipath, OnePathThatRunsIsEnough) {
  _tree.Write(_sda + "/device/state", "offline\n");
  EXPECT_EQ(Verdicts().at("mpatha"), "free");
  _tree.Write(_sdb + "/device/state", "offline\n");
  _probe.probed.clear();
  EXPECT_THAT(Verdicts().at("mpatha"), HasSubstr("not running: offline"));
  EXPECT_TRUE(_probe.probed.empty()) << "who reads from it may wait for ever";
}

TEST_F(DiskScanMultipath, ASuspendedMapIsNotRead) {
  _tree.Write(_map + "/dm/suspended", "1\n");
  EXPECT_THAT(Verdicts().at("mpatha"), HasSubstr("not running: suspended"));
  EXPECT_TRUE(_probe.probed.empty());
}

TEST_F(DiskScanMultipath, AMapWithoutPathsIsNotFree) {
  for (const char* const name : {"/slaves/sda", "/slaves/sdb"}) {
    _tree.Remove(_map + name);
  }
  EXPECT_THAT(Verdicts().at("mpatha"), HasSubstr("nobody knows: dm-0 has no path"));
}

TEST_F(DiskScanMultipath, AMapOnSomethingElseThanDisksIsNotFree) {
  _tree.AddPartition("sda", "sda1");
  _tree.Link(_map + "/slaves/sda1", "x");
  EXPECT_THAT(Verdicts().at("mpatha"), HasSubstr("one of its paths is no disk"));
}

TEST_F(DiskScanMultipath, AMapWithTheNameOfADiskDoesNotHideIt) {
  _tree.AddScsiDisk("sdz", sameDisk);
  _tree.Write(_map + "/dm/name", "sdz\n");
  const auto verdicts = Verdicts();
  EXPECT_THAT(verdicts.at("dm-0"), HasSubstr("same disk as "));
  EXPECT_THAT(verdicts.at("sdz"), HasSubstr("same disk as "));
  EXPECT_THAT(verdicts.at("sda"), HasSubstr("a path of the multipath device dm-0"));
}

TEST_F(DiskScanMultipath, AThirdPathThatWasNotJoinedIsToldToBeTheSameDisk) {
  _tree.AddScsiDisk("sdc", sameDisk);
  const auto verdicts = Verdicts();
  EXPECT_THAT(verdicts.at("sdc"), HasSubstr("same disk as "));
  EXPECT_THAT(verdicts.at("mpatha"), HasSubstr("same disk as "));
}

}  // namespace
}  // namespace OtxCtl::Linux
