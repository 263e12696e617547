// Requested groups beside the kernel's: which already exist, and which are there but not mounted.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <ostream>
#include <stdexcept>
#include <string>
#include <vector>

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/include/HostCtlException.h"
#include "nox/Faults.h"
#include "nox/Kova.h"
#include "tests/support/Groups.h"
#include "tests/support/Matchers.h"
#include "tests/support/PluginFixture.h"

namespace Kovasvc {
namespace {

using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskResult;
using HostCtl::Lib::HostCtlException;
using Nox::Kova::Host::DiskMapping;
using Orbis::DataArray;
using Tessa::MakeRef;
using Tessa::NotInitializedException;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::StrEq;
using testing::ThrowsMessage;
using TestSupport::AGroup;
using TestSupport::AMapping;
using TestSupport::AnInventory;
using TestSupport::ARecord;
using TestSupport::AScsiDisk;
using TestSupport::Disks;
using TestSupport::FakeKernel;
using TestSupport::GroupTexts;
using TestSupport::Hdd;
using TestSupport::LogLineIs;
using TestSupport::Ssd;

const std::string uuid = "52e7b2b4-0a7c-3a1c-9d3e-2f4a5b6c7d8e";
const auto isNotInitialized = ThrowsMessage<NotInitializedException>(StrEq("Not initialized"));
const auto isNotSet = ThrowsMessage<NotInitializedException>(StrEq("optional value not set"));

// ---- does the group exist?

class ExistingGroup : public TestSupport::PluginFixture {
 protected:
  ExistingGroup() : _manager(MakeManager()) {}

  bool Exists(const std::string& ssd, const std::vector<std::string>& capacityDisks) {
    Disks disks;
    for (const std::string& disk : capacityDisks) {
      disks.push_back(Hdd(disk));
    }
    return _manager->DiskMappingExists(AMapping(Ssd(ssd), disks));
  }

