#include "otxctl/sim/SimRules.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/sim/HostBuilder.h"
#include "otxctl/sim/KovaUuid.h"

namespace OtxCtl::Sim {
namespace {

using HostCtl::Kova::DiskMapping;
using HostCtl::Kova::DiskResult;
using HostCtl::Lib::HostCtlException;
using testing::ElementsAre;
using testing::StartsWith;

HostDisk Disk(const std::function<void(HostDisk&)>& edit) {
  return AHost().WithDisk("naa.1", false, edit).Build().disks.at(0);
}

const HostGroup mounted = {"naa.0", {"naa.1"}, false, true, 3, false};
const HostGroup unmounted = {"naa.0", {"naa.1"}, false, false, 3, false};

struct VerdictRow {
  const char* title;
  void (*make)(HostDisk&);
  const HostGroup* group;
  HostVerdict verdict;
};

void PrintTo(const VerdictRow& row, std::ostream* out) {
  *out << row.title;
}

class Verdicts : public testing::TestWithParam<VerdictRow> {};

TEST_P(Verdicts, FollowFromTheDiskAndItsGroup) {
  HostDescription host;
  host.minimumDiskBytes = 1000;
  EXPECT_EQ(VerdictOn(host, Disk(GetParam().make), GetParam().group), GetParam().verdict);
}

void Everything(HostDisk& disk) {
  disk.local = false;
  disk.partitions = 1;
  disk.transport = "usb";
  disk.bytes = 1;
}

INSTANTIATE_TEST_SUITE_P(
    Each, Verdicts,
    testing::Values(
        VerdictRow{"Free", [](HostDisk&) {}, nullptr, {1, 0}},
        VerdictRow{"Mounted", [](HostDisk&) {}, &mounted, {0, 0}},
        VerdictRow{"MountedWhateverElse", Everything, &mounted, {0, 0}},
        VerdictRow{"MountedAndAbsent", [](HostDisk& disk) { disk.absent = true; }, &mounted, {0, 0}},
        VerdictRow{"Unmounted", [](HostDisk&) {}, &unmounted, {2, 6}},
        VerdictRow{"UnmountedAndAbsent", [](HostDisk& disk) { disk.absent = true; }, &unmounted, {2, 6}},
        VerdictRow{"UnmountedAndSmall", [](HostDisk& disk) { disk.bytes = 1; }, &unmounted, {2, 5}},
        VerdictRow{"Absent", [](HostDisk& disk) { disk.absent = true; }, nullptr, {2, 0}},
        VerdictRow{"AbsentAndPartitioned",
                   [](HostDisk& disk) {
                     disk.absent = true;
                     disk.partitions = 1;
                   },
                   nullptr,
                   {2, 0}},
        VerdictRow{"NotLocal", [](HostDisk& disk) { disk.local = false; }, nullptr, {2, 1}},
        VerdictRow{"Partitioned", [](HostDisk& disk) { disk.partitions = 1; }, nullptr, {2, 2}},
        VerdictRow{"Usb", [](HostDisk& disk) { disk.transport = "usb"; }, nullptr, {2, 3}},
        VerdictRow{"OtherTransport", [](HostDisk& disk) { disk.transport = "sas"; }, nullptr, {1, 0}},
        VerdictRow{"TooSmall", [](HostDisk& disk) { disk.bytes = 999; }, nullptr, {2, 5}},
        VerdictRow{"JustLargeEnough", [](HostDisk& disk) { disk.bytes = 1000; }, nullptr, {1, 0}},
        VerdictRow{"TheLowestReasonWins", Everything, nullptr, {2, 1}},
        VerdictRow{"GivenOverDerived",
                   [](HostDisk& disk) {
                     disk.verdict = HostVerdict{7, -3};
                   },
                   &mounted,
                   {7, -3}}),
    [](const auto& row) { return std::string(row.param.title); });

// The record of a disk at a position of the kernel's list.
DiskResult RecordAt(const SimRules& rules, std::size_t position) {
  std::vector<DiskResult> records;
  rules.QueryDisks({}, records);
  return records.at(position);
}

std::vector<DiskMapping> GroupsOf(const SimRules& rules) {
  std::vector<DiskMapping> groups;
  rules.GetDiskMappings(groups, true);
  return groups;
}

std::string ErrorOf(const std::function<void()>& operation) {
  try {
    operation();
  } catch (const HostCtlException& exception) {
    return exception.what();
  }
  return "no error";
}

TEST(SimRules, AGivenVerdictOutlivesAFormat) {
  SimRules rules(AHost()
                     .WithSsd("naa.1")
                     .WithDisk("naa.2", false,
                               [](HostDisk& disk) {
                                 disk.verdict = HostVerdict{1, 0};
                               })
                     .Build());
  rules.FormatDiskMapping("naa.1", {"naa.2"});
  EXPECT_EQ(RecordAt(rules, 1).state, HostCtl::Kova::DiskState::Eligible);
  EXPECT_EQ(RecordAt(rules, 0).state, HostCtl::Kova::DiskState::InUse);
}

TEST(SimRules, RecordsCarryEveryFieldOfTheDisk) {
  const SimRules rules(AHost()
                           .WithDisk("naa.1", true,
                                     [](HostDisk& disk) {
                                       disk.capacityFlash = true;
                                       disk.kovaUuid = "u";
                                       disk.formatVersion = 9;
                                       disk.absent = true;
                                     })
                           .Build());
  const DiskResult record = RecordAt(rules, 0);
  EXPECT_EQ(record.name, "");
  EXPECT_EQ(record.kovaUuid, "u");
  EXPECT_TRUE(record.isSsd && record.isPdl && record.capacityFlash);
  EXPECT_FALSE(record.thirdFlag);
  EXPECT_EQ(record.formatVersion, 9);
}

TEST(SimRules, TheEmptyNameMatchesEveryAbsentDisk) {
  const SimRules rules(
      AHost().WithHdds({"naa.1", "naa.2", "naa.3"}).Without("naa.1").Without("naa.3").Build());
  std::vector<DiskResult> records;
  rules.QueryDisks({""}, records);
  EXPECT_EQ(records.size(), 2U);
}

TEST(SimRules, TheSameHostAlwaysGivesTheSameIdentities) {
  EXPECT_EQ(KovaUuidOf("host-a", "naa.1"), KovaUuidOf("host-a", "naa.1"));
  EXPECT_NE(KovaUuidOf("host-a", "naa.1"), KovaUuidOf("host-b", "naa.1"));
  EXPECT_NE(KovaUuidOf("host-a", "naa.1"), KovaUuidOf("host-a", "naa.2"));
  // Checked against another implementation of name-based UUIDs.
  EXPECT_EQ(KovaUuidOf("host-a", "naa.1"), "ddb6e5a8-ad01-5b60-9a7d-e0e24715cb89");
}

TEST(SimRules, FormattingReplacesAnOldIdentity) {
  SimRules rules(AHost()
                     .WithSsd("naa.1")
                     .WithDisk("naa.2", false,
                               [](HostDisk& disk) {
                                 disk.kovaUuid = "old";
                                 disk.formatVersion = 9;
                               })
                     .Edit([](HostDescription& host) { host.name = "host-a"; })
                     .Build());
  rules.FormatDiskMapping("naa.1", {"naa.2"});
  EXPECT_EQ(RecordAt(rules, 1).kovaUuid, KovaUuidOf("host-a", "naa.2"));
  EXPECT_EQ(RecordAt(rules, 1).formatVersion, 3);
  EXPECT_EQ(GroupsOf(rules).at(0).formatVersion, 3);
}

TEST(SimRules, DisksThatJoinAGroupGetItsFormatVersionAndLeaveTheOthersAlone) {
  SimRules rules(AHost()
                     .WithSsd("naa.1")
                     .WithHdds({"naa.2", "naa.3"})
                     .WithGroup("naa.1", {"naa.2"}, [](HostGroup& group) { group.formatVersion = 8; })
                     .Build());
  rules.FormatDiskMapping("naa.1", {"naa.3"});
  EXPECT_EQ(RecordAt(rules, 2).formatVersion, 8);
  EXPECT_EQ(RecordAt(rules, 0).kovaUuid, "uuid-of-naa.1");
  EXPECT_EQ(RecordAt(rules, 1).kovaUuid, "uuid-of-naa.2");
}

TEST(SimRules, ABusyGroupSaysSoAndIsExtendedAllTheSame) {
  SimRules rules(AHost()
                     .WithSsd("naa.1")
                     .WithHdds({"naa.2", "naa.3"})
                     .WithGroup("naa.1", {"naa.2"}, [](HostGroup& group) { group.busy = true; })
                     .Build());
  EXPECT_TRUE(GroupsOf(rules).at(0).thirdFlag);
  rules.FormatDiskMapping("naa.1", {"naa.3"});
  EXPECT_EQ(GroupsOf(rules).at(0).capacityDisks.size(), 2U);
}

TEST(SimRules, ExtendingDoesNotChangeTheKindOfAGroup) {
  SimRules rules(AHost()
                     .WithSsd("naa.1")
                     .WithHdd("naa.2")
                     .WithCapacityFlash("naa.3")
                     .WithGroup("naa.1", {"naa.3"}, [](HostGroup& group) { group.allFlash = true; })
                     .Build());
  rules.FormatDiskMapping("naa.1", {"naa.2"});
  EXPECT_TRUE(GroupsOf(rules).at(0).allFlash);
}

TEST(SimRules, ADiskThatTheKernelDoesNotKnowIsListedByItsGroupOnly) {
  SimRules rules(AHost()
                     .WithSsd("naa.1")
                     .WithHdds({"naa.2", "naa.3"})
                     .WithGroup("naa.1", {"naa.2", "naa.3"})
                     .Edit([](HostDescription& host) {
                       host.disks[0].inKernel = false;
                       host.disks[1].inKernel = false;
                     })
                     .Build());
  std::vector<DiskResult> records;
  rules.QueryDisks({}, records);
  EXPECT_EQ(records.size(), 1U);
  EXPECT_EQ(GroupsOf(rules).at(0).ssd.deviceName, "naa.1");
  EXPECT_EQ(GroupsOf(rules).at(0).capacityDisks.at(0).deviceName, "naa.2");
  const auto unknown = StartsWith("simulated kernel: ");
  EXPECT_THAT(ErrorOf([&] { rules.UnmountDiskMapping("naa.1"); }), unknown);
  EXPECT_THAT(ErrorOf([&] { rules.RemoveDisk("naa.2"); }), unknown);
  EXPECT_THAT(ErrorOf([&] { rules.RemoveDiskMapping("naa.1"); }), unknown);
  EXPECT_THAT(ErrorOf([&] { rules.RestampDiskMapping("naa.1"); }), unknown);
  EXPECT_THAT(ErrorOf([&] { rules.FormatDiskMapping("naa.2", {"naa.3"}); }), unknown);
}

TEST(SimRules, AnAbsentDiskCannotBeNamedAnyMore) {
  SimRules rules(AHost()
                     .WithSsd("naa.1")
                     .WithHdds({"naa.2", "naa.3"})
                     .WithGroup("naa.1", {"naa.2", "naa.3"})
                     .Without("naa.2")
                     .Build());
  EXPECT_THAT(ErrorOf([&] { rules.RemoveDisk("naa.2"); }),
              StartsWith("simulated kernel: disk \"naa.2\" is unknown"));
}

TEST(SimRules, RemovingAnAbsentDiskClearsItsIdentity) {
  SimRules rules(AHost()
                     .WithSsd("naa.1")
                     .WithHdds({"naa.2", "naa.3"})
                     .WithGroup("naa.1", {"naa.2", "naa.3"})
                     .Without("naa.2")
                     .Build());
  EXPECT_TRUE(rules.RemoveDiskByUuid("uuid-of-naa.2"));
  EXPECT_EQ(RecordAt(rules, 1).kovaUuid, "");
  EXPECT_EQ(RecordAt(rules, 1).formatVersion, 0);
  EXPECT_TRUE(RecordAt(rules, 1).isPdl);
}

TEST(SimRules, AnAbsentDiskInNoGroupIsForgottenByItsIdentity) {
  SimRules rules(AHost()
                     .WithDisk("naa.1", false,
                               [](HostDisk& disk) {
                                 disk.absent = true;
                                 disk.kovaUuid = "u";
                               })
                     .Build());
  EXPECT_TRUE(rules.RemoveDiskByUuid("u"));
  EXPECT_EQ(RecordAt(rules, 0).kovaUuid, "");
}

TEST(SimRules, AnAbsentDiskThatTheKernelDoesNotKnowIsNoneOfThatIdentity) {
  const auto leave = [](HostDisk& disk) {
    disk.absent = true;
    disk.inKernel = false;
    disk.kovaUuid = "uuid-of-naa.3";
  };
  SimRules unknown(AHost().WithDisk("naa.1", false, leave).Build());
  EXPECT_THROW(unknown.RemoveDiskByUuid("uuid-of-naa.3"), HostCtl::Lib::KovaStorageException);
  SimRules known(AHost()
                     .WithDisk("naa.1", false, leave)
                     .WithSsd("naa.2")
                     .WithDisk("naa.3", false, leave)
                     .WithHdd("naa.4")
                     .WithGroup("naa.2", {"naa.3", "naa.4"})
                     .Build());
  EXPECT_TRUE(known.RemoveDiskByUuid("uuid-of-naa.3")) << "its group lists it";
  EXPECT_EQ(GroupsOf(known).at(0).capacityDisks.size(), 1U);
}

TEST(SimRules, SayWhetherAnythingChanged) {
  SimRules rules(AHost().WithSsd("naa.1").WithHdd("naa.2").WithGroup("naa.1", {"naa.2"}).Build());
  EXPECT_FALSE(rules.MountDiskMapping("naa.1"));
  EXPECT_TRUE(rules.UnmountDiskMapping("naa.1"));
  EXPECT_FALSE(rules.UnmountDiskMapping("naa.1"));
  EXPECT_FALSE(rules.RestampDiskMapping("naa.1"));
  EXPECT_FALSE(rules.RestampDiskMappingByUuid("uuid-of-naa.1"));
  EXPECT_TRUE(rules.ClaimUnmountedDiskgroups());
  EXPECT_FALSE(rules.ClaimUnmountedDiskgroups());
  EXPECT_TRUE(rules.RemoveDiskMapping("naa.1"));
}

TEST(SimRules, EveryRefusalIsTheSimulatedKernelsOwnAndClean) {
  SimRules rules(AHost().WithSsd("naa.1").WithHdd("naa.2").Build());
  const auto own = StartsWith("simulated kernel: ");
  EXPECT_THAT(ErrorOf([&] { rules.FormatDiskMapping("naa.9\n", {}); }), own);
  EXPECT_THAT(ErrorOf([&] { rules.FormatDiskMapping("naa.9\n", {}); }),
              testing::Not(testing::HasSubstr("\n")));
  EXPECT_THAT(ErrorOf([&] { rules.FormatDiskMapping("naa.1", {}); }), own);
  EXPECT_THAT(ErrorOf([&] { rules.RestampDiskMappingByUuid(""); }), own);
  EXPECT_THAT(ErrorOf([&] { rules.RemoveDiskByUuid(""); }), own);
  EXPECT_THAT(ErrorOf([&] { rules.RemoveDiskMapping("naa.1"); }), own);
}

TEST(SimRules, GroupsOfAHostKeepTheirOrderWhenOneIsRemoved) {
  SimRules rules(AHost()
                     .WithSsd("a")
                     .WithSsd("b")
                     .WithSsd("c")
                     .WithHdds({"1", "2", "3"})
                     .WithGroup("b", {"1"})
                     .WithGroup("a", {"2"})
                     .WithGroup("c", {"3"})
                     .Build());
  rules.RemoveDisk("b");
  EXPECT_EQ(GroupsOf(rules).at(0).ssd.deviceName, "a");
  EXPECT_EQ(GroupsOf(rules).at(1).ssd.deviceName, "c");
  rules.RemoveDiskMapping("c");
  EXPECT_EQ(rules.Host().groups.size(), 1U);
}

}  // namespace
}  // namespace OtxCtl::Sim
