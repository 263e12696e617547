// In which order operations lock, read, ask, tell the log, forget the cache and answer, where their own tests
// do not show it.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <vector>

#include "kova/agentd/include/HostCtlException.h"
#include "nox/Faults.h"
#include "tests/support/InitializeFixture.h"
#include "tests/support/SpyManager.h"

namespace Kovasvc {
namespace {

using HostCtl::Kova::DiskReason;
using HostCtl::Lib::KovaStorageException;
using Nox::Kova::Host::DiskMapResult;
using Tessa::MakeRef;
using Tessa::NotInitializedException;
using Tessa::Ref;
using testing::_;
using testing::Contains;
using testing::ElementsAre;
using testing::StartsWith;
using TestSupport::AGroup;
using TestSupport::AMapping;
using TestSupport::AnInventory;
using TestSupport::ARecord;
using TestSupport::AScsiDisk;
using TestSupport::Hdd;
using TestSupport::noFaultLine;
using TestSupport::noResultLine;
using TestSupport::releaseCache;
using TestSupport::releaseOperation;
using TestSupport::SoapText;
using TestSupport::SoapTexts;
using TestSupport::Ssd;
using TestSupport::takeCache;
using TestSupport::takeOperation;

const std::string uuid = "52e7b2b4-0a7c-3a1c-9d3e-2f4a5b6c7d8e";
const std::string lost = "kova:" + uuid;
const std::string givenUuid = "log verbose: Given PDL'd disk input (KOVA UUID: '" + uuid + "')";

std::string Verbose(const std::string& text) {
  return "log verbose: " + text;
}
std::string Warning(const std::string& text) {
  return "log warning: " + text;
}

// Three groups could be made; the plug-in's lines stand among locks and calls.
class OrderOfSteps : public TestSupport::InitializeFixture {
 protected:
  OrderOfSteps() { LogIntoTimeline(); }

