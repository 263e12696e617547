// The host's disk groups as the agent gets to see them.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <vector>

#include "kova/agentd/KovaLibManager.h"
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
using HostCtl::Kova::DiskState;
using HostCtl::Lib::HostCtlException;
using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;
using Tessa::MakeRef;
using Tessa::NotInitializedException;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;
using testing::StartsWith;
using TestSupport::AGroup;
using TestSupport::ARecord;
using TestSupport::AScsiDisk;
using TestSupport::FakeKernel;
using TestSupport::GroupTexts;
using TestSupport::Hdd;
using TestSupport::LogLineIs;
using TestSupport::Ssd;
using Info = Nox::Kova::Host::ConfigInfo::StorageInfo;

constexpr const char* noFault = "No fault. Operation completed successfully";
constexpr const char* storageFailed = "Error retrieving storage info: %1";
constexpr const char* inventoryFailed = "GetDisksFromAgentd error %1";
constexpr const char* marshalFailed = "Error marshaling disk maping for SSD: %1";
constexpr const char* queryFailed = "Error when querying disks for KOVA: %2";
const std::string uuid = "52e7b2b4-0a7c-3a1c-9d3e-2f4a5b6c7d8e";

class StorageInfo : public TestSupport::PluginFixture {
 protected:
  StorageInfo() : _manager(MakeManager()) {}

  // The answer. The texts of before stay in front.
  Ref<Info> Ask() {
    const std::size_t length = _result.size();
    _manager->GetStorageInfo(_result);
    return TestSupport::ReadAnswer<Info>(_result.substr(length));
  }
  std::vector<std::string> AskForGroups() { return GroupTexts(*Ask()->GetDiskMapping()); }
  // A text has no empty lists: what it lacks is empty.
  static bool HasNoGroups(const Info& info) { return !info.GetDiskMapping() && !info.GetDiskMapInfo(); }
  // A group of these names, all in the inventory.
  void SetGroup(const std::string& ssd, const std::vector<std::string>& disks) {
    _kernel.groups.push_back(AGroup(ssd, disks));
    _disks.push_back(Ssd(ssd));
    for (const std::string& disk : disks) {
      _disks.push_back(Hdd(disk));
    }
    _storage->SetDisks(_disks);
  }
  bool IsMounted() { return (*Ask()->GetDiskMapInfo())[0]->GetMounted(); }

  Ref<KovaManagerImpl> _manager;
  TestSupport::Disks _disks;
  std::string _result;
};

TEST_F(StorageInfo, ListsEveryGroupTwiceAndInTheKernelsOrder) {
  SetGroup("s2", {"c", "b"});
  SetGroup("s1", {"a"});
  const Ref<Info> info = Ask();
  EXPECT_THAT(GroupTexts(*info->GetDiskMapping()), ElementsAre("s2: c b", "s1: a"));
  ASSERT_EQ(info->GetDiskMapInfo()->Size(), 2U);
  for (std::size_t index = 0; index < 2; ++index) {
    const Nox::Kova::Host::DiskMapInfo& mapInfo = *(*info->GetDiskMapInfo())[index];
    EXPECT_EQ(TestSupport::GroupText(*mapInfo.GetMapping()),
              TestSupport::GroupText(*(*info->GetDiskMapping())[index]));
    EXPECT_TRUE(mapInfo.GetMounted());
  }
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, noFault)));
}

TEST_F(StorageInfo, AsksInOrderAndInvalidatesTheCacheAtItsEnd) {
  SetGroup("s1", {"a"});
  SetGroup("s2", {"b"});
  Ask();
  EXPECT_THAT(_timeline.Events(),
              ElementsAre("RefreshKovaInfo()", "IsAutoModeEnabled()", "GetDiskMappings(false)",
                          "GetStorageDeviceInfo", "QueryDisks([s1], false)", "QueryDisks([s2], false)",
                          "take KovaManager.diskCache", "release KovaManager.diskCache"));
  for (const TestSupport::KernelCall& call : _kernel.Calls()) {
    EXPECT_THAT(call.locksHeld, IsEmpty()) << call.text;
  }
}

