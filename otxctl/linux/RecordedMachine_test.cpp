// What is made of machines as their kernels told of them, rather than of trees that tests made up.

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
using testing::IsEmpty;
using testing::Pair;
using testing::StartsWith;

// Verdicts by canonical name: the kernel's own names differ from boot to boot.
std::map<std::string, std::string> VerdictsOf(const DiskScan& scan) {
  const std::map<std::string, std::string> judged = Judged(scan);
  std::map<std::string, std::string> verdicts;
  for (const ScannedDisk& disk : scan.disks) {
    verdicts[disk.facts.canonicalName] = judged.at(disk.facts.kernelName);
  }
  return verdicts;
}

class RecordedMachine : public testing::Test {
 protected:
  DiskScan Scan(const std::string& recording) {
    _tree.Load(std::string(KOVA_RECORDED_TREES "/") + recording);
    return ScanDisks(_tree.Paths(), _probe);
  }

  SystemTree _tree;
  FakeProbe _probe;  // finds nothing: what is in use must be known without it
};

TEST_F(RecordedMachine, OffersWhatNobodyUsesAndNothingElse) {
  const DiskScan scan = Scan("lab.tree");
  EXPECT_THAT(scan.leftOut, IsEmpty());
  const auto two = HasSubstr("two paths");
  EXPECT_THAT(
      VerdictsOf(scan),
      ElementsAre(Pair("naa.5000c50000000100", "free"), Pair("naa.5000c50000000101", "free"),
                  Pair("naa.5000c50000000200", "free"), Pair("naa.5000c50000000201", "free"),
                  Pair("naa.5000c50000000202", "free"), Pair("naa.5000c50000000203", "free"),
                  Pair("naa.5000c50000000204", "free"), Pair("naa.5000c50000000205", "free"),
                  Pair("naa.5000c50000000300", "1 partition"), Pair("naa.5000c50000000400", "free"),
                  Pair("naa.5000c50000000600", two), Pair("naa.5000c50000000600.2", two),
                  Pair(StartsWith("nvme."), "free"),
                  Pair("t10.QEMU_QEMU_HARDDISK_USBSTICK0001", StartsWith("attached by USB, hot-plug"))));
}

TEST_F(RecordedMachine, TellsKindsAndPlacesOfItsDisks) {
  const DiskScan scan = Scan("lab.tree");
  for (const ScannedDisk& disk : scan.disks) {
    const std::string& name = disk.facts.canonicalName;
    const bool isFlash = name.compare(0, 18, "naa.5000c500000001") == 0 || name.compare(0, 5, "nvme.") == 0;
    EXPECT_TRUE(disk.facts.isFlash.Is(isFlash)) << name;
    EXPECT_EQ(disk.blockSize, 512) << name;
    const bool isOneOfTwo = name.find("5000c50000000600") != std::string::npos;
    EXPECT_EQ(disk.hasStableName, name.compare(0, 5, "path.") != 0 && !isOneOfTwo) << name;
    if (name.compare(0, 4, "naa.") == 0) {
      EXPECT_EQ(disk.facts.identity.Get().vendor, "LAB") << name;
      EXPECT_NE(disk.facts.identity.Get().serial, "") << name;
      EXPECT_TRUE(disk.facts.state.Is("running")) << name;
    }
  }
}

TEST_F(RecordedMachine, KnowsWhoUsesItsDisks) {
  const DiskScan scan = Scan("lab-used.tree");
  const auto verdicts = VerdictsOf(scan);
  EXPECT_THAT(verdicts.at("naa.5000c50000000100"), HasSubstr("mounted at /mnt/data (lab-data0)"));
  EXPECT_THAT(verdicts.at("naa.5000c50000000100"), HasSubstr("held by lab-cache1_cvol (LVM)"));
  EXPECT_EQ(verdicts.at("naa.5000c50000000200"),
            "mounted at /mnt/data (lab-data0), held by lab-data0_corig (LVM)");
  EXPECT_EQ(verdicts.at("naa.5000c50000000201"), "held by lab-data1_corig (LVM)");
  EXPECT_EQ(verdicts.at("naa.5000c50000000202"), "mounted at /mnt/a b");
  EXPECT_EQ(verdicts.at("naa.5000c50000000203"), "held by md0 (RAID)");
  EXPECT_EQ(verdicts.at("naa.5000c50000000204"), "held by md0 (RAID)");
  EXPECT_THAT(verdicts.at("naa.5000c50000000300"), StartsWith("1 partition, mounted at /mnt/part ("));
  EXPECT_EQ(verdicts.at("naa.5000c50000000400"), "mounted at [SWAP]");
  for (const char* const name : {"naa.5000c50000000101", "naa.5000c50000000205"}) {
    EXPECT_EQ(verdicts.at(name), "free") << name;
  }
  const auto whys = WhyLeftOut(scan);
  EXPECT_EQ(whys.at("md0"), "a RAID array");
  EXPECT_EQ(whys.at("loop0"), "a loop device");
  EXPECT_THAT(whys.at("dm-0"), StartsWith("a mapped device: lab-"));
}

TEST_F(RecordedMachine, IsWithoutTheDiskThatWasPulledOut) {
  const auto verdicts = VerdictsOf(Scan("lab-missing.tree"));
  EXPECT_EQ(verdicts.count("naa.5000c50000000201"), 0U);
  EXPECT_EQ(verdicts.size(), 13U);
}

}  // namespace
}  // namespace OtxCtl::Linux