  Ref<KovaManagerImpl> _manager;
};

TEST_F(ExistingGroup, HasTheSameDisksInAnyOrder) {
  _kernel.groups = {AGroup("s1", {"a", "b"})};
  EXPECT_TRUE(Exists("s1", {"a", "b"}));
  EXPECT_TRUE(Exists("s1", {"b", "a"}));
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(ExistingGroup, IsLookedForAmongTheMountedOnesWithNoLockHeld) {
  _kernel.unmountedGroups = {AGroup("s1", {"a"})};
  EXPECT_FALSE(Exists("s1", {"a"}));
  EXPECT_THAT(_timeline.Events(), ElementsAre("GetDiskMappings(false)"));
}

TEST_F(ExistingGroup, MayBeAnyOfTheKernels) {
  _kernel.groups = {AGroup("s1", {"a"}), AGroup("s1", {"b"}), AGroup("s2", {"c"})};
  EXPECT_TRUE(Exists("s1", {"b"}));
  EXPECT_TRUE(Exists("s2", {"c"}));
  EXPECT_FALSE(Exists("s2", {"b"}));
}

TEST_F(ExistingGroup, HasTheVeryNameOfTheSsd) {
  _kernel.groups = {AGroup("s1", {"a"})};
  EXPECT_FALSE(Exists("s2", {"a"}));
  EXPECT_FALSE(Exists("s", {"a"}));
  EXPECT_FALSE(Exists("s11", {"a"}));
  EXPECT_FALSE(Exists("S1", {"a"}));
}

TEST_F(ExistingGroup, HasAsManyDisksAsRequested) {
  _kernel.groups = {AGroup("s1", {"a", "b"})};
  EXPECT_FALSE(Exists("s1", {"a"}));
  EXPECT_FALSE(Exists("s1", {"a", "b", "c"}));
  EXPECT_FALSE(Exists("s1", {"a", "c"}));
}

TEST_F(ExistingGroup, WithoutCapacityDisksNeverExistsAndNobodyIsAsked) {
  _kernel.groups = {AGroup("s1", {})};
  EXPECT_FALSE(Exists("s1", {}));
  const auto mapping = MakeRef<DiskMapping>();
  mapping->SetSsd(Ssd("s1"));
  mapping->SetNonSsd(nullptr);
  EXPECT_FALSE(_manager->DiskMappingExists(mapping));
  EXPECT_THAT(_kernel.Calls(), IsEmpty());
}

TEST_F(ExistingGroup, NamesAnAbsentCapacityDiskByItsUuid) {
  HostCtl::Kova::DiskMapping group = AGroup("s1", {"a", ""});
  group.capacityDisks[1].kovaUuid = uuid;
  group.capacityDisks[0].kovaUuid = "not looked at";
  _kernel.groups = {group};
  EXPECT_TRUE(Exists("s1", {"kova:" + uuid, "a"}));
  EXPECT_FALSE(Exists("s1", {uuid, "a"}));
  EXPECT_FALSE(Exists("s1", {"", "a"}));
}

TEST_F(ExistingGroup, NamesAnAbsentSsdByNothingElseThanItsEmptyName) {
  HostCtl::Kova::DiskMapping group = AGroup("", {"a"});
  group.ssd.kovaUuid = uuid;
  _kernel.groups = {group};
  EXPECT_FALSE(Exists("kova:" + uuid, {"a"}));
  EXPECT_TRUE(Exists("", {"a"}));
}

TEST_F(ExistingGroup, CountsEmptyNamesOfARequestToo) {
  _kernel.groups = {AGroup("s1", {"a"})};
  EXPECT_FALSE(Exists("s1", {"a", ""}));
}

TEST_F(ExistingGroup, IsComparedFromTheKernelsSideOnly) {
  _kernel.groups = {AGroup("s1", {"a", "a"})};
  EXPECT_TRUE(Exists("s1", {"a", "z"})) << "what the kernel does not list twice is not missed";
  _kernel.groups = {AGroup("s1", {"a", "b"})};
  EXPECT_FALSE(Exists("s1", {"a", "a"}));
}

TEST_F(ExistingGroup, NeedsANameOfEveryDisk) {
  const auto ask = [this](const Ref<DiskMapping>& mapping) {
    return [this, mapping] { _manager->DiskMappingExists(mapping); };
  };
  EXPECT_THAT(ask(AMapping(AScsiDisk("x").Unnamed(), {Hdd("a")})), isNotInitialized);
  EXPECT_THAT(ask(AMapping(AScsiDisk("x").Unnamed(), {})), isNotInitialized);
  EXPECT_THAT(ask(AMapping(nullptr, {Hdd("a")})), isNotInitialized);
  EXPECT_THAT(ask(AMapping(Ssd("s1"), {Hdd("a"), AScsiDisk("x").Unnamed()})), isNotInitialized);
  EXPECT_THAT(ask(AMapping(Ssd("s1"), {nullptr})), isNotInitialized);
  EXPECT_THAT(_kernel.Calls(), IsEmpty());
}

TEST_F(ExistingGroup, DoesNotExistWhenTheKernelFails) {
  _kernel.groups = {AGroup("s1", {"a"})};
  for (const auto when : {FakeKernel::When::BeforeEffect, FakeKernel::When::AfterEffect}) {
    _logger->Clear();
    _kernel.Fail("GetDiskMappings", HostCtlException("the kernel is away"), when);
    EXPECT_FALSE(Exists("s1", {"a"}));
    EXPECT_THAT(_logger->Lines(),
                ElementsAre(LogLineIs(LogLevel::Warning, "Failed to validate disk mapping: %1",
                                      "the kernel is away")));
  }
}

TEST_F(ExistingGroup, WarnsOfAFailingKernelFromLevelWarningOn) {
  _kernel.Fail("GetDiskMappings", HostCtlException("x"));
  _logger->SetLevel(LogLevel::Error);
  EXPECT_FALSE(Exists("s1", {"a"}));
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(ExistingGroup, LetsOtherExceptionsThrough) {
  _kernel.Fail("GetDiskMappings", std::runtime_error("not the kernel's"));
  EXPECT_THROW(Exists("s1", {"a"}), std::runtime_error);
}

// ---- groups that are not mounted

class UnmountedGroups : public TestSupport::PluginFixture {
 protected:
  UnmountedGroups() : _manager(MakeManager()) {}

  void Know(const Disks& disks, const std::vector<DiskResult>& records) {
    SetHost(disks, records);
    _manager->InvalidateKovaDiskCache();
    _manager->RefreshKovaDiskCache();
    _candidates = AnInventory(disks);
    _timeline.Take();
    _logger->Clear();
  }
  // Of one SSD, flagged as not mounted, and a capacity disk; the kernel lists the group.
  void KnowOne() {
    Know({Ssd("s1"), Hdd("a")}, {ARecord("s1").Ssd().Ineligible(DiskReason::GroupNotMounted), ARecord("a")});
    _kernel.unmountedGroups = {AGroup("s1", {"a"})};
  }

  void Compute() { _manager->ComputeNotMountedDiskMappings(_candidates.Get(), _mappings); }
  std::vector<std::string> Plan() {
    Compute();
    return GroupTexts(*_mappings);
  }

  Ref<KovaManagerImpl> _manager;
  Ref<DataArray<Nox::Host::ScsiDisk>> _candidates = AnInventory({});
  Ref<DataArray<DiskMapping>> _mappings = MakeRef<DataArray<DiskMapping>>();
};

TEST_F(UnmountedGroups, AreMadeOfTheInventorysOwnDisks) {
  KnowOne();
  const Disks disks = {Hdd("z"), Hdd("a"), Ssd("s1")};
  _storage->SetDisks(disks);
  EXPECT_THAT(Plan(), ElementsAre("s1: a"));
  EXPECT_EQ((*_mappings)[0]->GetSsd(), disks[2]);
  EXPECT_EQ((*(*_mappings)[0]->GetNonSsd())[0], disks[1].Get());
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(UnmountedGroups, AreFoundInOrderAndWithTheCacheLockForTheCacheOnly) {
  KnowOne();
  Compute();
  EXPECT_THAT(_timeline.Events(), ElementsAre("take KovaManager.diskCache", "release KovaManager.diskCache",
                                              "GetDiskMappings(true)", "GetStorageDeviceInfo"));
}

TEST_F(UnmountedGroups, AreReadFromTheCacheAsItIs) {
  KnowOne();
  _manager->InvalidateKovaDiskCache();
  _kernel.records.clear();
  EXPECT_THAT(Plan(), ElementsAre("s1: a"));
}

TEST_F(UnmountedGroups, AreAppendedInTheKernelsOrder) {
  Know({Ssd("s1"), Ssd("s2"), Hdd("a"), Hdd("b")},
       {ARecord("s1").Ssd().Ineligible(DiskReason::GroupNotMounted),
        ARecord("s2").Ssd().Ineligible(DiskReason::GroupNotMounted)});
  _kernel.unmountedGroups = {AGroup("s2", {"b", "a"}), AGroup("s9", {"a"}), AGroup("s1", {"a"})};
  const Ref<DiskMapping> before = AMapping(Ssd("x"), {});
  _mappings->Append(before);
  EXPECT_THAT(Plan(), ElementsAre("x:", "s2: b a", "s1: a"));
  EXPECT_EQ((*_mappings)[0], before.Get());
}

TEST_F(UnmountedGroups, AreThoseWhoseSsdIsACandidate) {
  KnowOne();
  _candidates = AnInventory({Ssd("s2"), Hdd("s1")});
  EXPECT_THAT(Plan(), IsEmpty());
  EXPECT_THAT(_timeline.Events(), ElementsAre("take KovaManager.diskCache", "release KovaManager.diskCache"));
}

TEST_F(UnmountedGroups, AreThoseWhoseSsdTheKernelFlags) {
  Know({Ssd("s1"), Ssd("s2"), Ssd("s3")},
       {ARecord("s1").Ssd().Ineligible(DiskReason::Usb),
        ARecord("s2").Ineligible(DiskReason::GroupNotMounted), ARecord("s3").Ssd().InUse(uuid)});
  _kernel.unmountedGroups = {AGroup("s1", {"a"}), AGroup("s2", {"b"}), AGroup("s3", {"c"})};
  EXPECT_THAT(Plan(), IsEmpty());
}

TEST_F(UnmountedGroups, AreToldByTheReasonWhateverTheState) {
  Know({Ssd("s1"), Hdd("a")}, {ARecord("s1").Ssd().Reason(DiskReason::GroupNotMounted)});
  _kernel.groups = {AGroup("s1", {"a"})};
  EXPECT_THAT(Plan(), ElementsAre("s1: a")) << "the kernel lists it as mounted all the same";
}

TEST_F(UnmountedGroups, AreNotMadeUpWhenTheKernelListsNone) {
  KnowOne();
  _kernel.unmountedGroups.clear();
  EXPECT_THAT(Plan(), IsEmpty());
}

TEST_F(UnmountedGroups, AreNotLookedForWithoutAnSsdAmongTheCandidates) {
  KnowOne();
  for (const Ref<DataArray<Nox::Host::ScsiDisk>>& candidates :
       {AnInventory({Hdd("a")}), AnInventory({}), Ref<DataArray<Nox::Host::ScsiDisk>>()}) {
    _candidates = candidates;
    EXPECT_THAT(Plan(), IsEmpty());
  }
  EXPECT_THAT(_timeline.Events(), IsEmpty());
}

TEST_F(UnmountedGroups, HaveNullDisksWhereTheInventoryHasNone) {
  KnowOne();
  _kernel.unmountedGroups = {AGroup("s1", {"a", "", "b"})};
  _storage->SetDisks({Hdd("b")});
  EXPECT_THAT(Plan(), ElementsAre("null: null null b"));
}

TEST_F(UnmountedGroups, NeedTheSsdFlagOfEveryCandidateAndTheNamesOfSsds) {
  KnowOne();
  const auto compute = [this](const Disks& disks) {
    return [this, disks] {
      _candidates = AnInventory(disks);
      Compute();
    };
  };
  EXPECT_THAT(compute({Ssd("s1"), AScsiDisk("x").Ssd(std::nullopt)}), isNotSet);
  EXPECT_THAT(compute({Ssd("s1"), AScsiDisk("x").Unnamed().Ssd()}), isNotInitialized);
  EXPECT_THAT(compute({nullptr}), isNotSet);
  EXPECT_THAT(_timeline.Events(), IsEmpty());
  EXPECT_NO_THROW(compute({Ssd("s1"), AScsiDisk("x").Unnamed()})()) << "a hard disk's name is not read";
  EXPECT_EQ(_mappings->Size(), 1U);
}

TEST_F(UnmountedGroups, AreNoneWhenTheKernelFails) {
  KnowOne();
  for (const auto when : {FakeKernel::When::BeforeEffect, FakeKernel::When::AfterEffect}) {
    _logger->Clear();
    _timeline.Take();
    _kernel.Fail("GetDiskMappings", HostCtlException("the kernel is away"), when);
    EXPECT_THAT(Plan(), IsEmpty());
    EXPECT_THAT(_logger->Lines(),
                ElementsAre(LogLineIs(LogLevel::Warning, "Error retrieving disk mappings: %1",
                                      "the kernel is away")));
    EXPECT_EQ(_timeline.Events().back(), "GetStorageDeviceInfo") << "the agent is asked all the same";
  }
}

TEST_F(UnmountedGroups, AreNoneWithoutAnInventory) {
  KnowOne();
  _app.SetObject("storageSystem", nullptr);
  EXPECT_THAT(Plan(), IsEmpty());
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Warning, "GetDisksFromAgentd error %1",
                                                      "Failed to lookup STORAGE_SYSTEM_MO.")));
}

TEST_F(UnmountedGroups, WarnOfBothFailures) {
  KnowOne();
  _app.SetObject("storageSystem", nullptr);
  _kernel.Fail("GetDiskMappings", HostCtlException("away"));
  Compute();
  EXPECT_EQ(_logger->Lines(LogLevel::Warning).size(), 2U);
}

TEST_F(UnmountedGroups, LetOtherExceptionsThrough) {
  KnowOne();
  _storage->SetObserver(
      [] { throw Nox::Fault::DiskIsUSB::Exception(MakeRef<Nox::Fault::DiskIsUSB>("naa.1")); });
  EXPECT_THROW(Compute(), Nox::Fault::DiskIsUSB::Exception);
  _kernel.Fail("GetDiskMappings", std::runtime_error("not the kernel's"));
  EXPECT_THROW(Compute(), std::runtime_error);
  EXPECT_TRUE(_mappings->IsEmpty());
}

TEST_F(UnmountedGroups, MeetAnUnnamedDiskOfTheInventoryOnlyBeforeAMatch) {
  KnowOne();
  _storage->SetDisks({Ssd("s1"), Hdd("a"), AScsiDisk("x").Unnamed()});
  EXPECT_THAT(Plan(), ElementsAre("s1: a"));
  _storage->SetDisks({Ssd("s1"), AScsiDisk("x").Unnamed(), Hdd("a")});
  EXPECT_THAT([this] { Compute(); }, isNotInitialized);
  EXPECT_EQ(_mappings->Size(), 1U);
}

}  // namespace
}  // namespace Kovasvc
