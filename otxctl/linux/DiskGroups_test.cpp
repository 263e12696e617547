#include "otxctl/linux/DiskGroups.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <utility>

#include "otxctl/linux/testing/TestGroups.h"

namespace OtxCtl::Linux {
namespace {

using Disks::Membership;
using testing::ElementsAre;
using testing::IsEmpty;

// One disk group: cache disk 1, capacity disks 2 and 3, its volumes active.
struct Machine {
  std::vector<ScannedDisk> disks = {MemberDisk("1", true), MemberDisk("2", false), MemberDisk("3", false)};
  std::vector<PhysicalVolume> physical = {MemberVolume("1", "cache", "u1"),
                                          MemberVolume("2", "capacity", "u2", "g1", 1),
                                          MemberVolume("3", "capacity", "u3", "g1", 0)};
  std::vector<LogicalVolume> logical = {DataVolumeOf("u2"), DataVolumeOf("u3")};
  std::vector<std::string> underChange;
  std::vector<Unfinished> unfinished;

  std::vector<DiskGroup> Find(const std::string& machineId = testMachine) {
    FoundGroups found = FindDiskGroups(physical, logical, machineId, underChange, disks);
    unfinished = std::move(found.unfinished);
    return std::move(found.groups);
  }

  // The one line that is told of each disk.
  std::string WordsOf(std::size_t disk) const { return disks[disk].facts.signatures.Get().at(0); }
};

std::vector<std::string> UuidsOf(const DiskGroup& group) {
  std::vector<std::string> uuids = {group.cache.kovaUuid};
  for (const GroupMember& member : group.capacity) {
    uuids.push_back(member.kovaUuid);
  }
  return uuids;
}

TEST(DiskGroups, AreVolumeGroupsWithTheMarksOfThisMachine) {
  Machine machine;
  const auto groups = machine.Find();
  ASSERT_EQ(groups.size(), 1U);
  EXPECT_EQ(groups[0].uuid, "g1");
  EXPECT_TRUE(groups[0].isMounted);
  EXPECT_FALSE(groups[0].HasLeft());
  EXPECT_THAT(UuidsOf(groups[0]), ElementsAre("u1", "u3", "u2")) << "in the order of their places";
  EXPECT_EQ(groups[0].cache.canonicalName, "naa.1");
  EXPECT_TRUE(groups[0].cache.isFlash);
  EXPECT_FALSE(groups[0].capacity[0].isFlash);
  for (const ScannedDisk& disk : machine.disks) {
    EXPECT_EQ(disk.facts.membership, Membership::Mounted);
    EXPECT_EQ(disk.facts.group, "g1");
  }
}

TEST(DiskGroups, AreMountedWhenAllTheirVolumesAreActive) {
  Machine machine;
  machine.logical[1].isActive = false;
  EXPECT_FALSE(machine.Find().at(0).isMounted);
  EXPECT_EQ(machine.disks[0].facts.membership, Membership::Unmounted);
}

TEST(DiskGroups, AreNotMountedOnADiskThatWentAway) {
  Machine capacity;
  capacity.disks[2].facts.holders = std::vector<std::string>();
  EXPECT_FALSE(capacity.Find().at(0).isMounted) << "its map is on the disk that was there before";
  Machine cache;
  cache.disks[0].facts.holders = std::vector<std::string>();
  EXPECT_FALSE(cache.Find().at(0).isMounted);
  Machine unknown;
  unknown.disks[0].facts.holders = Disks::Fact<std::vector<std::string>>::Unknown("why");
  EXPECT_TRUE(unknown.Find().at(0).isMounted);
}

TEST(DiskGroups, AreNotMountedBeforeAMemberThatCameBackIsTakenBack) {
  for (const std::size_t member : {0, 2}) {
    Machine machine;
    machine.physical[member].isLeftBehind = true;
    const auto groups = machine.Find();
    ASSERT_EQ(groups.size(), 1U);
    EXPECT_FALSE(groups[0].isMounted);
    EXPECT_EQ((member == 0 ? groups[0].cache : groups[0].capacity[0]).isLeftBehind, true);
  }
}

TEST(DiskGroups, TellOfTheirVolumes) {
  Machine machine;
  const auto groups = machine.Find();
  EXPECT_EQ(groups.at(0).volumeGroup, "vg-g1");
  EXPECT_EQ(groups[0].volumeGroupUuid, "vg-uuid-g1");
  EXPECT_EQ(groups[0].cache.extents, 511);
  EXPECT_EQ(groups[0].cache.deviceNode, "/dev/sd1");
  const DataVolume& volume = groups[0].capacity.at(1).volume;
  EXPECT_EQ(volume.path, "/dev/vg-g1/data_u2");
  EXPECT_EQ(volume.bytes, std::int64_t{4} << 30);
  EXPECT_EQ(volume.cacheState, "37% of its cache used");
  EXPECT_TRUE(volume.isActive);
  EXPECT_FALSE(volume.isOpen);
  EXPECT_THAT(groups[0].foreignVolumes, IsEmpty());
}

TEST(DiskGroups, AreOfTheKindThatTheyWereMade) {
  const auto isAllFlash = [](const std::string& tag, bool areFlash) {
    Machine machine;
    machine.disks[1].facts.isFlash = machine.disks[2].facts.isFlash = areFlash;
    for (PhysicalVolume& volume : machine.physical) {
      volume.groupTags.push_back(tag);
    }
    return machine.Find().at(0).isAllFlash;
  };
  EXPECT_TRUE(isAllFlash("kova.kind=all-flash", false));
  EXPECT_FALSE(isAllFlash("kova.kind=hybrid", true));
  EXPECT_TRUE(isAllFlash("", true)) << "one that does not say so";
  EXPECT_FALSE(isAllFlash("", false));
}

TEST(DiskGroups, TellHowAVolumeIsCached) {
  const auto stateWith = [](const std::function<void(LogicalVolume&)>& change) {
    Machine machine;
    change(machine.logical[0]);
    return machine.Find().at(0).capacity.at(1).volume.cacheState;
  };
  EXPECT_EQ(stateWith([](LogicalVolume& v) { v.isActive = false; }), "cached, not active");
  EXPECT_EQ(stateWith([](LogicalVolume& v) { v.cacheBlocks = 0; }), "cached, not active");
  EXPECT_EQ(stateWith([](LogicalVolume& v) { v.cacheMode = "writeback"; }), "cached in mode writeback");
  EXPECT_EQ(stateWith([](LogicalVolume& v) { v.cacheMode.clear(); }), "cached in mode unknown");
}

TEST(DiskGroups, VolumesOfOthersInThemAreTold) {
  Machine machine;
  LogicalVolume own = DataVolumeOf("u2");
  own.name = "data_u2_cache";
  own.tags.clear();
  LogicalVolume foreign = own;
  foreign.name = "home";
  machine.logical.insert(machine.logical.end(), {own, foreign});
  EXPECT_THAT(machine.Find().at(0).foreignVolumes, ElementsAre("home"));
}

// A disk is a member from the moment its volume is cached until it is removed.
TEST(DiskGroups, ADiskWithoutAWholeVolumeIsHalfWay) {
  struct Row {
    const char* title;
    std::function<void(Machine&)> change;
    std::vector<std::string> volumes;
  };
  const std::vector<Row> rows = {
      {"no volume yet", [](Machine& m) { m.logical.erase(m.logical.begin()); }, {}},
      {"no marks yet",
       [](Machine& m) {
         m.logical.erase(m.logical.begin());
         m.physical[1].tags.clear();
       },
       {}},
      {"not yet cached",
       [](Machine& m) {
         m.logical[0].kind = "linear";
         m.logical.push_back(m.logical[0]);
         m.logical.back().name = "data_u2_cache";
         m.logical.back().tags.clear();
       },
       {"data_u2", "data_u2_cache"}},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.title);
    Machine machine;
    row.change(machine);
    const auto groups = machine.Find();
    ASSERT_EQ(groups.size(), 1U);
    EXPECT_THAT(UuidsOf(groups[0]), ElementsAre("u1", "u3"));
    EXPECT_TRUE(groups[0].isMounted);
    EXPECT_EQ(machine.WordsOf(1), "half way into disk group g1, or out of it");
    EXPECT_EQ(machine.disks[1].facts.membership, Membership::None);
    ASSERT_EQ(machine.unfinished.size(), 1U);
    EXPECT_THAT(machine.unfinished[0].disks, ElementsAre("naa.2"));
    EXPECT_THAT(machine.unfinished[0].deviceNodes, ElementsAre("/dev/sd2"));
    EXPECT_EQ(machine.unfinished[0].volumeGroup, "vg-g1");
    EXPECT_FALSE(machine.unfinished[0].isWholeGroup);
    EXPECT_EQ(machine.unfinished[0].volumes, row.volumes);
  }
}

TEST(DiskGroups, VolumesWithoutACacheAreThoseOfAGroupWhoseCacheDiskHasLeft) {
  Machine machine;
  machine.disks.erase(machine.disks.begin());
  machine.physical[0].deviceNumber.clear();
  machine.logical[0].kind = "linear";
  const auto groups = machine.Find();
  ASSERT_EQ(groups.size(), 1U);
  EXPECT_EQ(groups[0].capacity.size(), 2U);
  EXPECT_EQ(groups[0].capacity[1].volume.cacheState, "not cached");
}

TEST(DiskGroups, HalfMadeAndHalfRemovedOnesOfThisMachineCanBeCleanedUp) {
  for (const char* const state : {"creating", "removing"}) {
    Machine machine;
    for (PhysicalVolume& volume : machine.physical) {
      volume.groupTags[3] = std::string("kova.state=") + state;
    }
    EXPECT_THAT(machine.Find(), IsEmpty());
    ASSERT_EQ(machine.unfinished.size(), 1U) << state;
    EXPECT_TRUE(machine.unfinished[0].isWholeGroup);
    EXPECT_EQ(machine.unfinished[0].volumeGroup, "vg-g1");
    EXPECT_THAT(machine.unfinished[0].disks, ElementsAre("naa.1", "naa.2", "naa.3"));
    for (PhysicalVolume& volume : machine.physical) {
      volume.groupTags[2] = "kova.machine=machine-2";
    }
    machine.Find();
    EXPECT_THAT(machine.unfinished, IsEmpty()) << "another machine may be at it";
  }
}

TEST(DiskGroups, WhatAChangeLeftInNoVolumeGroupCanBeCleanedUp) {
  Machine machine;
  machine.physical[1].groupUuid.clear();
  machine.physical[2].groupUuid.clear();
  machine.underChange = {"naa.9", "naa.3"};
  machine.Find();
  EXPECT_EQ(machine.WordsOf(1), "LVM physical volume in no volume group");
  EXPECT_EQ(machine.WordsOf(2), "LVM physical volume that an unfinished change of a disk group left behind");
  EXPECT_EQ(machine.disks[2].facts.signatures.Get().size(), 1U);
  ASSERT_EQ(machine.unfinished.size(), 1U);
  EXPECT_THAT(machine.unfinished[0].disks, ElementsAre("naa.3"));
  EXPECT_EQ(machine.unfinished[0].volumeGroup, "");
}

TEST(DiskGroups, KeepMembersThatHaveLeft) {
  Machine machine;
  machine.disks.pop_back();
  machine.physical[2].deviceNumber.clear();
  const auto groups = machine.Find();
  ASSERT_EQ(groups.size(), 1U);
  EXPECT_EQ(groups[0].capacity[0].kovaUuid, "u3");
  EXPECT_EQ(groups[0].capacity[0].canonicalName, "");
}

TEST(DiskGroups, MayHaveLostTheirCacheDisk) {
  Machine machine;
  machine.disks.erase(machine.disks.begin());
  machine.physical[0].deviceNumber.clear();
  const auto groups = machine.Find();
  ASSERT_EQ(groups.size(), 1U);
  EXPECT_TRUE(groups[0].HasLeft());
  EXPECT_TRUE(groups[0].cache.isFlash);
}

TEST(DiskGroups, StandInOrderOfCreation) {
  Machine machine;
  for (const char* const number : {"4", "5"}) {
    machine.disks.push_back(MemberDisk(number, *number == '4'));
    machine.physical.push_back(
        MemberVolume(number, *number == '4' ? "cache" : "capacity", std::string("v") + number, "g0"));
    machine.physical.back().groupTags.back() = "kova.created=4";
  }
  machine.logical.push_back(DataVolumeOf("v5", "g0"));
  const auto groups = machine.Find();
  ASSERT_EQ(groups.size(), 2U);
  EXPECT_EQ(groups[0].uuid, "g0");
  EXPECT_EQ(groups[1].uuid, "g1");
}

struct ForeignRow {
  std::function<void(Machine&)> change;
  const char* words;
};

void SetGroupTag(Machine& machine, std::size_t tag, const std::string& value) {
  for (PhysicalVolume& volume : machine.physical) {
    volume.groupTags[tag] = value;
  }
}

TEST(DiskGroups, WhatIsNotWholeAndOursIsShownAsWhatItIsAndNeverClaimed) {
  const std::vector<ForeignRow> rows = {
      {[](Machine& m) { SetGroupTag(m, 0, "other"); }, "member of volume group vg-g1"},
      {[](Machine& m) { SetGroupTag(m, 1, "kova.group="); }, "member of disk group which has no identity"},
      {[](Machine& m) { SetGroupTag(m, 2, "kova.machine=machine-2"); },
       "member of disk group g1, of another machine"},
      {[](Machine& m) { SetGroupTag(m, 2, "x"); }, "member of disk group g1, of another machine"},
      {[](Machine& m) { SetGroupTag(m, 3, "kova.state=creating"); },
       "member of disk group g1, which was never finished"},
      {[](Machine& m) { SetGroupTag(m, 3, "x"); }, "member of disk group g1, which was never finished"},
      {[](Machine& m) { SetGroupTag(m, 3, "kova.state=removing"); },
       "member of disk group g1, of which the removal was not finished"},
      {[](Machine& m) { SetGroupTag(m, 3, "kova.state=released"); },
       "member of disk group g1, whose cache disk was removed while its volumes held data"},
      {[](Machine& m) { m.logical.clear(); }, "member of disk group g1, which is not whole"},
      {[](Machine& m) { m.physical[1].tags[0] = "x"; },
       "member of disk group g1, whose members are not marked as they should be"},
      {[](Machine& m) { m.physical[1].tags[0] = "kova.disk=u1"; },
       "member of disk group g1, whose members are not marked as they should be"},
      {[](Machine& m) { m.physical[1].tags[1] = "kova.role=spare"; },
       "member of disk group g1, whose members are not marked as they should be"},
      {[](Machine& m) { m.physical[1].tags[1] = "kova.role=cache"; },
       "member of disk group g1, which is not whole"},
      {[](Machine& m) { m.physical[0].tags[1] = "kova.role=capacity"; },
       "member of disk group g1, which is not whole"},
      {[](Machine& m) { m.physical[2].deviceNumber = "8:99"; },
       "member of disk group g1, of which a member is no whole disk"},
      {[](Machine& m) {
         m.disks[2].facts.connection = Disks::Connection{Disks::Attachment::Usb, "usb"};
       },
       "member of disk group g1, of which sd3 is not attached to this machine as its own"},
      {[](Machine& m) { m.disks[2].facts.connection = Disks::Fact<Disks::Connection>::Unknown("why"); },
       "member of disk group g1, of which sd3 is not attached to this machine as its own"},
  };
  for (const ForeignRow& row : rows) {
    Machine machine;
    row.change(machine);
    EXPECT_THAT(machine.Find(), IsEmpty()) << row.words;
    EXPECT_EQ(machine.WordsOf(0), row.words);
    for (const ScannedDisk& disk : machine.disks) {
      EXPECT_EQ(disk.facts.membership, Membership::None) << row.words;
      EXPECT_EQ(disk.facts.signatures.Get().size(), 1U);
    }
  }
}

TEST(DiskGroups, WithoutAnIdOfThisMachineNoneIsOurs) {
  Machine machine;
  SetGroupTag(machine, 2, "kova.machine=");
  EXPECT_THAT(machine.Find(""), IsEmpty());
}

TEST(DiskGroups, TwoVolumeGroupsThatClaimOneIdentityAreBothLeftAlone) {
  Machine machine;
  machine.disks.push_back(MemberDisk("4", true));
  machine.disks.push_back(MemberDisk("5", false));
  for (const char* const number : {"4", "5"}) {
    PhysicalVolume copy =
        MemberVolume(number, *number == '4' ? "cache" : "capacity", std::string("v") + number, "g1");
    copy.groupUuid = "vg-uuid-copy";
    machine.physical.push_back(copy);
  }
  EXPECT_THAT(machine.Find(), IsEmpty());
  EXPECT_EQ(machine.WordsOf(0), "member of disk group g1, which more than one volume group claims to be");
  EXPECT_EQ(machine.WordsOf(3), "member of disk group g1, which more than one volume group claims to be");
}

TEST(DiskGroups, OtherPhysicalVolumesAreToldAsWhatTheyAre) {
  Machine machine;
  machine.physical[1].groupUuid.clear();
  machine.physical.erase(machine.physical.begin() + 2);
  machine.Find();
  EXPECT_EQ(machine.WordsOf(1), "LVM physical volume in no volume group");
  EXPECT_EQ(machine.WordsOf(2), "LVM physical volume that its volume group no longer knows, or hides");
}

TEST(DiskGroups, WhatCouldNotBeReadOnAMemberStaysUnknown) {
  Machine machine;
  SetGroupTag(machine, 0, "other");
  machine.disks[0].facts.signatures = Disks::Fact<std::vector<std::string>>::Unknown("why");
  machine.Find();
  EXPECT_FALSE(machine.disks[0].facts.signatures.IsKnown());
}

TEST(DiskGroups, AMarkIsFoundAmongVolumeGroups) {
  Machine machine;
  EXPECT_TRUE(HasMarkedGroup(machine.physical));
  SetGroupTag(machine, 0, "kovax");
  EXPECT_FALSE(HasMarkedGroup(machine.physical));
}

}  // namespace
}  // namespace OtxCtl::Linux
