#include "otxctl/contract/ProviderContract.h"

namespace OtxCtl::Contract {
namespace {

using HostCtl::Kova::DiskMapping;
using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskResult;
using HostCtl::Kova::DiskState;
using Sim::AHost;
using Sim::HostDescription;
using Sim::HostDisk;
using testing::AllOf;
using testing::ElementsAre;
using testing::Field;
using testing::IsEmpty;

auto IsDisk(const std::string& name) {
  return Field("name", &DiskResult::name, name);
}

auto IsVerdict(DiskState state, DiskReason reason) {
  return AllOf(Field("state", &DiskResult::state, state), Field("reason", &DiskResult::reason, reason));
}

TEST_P(ProviderContract, ListsEveryDiskOnceInTheOrderOfTheHost) {
  Start(AHost().WithHdd("naa.3").WithSsd("naa.1").WithHdd("naa.2"));
  EXPECT_THAT(Query(), ElementsAre(IsDisk("naa.3"), IsDisk("naa.1"), IsDisk("naa.2")));
}

TEST_P(ProviderContract, AHostWithoutDisksHasNoRecords) {
  Start(AHost());
  EXPECT_THAT(Query(), IsEmpty());
  EXPECT_THAT(Groups(), IsEmpty());
}

TEST_P(ProviderContract, ListsOnlyTheNamedDisksStillInTheOrderOfTheHost) {
  Start(AHost().WithHdds({"naa.1", "naa.2", "naa.3"}));
  EXPECT_THAT(Query({"naa.3", "naa.9", "naa.1", "naa.3"}), ElementsAre(IsDisk("naa.1"), IsDisk("naa.3")));
  EXPECT_THAT(Query({"naa.9"}), IsEmpty());
}

TEST_P(ProviderContract, AppendsRecordsBehindThoseOfTheCaller) {
  Start(AHost().WithSsd("naa.1").WithHdd("naa.2"));
  Format("naa.1", {"naa.2"});
  std::vector<DiskResult> records(1);
  Provider().QueryDisks({}, records, true);
  EXPECT_THAT(records, ElementsAre(IsDisk(""), IsDisk("naa.1"), IsDisk("naa.2")));
  std::vector<DiskMapping> groups(1);
  Provider().GetDiskMappings(groups, false);
  EXPECT_EQ(groups.size(), 2U);
}

TEST_P(ProviderContract, TellsFlashFromHardDisksAndTaggedFlash) {
  Start(AHost().WithSsd("naa.1").WithHdd("naa.2").WithCapacityFlash("naa.3"));
  EXPECT_TRUE(RecordOf("naa.1").isSsd);
  EXPECT_FALSE(RecordOf("naa.1").capacityFlash);
  EXPECT_FALSE(RecordOf("naa.2").isSsd);
  EXPECT_TRUE(RecordOf("naa.3").isSsd);
  EXPECT_TRUE(RecordOf("naa.3").capacityFlash);
}

TEST_P(ProviderContract, AFreeDiskIsEligibleAndHasNoIdentity) {
  Start(AHost().WithHdd("naa.1"));
  const DiskResult record = RecordOf("naa.1");
  EXPECT_THAT(record, IsVerdict(DiskState::Eligible, DiskReason::None));
  EXPECT_EQ(record.kovaUuid, "");
  EXPECT_FALSE(record.isPdl);
}

struct UnusableRow {
  DiskReason reason;
  void (*make)(HostDisk&);
};

TEST_P(ProviderContract, SaysWhyADiskCannotBeUsed) {
  const std::vector<UnusableRow> rows = {
      {DiskReason::NonLocal, [](HostDisk& disk) { disk.local = false; }},
      {DiskReason::HasPartitions, [](HostDisk& disk) { disk.partitions = 2; }},
      {DiskReason::Usb, [](HostDisk& disk) { disk.transport = "usb"; }},
      {DiskReason::TooSmall, [](HostDisk& disk) { disk.bytes = 1'000'000; }},
  };
  for (const UnusableRow& row : rows) {
    Start(AHost().WithDisk("naa.1", false, row.make).Edit([](HostDescription& host) {
      host.minimumDiskBytes = 1'000'000'000;
    }));
    EXPECT_THAT(RecordOf("naa.1"), IsVerdict(DiskState::Ineligible, row.reason));
  }
}

TEST_P(ProviderContract, OfSeveralReasonsTheLowestNumberIsReported) {
  Start(AHost().WithDisk("naa.1", false, [](HostDisk& disk) {
    disk.partitions = 1;
    disk.transport = "usb";
  }));
  EXPECT_THAT(RecordOf("naa.1"), IsVerdict(DiskState::Ineligible, DiskReason::HasPartitions));
}

TEST_P(ProviderContract, ListsGroupsInOrderOfCreation) {
  Start(AHost().WithSsd("naa.1").WithSsd("naa.2").WithHdds({"naa.3", "naa.4", "naa.5"}));
  Format("naa.2", {"naa.5", "naa.3"});
  Format("naa.1", {"naa.4"});
  const auto groups = Groups();
  ASSERT_EQ(groups.size(), 2U);
  EXPECT_THAT(NamesOf(groups[0]), ElementsAre("naa.2", "naa.5", "naa.3"));
  EXPECT_THAT(NamesOf(groups[1]), ElementsAre("naa.1", "naa.4"));
}

TEST_P(ProviderContract, AnAbsentDiskKeepsItsRecordWithoutAName) {
  if (!Can().absentDisks || !Can().groupsFromStart) {
    GTEST_SKIP() << "disks of this host cannot leave";
  }
  Start(AHost()
            .WithSsd("naa.1")
            .WithHdds({"naa.2", "naa.3"})
            .WithGroup("naa.1", {"naa.2", "naa.3"})
            .Without("naa.2"));
  EXPECT_THAT(Query(), ElementsAre(IsDisk("naa.1"), IsDisk(""), IsDisk("naa.3")));
  EXPECT_THAT(Query({"naa.2"}), IsEmpty());
  const DiskResult record = RecordOf("");
  EXPECT_TRUE(record.isPdl);
  EXPECT_EQ(record.kovaUuid, "uuid-of-naa.2");
  const auto groups = Groups();
  ASSERT_EQ(groups.size(), 1U);
  EXPECT_EQ(groups[0].capacityDisks.at(0), (HostCtl::Kova::DiskName{"", "uuid-of-naa.2"}));
  EXPECT_EQ(groups[0].capacityDisks.at(1), (HostCtl::Kova::DiskName{"naa.3", "uuid-of-naa.3"}));
}

TEST_P(ProviderContract, AnswersTheConfigurationOfTheHost) {
  if (!Can().configuration) {
    GTEST_SKIP() << "this host's configuration cannot be given";
  }
  Start(AHost().Edit([](HostDescription& host) {
    host.faultDomain = "rack-1";
    host.cluster = {true, "cluster", "node"};
    host.networks = {{"otx1", "224.1.2.3", "FF19:0:0:0:0:2:3:4"}};
  }));
  EXPECT_EQ(Provider().GetFaultDomainName(), "rack-1");
  EXPECT_FALSE(Provider().IsAutoModeEnabled());
  HostCtl::Kova::KovaClusterInfoDetailed cluster;
  Provider().GetClusterInfoDetailed(cluster);
  EXPECT_TRUE(cluster.enabled);
  EXPECT_EQ(cluster.clusterUuid, "cluster");
  EXPECT_EQ(cluster.nodeUuid, "node");

  auto nics = Provider().GetKovaOtxNicConfigs();
  ASSERT_EQ(nics.size(), 1U);
  EXPECT_EQ(nics[0]->GetOtxnicName(), "otx1");
  EXPECT_FALSE(nics[0]->GetMasterMulticastGroup().isIpv6);
  EXPECT_EQ(nics[0]->GetMasterMulticastGroup().ipv4.GetStringAddress(), "224.1.2.3");
  EXPECT_TRUE(nics[0]->GetAgentMulticastGroup().isIpv6);
  EXPECT_EQ(nics[0]->GetAgentMulticastGroup().ipv6.GetStringAddress(), "FF19:0:0:0:0:2:3:4");
  OtxCtl::Util::DeleteVector(nics);
}

TEST_P(ProviderContract, AHostWithoutConfigurationAnswersEmptyValues) {
  Start(AHost().WithHdd("naa.1"));
  EXPECT_EQ(Provider().GetFaultDomainName(), "");
  EXPECT_THAT(Provider().GetKovaOtxNicConfigs(), IsEmpty());
  HostCtl::Kova::KovaClusterInfoDetailed cluster;
  cluster.enabled = true;
  cluster.clusterUuid = "left over";
  Provider().GetClusterInfoDetailed(cluster);
  EXPECT_FALSE(cluster.enabled);
  EXPECT_EQ(cluster.clusterUuid, "");
}

TEST_P(ProviderContract, RefreshingChangesNothingByItself) {
  Start(AHost().WithSsd("naa.1").WithHdd("naa.2"));
  Format("naa.1", {"naa.2"});
  const HostState before = State();
  Provider().RefreshKovaInfo();
  EXPECT_EQ(State(), before);
}

}  // namespace
}  // namespace OtxCtl::Contract
