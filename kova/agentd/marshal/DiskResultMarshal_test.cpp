#include "kova/agentd/marshal/DiskResultMarshal.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <vector>

#include "kova/agentd/disks/DiskInventory.h"
#include "nox/Faults.h"
#include "nox/Kova.h"
#include "orbis/Engine.h"
#include "tests/support/Builders.h"
#include "tests/support/Matchers.h"
#include "tests/support/PluginFixture.h"

namespace Kovasvc {
namespace {

using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskState;
using Nox::Host::ScsiDisk;
using Orbis::DataArray;
using Orbis::MethodFault;
using Orbis::Fault::SystemError;
using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::ElementsAre;
using testing::IsEmpty;
using TestSupport::AnInventory;
using TestSupport::ARecord;
using TestSupport::AScsiDisk;
using TestSupport::CarriesSystemError;
using TestSupport::LogLineIs;
using TestSupport::NamesDevice;
using Result = Nox::Kova::Host::DiskResult;

constexpr bool forQuery = true;
constexpr bool forPlanning = false;
const std::string uuid = "52e7b2b4-0a7c-3a1c-9d3e-2f4a5b6c7d8e";

// ---- states and reasons

TEST(DiskStateText, IsIneligibleForEveryValueButTheFirstTwo) {
  EXPECT_STREQ(MarshalDiskState(DiskState::InUse), Result::STATE_INUSE);
  EXPECT_STREQ(MarshalDiskState(DiskState::Eligible), Result::STATE_ELIGIBLE);
  for (const int value : {2, 3, 255, -1, 1 << 30}) {
    EXPECT_STREQ(MarshalDiskState(static_cast<DiskState>(value)), Result::STATE_INELIGIBLE) << value;
  }
}

TEST(DiskStateText, ReadsTheKernelsNumbers) {
  EXPECT_STREQ(MarshalDiskState(static_cast<DiskState>(0)), "inUse");
  EXPECT_STREQ(MarshalDiskState(static_cast<DiskState>(1)), "eligible");
}

struct ReasonCase {
  int value;
  const char* fault;
};

class DiskReasonFault : public testing::TestWithParam<ReasonCase> {};

INSTANTIATE_TEST_SUITE_P(Values, DiskReasonFault,
                         testing::Values(ReasonCase{1, "DiskIsNonLocal"}, ReasonCase{2, "DiskHasPartitions"},
                                         ReasonCase{3, "DiskIsUSB"}, ReasonCase{4, "DiskHasPartitions"},
                                         ReasonCase{5, "DiskTooSmall"}));

TEST_P(DiskReasonFault, NamesTheDiskAndHasNoMessages) {
  Ref<MethodFault> fault;
  MarshalDiskReason("naa.1", static_cast<DiskReason>(GetParam().value), fault);
  EXPECT_THAT(fault, NamesDevice(GetParam().fault, "naa.1"));
  EXPECT_TRUE(fault->GetFaultMessage()->IsEmpty());
}

TEST_P(DiskReasonFault, ReplacesTheFaultThatTheReferenceHeld) {
  const Ref<MethodFault> old = MakeRef<SystemError>("old");
  Ref<MethodFault> fault = old;
  MarshalDiskReason("naa.1", static_cast<DiskReason>(GetParam().value), fault);
  EXPECT_NE(fault, old);
  EXPECT_EQ(old->GetRefCount(), 1);
}

TEST(DiskReasonWithoutFault, LeavesTheReferenceAlone) {
  for (const int value : {0, 6, 7, 255, -1, 1 << 30}) {
    const Ref<MethodFault> old = MakeRef<SystemError>("old");
    Ref<MethodFault> fault = old;
    MarshalDiskReason("naa.1", static_cast<DiskReason>(value), fault);
    EXPECT_EQ(fault, old) << value;
  }
}

// ---- cleaning

TEST(CleanedDisk, LosesExactlyDurableNameAlternateNamesAndInquiryData) {
  const Ref<ScsiDisk> disk = AScsiDisk("naa.1").WithInquiryData();
  CleanUnusedDiskFileds(*disk);
  EXPECT_FALSE(disk->GetDurableName());
  EXPECT_FALSE(disk->GetAlternateName());
  EXPECT_FALSE(disk->GetStandardInquiry());
  EXPECT_TRUE(Orbis::Equal(disk.Get(), AScsiDisk("naa.1").Build().Get())) << disk->ToString();
}

// ---- one record

class OneRecord : public testing::Test {
 protected:
  Ref<Result> Marshal(const HostCtl::Kova::DiskResult& record, bool queryMode = forQuery) {
    Ref<Result> result;
    MarshalHostCtlDiskResult(*_logger, record, DiskInventory(AnInventory({_disk})), result, queryMode);
    return result;
  }

