// Mounting, restamping and removing disk groups: which commands are run, and who is refused.

#include "otxctl/linux/GroupChanges.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <regex>
#include <thread>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/linux/testing/ChangeableMachine.h"

namespace OtxCtl::Linux {
namespace {

using HostCtl::Lib::HostCtlException;
using HostCtl::Lib::KovaExceptionHasPartition;
using HostCtl::Lib::KovaExceptionLastRemainingHDD;
using HostCtl::Lib::KovaExceptionRemoveDiskAutoModeEnabled;
using HostCtl::Lib::KovaExceptionRemoveMappingAutoModeEnabled;
using HostCtl::Lib::KovaStorageException;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::StartsWith;

// The text of an exception of exactly this class; "" if nothing was thrown.
template <typename Exception, typename Change>
std::string Refusal(Change change) {
  try {
    change();
    return "";
  } catch (const Exception& refused) {
    EXPECT_EQ(typeid(refused), typeid(Exception)) << refused.what();
    return refused.Describe();
  }
}

GroupRow UnmountedGroup() {
  GroupRow group = WholeGroup();
  for (MemberRow& member : group.members) {
    member.isActive = false;
  }
  return group;
}

class GroupChangesTest : public testing::Test {
 protected:
  GroupChanges& Changes() { return *machine.changes; }