TEST_F(StorageInfo, MakesTheNextQueryReadTheCacheAnew) {
  _manager->RefreshKovaDiskCache();
  Ask();
  _kernel.ForgetCalls();
  _manager->RefreshKovaDiskCache();
  EXPECT_THAT(_kernel.CallTexts(), ElementsAre("RefreshKovaInfo()", "QueryDisks([], true)"));
}

TEST_F(StorageInfo, TellsWhetherDisksAreClaimedAutomatically) {
  for (const bool autoMode : {true, false}) {
    _kernel.autoMode = autoMode;
    const Ref<Info> info = Ask();
    ASSERT_TRUE(info->HasAutoClaim());
    EXPECT_EQ(info->GetAutoClaim(), autoMode);
  }
}

TEST_F(StorageInfo, WithoutGroupsAsksNotForTheInventory) {
  const Ref<Info> info = Ask();
  EXPECT_TRUE(HasNoGroups(*info));
  EXPECT_TRUE(info->HasAutoClaim());
  EXPECT_THAT(_timeline.Events(), Not(Contains("GetStorageDeviceInfo")));
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, noFault)));
}

TEST_F(StorageInfo, AppendsItsText) {
  _result = "before";
  Ask();
  EXPECT_THAT(_result, StartsWith("before<?xml"));
}

// ---- the disks of a group

TEST_F(StorageInfo, GivesEveryDiskItsUuidAndNoFormatVersion) {
  HostCtl::Kova::DiskMapping group = AGroup("s", {"a", "b"});
  group.ssd.kovaUuid = "uuid of s in use";
  group.capacityDisks[1].kovaUuid = uuid;
  _kernel.groups = {group};
  _storage->SetDisks({Ssd("s"), Hdd("a"), Hdd("b")});
  const Ref<Info> info = Ask();
  const DiskMapping& mapping = *(*info->GetDiskMapping())[0];
  EXPECT_EQ(mapping.GetSsd()->GetKovaDiskInfo()->GetKovaUuid(), "uuid of s in use");
  EXPECT_FALSE(mapping.GetSsd()->GetKovaDiskInfo()->HasFormatVersion());
  EXPECT_EQ((*mapping.GetNonSsd())[0]->GetKovaDiskInfo()->GetKovaUuid(), "");
  EXPECT_EQ((*mapping.GetNonSsd())[1]->GetKovaDiskInfo()->GetKovaUuid(), uuid);
  EXPECT_FALSE((*mapping.GetNonSsd())[1]->GetKovaDiskInfo()->HasFormatVersion());
}

TEST_F(StorageInfo, ShowsCleanedCopiesAndLeavesTheInventoryAlone) {
  const Ref<ScsiDisk> ssd = AScsiDisk("s").Ssd().WithInquiryData();
  const Ref<ScsiDisk> disk = AScsiDisk("a").WithInquiryData();
  _kernel.groups = {AGroup("s", {"a"})};
  _storage->SetDisks({ssd, disk});
  const Ref<Info> info = Ask();
  const DiskMapping& mapping = *(*info->GetDiskMapping())[0];
  for (const ScsiDisk* shown : {mapping.GetSsd().Get(), (*mapping.GetNonSsd())[0]}) {
    EXPECT_FALSE(shown->GetDurableName());
    EXPECT_TRUE(!shown->GetAlternateName() || shown->GetAlternateName()->IsEmpty());
    EXPECT_FALSE(shown->GetStandardInquiry());
  }
  EXPECT_EQ(mapping.GetSsd()->GetDisplayName(), "Disk s");
  for (const Ref<ScsiDisk>& own : {ssd, disk}) {
    EXPECT_TRUE(own->GetDurableName());
    EXPECT_FALSE(own->GetKovaDiskInfo());
  }
}