  const Ref<TestSupport::RecordingLogger> _logger = MakeRef<TestSupport::RecordingLogger>();
  const Ref<ScsiDisk> _disk = AScsiDisk("naa.1").Ssd().WithInquiryData();
};

TEST_F(OneRecord, GivesACleanedCopyOfTheInventorysDisk) {
  const auto before = Orbis::Clone(_disk);
  const auto result = Marshal(ARecord("naa.1"));
  ASSERT_TRUE(result);
  const Ref<ScsiDisk> cleaned = AScsiDisk("naa.1").Ssd();
  EXPECT_TRUE(Orbis::Equal(result->GetDisk().Get(), cleaned.Get())) << result->GetDisk()->ToString();
  EXPECT_NE(result->GetDisk(), _disk);
  EXPECT_TRUE(Orbis::Equal(_disk.Get(), before.Get())) << "the inventory's disk was changed";
}

TEST_F(OneRecord, NeverWritesThroughToTheInventoryWhateverItSets) {
  const auto before = Orbis::Clone(_disk);
  Marshal(ARecord("naa.1").InUse(uuid).CapacityFlash().Reason(DiskReason::GroupNotMounted), forPlanning);
  EXPECT_TRUE(Orbis::Equal(_disk.Get(), before.Get())) << _disk->ToString();
}

TEST_F(OneRecord, SharesNoPartOfTheDiskWithTheInventory) {
  const auto result = Marshal(ARecord("naa.1"));
  EXPECT_NE(result->GetDisk()->GetCapacity(), _disk->GetCapacity());
  EXPECT_NE(result->GetDisk()->GetOperationalState(), _disk->GetOperationalState());
}

TEST_F(OneRecord, GivesNothingForADiskThatTheInventoryLacks) {
  const auto old = MakeRef<Result>();
  Ref<Result> result = old;
  MarshalHostCtlDiskResult(*_logger, ARecord("naa.9"), DiskInventory(AnInventory({_disk})), result, forQuery);
  EXPECT_EQ(result, old);
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(OneRecord, ReplacesTheResultThatTheReferenceHeld) {
  const auto old = MakeRef<Result>();
  Ref<Result> result = old;
  MarshalHostCtlDiskResult(*_logger, ARecord("naa.1"), DiskInventory(AnInventory({_disk})), result, forQuery);
  EXPECT_NE(result, old);
  EXPECT_EQ(old->GetRefCount(), 1);
}

TEST_F(OneRecord, LetsTheLookUpsExceptionPass) {
  const DiskInventory inventory(AnInventory({AScsiDisk("x").Unnamed(), _disk}));
  Ref<Result> result;
  EXPECT_THROW(MarshalHostCtlDiskResult(*_logger, ARecord("naa.1"), inventory, result, forQuery),
               Tessa::NotInitializedException);
  EXPECT_FALSE(result);
}

TEST_F(OneRecord, AlwaysSetsTheUuidEvenAnEmptyOne) {
  const auto without = Marshal(ARecord("naa.1"));
  EXPECT_TRUE(without->HasKovaUuid());
  EXPECT_EQ(without->GetKovaUuid(), "");
  EXPECT_EQ(Marshal(ARecord("naa.1").Uuid(uuid))->GetKovaUuid(), uuid);
}

TEST_F(OneRecord, CarriesItsStatesText) {
  EXPECT_EQ(Marshal(ARecord("naa.1"))->GetState(), Result::STATE_ELIGIBLE);
  EXPECT_EQ(Marshal(ARecord("naa.1").InUse(uuid))->GetState(), Result::STATE_INUSE);
  EXPECT_EQ(Marshal(ARecord("naa.1").State(static_cast<DiskState>(3)))->GetState(), Result::STATE_INELIGIBLE);
}

TEST_F(OneRecord, OfADiskInUseCarriesItsUuidAndFormatVersion) {
  const auto result = Marshal(ARecord("naa.1").InUse(uuid, 255));
  ASSERT_TRUE(result->GetDisk()->GetKovaDiskInfo());
  EXPECT_EQ(result->GetDisk()->GetKovaDiskInfo()->GetKovaUuid(), uuid);
  EXPECT_EQ(result->GetDisk()->GetKovaDiskInfo()->GetFormatVersion(), 255);
}

TEST_F(OneRecord, OfADiskNotInUseCarriesNone) {
  for (const DiskState state : {DiskState::Eligible, DiskState::Ineligible, static_cast<DiskState>(3)}) {
    const auto result = Marshal(ARecord("naa.1").Uuid(uuid).State(state));
    EXPECT_FALSE(result->GetDisk()->GetKovaDiskInfo());
  }
}

TEST_F(OneRecord, CarriesTheFaultOfItsReason) {
  EXPECT_THAT(Marshal(ARecord("naa.1").Ineligible(DiskReason::Usb))->GetError(),
              NamesDevice("DiskIsUSB", "naa.1"));
}

TEST_F(OneRecord, CarriesNoErrorWithoutAReasonOrForOneThatHasNoFault) {
  for (const int reason : {0, 6, 7}) {
    EXPECT_FALSE(Marshal(ARecord("naa.1").Ineligible(static_cast<DiskReason>(reason)))->GetError()) << reason;
  }
}

TEST_F(OneRecord, OfAGroupThatIsNotMountedShowsTheDiskSwitchedOff) {
  for (const bool mode : {forQuery, forPlanning}) {
    const auto result = Marshal(ARecord("naa.1").Ineligible(DiskReason::GroupNotMounted), mode);
    EXPECT_THAT(result->GetDisk()->GetOperationalState()->Items(), ElementsAre(ScsiDisk::STATE_OFF));
  }
}

TEST_F(OneRecord, OfAnyOtherReasonShowsTheDiskAsItIs) {
  for (const int reason : {0, 1, 2, 3, 4, 5, 7}) {
    const auto result = Marshal(ARecord("naa.1").Ineligible(static_cast<DiskReason>(reason)));
    EXPECT_THAT(result->GetDisk()->GetOperationalState()->Items(), ElementsAre(ScsiDisk::STATE_OK));
  }
}

TEST_F(OneRecord, OfFlashForTheCapacityTierIsNoSsdForPlanningButStaysOneInQueries) {
  EXPECT_FALSE(Marshal(ARecord("naa.1").CapacityFlash(), forPlanning)->GetDisk()->GetSsd());
  EXPECT_TRUE(Marshal(ARecord("naa.1").CapacityFlash(), forQuery)->GetDisk()->GetSsd());
  EXPECT_TRUE(Marshal(ARecord("naa.1"), forPlanning)->GetDisk()->GetSsd());
}

TEST_F(OneRecord, OfFlashForTheCapacityTierSetsAnSsdFlagThatTheInventoryLeftUnset) {
  _disk->SetSsd(std::nullopt);
  EXPECT_FALSE(Marshal(ARecord("naa.1"), forPlanning)->GetDisk()->HasSsd());
  const auto result = Marshal(ARecord("naa.1").CapacityFlash(), forPlanning);
  ASSERT_TRUE(result->GetDisk()->HasSsd());
  EXPECT_FALSE(result->GetDisk()->GetSsd());
}

// ---- absent disks

TEST_F(OneRecord, OfAnAbsentDiskGivesAStandInNamedAfterItsUuid) {
  const auto result = Marshal(ARecord("").Absent().InUse(uuid).Ssd());
  ASSERT_TRUE(result);
  EXPECT_EQ(result->GetDisk()->GetCanonicalName(), "kova:" + uuid);
  EXPECT_TRUE(result->GetDisk()->GetSsd());
  EXPECT_EQ(result->GetKovaUuid(), uuid);
  ASSERT_TRUE(result->GetDisk()->GetKovaDiskInfo());
  EXPECT_EQ(result->GetDisk()->GetKovaDiskInfo()->GetKovaUuid(), uuid);
}

TEST_F(OneRecord, OfAnAbsentDiskKeepsItsSsdFlagForPlanningUnlessItIsCapacityFlash) {
  EXPECT_TRUE(Marshal(ARecord("").Absent().Uuid(uuid).Ssd(), forPlanning)->GetDisk()->GetSsd());
  EXPECT_FALSE(
      Marshal(ARecord("").Absent().Uuid(uuid).Ssd().CapacityFlash(), forPlanning)->GetDisk()->GetSsd());
  EXPECT_TRUE(Marshal(ARecord("").Absent().Uuid(uuid).Ssd().CapacityFlash(), forQuery)->GetDisk()->GetSsd());
  EXPECT_FALSE(Marshal(ARecord("").Absent().Uuid(uuid).Ssd(false), forPlanning)->GetDisk()->GetSsd());
}

TEST_F(OneRecord, OfAnAbsentDiskIsNotLookedUp) {
  const auto result = Marshal(ARecord("naa.1").Absent().Uuid(uuid));
  EXPECT_EQ(result->GetDisk()->GetCanonicalName(), "kova:" + uuid);
  EXPECT_EQ(result->GetDisk()->GetDeviceName(), "unknown");
}

TEST_F(OneRecord, OfAnAbsentDiskNamesTheRecordInItsReasonsFault) {
  const auto result = Marshal(ARecord("naa.gone").Absent().Uuid(uuid).Ineligible(DiskReason::TooSmall));
  EXPECT_THAT(result->GetError(), NamesDevice("DiskTooSmall", "naa.gone"));
}

TEST_F(OneRecord, OfAnAbsentDiskWithoutUuidGivesNothingEvenIfTheInventoryKnowsItsName) {
  EXPECT_FALSE(Marshal(ARecord("naa.1").Absent()));
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(OneRecord, OfAnAbsentDiskInAGroupThatIsNotMountedIsOffInsteadOfInError) {
  EXPECT_THAT(Marshal(ARecord("").Absent().Uuid(uuid))->GetDisk()->GetOperationalState()->Items(),
              ElementsAre(ScsiDisk::STATE_ERROR));
  const auto result = Marshal(ARecord("").Absent().Uuid(uuid).Ineligible(DiskReason::GroupNotMounted));
  EXPECT_THAT(result->GetDisk()->GetOperationalState()->Items(), ElementsAre(ScsiDisk::STATE_OFF));
}

// ---- all records

class AllRecords : public TestSupport::PluginFixture {
 protected:
  void Marshal(const std::vector<HostCtl::Kova::DiskResult>& records, bool queryMode = forQuery) {
    MarshalHostCtlDiskResults(*_logger, records, _results, queryMode);
  }

  std::vector<std::string> Names() const {
    std::vector<std::string> names;
    for (const Result* result : *_results) {
      names.push_back(result->GetDisk()->GetCanonicalName());
    }
    return names;
  }

  const Ref<DataArray<Result>> _old = MakeRef<DataArray<Result>>();
  Ref<DataArray<Result>> _results = _old;
};

TEST_F(AllRecords, KeepTheirOrderAgainstOneReadingOfTheInventory) {
  _storage->SetDisks({AScsiDisk("naa.1"), AScsiDisk("naa.2"), AScsiDisk("naa.3")});
  Marshal({ARecord("naa.3"), ARecord("naa.1"), ARecord("naa.2")});
  EXPECT_THAT(Names(), ElementsAre("naa.3", "naa.1", "naa.2"));
  EXPECT_THAT(_timeline.Events(), ElementsAre("GetStorageDeviceInfo"));
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(AllRecords, OfNoDiskAreAnEmptyListStillAfterOneReading) {
  Marshal({});
  EXPECT_NE(_results, _old);
  EXPECT_TRUE(_results->IsEmpty());
  EXPECT_EQ(_old->GetRefCount(), 1);
  EXPECT_THAT(_timeline.Events(), ElementsAre("GetStorageDeviceInfo"));
}

TEST_F(AllRecords, WithoutADiskInTheInventoryAreLeftOutWithALineEach) {
  _storage->SetDisks({AScsiDisk("naa.2")});
  Marshal({ARecord("naa.1"), ARecord("naa.2"), ARecord("")});
  EXPECT_THAT(Names(), ElementsAre("naa.2"));
  constexpr const char* line = "%1: Failed to marshal disk: %2";
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Info, line, "MarshalHostCtlDiskResults", "naa.1"),
                          LogLineIs(LogLevel::Info, line, "MarshalHostCtlDiskResults", "")));
}

TEST_F(AllRecords, WithoutADiskInTheInventoryAreLeftOutInSilenceBelowInfo) {
  _logger->SetLevel(LogLevel::Warning);
  Marshal({ARecord("naa.1")});
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(AllRecords, OfAbsentDisksWithoutUuidAreDroppedWithoutALine) {
  Marshal({ARecord("naa.1").Absent(), ARecord("").Absent().Uuid(uuid)});
  EXPECT_THAT(Names(), ElementsAre("kova:" + uuid));
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(AllRecords, PassTheModeOn) {
  _storage->SetDisks({AScsiDisk("naa.1").Ssd()});
  Marshal({ARecord("naa.1").CapacityFlash()}, forQuery);
  EXPECT_TRUE((*_results)[0]->GetDisk()->GetSsd());
  Marshal({ARecord("naa.1").CapacityFlash()}, forPlanning);
  EXPECT_FALSE((*_results)[0]->GetDisk()->GetSsd());
}

TEST_F(AllRecords, AreRefusedWithAWarningWhenThereIsNoInventory) {
  _app.SetObject("storageSystem", nullptr);
  constexpr const char* reason = "Failed to lookup STORAGE_SYSTEM_MO.";
  EXPECT_THAT([&] { Marshal({ARecord("naa.1")}); },
              testing::Throws<SystemError::Exception>(CarriesSystemError(reason)));
  EXPECT_EQ(_results, _old);
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Warning, "GetDisksFromAgentd %1", reason)));
}

TEST_F(AllRecords, LetTheVerySameFaultThroughThatTheInventoryThrew) {
  const auto fault = MakeRef<SystemError>("storage is starting");
  _storage->SetObserver([&] { throw SystemError::Exception(fault); });
  try {
    Marshal({});
    ADD_FAILURE() << "nothing was thrown";
  } catch (const SystemError::Exception& exception) {
    EXPECT_EQ(exception.GetFault(), Ref<MethodFault>(fault));
  }
}

TEST_F(AllRecords, LetOtherExceptionsOfTheInventoryThroughWithoutALine) {
  _app.SetObject("storageSystem", _logger);
  EXPECT_THROW(Marshal({}), Tessa::TypeMismatchException);
  EXPECT_EQ(_results, _old);
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(AllRecords, StopAtADiskWithoutANameThatTheLookUpMeets) {
  _storage->SetDisks({AScsiDisk("naa.1"), AScsiDisk("x").Unnamed(), AScsiDisk("naa.2")});
  Marshal({ARecord("naa.1")});
  EXPECT_THAT(Names(), ElementsAre("naa.1"));
  const auto before = _results;
  EXPECT_THROW(Marshal({ARecord("naa.1"), ARecord("naa.2")}), Tessa::NotInitializedException);
  EXPECT_EQ(_results, before);
}

TEST_F(AllRecords, OfAbsentDisksNeedNoNamesInTheInventory) {
  _storage->SetDisks({AScsiDisk("x").Unnamed()});
  Marshal({ARecord("").Absent().Uuid(uuid)});
  EXPECT_THAT(Names(), ElementsAre("kova:" + uuid));
}

TEST_F(AllRecords, OfOneDiskTwiceGiveTwoCopies) {
  _storage->SetDisks({AScsiDisk("naa.1")});
  Marshal({ARecord("naa.1"), ARecord("naa.1")});
  ASSERT_EQ(_results->Size(), 2U);
  EXPECT_NE((*_results)[0]->GetDisk(), (*_results)[1]->GetDisk());
}

}  // namespace
}  // namespace Kovasvc