  ChangeableMachine machine;
};

TEST_F(GroupChangesTest, UnmountingIsToDeactivate) {
  machine.Show({WholeGroup()});
  Changes().Unmount("naa.1");
  EXPECT_THAT(machine.Changes(), ElementsAre("vgchange --activate n -- kova_g1"));
}

TEST_F(GroupChangesTest, MountingIsToActivate) {
  machine.Show({UnmountedGroup()});
  Changes().Mount("naa.1");
  EXPECT_THAT(machine.Changes(), ElementsAre("vgchange --activate y -- kova_g1"));
}

TEST_F(GroupChangesTest, WhatIsSoAlreadyNeedsNoCommand) {
  machine.Show({WholeGroup()});
  Changes().Mount("naa.1");
  Changes().Claim();
  machine.Show({UnmountedGroup()});
  Changes().Unmount("naa.1");
  EXPECT_THAT(machine.Changes(), IsEmpty());
}

TEST_F(GroupChangesTest, AGroupInUseIsNotUnmounted) {
  GroupRow group = WholeGroup();
  group.members[2].isOpen = true;
  machine.Show({group});
  EXPECT_THAT(Refusal<HostCtlException>([&] { Changes().Unmount("naa.1"); }),
              HasSubstr("its volume /dev/kova_g1/data_u3 is in use"));
  EXPECT_THAT(machine.Changes(), IsEmpty());
}

TEST_F(GroupChangesTest, AGroupThatIsUnmountedInPartIsMountedAgain) {
  machine.Show({WholeGroup()});
  machine.failing[1] = {5, "", "in use"};
  EXPECT_THAT(Refusal<HostCtlException>([&] { Changes().Unmount("naa.1"); }), HasSubstr("in use"));
  EXPECT_THAT(machine.Changes(),
              ElementsAre("vgchange --activate n -- kova_g1", "vgchange --activate y -- kova_g1"));
}

TEST_F(GroupChangesTest, VolumesOnDisksThatWentAwayAreLetGoBeforeMounting) {
  GroupRow group = UnmountedGroup();
  group.members[1].isLeftBehind = true;
  group.members[2].isActive = true;
  machine.Show({group});
  Changes().Mount("naa.1");
  EXPECT_THAT(machine.Changes(),
              ElementsAre("vgextend --restoremissing -- kova_g1 sdb", "vgchange --activate n -- kova_g1",
                          "vgchange --activate y -- kova_g1"));
}

TEST_F(GroupChangesTest, AVolumeOfAnAbsentDiskKeepsNoOtherFromBeingMounted) {
  GroupRow group = UnmountedGroup();
  group.members[2].disk = "";
  machine.Show({group});
  machine.failing[1] = {5, "", "  Refusing activation of partial LV kova_g1/data_u3.\n"};
  Changes().Mount("naa.1");
  machine.failing[2] = {5, "", "  something else\n"};
  EXPECT_THAT(Refusal<HostCtlException>([&] { Changes().Mount("naa.1"); }), HasSubstr("something else"));
}

TEST_F(GroupChangesTest, ClaimingMountsWhatCanBeMounted) {
  GroupRow first = UnmountedGroup();
  GroupRow second = {"ready", {{"", "v1", true}, {"sdd", "v2"}}, "g2", "kova_g2"};
  second.members[1].isActive = false;
  machine.Show({first, second});
  Changes().Claim();
  EXPECT_THAT(machine.Changes(), ElementsAre("vgchange --activate y -- kova_g1"));
  EXPECT_THAT(machine.log,
              testing::Contains("disk group g2 is not mounted: its cache disk has left the host"));
}

TEST_F(GroupChangesTest, ClaimingTellsWhatItCouldNotMountAndMountsTheOthers) {
  GroupRow first = {"ready", {{"sda", "u1", true}, {"sdb", "u2"}}};
  GroupRow second = {"ready", {{"sde", "v1", true}, {"sdd", "v2"}}, "g2", "kova_g2"};
  first.members[1].isActive = second.members[1].isActive = false;
  machine.Show({first, second});
  machine.failing[1] = {5, "", "bad"};
  EXPECT_THAT(Refusal<HostCtlException>([&] { Changes().Claim(); }),
              StartsWith("disk group g1 cannot be mounted"));
  EXPECT_EQ(machine.Changes().size(), 2U);
}

TEST_F(GroupChangesTest, RestampingGivesANewIdentity) {
  machine.Show({WholeGroup()});
  Changes().Restamp("naa.1");
  ASSERT_EQ(machine.Changes().size(), 1U);
  EXPECT_TRUE(std::regex_match(
      machine.Changes()[0],
      std::regex("vgchange --deltag kova.group=g1 --addtag kova.group=[0-9a-f-]{36} -- kova_g1")))
      << machine.Changes()[0];
}

TEST_F(GroupChangesTest, AGroupWhoseCacheDiskHasLeftIsRestampedByUuid) {
  GroupRow group = WholeGroup();
  group.members[0].disk = "";
  machine.Show({group});
  for (const char* const uuid : {"u2", "u9", ""}) {
    EXPECT_NE(Refusal<KovaStorageException>([&] { Changes().RestampByUuid(uuid); }), "") << uuid;
  }
  EXPECT_THAT(machine.Changes(), IsEmpty());
  Changes().RestampByUuid("u1");
  EXPECT_EQ(machine.Changes().size(), 1U);
}

TEST_F(GroupChangesTest, ARemovedDiskGoesWithItsVolume) {
  machine.Show({WholeGroup()});
  Changes().RemoveDisk("naa.2", {"discard", 0, 0});
  EXPECT_THAT(machine.Changes(),
              ElementsAre("lvremove --yes -- kova_g1/data_u2", "vgreduce -- kova_g1 sdb", "pvremove -- sdb"));
  EXPECT_THAT(machine.locked, ElementsAre("naa.2"));
  EXPECT_THAT(machine.Recorded(), IsEmpty());
}

TEST_F(GroupChangesTest, ADiskWhoseVolumeCannotBeRemovedStaysAMember) {
  machine.Show({WholeGroup()});
  machine.failing[1] = {5, "", "in use"};
  EXPECT_THAT(Refusal<HostCtlException>([&] { Changes().RemoveDisk("naa.2", {}); }), HasSubstr("in use"));
  EXPECT_EQ(machine.Changes().size(), 1U);
  EXPECT_THAT(machine.Recorded(), IsEmpty());
}

TEST_F(GroupChangesTest, ADiskThatIsHalfRemovedIsToldAndRemembered) {
  machine.Show({WholeGroup()});
  machine.failing[3] = {5, "", "busy"};
  EXPECT_THAT(Refusal<HostCtlException>([&] { Changes().RemoveDisk("naa.2", {}); }),
              AllOf(HasSubstr("busy"), HasSubstr("can be cleaned up by removing the disk")));
  EXPECT_THAT(machine.Recorded(), ElementsAre("naa.2"));
}

TEST_F(GroupChangesTest, AVolumeInUseKeepsItsDisk) {
  GroupRow group = WholeGroup();
  group.members[1].isOpen = true;
  machine.Show({group});
  EXPECT_THAT(Refusal<HostCtlException>([&] { Changes().RemoveDisk("naa.2", {}); }), HasSubstr("is in use"));
  EXPECT_THAT(Refusal<HostCtlException>([&] { Changes().RemoveGroup("naa.1", {}); }), HasSubstr("is in use"));
  EXPECT_THAT(machine.Changes(), IsEmpty());
}

const std::vector<std::string> dissolved = {
    "vgchange --deltag kova.state=ready --addtag kova.state=removing -- kova_g1", "vgremove --yes -- kova_g1",
    "pvremove -- sda sdb sdc"};

TEST_F(GroupChangesTest, ARemovedGroupIsMarkedFirst) {
  machine.Show({WholeGroup()});
  Changes().RemoveGroup("naa.1", {});
  EXPECT_EQ(machine.Changes(), dissolved);
  EXPECT_THAT(machine.locked, ElementsAre("naa.1", "naa.2", "naa.3"));
}

TEST_F(GroupChangesTest, TheCacheDiskTakesItsGroupAlong) {
  machine.Show({WholeGroup()});
  Changes().RemoveDisk("naa.1", {});
  EXPECT_EQ(machine.Changes(), dissolved);
}

TEST_F(GroupChangesTest, AGroupThatCannotBeRemovedIsReadyAgain) {
  machine.Show({WholeGroup()});
  machine.failing[2] = {5, "", "in use"};
  EXPECT_THAT(Refusal<HostCtlException>([&] { Changes().RemoveGroup("naa.1", {}); }), HasSubstr("in use"));
  EXPECT_EQ(machine.Changes().back(),
            "vgchange --deltag kova.state=removing --addtag kova.state=ready -- kova_g1");
}

TEST_F(GroupChangesTest, AGroupThatHoldsSomebodyElsesVolumeIsNotRemoved) {
  GroupRow group = WholeGroup();
  group.foreignVolume = "home";
  machine.Show({group});
  EXPECT_THAT(Refusal<HostCtlException>([&] { Changes().RemoveGroup("naa.1", {}); }),
              HasSubstr("it holds the volume kova_g1/home, which somebody else has made"));
  EXPECT_THAT(machine.Changes(), IsEmpty());
}

TEST_F(GroupChangesTest, OnlyTheVolumeOfAnAbsentDiskIsLostWithIt) {
  GroupRow group = WholeGroup();
  group.members[2].disk = "";
  machine.Show({group});
  Changes().RemoveByUuid("u3");
  EXPECT_THAT(machine.Changes(),
              ElementsAre("lvremove --yes -- kova_g1/data_u3", "vgreduce --removemissing -- kova_g1"));
  EXPECT_EQ(machine.Shortened(machine.machine.results.commands.back().at(3)), "sda,sdb");
}

TEST_F(GroupChangesTest, AnotherAbsentDiskKeepsItsVolume) {
  GroupRow group = WholeGroup();
  group.members[1].disk = group.members[2].disk = "";
  group.members.push_back({"sdd", "u4"});
  machine.Show({group});
  machine.failing[2] = {5, "", "There are still partial LVs in VG kova_g1."};
  Changes().RemoveByUuid("u3");
  EXPECT_EQ(machine.Changes().size(), 2U);
  machine.failing[4] = {3, "", "bad"};
  EXPECT_THAT(Refusal<HostCtlException>([&] { Changes().RemoveByUuid("u2"); }), HasSubstr("bad"));
}

TEST_F(GroupChangesTest, AnAbsentCacheDiskIsTakenOffItsVolumesBeforeAnythingElse) {
  GroupRow group = WholeGroup();
  group.members[0].disk = "";
  machine.Show({group});
  Changes().RemoveByUuid("u1");
  EXPECT_THAT(
      machine.Changes(),
      ElementsAre("vgchange --activate n -- kova_g1", "lvconvert --yes --splitcache -- kova_g1/data_u2",
                  "lvconvert --yes --splitcache -- kova_g1/data_u3",
                  "vgreduce --removemissing --force -- kova_g1", "vgchange --activate y -- kova_g1",
                  "vgchange --deltag kova.state=ready --addtag kova.state=removing -- kova_g1",
                  "vgremove --yes -- kova_g1", "pvremove -- sdb sdc"));
}

TEST_F(GroupChangesTest, DataThatOutlivedTheirCacheAreKept) {
  GroupRow group = WholeGroup();
  group.members[0].disk = "";
  group.members[1].volumeKind = "linear";  // taken off it already
  machine.Show({group});
  machine.holdsData = true;
  Changes().RemoveByUuid("u1");
  EXPECT_THAT(
      machine.Changes(),
      ElementsAre("vgchange --activate n -- kova_g1", "lvconvert --yes --splitcache -- kova_g1/data_u3",
                  "vgreduce --removemissing --force -- kova_g1", "vgchange --activate y -- kova_g1",
                  "vgchange --deltag kova.state=ready --addtag kova.state=released -- kova_g1",
                  "vgchange --activate n -- kova_g1"));
}

TEST_F(GroupChangesTest, AHalfMadeGroupIsCleanedUpByAnyOfItsDisks) {
  GroupRow group = WholeGroup();
  group.state = "creating";
  machine.Show({group});
  Changes().RemoveDisk("naa.3", {});
  EXPECT_THAT(machine.Changes(), ElementsAre("vgremove --yes -- kova_g1", "pvremove -- sda sdb sdc"));
}

TEST_F(GroupChangesTest, AHalfJoinedDiskIsCleanedUpAlone) {
  GroupRow group = WholeGroup();
  group.members.push_back({"sdd", "u4", false, false, "linear"});
  machine.Show({group});
  machine.failing[1] = {5, "", "Failed to find logical volume"};
  Changes().RemoveDisk("naa.4", {});
  EXPECT_THAT(machine.Changes(),
              ElementsAre("lvremove --yes -- kova_g1/data_u4", "vgreduce -- kova_g1 sdd", "pvremove -- sdd"));
}

TEST_F(GroupChangesTest, WhatIsInNoVolumeGroupIsCleanedUpIfAChangeWasAtIt) {
  machine.ShowOrphan("sdb");
  EXPECT_NE(Refusal<KovaStorageException>([&] { Changes().RemoveDisk("naa.2", {}); }), "");
  ChangeRecord(machine.machine.stateFolder).Add({"naa.2"});
  Changes().RemoveDisk("naa.2", {});
  EXPECT_THAT(machine.Changes(), ElementsAre("pvremove -- sdb"));
  EXPECT_THAT(machine.Recorded(), IsEmpty());
}

TEST_F(GroupChangesTest, TheLastCapacityDiskStays) {
  machine.Show({{"ready", {{"sda", "u1", true}, {"sdb", "u2"}}}});
  EXPECT_NE(Refusal<KovaExceptionLastRemainingHDD>([&] { Changes().RemoveDisk("naa.2", {}); }), "");
  machine.Show({{"ready", {{"sda", "u1", true}, {"", "u2"}}}});
  EXPECT_NE(Refusal<KovaExceptionLastRemainingHDD>([&] { Changes().RemoveByUuid("u2"); }), "");
}

TEST_F(GroupChangesTest, NothingIsRemovedInTheAutomaticMode) {
  machine.Show({WholeGroup()});
  machine.machine.settings.isAutoMode = true;
  EXPECT_NE(Refusal<KovaExceptionRemoveDiskAutoModeEnabled>([&] { Changes().RemoveDisk("nobody", {}); }), "");
  EXPECT_NE(Refusal<KovaExceptionRemoveMappingAutoModeEnabled>([&] { Changes().RemoveGroup("nobody", {}); }),
            "");
}

TEST_F(GroupChangesTest, NothingCanBeEvacuated) {
  machine.Show({WholeGroup()});
  EXPECT_THAT(Refusal<KovaStorageException>([&] {
                Changes().RemoveDisk("naa.2", {"evacuate", 0, 0});
              }),
              HasSubstr("every disk is filled by its own volume"));
  EXPECT_NE(Refusal<KovaStorageException>([&] { Changes().RemoveGroup("naa.1", {"evacuate", 0, 0}); }), "");
  EXPECT_THAT(machine.Changes(), IsEmpty());
}

TEST_F(GroupChangesTest, ARemovalThatCannotBeginInTimeDoesNotBegin) {
  machine.Show({WholeGroup()});
  machine.machine.probe->whileProbing = [](const std::string& name) {
    if (name == "sda") {
      std::this_thread::sleep_for(std::chrono::milliseconds(1100));
    }
  };
  EXPECT_THAT(Refusal<KovaStorageException>([&] {
                Changes().RemoveDisk("naa.2", {"discard", 1, 0});
              }),
              HasSubstr("1 s were over before anything could be changed"));
  EXPECT_THAT(machine.Changes(), IsEmpty());
  Changes().RemoveDisk("naa.2", {"whatever", 1, 0});
  EXPECT_THAT(machine.Changes(), testing::Not(IsEmpty()));
}

struct RefusedRow {
  const char* disk;
  const char* words;
};

TEST_F(GroupChangesTest, ADiskThatIsNotFreeIsRefusedByItsName) {
  GroupRow group = {"ready", {{"sda", "u1", true}, {"sdb", "u2"}}};
  machine.Show({group});
  machine.machine.probe->results["sdc"] = EmptyDisk();
  machine.machine.probe->results["sdc"].signatures = std::vector<std::string>{"ext4 file system"};
  for (const RefusedRow& row : {RefusedRow{"naa.2", "is a member of disk group g1"},
                                {"naa.3", "is not free: ext4 file system"},
                                {"naa.9", "is not there"},
                                {"", "is not there"},
                                {"naa.5", "is named more than once"}}) {
    try {
      Changes().Format("naa.5", {row.disk});
      ADD_FAILURE() << row.disk;
    } catch (const KovaStorageException& refused) {
      EXPECT_EQ(refused.GetDiskName(), row.disk);
      EXPECT_THAT(refused.Describe(), HasSubstr(row.words));
    }
  }
  EXPECT_THAT(machine.Changes(), IsEmpty());
  EXPECT_THAT(machine.locked, IsEmpty());
}

TEST_F(GroupChangesTest, ADiskWithPartitionsIsRefusedInItsOwnWay) {
  machine.machine.tree.AddPartition("sdc", "sdc1");
  machine.machine.probe->results["sdc"] = EmptyDisk();
  machine.machine.probe->results["sdc"].partitionTable = std::string("gpt");
  EXPECT_NE(Refusal<KovaExceptionHasPartition>([&] { Changes().Format("naa.1", {"naa.3"}); }), "");
}

TEST_F(GroupChangesTest, AGroupOfNoneOrOfEightIsRefused) {
  EXPECT_NE(Refusal<HostCtlException>([&] { Changes().Format("naa.1", {}); }), "");
  GroupRow full = {"ready", {{"sda", "u1", true}, {"sdb", "u2"}}};
  for (const char* const uuid : {"u3", "u4", "u5", "u6", "u7", "u8"}) {
    full.members.push_back({"", uuid});
  }
  machine.Show({full});
  EXPECT_THAT(Refusal<HostCtlException>([&] { Changes().Format("naa.1", {"naa.4"}); }),
              HasSubstr("at most 7 capacity disks, and would have 8"));
}

// Everything that was seen before a change is out of date.
TEST_F(GroupChangesTest, WhoLooksOnceSeesWhatHasChangedAllTheSame) {
  machine.Show({WholeGroup()});
  const LinuxHost::OneLook oneLook;
  EXPECT_TRUE(machine.host->Look()->groups.at(0).isMounted);
  machine.after = [this](const std::vector<std::string>&) { machine.Show({UnmountedGroup()}); };
  Changes().Unmount("naa.1");
  EXPECT_FALSE(machine.host->Look()->groups.at(0).isMounted);
}

TEST_F(GroupChangesTest, WithoutAVolumeManagerNothingIsBegun) {
  machine.machine.results.areThere = false;
  EXPECT_THAT(Refusal<HostCtlException>([&] { Changes().Format("naa.1", {"naa.2"}); }),
              HasSubstr("/usr/sbin/lvm is not there; it comes with the package lvm2"));
  EXPECT_THAT(machine.machine.results.commands, IsEmpty());
  EXPECT_THAT(machine.Recorded(), IsEmpty());
}

TEST_F(GroupChangesTest, KeepOtherProgramsOut) {
  const std::string file = machine.machine.tree.Full("run/lock").string();
  machine.machine.tree.MakeFolder("run");
  const auto withLock = [&] {
    ChangeTools tools;
    tools.commands = std::make_unique<FakeCommands>(machine.machine.results);
    tools.locks = std::make_unique<FakeLocks>(machine.locked, machine.whyNotTheSame);
    tools.lockFile = file;
    return std::make_unique<GroupChanges>(machine.host, std::move(tools));
  };
  const auto one = withLock();
  one->KeepOthersOut();
  one->KeepOthersOut();
  const auto other = withLock();
  EXPECT_THAT(Refusal<HostCtlException>([&] { other->Claim(); }),
              HasSubstr("process " + std::to_string(getpid()) + " changes the disks of this host already"));
}

}  // namespace
}  // namespace OtxCtl::Linux