TEST_F(StorageInfo, KeepsTheSsdFlagsOfTheInventory) {
  _kernel.groups = {AGroup("s", {"a"}).AllFlash()};
  _storage->SetDisks({Hdd("s"), Ssd("a")});
  const Ref<Info> info = Ask();
  EXPECT_FALSE((*info->GetDiskMapping())[0]->GetSsd()->GetSsd());
  EXPECT_TRUE((*(*info->GetDiskMapping())[0]->GetNonSsd())[0]->GetSsd());
}

TEST_F(StorageInfo, ShowsStandInsForAbsentDisks) {
  HostCtl::Kova::DiskMapping group = AGroup("", {""});
  group.ssd.kovaUuid = uuid;
  group.capacityDisks[0].kovaUuid = "other";
  _kernel.groups = {group};
  _kernel.records = {ARecord("").Absent().InUse(uuid)};
  const Ref<Info> info = Ask();
  EXPECT_THAT(GroupTexts(*info->GetDiskMapping()), ElementsAre("kova:" + uuid + ": kova:other"));
  const DiskMapping& mapping = *(*info->GetDiskMapping())[0];
  EXPECT_TRUE(mapping.GetSsd()->GetSsd());
  EXPECT_EQ(mapping.GetSsd()->GetKovaDiskInfo()->GetKovaUuid(), uuid);
  EXPECT_FALSE((*mapping.GetNonSsd())[0]->GetSsd());
  EXPECT_EQ((*mapping.GetNonSsd())[0]->GetKovaDiskInfo()->GetKovaUuid(), "other");
  EXPECT_THAT(_kernel.CallTexts(), Contains("QueryDisks([\"\"], false)"))
      << "it is asked for under its empty name";
}

TEST_F(StorageInfo, NamesAnAbsentSsdByItsUuidWhenItsDisksAreUnknown) {
  HostCtl::Kova::DiskMapping group = AGroup("", {"x"});
  group.ssd.kovaUuid = uuid;
  _kernel.groups = {group};
  EXPECT_TRUE(HasNoGroups(*Ask()));
  EXPECT_THAT(_logger->Lines(LogLevel::Info),
              ElementsAre(LogLineIs(LogLevel::Info, marshalFailed, "kova:" + uuid)));
}

// Has groups of its own, whatever the kernel says.
class ManagerWithGroups final : public KovaManagerImpl {
 public:
  using KovaManagerImpl::KovaManagerImpl;
  void GetKovaDiskMapping(std::vector<HostCtl::Kova::DiskMapping>& mappings) override {
    mappings.push_back(AGroup("s1", {"a"}));
  }
};

TEST_F(StorageInfo, AsksADerivedManagerForTheGroups) {
  SetGroup("s1", {"a"});
  SetGroup("s2", {"b"});
  Ref<Tessa::Service::Logger> logger = _logger;
  _manager = MakeRef<ManagerWithGroups>(logger);
  EXPECT_THAT(AskForGroups(), ElementsAre("s1: a"));
  EXPECT_THAT(_kernel.CallTexts(), Not(Contains(StartsWith("GetDiskMappings"))));
}

TEST_F(StorageInfo, LeavesOutInSilenceAGroupWhoseSsdTheInventoryLacks) {
  SetGroup("s1", {"a"});
  _kernel.groups.insert(_kernel.groups.begin(), AGroup("s9", {"a"}));
  EXPECT_THAT(AskForGroups(), ElementsAre("s1: a"));
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, noFault)));
  EXPECT_THAT(_kernel.CallTexts(), Not(Contains("QueryDisks([s9], false)")));
}

TEST_F(StorageInfo, LeavesOutInSilenceACapacityDiskThatTheInventoryLacks) {
  SetGroup("s1", {"a"});
  _kernel.groups = {AGroup("s1", {"x", "a", "y"})};
  EXPECT_THAT(AskForGroups(), ElementsAre("s1: a"));
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, noFault)));
}

