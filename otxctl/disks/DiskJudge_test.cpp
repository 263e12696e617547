#include "otxctl/disks/DiskJudge.h"

#include <gtest/gtest.h>

#include <functional>
#include <random>
#include <string>
#include <vector>

namespace OtxCtl::Disks {
namespace {

using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskState;

constexpr std::int64_t gibibyte = std::int64_t{1} << 30;
constexpr DiskLimits limits{gibibyte};

// About which everything is known, and nothing speaks against it.
DiskFacts FreeDisk(const std::string& name = "naa.1", const std::string& serial = "S1") {
  DiskFacts disk;
  disk.kernelName = "sd-" + name;
  disk.canonicalName = name;
  disk.identity = DiskIdentity{name, "LAB", "HDD", serial};
  disk.bytes = 4 * gibibyte;
  disk.isFlash = false;
  disk.connection = Connection{Attachment::Machine, "sas"};
  disk.isReadOnly = false;
  disk.isRemovable = false;
  disk.isHotPlug = false;
  disk.state = std::string("running");
  disk.zones = std::string("none");
  disk.signatures = std::vector<std::string>();
  disk.partitionTable = std::string();
  disk.partitions = 0;
  disk.mounts = std::vector<std::string>();
  disk.holders = std::vector<std::string>();
  disk.multipathMap = std::string();
  return disk;
}

DiskVerdict JudgeOne(const DiskFacts& disk) {
  return JudgeDisks({disk}, limits).at(0);
}

using Change = std::function<void(DiskFacts&)>;

struct Row {
  Change change;
  DiskReason reason;
  const char* detail;
};

// Every trace of use and every unfitness, one at a time.
std::vector<Row> Against() {
  using Texts = std::vector<std::string>;
  constexpr auto notOurs = DiskReason::HasPartitions;
  constexpr auto unfit = DiskReason::HasForeignPartitions;
  return {
      {[](DiskFacts& disk) {
         disk.connection = Connection{Attachment::Remote, "iscsi"};
       },
       DiskReason::NonLocal, "not local: iscsi"},
      {[](DiskFacts& disk) {
         disk.connection = Connection{Attachment::Remote, ""};
       },
       DiskReason::NonLocal, "not local"},
      {[](DiskFacts& disk) { disk.partitionTable = std::string("gpt"); }, notOurs, "gpt partition table"},
      {[](DiskFacts& disk) { disk.partitions = 1; }, notOurs, "1 partition"},
      {[](DiskFacts& disk) { disk.signatures = Texts{"ext4 file system"}; }, notOurs, "ext4 file system"},
      {[](DiskFacts& disk) { disk.mounts = Texts{"/data"}; }, notOurs, "mounted at /data"},
      {[](DiskFacts& disk) { disk.holders = Texts{"another program"}; }, notOurs, "held by another program"},
      {[](DiskFacts& disk) { disk.multipathMap = std::string("mpatha"); }, notOurs,
       "a path of the multipath device mpatha"},
      {[](DiskFacts& disk) {
         disk.connection = Connection{Attachment::Usb, "usb"};
       },
       DiskReason::Usb, "attached by USB"},
      {[](DiskFacts& disk) {
         disk.connection = Connection{Attachment::FireWire, "sbp"};
       },
       unfit, "attached by FireWire"},
      {[](DiskFacts& disk) {
         disk.connection = Connection{Attachment::MemoryCard, ""};
       },
       unfit, "an SD or MMC device"},
      {[](DiskFacts& disk) {
         disk.connection = Connection{Attachment::Virtual, ""};
       },
       unfit, "a virtual device"},
      {[](DiskFacts& disk) { disk.isReadOnly = true; }, unfit, "read-only"},
      {[](DiskFacts& disk) { disk.isRemovable = true; }, unfit, "removable"},
      {[](DiskFacts& disk) { disk.isHotPlug = true; }, unfit, "hot-plug"},
      {[](DiskFacts& disk) { disk.state = std::string("offline"); }, unfit, "not running: offline"},
      {[](DiskFacts& disk) { disk.zones = std::string("host-managed"); }, unfit, "zoned: host-managed"},
      {[](DiskFacts& disk) {
         disk.identity = DiskIdentity{"", "LAB", "HDD", ""};
       },
       unfit, "nobody knows: it has neither a world wide name nor a serial number to be told by"},
      {[](DiskFacts& disk) { disk.bytes = gibibyte - 1; }, DiskReason::TooSmall,
       "1073741823 bytes, smaller than 1 GiB"},
      {[](DiskFacts& disk) { disk.bytes = 64 << 20; }, DiskReason::TooSmall, "64 MiB, smaller than 1 GiB"},
      {[](DiskFacts& disk) { disk.bytes = 0; }, DiskReason::TooSmall, "without a medium"},
  };
}

// What anybody's use of a disk may leave behind, besides what it has already.
std::vector<Change> Traces() {
  using Texts = std::vector<std::string>;
  return {
      [](DiskFacts& disk) { disk.mounts = Texts{"/"}; },
      [](DiskFacts& disk) { disk.holders = Texts{"dm-0"}; },
      [](DiskFacts& disk) { disk.signatures = Texts{"swap space"}; },
      [](DiskFacts& disk) { disk.partitionTable = std::string("gpt"); },
      [](DiskFacts& disk) { disk.partitions = 3; },
      [](DiskFacts& disk) { disk.multipathMap = std::string("mpatha"); },
  };
}

// Every fact becomes unknown, one at a time.
std::vector<Change> Forgetting() {
  return {
      [](DiskFacts& disk) { disk.identity = Fact<DiskIdentity>::Unknown("why"); },
      [](DiskFacts& disk) { disk.bytes = Fact<std::int64_t>::Unknown("why"); },
      [](DiskFacts& disk) { disk.isFlash = Fact<bool>::Unknown("why"); },
      [](DiskFacts& disk) { disk.connection = Fact<Connection>::Unknown("why"); },
      [](DiskFacts& disk) { disk.isReadOnly = Fact<bool>::Unknown("why"); },
      [](DiskFacts& disk) { disk.isRemovable = Fact<bool>::Unknown("why"); },
      [](DiskFacts& disk) { disk.isHotPlug = Fact<bool>::Unknown("why"); },
      [](DiskFacts& disk) { disk.state = Fact<std::string>::Unknown("why"); },
      [](DiskFacts& disk) { disk.zones = Fact<std::string>::Unknown("why"); },
      [](DiskFacts& disk) { disk.signatures = Fact<std::vector<std::string>>::Unknown("why"); },
      [](DiskFacts& disk) { disk.partitionTable = Fact<std::string>::Unknown("why"); },
      [](DiskFacts& disk) { disk.partitions = Fact<std::int32_t>::Unknown("why"); },
      [](DiskFacts& disk) { disk.mounts = Fact<std::vector<std::string>>::Unknown("why"); },
      [](DiskFacts& disk) { disk.holders = Fact<std::vector<std::string>>::Unknown("why"); },
      [](DiskFacts& disk) { disk.multipathMap = Fact<std::string>::Unknown("why"); },
  };
}

TEST(DiskJudge, ADiskIsFreeWhenAllIsKnownAndNothingSpeaksAgainstIt) {
  EXPECT_EQ(JudgeOne(FreeDisk()), (DiskVerdict{DiskState::Eligible, DiskReason::None, ""}));
}

TEST(DiskJudge, WhatNothingIsKnownAboutIsNotFree) {
  EXPECT_EQ(JudgeOne(DiskFacts()), (DiskVerdict{DiskState::Ineligible, DiskReason::HasForeignPartitions,
                                                "nobody knows: nobody has looked"}));
}

TEST(DiskJudge, EachFindingHasItsReasonAndItsWords) {
  for (const Row& row : Against()) {
    DiskFacts disk = FreeDisk();
    row.change(disk);
    EXPECT_EQ(JudgeOne(disk), (DiskVerdict{DiskState::Ineligible, row.reason, row.detail}));
  }
}

TEST(DiskJudge, WhatThereIsNoneOfDoesNotSpeakAgainstADisk) {
  for (const Change& change :
       {Change([](DiskFacts& disk) { disk.state = std::string(); }),
        Change([](DiskFacts& disk) { disk.state = std::string("live"); }),
        Change([](DiskFacts& disk) { disk.zones = std::string(); }),
        Change([](DiskFacts& disk) { disk.isFlash = true; }),
        Change([](DiskFacts& disk) { disk.bytes = gibibyte; }), Change([](DiskFacts& disk) {
          disk.identity = DiskIdentity{"", "", "", "S1"};
        }),
        Change([](DiskFacts& disk) {
          disk.identity = DiskIdentity{"naa.1", "", "", ""};
        })}) {
    DiskFacts disk = FreeDisk();
    change(disk);
    EXPECT_EQ(JudgeOne(disk).state, DiskState::Eligible) << JudgeOne(disk).detail;
  }
}

TEST(DiskJudge, EachUnknownFactKeepsADiskFromBeingOfferedAndSaysWhy) {
  for (const Change& forget : Forgetting()) {
    DiskFacts disk = FreeDisk();
    forget(disk);
    EXPECT_EQ(JudgeOne(disk),
              (DiskVerdict{DiskState::Ineligible, DiskReason::HasForeignPartitions, "nobody knows: why"}));
  }
}

TEST(DiskJudge, TellsAllThatWasFoundAndTheReasonOfTheLowestNumber) {
  DiskFacts disk = FreeDisk();
  disk.bytes = 64 << 20;
  disk.connection = Connection{Attachment::Usb, "usb"};
  disk.isRemovable = true;
  disk.signatures = std::vector<std::string>{"ext4 file system"};
  disk.mounts = std::vector<std::string>{"/data", "/srv"};
  disk.partitionTable = std::string("dos");
  disk.partitions = 2;
  EXPECT_EQ(JudgeOne(disk), (DiskVerdict{DiskState::Ineligible, DiskReason::HasPartitions,
                                         "dos partition table with 2 partitions, ext4 file system, mounted "
                                         "at /data, mounted at /srv, attached by USB, removable, 64 MiB, "
                                         "smaller than 1 GiB"}));
}

TEST(DiskJudge, AMemberIsWhatItsGroupIs) {
  DiskFacts disk = FreeDisk();
  disk.signatures = std::vector<std::string>{"LVM physical volume"};
  disk.group = "52e7b2b4";
  disk.membership = Membership::Mounted;
  EXPECT_EQ(JudgeOne(disk), (DiskVerdict{DiskState::InUse, DiskReason::None, ""}));
  disk.membership = Membership::Unmounted;
  EXPECT_EQ(JudgeOne(disk), (DiskVerdict{DiskState::Ineligible, DiskReason::GroupNotMounted,
                                         "member of disk group 52e7b2b4, which is not mounted"}));
}

TEST(DiskJudge, OfOneDiskByTwoPathsNeitherIsOfferedAndEachNamesTheOther) {
  DiskFacts first = FreeDisk();
  DiskFacts second = FreeDisk();
  second.canonicalName = "naa.1.2";
  second.kernelName = "sdb";
  const std::vector<DiskVerdict> verdicts = JudgeDisks({first, second, FreeDisk("naa.3", "S3")}, limits);
  EXPECT_EQ(verdicts[0], (DiskVerdict{DiskState::Ineligible, DiskReason::HasForeignPartitions,
                                      "same disk as naa.1.2 (sdb): two paths"}));
  EXPECT_EQ(verdicts[1], (DiskVerdict{DiskState::Ineligible, DiskReason::HasForeignPartitions,
                                      "same disk as naa.1 (sd-naa.1): two paths"}));
  EXPECT_EQ(verdicts[2].state, DiskState::Eligible);
}

TEST(DiskJudge, WhereANameIsMissingModelAndSerialNumberTellTheDisk) {
  const auto eligible = [](const DiskIdentity& one, const DiskIdentity& other) {
    DiskFacts first = FreeDisk("a");
    first.identity = one;
    DiskFacts second = FreeDisk("b");
    second.identity = other;
    const std::vector<DiskVerdict> verdicts = JudgeDisks({first, second}, limits);
    EXPECT_EQ(verdicts[0].state, verdicts[1].state);
    return verdicts[0].state == DiskState::Eligible;
  };
  EXPECT_FALSE(eligible({"", "", "HDD", "S1"}, {"", "LAB", "HDD", "S1"}));
  EXPECT_FALSE(eligible({"naa.1", "", "HDD", "S1"}, {"", "", "HDD", "S1"}));
  EXPECT_TRUE(eligible({"", "", "HDD", "S1"}, {"", "", "SSD", "S1"}));
  EXPECT_FALSE(eligible({"", "", "HDD", "S1"}, {"", "", "", "S1"})) << "a model that is not told may be it";
  EXPECT_FALSE(eligible({"naa.1", "", "HDD", "S1"}, {"", "", "", "S1"}));
  EXPECT_FALSE(eligible({"naa.1", "", "", "S1"}, {"", "", "HDD", "S1"}));
  EXPECT_TRUE(eligible({"naa.1", "", "HDD", "S1"}, {"naa.2", "", "", "S1"}));
  EXPECT_TRUE(eligible({"", "", "HDD", "S1"}, {"", "", "", "S2"}));
  EXPECT_TRUE(eligible({"", "", "HDD", "S1"}, {"", "", "HDD", "S2"}));
  // Two namespaces of one controller have its serial number.
  EXPECT_TRUE(eligible({"eui.1", "", "HDD", "S1"}, {"eui.2", "", "HDD", "S1"}));
}

TEST(DiskJudge, PathsOfAMultipathDeviceAreNotOfferedAndItIs) {
  DiskFacts path = FreeDisk();
  path.multipathMap = std::string("mpatha");
  DiskFacts map = FreeDisk();
  map.kernelName = "mpatha";
  const std::vector<DiskVerdict> verdicts = JudgeDisks({path, map, path}, limits);
  EXPECT_EQ(verdicts[0].detail, "a path of the multipath device mpatha");
  EXPECT_EQ(verdicts[1].state, DiskState::Eligible) << verdicts[1].detail;
  EXPECT_EQ(verdicts[2].detail, "a path of the multipath device mpatha");
}

TEST(DiskJudge, APathOutsideItsMultipathDeviceKeepsThatFromBeingOffered) {
  DiskFacts path = FreeDisk();
  path.multipathMap = std::string("mpatha");
  DiskFacts map = FreeDisk();
  map.kernelName = "mpatha";
  const std::vector<DiskVerdict> verdicts = JudgeDisks({path, map, FreeDisk()}, limits);
  EXPECT_EQ(verdicts[1].detail, "same disk as naa.1 (sd-naa.1): two paths");
  EXPECT_EQ(verdicts[2].detail, "same disk as naa.1 (sd-naa.1): two paths");
}

TEST(DiskJudge, ADiskThatNothingIdentifiesMayBeTheTwinOfAnyOther) {
  DiskFacts unknown = FreeDisk("naa.2", "S2");
  unknown.identity = Fact<DiskIdentity>::Unknown("why");
  const std::vector<DiskVerdict> verdicts = JudgeDisks({FreeDisk(), unknown}, limits);
  EXPECT_EQ(verdicts[0].detail, "nobody knows whether it is the same disk as naa.2 (sd-naa.2)");
  EXPECT_EQ(verdicts[1].detail, "nobody knows: why");
}

TEST(DiskJudge, OfManyPathsAFewAreNamed) {
  const std::vector<DiskVerdict> verdicts = JudgeDisks(std::vector<DiskFacts>(6, FreeDisk()), limits);
  EXPECT_EQ(verdicts[5].detail,
            "same disk as naa.1 (sd-naa.1), naa.1 (sd-naa.1), naa.1 (sd-naa.1), ...: 6 paths");
}

// Whatever is found in addition, or forgotten, never makes a disk eligible that was not.
TEST(DiskJudge, NoTraceAndNoGapEverMakesADiskEligible) {
  const std::vector<Row> against = Against();
  const std::vector<Change> forgetting = Forgetting();
  const std::vector<Change> traces = Traces();
  const unsigned seed = std::random_device()();
  std::mt19937 random(seed);
  const auto oneOf = [&random](std::size_t count) {
    return std::uniform_int_distribution<std::size_t>(0, count - 1)(random);
  };
  for (int round = 0; round < 5000; ++round) {
    std::vector<DiskFacts> disks = {FreeDisk("naa.1", "S1"), FreeDisk("naa.2", "S2"),
                                    FreeDisk("naa.3", "S3")};
    // A duplicate, now and then: also two disks that are known to be one stay so.
    if (oneOf(3) == 0) {
      disks[1].identity = disks[0].identity;
    }
    for (std::size_t steps = oneOf(4); steps > 0; --steps) {
      against[oneOf(against.size())].change(disks[oneOf(3)]);
    }
    const std::size_t changed = oneOf(3);
    const std::vector<DiskVerdict> before = JudgeDisks(disks, limits);
    std::vector<DiskFacts> after = disks;
    if (oneOf(2) == 0) {
      forgetting[oneOf(forgetting.size())](after[changed]);
    } else {
      traces[oneOf(traces.size())](after[changed]);
    }
    const std::vector<DiskVerdict> verdicts = JudgeDisks(after, limits);
    for (std::size_t disk = 0; disk < disks.size(); ++disk) {
      const bool isOffered = verdicts[disk].state == DiskState::Eligible;
      EXPECT_TRUE(!isOffered || before[disk].state == DiskState::Eligible) << "seed " << seed;
    }
    EXPECT_NE(verdicts[changed].state, DiskState::Eligible) << "seed " << seed;
  }
}

TEST(DiskJudge, ManyDisksOfOneNameTakeLinearTime) {
  const std::vector<DiskVerdict> verdicts = JudgeDisks(std::vector<DiskFacts>(50'000, FreeDisk()), limits);
  EXPECT_EQ(verdicts.size(), 50'000U);
}

}  // namespace
}  // namespace OtxCtl::Disks
