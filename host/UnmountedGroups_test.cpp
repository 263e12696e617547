#include "host/UnmountedGroups.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/KnownDisks.h"
#include "machines/SimulatedInventory.h"
#include "nox/Host.h"
#include "otxctl/sim/HostBuilder.h"
#include "otxctl/sim/SimHost.h"

namespace Host {
namespace {

using Nox::Kova::Host::DiskMapInfo;
using OtxCtl::Sim::AHost;
using OtxCtl::Sim::HostBuilder;
using OtxCtl::Sim::SimHost;
using StorageInfo = Nox::Kova::Host::ConfigInfo::StorageInfo;
using testing::ElementsAre;

HostBuilder FourDisks() {
  return AHost().WithSsd("naa.1").WithHdd("naa.2").WithSsd("naa.3").WithHdds({"naa.4", "naa.5"});
}

// One that is not mounted.
KernelGroup GroupOf(const HostCtl::Kova::DiskName& ssd, const std::string& disk) {
  KernelGroup group;
  group.disks.ssd = ssd;
  group.disks.capacityDisks = {{disk, ""}};
  return group;
}

// The cache disks, and "+" in front of those of mounted groups.
std::vector<std::string> CacheDisksOf(const std::vector<KernelGroup>& groups) {
  std::vector<std::string> names;
  for (const KernelGroup& group : groups) {
    names.push_back((group.mounted ? "+" : "") + group.disks.ssd.deviceName);
  }
  return names;
}

// "SSD: DISK DISK", and "+" in front of one that is mounted.
std::vector<std::string> Listed(const StorageInfo& info) {
  std::vector<std::string> lines;
  for (const DiskMapInfo* group : *info.GetDiskMapInfo()) {
    std::string line =
        (group->GetMounted() ? "+" : "") + group->GetMapping()->GetSsd()->GetCanonicalName() + ":";
    for (const Nox::Host::ScsiDisk* disk : *group->GetMapping()->GetNonSsd()) {
      line += " " + disk->GetCanonicalName();
    }
    lines.push_back(line);
  }
  return lines;
}

StorageInfo InfoAbout(const HostBuilder& builder) {
  SimHost host(builder.Build());
  StorageInfo info;
  AppendUnlisted(GroupsOf(host), KnownDisks(Machines::DescribeInventory(host.Snapshot())), info);
  return info;
}

TEST(GroupsOfTheKernel, AreAllOfThemAndSayWhetherTheyAreMounted) {
  SimHost host(FourDisks().WithGroup("naa.1", {"naa.2"}).WithUnmountedGroup("naa.3", {"naa.4"}).Build());
  EXPECT_THAT(CacheDisksOf(GroupsOf(host)), ElementsAre("+naa.1", "naa.3"));
  host.UnmountDiskMapping("naa.1");
  EXPECT_THAT(CacheDisksOf(GroupsOf(host)), ElementsAre("naa.1", "naa.3"));
  host.ClaimUnmountedDiskgroups();
  EXPECT_THAT(CacheDisksOf(GroupsOf(host)), ElementsAre("+naa.1", "+naa.3"));
}

TEST(UnmountedGroups, StandBehindTheMountedOnes) {
  SimHost host(
      FourDisks().WithGroup("naa.1", {"naa.2"}).WithUnmountedGroup("naa.3", {"naa.4", "naa.5"}).Build());
  const KnownDisks known(Machines::DescribeInventory(host.Snapshot()));
  const std::vector<KernelGroup> groups = GroupsOf(host);
  StorageInfo info;
  AppendUnlisted({groups.front()}, known, info);
  AppendUnlisted(groups, known, info);
  EXPECT_THAT(Listed(info), ElementsAre("+naa.1: naa.2", "naa.3: naa.4 naa.5"));
  AppendUnlisted(groups, known, info);
  EXPECT_THAT(Listed(info), ElementsAre("+naa.1: naa.2", "naa.3: naa.4 naa.5")) << "none is listed twice";
}

TEST(UnmountedGroups, ThatAreMountedBetweenTheTwoQuestionsAreListed) {
  SimHost host(FourDisks().WithUnmountedGroup("naa.3", {"naa.4"}).Build());
  StorageInfo info;  // which listed nothing
  host.ClaimUnmountedDiskgroups();
  AppendUnlisted(GroupsOf(host), KnownDisks(Machines::DescribeInventory(host.Snapshot())), info);
  EXPECT_THAT(Listed(info), ElementsAre("+naa.3: naa.4"));
}

TEST(UnmountedGroups, ThatGrewBetweenTheTwoQuestionsAreListedAsTheyWere) {
  const KernelGroup before = GroupOf({"naa.1", ""}, "naa.2");
  KernelGroup after = before;
  after.disks.capacityDisks.push_back({"naa.4", ""});
  const KnownDisks known(Machines::DescribeInventory(FourDisks().Build()));
  StorageInfo info;
  AppendUnlisted({before}, known, info);
  AppendUnlisted({after}, known, info);
  EXPECT_THAT(Listed(info), ElementsAre("naa.1: naa.2"));
}

TEST(UnmountedGroups, WhoseCacheDisksHaveLeftDoNotHideEachOther) {
  const auto groupOf = [](const char* uuid, const char* disk) { return GroupOf({"", uuid}, disk); };
  const KnownDisks known(Machines::DescribeInventory(FourDisks().Build()));
  StorageInfo info;
  const KernelGroup mounted = groupOf("", "naa.4");
  AppendUnlisted({mounted}, known, info);
  AppendUnlisted({groupOf("", "naa.2"), mounted, groupOf("u", "naa.1"), groupOf("u", "naa.5")}, known, info);
  EXPECT_THAT(Listed(info), ElementsAre("kova:: naa.4", "kova:: naa.2", "kova:u: naa.1", "kova:u: naa.5"));
}

TEST(UnmountedGroups, ShowTheInventorysDisksWithTheirKovaUuid) {
  const StorageInfo info = InfoAbout(FourDisks().WithUnmountedGroup("naa.1", {"naa.2"}));
  const auto ssd = (*info.GetDiskMapInfo())[0]->GetMapping()->GetSsd();
  EXPECT_TRUE(ssd->GetSsd());
  EXPECT_EQ(ssd->GetCapacity()->GetBlock(), HostBuilder::diskBytes / 512);
  EXPECT_EQ(ssd->GetKovaDiskInfo()->GetKovaUuid(), "uuid-of-naa.1");
}

TEST(UnmountedGroups, ShowADiskThatHasLeftByItsUuid) {
  const StorageInfo info =
      InfoAbout(FourDisks().WithUnmountedGroup("naa.1", {"naa.2"}).Without("naa.1").Without("naa.2"));
  EXPECT_THAT(Listed(info), ElementsAre("kova:uuid-of-naa.1: kova:uuid-of-naa.2"));
  EXPECT_TRUE((*info.GetDiskMapInfo())[0]->GetMapping()->GetSsd()->GetSsd());
}

TEST(UnmountedGroups, ShowADiskThatTheInventoryLacksByItsName) {
  const StorageInfo info =
      InfoAbout(AHost()
                    .WithSsd("naa.1")
                    .WithDisk("naa.2", false, [](OtxCtl::Sim::HostDisk& disk) { disk.inInventory = false; })
                    .WithUnmountedGroup("naa.1", {"naa.2"}));
  EXPECT_THAT(Listed(info), ElementsAre("naa.1: naa.2"));
}

}  // namespace
}  // namespace Host