TEST_F(StorageInfo, LeavesOutAGroupNoneOfWhoseCapacityDisksIsKnown) {
  SetGroup("s1", {"a"});
  _kernel.groups = {AGroup("s1", {"x", "y"}), AGroup("s1", {}), AGroup("s1", {"a"})};
  EXPECT_THAT(AskForGroups(), ElementsAre("s1: a"));
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Info, marshalFailed, "s1"),
                                            LogLineIs(LogLevel::Info, marshalFailed, "s1"),
                                            LogLineIs(LogLevel::Verbose, noFault)));
  EXPECT_EQ(_kernel.CallTexts().size(), 4U) << "the mounted group alone is asked for";
}

TEST_F(StorageInfo, MeetsAnUnnamedDiskOfTheInventoryOnlyBeforeAMatch) {
  SetGroup("s1", {"a"});
  _storage->SetDisks({Ssd("s1"), Hdd("a"), AScsiDisk("x").Unnamed()});
  EXPECT_THAT(AskForGroups(), ElementsAre("s1: a"));
  _storage->SetDisks({Ssd("s1"), AScsiDisk("x").Unnamed(), Hdd("a")});
  _result = "before";
  EXPECT_THROW(_manager->GetStorageInfo(_result), NotInitializedException);
  EXPECT_EQ(_result, "before");
}

// ---- mounted or not

TEST_F(StorageInfo, CallsAGroupUnmountedWhoseSsdTheKernelCallsIneligible) {
  SetGroup("s1", {"a"});
  _kernel.records = {ARecord("s1").Ssd().Ineligible(DiskReason::GroupNotMounted)};
  EXPECT_FALSE(IsMounted());
}

TEST_F(StorageInfo, CallsAGroupMountedInEveryOtherState) {
  SetGroup("s1", {"a"});
  EXPECT_TRUE(IsMounted()) << "the kernel knows nothing of the disk";
  for (const DiskState state : {DiskState::InUse, DiskState::Eligible, static_cast<DiskState>(9)}) {
    _kernel.records = {ARecord("s1").Ssd().State(state).Reason(DiskReason::GroupNotMounted)};
    EXPECT_TRUE(IsMounted());
  }
}

TEST_F(StorageInfo, LooksAtTheFirstRecordOnly) {
  SetGroup("s1", {"a"});
  _kernel.records = {ARecord("s1"), ARecord("s1").Ineligible(DiskReason::Usb)};
  EXPECT_TRUE(IsMounted());
  _kernel.records = {ARecord("s1").Ineligible(DiskReason::Usb), ARecord("s1")};
  EXPECT_FALSE(IsMounted());
}

TEST_F(StorageInfo, CallsAGroupMountedWhenItCannotAsk) {
  SetGroup("s1", {"a"});
  _kernel.records = {ARecord("s1").Ineligible(DiskReason::Usb)};
  _kernel.Fail("QueryDisks", HostCtlException("the kernel is away"));
  EXPECT_TRUE(IsMounted());
  // The format names a second argument, and there is only one.
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Info, queryFailed, "the kernel is away"),
                                            LogLineIs(LogLevel::Verbose, noFault)));
  EXPECT_EQ(Tessa::Service::FormatMessage(queryFailed, {}), queryFailed);
}

TEST_F(StorageInfo, CallsAGroupMountedForAnyStandardException) {
  SetGroup("s1", {"a"});
  _kernel.records = {ARecord("s1").Ineligible(DiskReason::Usb)};
  _kernel.Fail("QueryDisks", std::runtime_error("not the kernel's"), FakeKernel::When::AfterEffect);
  EXPECT_TRUE(IsMounted());
  EXPECT_THAT(_logger->Lines(LogLevel::Info),
              ElementsAre(LogLineIs(LogLevel::Info, queryFailed, "not the kernel's")));
}

// ---- failures

struct KernelFailure {
  const char* operation;
  bool hasAutoClaim;
};