  // As many events from the first that is this.
  std::vector<std::string> EventsFrom(const std::string& first, std::size_t count) const {
    std::vector<std::string> events = OperationFixture::EventsFrom(first);
    events.resize(std::min(count, events.size()));
    return events;
  }
};

// ---- queries

TEST_F(OrderOfSteps, OfStorageInfoAnswersBeforeItForgetsTheCache) {
  _manager->GetStorageInfo(_resultText);
  EXPECT_THAT(LastEvents(4),
              ElementsAre("GetDiskMappings(false)", Verbose(noFaultLine), takeCache, releaseCache));
}

TEST_F(OrderOfSteps, OfStorageInfoForgetsNothingWhenAnExceptionIsLetOut) {
  _manager->RefreshKovaDiskCache();
  for (const std::string operation : {"RefreshKovaInfo", "IsAutoModeEnabled", "GetDiskMappings"}) {
    _kernel.Fail(operation, std::runtime_error("not the kernel's"));
    EXPECT_THROW(_manager->GetStorageInfo(_resultText), std::runtime_error);
    _kernel.Heal(operation);
    EXPECT_TRUE(IsCacheValid()) << operation;
  }
}

// ---- additions

TEST_F(OrderOfSteps, OfAddingAllCountsWhatItFoundOnceTheLocksAreFree) {
  _manager->AddAllEligibleDisks("tag", _faultText, _resultText);
  EXPECT_THAT(EventsFrom("GetStorageDeviceInfo", 4),
              ElementsAre("GetStorageDeviceInfo", releaseCache, releaseOperation,
                          Verbose("Queried 6 eligible disks to be added to KOVA")));
}

TEST_F(OrderOfSteps, OfAllFlashPlanningReadsTheNamesUnderTheCacheLock) {
  Ref<Orbis::DataArray<KovaManagerImpl::Mapping>> mappings;
  std::vector<std::string> taken;
  bool limitReached = false;
  const auto candidates = AnInventory({AScsiDisk("x").Unnamed()});
  EXPECT_THROW(_manager->ComputeAllFlashDiskMappings(candidates.Get(), mappings, taken, limitReached),
               NotInitializedException);
  EXPECT_THAT(_timeline.Events(), ElementsAre(takeCache, releaseCache));
}

// ---- initializations

TEST_F(OrderOfSteps, OfACheckJudgesTheDisksOnceTheCacheLockIsFree) {
  SetRecord(ARecord("a").Ineligible(DiskReason::Usb));
  _manager->RefreshKovaDiskCache();
  Forget();
  auto result = MakeRef<DiskMapResult>();
  _manager->ValidateDiskMapping(_first, result);
  EXPECT_THAT(
      EventsFrom("GetStorageDeviceInfo", 4),
      ElementsAre("GetStorageDeviceInfo", releaseCache, Warning("Found ineligible disk in mapping: a"),
                  Verbose("Done checking for ineligible disks: FAIL")));
}

TEST_F(OrderOfSteps, OfAnInitializationForgetsTheCacheBeforeItAnswers) {
  Initialize({_first});
  EXPECT_THAT(LastEvents(3), ElementsAre(takeCache, releaseCache, Verbose(noFaultLine)));
}

TEST_F(OrderOfSteps, OfAnInitializationLooksUpTheSsdAlsoWhenItsNameSaysThatItHasLeft) {
  auto result = MakeRef<DiskMapResult>();
  _manager->InitializeMapping(AMapping(Ssd(lost), {Hdd("a")}), "tag", 1, 0, result);
  EXPECT_THAT(EventsFrom(Verbose("Done checking for ineligible disks: OK"), 4),
              ElementsAre(_, takeCache, releaseCache, Verbose("Restamping disks " + lost)));
}

TEST_F(OrderOfSteps, OfARefusedFormatTellsItOnceTheLockIsFree) {
  _kernel.Fail("FormatDiskMapping", KovaStorageException("no", "a"));
  Initialize({_first});
  EXPECT_THAT(EventsFrom("FormatDiskMapping(s1, [a], {tag, 1, 0})", 4),
              ElementsAre(_, releaseOperation, Warning("Error formatting KOVA disks: no"), takeCache));
}

TEST_F(OrderOfSteps, OfARestampByUuidTellsTheUuidAndThenAsks) {
  std::vector<std::string> capacity;
  _manager->RestampDiskMapping(lost, capacity);
  EXPECT_THAT(_timeline.Events(),
              ElementsAre(Verbose("Restamping disks " + lost), takeOperation, Verbose("UUID input " + lost),
                          givenUuid, "RestampDiskMappingByUuid(" + uuid + ")", releaseOperation,
                          Verbose("Done restamping disks")));
}

TEST_F(OrderOfSteps, OfARefusedRestampByUuidTellsItUnderTheLock) {
  _kernel.Fail("RestampDiskMappingByUuid", KovaStorageException("no", "s1"));
  std::vector<std::string> capacity;
  EXPECT_THROW(_manager->RestampDiskMapping(lost, capacity), KovaStorageException);
  EXPECT_THAT(LastEvents(3),
              ElementsAre("RestampDiskMappingByUuid(" + uuid + ")",
                          Warning("Error restamping PDL'd KOVA disk mapping: no"), releaseOperation));
}

// ---- removals

TEST_F(OrderOfSteps, OfARemovalByUuidTellsTheUuidAndThenAsks) {
  _manager->RemoveDisk(lost, "pass", "", 0, 0, _faultText);
  EXPECT_THAT(LastEvents(7),
              ElementsAre(givenUuid, "RemoveDiskByUuid(" + uuid + ", pass)", releaseOperation, takeCache,
                          releaseCache, Verbose(noResultLine), Verbose(noFaultLine)));
}

TEST_F(OrderOfSteps, OfARemovalOfAGroupByUuidTellsGroupAndUuidAndThenAsks) {
  _manager->RemoveDiskMapping(SoapText(*AMapping(Ssd(lost), {Hdd("a")})), "pass", "", 0, 0, _faultText);
  EXPECT_THAT(LastEvents(8),
              ElementsAre(Verbose("LogDiskMappings: Mapping[0]: { SSD: " + lost + ", MDs: a }"), givenUuid,
                          "RemoveDiskByUuid(" + uuid + ", pass)", releaseOperation, takeCache, releaseCache,
                          Verbose(noResultLine), Verbose(noFaultLine)));
}

TEST_F(OrderOfSteps, OfARefusedRemovalOfAGroupTellsItUnderTheLock) {
  _kernel.groups = {AGroup("s1", {"a"})};
  _kernel.Fail("RemoveDiskMapping", KovaStorageException("no", "a"));
  _manager->RemoveDiskMapping(SoapText(*_first), "", "", 0, 0, _faultText);
  EXPECT_THAT(LastEvents(6), ElementsAre("RemoveDiskMapping(s1, , {, 0, 0})",
                                         Warning("Error removing KOVA disk mapping: no"), releaseOperation,
                                         takeCache, releaseCache, Verbose(noResultLine)));
  _kernel.Fail("RemoveDiskByUuid", KovaStorageException("no", "a"));
  _manager->RemoveDiskMapping(SoapText(*AMapping(Ssd(lost), {})), "", "", 0, 0, _faultText);
  EXPECT_THAT(LastEvents(6), ElementsAre("RemoveDiskByUuid(" + uuid + ", )",
                                         Warning("Error removing PDL'd KOVA disk mapping: no"),
                                         releaseOperation, takeCache, releaseCache, Verbose(noResultLine)));
}

TEST_F(OrderOfSteps, OfARemovalOfAGroupReadsItsNamesUnderTheLockAndBehindTheRefresh) {
  const auto unnamed = AMapping(AScsiDisk("x").Unnamed(), {Hdd("a")});
  EXPECT_THROW(_manager->RemoveDiskMapping(SoapText(*unnamed), "", "", 0, 0, _faultText),
               NotInitializedException);
  EXPECT_THAT(_timeline.Events(), ElementsAre(takeOperation, takeCache, "RefreshKovaInfo()",
                                              "QueryDisks([], true)", releaseCache, releaseOperation));
}

// ---- unmounting

TEST_F(OrderOfSteps, OfAnUnmountReadsTheNameOfTheSsdUnderTheLock) {
  auto unnamed = AMapping(AScsiDisk("x").Unnamed(), {Hdd("a")});
  Ref<Orbis::MethodFault> fault;
  EXPECT_THROW(_manager->UnmountDiskMappingInt(unnamed, "", fault), NotInitializedException);
  EXPECT_THAT(_timeline.Events(), ElementsAre(takeOperation, releaseOperation));
}

TEST_F(OrderOfSteps, OfAnUnmountTellsWhatFailsUnderTheLock) {
  Ref<Orbis::MethodFault> fault;
  auto group = _first;
  _manager->UnmountDiskMappingInt(group, "", fault);
  EXPECT_THAT(_timeline.Events(),
              ElementsAre(takeOperation, "GetDiskMappings(false)",
                          Verbose("Failed to validate existing disk mapping:"), releaseOperation));
  _kernel.groups = {AGroup("s1", {"a"})};
  _kernel.Fail("UnmountDiskMapping", KovaStorageException("no", "s1"));
  _manager->UnmountDiskMappingInt(group, "", fault);
  EXPECT_THAT(LastEvents(3),
              ElementsAre("UnmountDiskMapping(s1)", Warning("Error unmounting KOVA disk mapping: no"),
                          releaseOperation));
}

TEST_F(OrderOfSteps, OfAnUnmountTellsAFaultThatStopsItThenForgetsTheCacheThenAnswers) {
  _kernel.Fail("GetDiskMappings",
               Orbis::Fault::SystemError::Exception(MakeRef<Orbis::Fault::SystemError>("out")));
  _manager->UnmountDiskMapping(SoapTexts(std::vector{_first}), "", _faultText, _resultText);
  EXPECT_THAT(LastEvents(5), ElementsAre("GetDiskMappings(false)", releaseOperation,
                                         StartsWith(Warning("UnmountDiskMapping failed with exception: ")),
                                         takeCache, releaseCache));
  _kernel.Heal("GetDiskMappings");
  _manager->UnmountDiskMapping({}, "", _faultText, _resultText);
  EXPECT_THAT(LastEvents(3), ElementsAre(takeCache, releaseCache, Verbose(noFaultLine)));
}

}  // namespace
}  // namespace Kovasvc
