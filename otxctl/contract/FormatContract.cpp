#include <cstdint>

#include "otxctl/contract/ProviderContract.h"

namespace OtxCtl::Contract {
namespace {

using HostCtl::Kova::DiskMapping;
using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskResult;
using HostCtl::Kova::DiskState;
using HostCtl::Lib::HostCtlException;
using HostCtl::Lib::KovaExceptionHasPartition;
using HostCtl::Lib::KovaStorageException;
using Sim::AHost;
using Sim::HostBuilder;
using Sim::HostDisk;
using testing::ElementsAre;

std::vector<std::string> Numbered(int count) {
  std::vector<std::string> names;
  for (int number = 0; number < count; ++number) {
    names.push_back("naa.hdd" + std::to_string(number));
  }
  return names;
}

TEST_P(ProviderContract, FormattingMakesAMountedGroup) {
  Start(AHost().WithSsd("naa.1").WithHdds({"naa.2", "naa.3"}));
  Format("naa.1", {"naa.3", "naa.2"});
  const auto groups = Groups(false);
  ASSERT_EQ(groups.size(), 1U);
  EXPECT_THAT(NamesOf(groups[0]), ElementsAre("naa.1", "naa.3", "naa.2"));
  EXPECT_FALSE(groups[0].allFlash);
  EXPECT_FALSE(groups[0].thirdFlag);
}

TEST_P(ProviderContract, AFormattedDiskIsInUseAndHasAnIdentityOfItsOwn) {
  Start(AHost().WithSsd("naa.1").WithHdd("naa.2"));
  Format("naa.1", {"naa.2"});
  const DiskMapping group = Groups().at(0);
  for (const std::string name : {"naa.1", "naa.2"}) {
    const DiskResult record = RecordOf(name);
    EXPECT_EQ(record.state, DiskState::InUse) << name;
    EXPECT_EQ(record.reason, DiskReason::None) << name;
    EXPECT_EQ(record.kovaUuid.size(), 36U) << name;
    EXPECT_EQ(record.formatVersion, group.formatVersion) << name;
  }
  EXPECT_EQ(group.ssd.kovaUuid, RecordOf("naa.1").kovaUuid);
  EXPECT_EQ(group.capacityDisks.at(0).kovaUuid, RecordOf("naa.2").kovaUuid);
  EXPECT_NE(group.ssd.kovaUuid, group.capacityDisks.at(0).kovaUuid);
}

TEST_P(ProviderContract, FormattingWithTheSsdOfAGroupExtendsIt) {
  Start(AHost().WithSsd("naa.1").WithHdds({"naa.2", "naa.3", "naa.4"}));
  Format("naa.1", {"naa.3"});
  const DiskMapping before = Groups().at(0);
  Format("naa.1", {"naa.4", "naa.2"});
  const auto groups = Groups();
  ASSERT_EQ(groups.size(), 1U);
  EXPECT_THAT(NamesOf(groups[0]), ElementsAre("naa.1", "naa.3", "naa.4", "naa.2"));
  EXPECT_EQ(groups[0].ssd, before.ssd);
  EXPECT_EQ(groups[0].capacityDisks.at(0), before.capacityDisks.at(0));
  EXPECT_EQ(RecordOf("naa.2").formatVersion, before.formatVersion);
}

TEST_P(ProviderContract, AGroupIsAllFlashWhenEveryCapacityDiskIs) {
  Start(AHost().WithSsd("naa.1").WithSsd("naa.2").WithCapacityFlash("naa.3").WithSsd("naa.4"));
  Format("naa.1", {"naa.3", "naa.4"});
  EXPECT_TRUE(Groups().at(0).allFlash);
}

TEST_P(ProviderContract, OneHardDiskMakesAGroupHybrid) {
  Start(AHost().WithSsd("naa.1").WithCapacityFlash("naa.2").WithHdd("naa.3"));
  Format("naa.1", {"naa.2", "naa.3"});
  EXPECT_FALSE(Groups().at(0).allFlash);
}

TEST_P(ProviderContract, AGroupTakesSevenCapacityDisksAndNoMore) {
  Start(AHost().WithSsd("naa.1").WithSsd("naa.2").WithHdds(Numbered(8)));
  Refused<HostCtlException>([&] { Format("naa.1", Numbered(8)); });
  Format("naa.2", Numbered(7));
  EXPECT_EQ(Groups().at(0).capacityDisks.size(), 7U);
}

TEST_P(ProviderContract, TheLimitCountsTheDisksThatAGroupHasAlready) {
  Start(AHost().WithSsd("naa.1").WithHdds(Numbered(9)));
  Format("naa.1", {"naa.hdd0", "naa.hdd1", "naa.hdd2", "naa.hdd3", "naa.hdd4"});
  Refused<HostCtlException>([&] { Format("naa.1", {"naa.hdd5", "naa.hdd6", "naa.hdd7"}); });
  Format("naa.1", {"naa.hdd5", "naa.hdd6"});
  EXPECT_EQ(Groups().at(0).capacityDisks.size(), 7U);
}

TEST_P(ProviderContract, AGroupNeedsACapacityDisk) {
  Start(AHost().WithSsd("naa.1").WithSsd("naa.2").WithHdd("naa.3"));
  Format("naa.2", {"naa.3"});
  Refused<HostCtlException>([&] { Format("naa.1", {}); });
  Refused<HostCtlException>([&] { Format("naa.2", {}); });
}

TEST_P(ProviderContract, ADiskThatWillNotDoIsNamedBeforeTheNumberOfDisks) {
  Start(AHost().WithSsd("naa.1").WithHdds(Numbered(8)));
  Names tooMany = Numbered(8);
  tooMany.emplace_back("naa.nowhere");
  EXPECT_EQ(Refused<KovaStorageException>([&] { Format("naa.1", tooMany); }).GetDiskName(), "naa.nowhere");
}

TEST_P(ProviderContract, WhatARequestBringsAlongChangesNothingOfTheGroup) {
  for (const HostCtl::Kova::FormatContext& context : {HostCtl::Kova::FormatContext{"", 0, 0},
                                                      {std::string(4096, 'x'), INT32_MAX, INT32_MIN},
                                                      {"\xFF", 1, 7}}) {
    Start(AHost().WithSsd("naa.1").WithHdd("naa.2"));
    Provider().FormatDiskMapping("naa.1", {"naa.2"}, context);
    ASSERT_EQ(Groups(false).size(), 1U);
    EXPECT_THAT(NamesOf(Groups()[0]), ElementsAre("naa.1", "naa.2"));
  }
}

// The host of the refusals: one group, a partitioned disk, and three free disks.
HostBuilder HostWithAGroup() {
  return AHost()
      .WithSsd("naa.free-ssd")
      .WithSsd("naa.ssd")
      .WithHdds({"naa.member", "naa.free", "naa.free2"})
      .WithDisk("naa.parted", false, [](HostDisk& disk) { disk.partitions = 1; })
      .WithDisk("naa.parted-ssd", true, [](HostDisk& disk) { disk.partitions = 1; });
}

struct RefusalRow {
  const char* title;
  std::string ssd;
  std::vector<std::string> capacity;
  std::string offender;
};

TEST_P(ProviderContract, RefusesUnknownAndUsedDisksByNameAndChangesNothing) {
  Start(HostWithAGroup());
  Format("naa.ssd", {"naa.member"});
  const std::vector<RefusalRow> rows = {
      {"unknown cache disk", "naa.nowhere", {"naa.free"}, "naa.nowhere"},
      {"unknown capacity disk", "naa.free-ssd", {"naa.free", "naa.nowhere"}, "naa.nowhere"},
      {"empty name", "naa.free-ssd", {""}, ""},
      {"member of another group", "naa.free-ssd", {"naa.free", "naa.member"}, "naa.member"},
      {"cache disk of another group", "naa.free-ssd", {"naa.ssd"}, "naa.ssd"},
      {"capacity disk as cache disk", "naa.member", {"naa.free"}, "naa.member"},
      {"its own member again", "naa.ssd", {"naa.member"}, "naa.member"},
      {"the same disk twice", "naa.free-ssd", {"naa.free", "naa.free"}, "naa.free"},
      {"its own cache disk", "naa.free-ssd", {"naa.free-ssd"}, "naa.free-ssd"},
      {"its own cache disk, extended", "naa.ssd", {"naa.ssd"}, "naa.ssd"},
      {"the first offender counts", "naa.free-ssd", {"naa.member", "naa.nowhere"}, "naa.member"},
      {"used before partitioned, in order", "naa.free-ssd", {"naa.member", "naa.parted"}, "naa.member"},
  };
  for (const RefusalRow& row : rows) {
    SCOPED_TRACE(row.title);
    EXPECT_EQ(Refused<KovaStorageException>([&] { Format(row.ssd, row.capacity); }).GetDiskName(),
              row.offender);
  }
}

TEST_P(ProviderContract, RefusesPartitionedDisksWithAnExceptionOfTheirOwn) {
  Start(HostWithAGroup());
  const std::vector<RefusalRow> rows = {
      {"capacity disk", "naa.free-ssd", {"naa.free", "naa.parted"}, "naa.parted"},
      {"cache disk", "naa.parted-ssd", {"naa.free"}, "naa.parted-ssd"},
      {"the cache disk is looked at first", "naa.parted-ssd", {"naa.nowhere"}, "naa.parted-ssd"},
      {"partitioned before unknown, in order", "naa.free-ssd", {"naa.parted", "naa.nowhere"}, "naa.parted"},
  };
  for (const RefusalRow& row : rows) {
    SCOPED_TRACE(row.title);
    EXPECT_EQ(Refused<KovaExceptionHasPartition>([&] { Format(row.ssd, row.capacity); }).GetDiskName(),
              row.offender);
  }
}

// Whatever a group that is not mounted holds may be somebody's only copy.
TEST_P(ProviderContract, NeverFormatsADiskOfAnUnmountedGroup) {
  Start(AHost()
            .WithSsd("naa.1")
            .WithHdds({"naa.2", "naa.3"})
            .WithSsd("naa.4")
            .WithSsd("naa.5")
            .WithHdd("naa.6"));
  Format("naa.1", {"naa.2"});
  Format("naa.5", {"naa.6"});
  Provider().UnmountDiskMapping("naa.1");
  const std::vector<RefusalRow> rows = {
      {"its cache disk with a free disk", "naa.1", {"naa.3"}, "naa.1"},
      {"its cache disk with its own member", "naa.1", {"naa.2"}, "naa.1"},
      {"its member in a new group", "naa.4", {"naa.2"}, "naa.2"},
      {"its member in a group that is extended", "naa.5", {"naa.3", "naa.2"}, "naa.2"},
      {"its cache disk in a group that is extended", "naa.5", {"naa.1"}, "naa.1"},
      {"its cache disk as capacity disk", "naa.4", {"naa.3", "naa.1"}, "naa.1"},
      {"its member as cache disk", "naa.2", {"naa.3"}, "naa.2"},
  };
  for (const RefusalRow& row : rows) {
    SCOPED_TRACE(row.title);
    EXPECT_EQ(Refused<KovaStorageException>([&] { Format(row.ssd, row.capacity); }).GetDiskName(),
              row.offender);
  }
}

TEST_P(ProviderContract, NeverFormatsAnAbsentDisk) {
  if (!Can().absentDisks) {
    GTEST_SKIP() << "disks of this host cannot leave";
  }
  Start(AHost().WithSsd("naa.1").WithHdds({"naa.2", "naa.3"}).Without("naa.2"));
  EXPECT_EQ(Refused<KovaStorageException>([&] {
              Format("naa.1", {"naa.3", "naa.2"});
            }).GetDiskName(),
            "naa.2");
}

TEST_P(ProviderContract, EveryProviderOfAHostSeesTheSameDisks) {
  Start(AHost().WithSsd("naa.1").WithHdd("naa.2"));
  {
    const auto other = AnotherProvider();
    other->FormatDiskMapping("naa.1", {"naa.2"}, {"", 1, 0});
  }
  EXPECT_EQ(Groups().size(), 1U) << "also when the provider that made it is gone";
}

}  // namespace
}  // namespace OtxCtl::Contract
