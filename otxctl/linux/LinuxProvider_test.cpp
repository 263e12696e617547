#include "otxctl/linux/LinuxProvider.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/linux/testing/ChangeableMachine.h"

namespace OtxCtl::Linux {
namespace {

using HostCtl::Kova::DiskMapping;
using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskResult;
using HostCtl::Kova::DiskState;
using HostCtl::Lib::HostCtlException;
using testing::IsEmpty;
using testing::SizeIs;

std::vector<DiskResult> QueryOn(TestMachine& machine, const std::vector<std::string>& names = {}) {
  std::vector<DiskResult> records;
  LinuxProvider(machine.Host()).QueryDisks(names, records, true);
  return records;
}

std::vector<DiskMapping> GroupsOn(TestMachine& machine, bool withUnmounted) {
  std::vector<DiskMapping> groups;
  LinuxProvider(machine.Host()).GetDiskMappings(groups, withUnmounted);
  return groups;
}

TEST(LinuxProvider, TellsOfFreeDisksAndOfMembers) {
  TestMachine machine;
  machine.AddGroup();
  machine.tree.AddScsiDisk("sdc", {.worldWideName = "naa.3", .serial = "S3"});
  const auto records = QueryOn(machine);
  ASSERT_THAT(records, SizeIs(3));
  EXPECT_EQ(records[0].name, "naa.1");
  EXPECT_EQ(records[0].kovaUuid, "u1");
  EXPECT_EQ(records[0].state, DiskState::InUse);
  EXPECT_EQ(records[0].reason, DiskReason::None);
  EXPECT_TRUE(records[0].isSsd);
  EXPECT_EQ(records[0].formatVersion, 3);
  EXPECT_FALSE(records[1].isSsd);
  EXPECT_EQ(records[2].name, "naa.3");
  EXPECT_EQ(records[2].kovaUuid, "");
  EXPECT_EQ(records[2].state, DiskState::Eligible);
  EXPECT_EQ(records[2].formatVersion, 0);
}

TEST(LinuxProvider, TellsOfTheDisksThatAreNamedOnceAndInTheirOrder) {
  TestMachine machine;
  machine.AddGroup();
  const auto records = QueryOn(machine, {"naa.2", "naa.1", "naa.2", "naa.9"});
  ASSERT_THAT(records, SizeIs(2));
  EXPECT_EQ(records[0].name, "naa.1");
  EXPECT_THAT(QueryOn(machine, {"naa.9"}), IsEmpty());
  EXPECT_THAT(QueryOn(machine, {""}), IsEmpty()) << "no disk has left";
}

TEST(LinuxProvider, AMemberThatHasLeftHasItsUuidAndNoName) {
  TestMachine machine;
  machine.AddGroup();
  machine.tree.AddScsiDisk("sdc", {.worldWideName = "naa.3", .serial = "S3"});
  std::string& report = machine.results.of["pvs"].output;
  report.replace(report.find("/dev/sdb"), 8, "[unknown]");
  machine.probeResults["sdb"] = EmptyDisk();
  const auto records = QueryOn(machine, {""});
  ASSERT_THAT(records, SizeIs(1));
  EXPECT_EQ(records[0].name, "");
  EXPECT_EQ(records[0].kovaUuid, "u2");
  EXPECT_TRUE(records[0].isPdl);
  EXPECT_FALSE(records[0].isSsd);
  const auto groups = GroupsOn(machine, false);
  ASSERT_THAT(groups, SizeIs(1));
  EXPECT_EQ(groups[0].capacityDisks.at(0), (HostCtl::Kova::DiskName{"", "u2"}));
}

TEST(LinuxProvider, ListsGroupsThatAreNotMountedOnlyWhenAskedFor) {
  TestMachine machine;
  machine.AddGroup("ready", false);
  EXPECT_THAT(GroupsOn(machine, false), IsEmpty());
  const auto groups = GroupsOn(machine, true);
  ASSERT_THAT(groups, SizeIs(1));
  EXPECT_EQ(groups[0].ssd, (HostCtl::Kova::DiskName{"naa.1", "u1"}));
  EXPECT_TRUE(groups[0].thirdFlag);
  EXPECT_FALSE(groups[0].allFlash);
  EXPECT_EQ(groups[0].formatVersion, 3);
  const auto records = QueryOn(machine);
  EXPECT_EQ(records[0].state, DiskState::Ineligible);
  EXPECT_EQ(records[0].reason, DiskReason::GroupNotMounted);
  EXPECT_EQ(records[0].kovaUuid, "u1") << "a member keeps its identity";
}

TEST(LinuxProvider, AHalfMadeGroupIsNone) {
  TestMachine machine;
  machine.AddGroup("creating");
  EXPECT_THAT(GroupsOn(machine, true), IsEmpty());
  EXPECT_EQ(QueryOn(machine).at(0).reason, DiskReason::HasPartitions);
}

TEST(LinuxProvider, CapacityFlashIsASettingThatOnlyFlashDisksTake) {
  TestMachine machine;
  machine.AddGroup();
  machine.settings.capacityFlash = {"naa.1", "naa.2"};
  const auto records = QueryOn(machine);
  EXPECT_TRUE(records[0].capacityFlash);
  EXPECT_FALSE(records[1].capacityFlash);
}

TEST(LinuxProvider, ConfigurationIsWhatTheSettingsSay) {
  TestMachine machine;
  machine.settings.isInCluster = true;
  machine.settings.clusterUuid = "c";
  machine.settings.nodeUuid = "n";
  machine.settings.faultDomain = "rack-1";
  machine.settings.nics = {{"otx1", "224.1.2.3", "FF19::1"}};
  LinuxProvider provider(machine.Host());
  EXPECT_FALSE(provider.IsAutoModeEnabled());
  HostCtl::Kova::KovaClusterInfoDetailed info;
  info.text1 = "old";
  provider.GetClusterInfoDetailed(info);
  EXPECT_TRUE(info.enabled);
  EXPECT_EQ(info.clusterUuid, "c");
  EXPECT_EQ(info.nodeUuid, "n");
  EXPECT_EQ(info.text1, "");
  EXPECT_EQ(provider.GetFaultDomainName(), "rack-1");
  auto nics = provider.GetKovaOtxNicConfigs();
  ASSERT_THAT(nics, SizeIs(1));
  EXPECT_EQ(nics[0]->GetOtxnicName(), "otx1");
  EXPECT_FALSE(nics[0]->GetMasterMulticastGroup().isIpv6);
  EXPECT_TRUE(nics[0]->GetAgentMulticastGroup().isIpv6);
  Util::DeleteVector(nics);
}

TEST(LinuxProvider, RefreshLooksAnew) {
  TestMachine machine;
  machine.freshness = std::chrono::hours(1);
  LinuxProvider provider(machine.Host());
  std::vector<DiskResult> records;
  provider.QueryDisks({}, records, true);
  EXPECT_THAT(records, IsEmpty());
  machine.tree.AddScsiDisk("sda", {.worldWideName = "naa.1", .serial = "S1"});
  provider.QueryDisks({}, records, true);
  EXPECT_THAT(records, IsEmpty());
  provider.RefreshKovaInfo();
  provider.QueryDisks({}, records, true);
  EXPECT_THAT(records, SizeIs(1));
}

TEST(LinuxProvider, AMachineThatCannotBeLookedAtIsAnError) {
  TestMachine machine;
  machine.tree.Remove("sys/class/block");
  LinuxProvider provider(machine.Host());
  std::vector<DiskResult> records;
  std::vector<DiskMapping> groups;
  EXPECT_THROW(provider.QueryDisks({}, records, true), HostCtlException);
  EXPECT_THROW(provider.GetDiskMappings(groups, true), HostCtlException);
  EXPECT_THROW(provider.RefreshKovaInfo(), HostCtlException);
}

TEST(LinuxProvider, WithNothingToChangeByItRefusesEveryChange) {
  TestMachine machine;
  machine.AddGroup("ready", false);
  LinuxProvider provider(machine.Host());
  const std::vector<std::function<void()>> changes = {
      [&] { provider.FormatDiskMapping("naa.1", {"naa.2"}, {}); },
      [&] { provider.RestampDiskMapping("naa.1", {"naa.2"}); },
      [&] { provider.MountDiskMapping("naa.1", true); },
      [&] { provider.RestampDiskMappingByUuid("u1"); },
      [&] { provider.RemoveDisk("naa.2", "", {}); },
      [&] { provider.RemoveDiskMapping("naa.1", "", {}); },
      [&] { provider.UnmountDiskMapping("naa.1"); },
      [&] { provider.RemoveDiskByUuid("u2", ""); },
      [&] { provider.ClaimUnmountedDiskgroups(); },
  };
  for (const auto& change : changes) {
    EXPECT_THROW(change(), HostCtlException);
  }
}

TEST(LinuxProvider, ADiskThatHasLeftStandsBesideTheMembersOfItsGroup) {
  const auto uuidsWithout = [](const std::vector<std::size_t>& absent) {
    ChangeableMachine machine;
    GroupRow group = WholeGroup();
    for (const std::size_t member : absent) {
      group.members[member].disk = "";
    }
    machine.Show({group});
    std::vector<DiskResult> records;
    LinuxProvider(machine.host).QueryDisks({}, records, true);
    std::vector<std::string> uuids;
    for (const DiskResult& record : records) {
      if (!record.kovaUuid.empty()) {
        uuids.push_back(record.kovaUuid);
      }
    }
    EXPECT_EQ(records.size(), 5U + absent.size()) << "a disk that is there beside each that has left";
    return uuids;
  };
  using testing::ElementsAre;
  EXPECT_THAT(uuidsWithout({1}), ElementsAre("u1", "u2", "u3"));
  EXPECT_THAT(uuidsWithout({0}), ElementsAre("u1", "u2", "u3"));
  EXPECT_THAT(uuidsWithout({0, 1}), ElementsAre("u1", "u2", "u3"));
  EXPECT_THAT(uuidsWithout({1, 2}), ElementsAre("u1", "u2", "u3"));
}

TEST(LinuxProvider, HandsChangesOn) {
  ChangeableMachine machine;
  GroupRow group = WholeGroup();
  group.members[1].isActive = group.members[2].isActive = false;
  machine.Show({group});
  LinuxProvider provider(machine.host, std::move(machine.changes));
  provider.MountDiskMapping("naa.1", true);
  provider.ClaimUnmountedDiskgroups();
  provider.RestampDiskMapping("naa.1", {});
  provider.RestampDiskMappingByUuid("u1");
  provider.RemoveDisk("naa.2", "", {});
  provider.RemoveDiskMapping("naa.1", "", {});
  EXPECT_THROW(provider.RemoveDiskByUuid("u2", ""), HostCtlException) << "it has not left";
  EXPECT_THROW(provider.FormatDiskMapping("naa.5", {"naa.2"}, {}), HostCtlException);
  EXPECT_EQ(machine.Changes().size(), 10U);
  machine.Show({WholeGroup()});
  provider.UnmountDiskMapping("naa.1");
  EXPECT_EQ(machine.Changes().back(), "vgchange --activate n -- kova_g1");
}

TEST(LinuxProvider, TheAutomaticModeIsASetting) {
  TestMachine machine;
  EXPECT_FALSE(LinuxProvider(machine.Host()).IsAutoModeEnabled());
  machine.settings.isAutoMode = true;
  EXPECT_TRUE(LinuxProvider(machine.Host()).IsAutoModeEnabled());
}

TEST(LinuxProvider, ConfigurationIsToldWithoutALookAtTheDisks) {
  TestMachine machine;
  machine.tree.Remove("sys/class/block");
  machine.settings.faultDomain = "rack-1";
  EXPECT_EQ(LinuxProvider(machine.Host()).GetFaultDomainName(), "rack-1");
}

}  // namespace
}  // namespace OtxCtl::Linux