class StorageInfoWithoutKernel : public StorageInfo, public testing::WithParamInterface<KernelFailure> {};

INSTANTIATE_TEST_SUITE_P(Operations, StorageInfoWithoutKernel,
                         testing::Values(KernelFailure{"RefreshKovaInfo", false},
                                         KernelFailure{"IsAutoModeEnabled", false},
                                         KernelFailure{"GetDiskMappings", true}),
                         [](const auto& test) { return std::string(test.param.operation); });

TEST_P(StorageInfoWithoutKernel, WarnsAndIsEmpty) {
  SetGroup("s1", {"a"});
  for (const auto when : {FakeKernel::When::BeforeEffect, FakeKernel::When::AfterEffect}) {
    _kernel.Fail(GetParam().operation, HostCtlException("the kernel is away"), when);
    _logger->Clear();
    _timeline.Take();
    const Ref<Info> info = Ask();
    EXPECT_TRUE(HasNoGroups(*info));
    EXPECT_EQ(info->HasAutoClaim(), GetParam().hasAutoClaim);
    EXPECT_THAT(_logger->Lines(),
                ElementsAre(LogLineIs(LogLevel::Warning, storageFailed, "the kernel is away"),
                            LogLineIs(LogLevel::Verbose, noFault)));
    EXPECT_THAT(_timeline.Events(), Not(Contains("GetStorageDeviceInfo")));
    EXPECT_EQ(_timeline.Events().back(), "release KovaManager.diskCache") << "it is invalidated all the same";
  }
}

TEST_P(StorageInfoWithoutKernel, LetsOtherExceptionsThrough) {
  _kernel.Fail(GetParam().operation, std::runtime_error("not the kernel's"));
  _result = "before";
  EXPECT_THROW(_manager->GetStorageInfo(_result), std::runtime_error);
  EXPECT_EQ(_result, "before");
}

TEST_F(StorageInfo, WithoutAnInventoryWarnsAndHasNoGroups) {
  SetGroup("s1", {"a"});
  _kernel.autoMode = true;
  _app.SetObject("storageSystem", nullptr);
  const Ref<Info> info = Ask();
  EXPECT_TRUE(HasNoGroups(*info));
  EXPECT_TRUE(info->GetAutoClaim());
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Warning, inventoryFailed,
                                                      "Failed to lookup STORAGE_SYSTEM_MO."),
                                            LogLineIs(LogLevel::Verbose, noFault)));
  EXPECT_THAT(_kernel.CallTexts(), Not(Contains(StartsWith("QueryDisks"))));
  EXPECT_EQ(_timeline.Events().back(), "release KovaManager.diskCache");
}

TEST_F(StorageInfo, WithoutAnInventoryHasNoGroupsOfAbsentDisksEither) {
  _kernel.groups = {AGroup("", {""})};
  _app.SetObject("storageSystem", nullptr);
  EXPECT_TRUE(HasNoGroups(*Ask()));
}

TEST_F(StorageInfo, LetsOtherExceptionsOfTheInventoryThrough) {
  SetGroup("s1", {"a"});
  _storage->SetObserver(
      [] { throw Nox::Fault::DiskIsUSB::Exception(MakeRef<Nox::Fault::DiskIsUSB>("naa.1")); });
  EXPECT_THROW(_manager->GetStorageInfo(_result), Nox::Fault::DiskIsUSB::Exception);
  EXPECT_EQ(_result, "");
}

// ---- through the hook

TEST_F(StorageInfo, IsWhatTheHookAppends) {
  SetGroup("s1", {"a"});
  _kovaManagerImpl = _manager;
  _result = "before";
  GetStorageInfoHookFn(_result);
  ASSERT_THAT(_result, StartsWith("before<?xml"));
  const auto info = TestSupport::ReadAnswer<Info>(_result.substr(6));
  EXPECT_THAT(GroupTexts(*info->GetDiskMapping()), ElementsAre("s1: a"));
}

}  // namespace
}  // namespace Kovasvc
