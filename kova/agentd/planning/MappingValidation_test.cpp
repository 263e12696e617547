// What is checked before disks are formatted, in which order, and what each failure is called.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <vector>

#include "kova/agentd/KovaManagerImpl.h"
#include "nox/Faults.h"
#include "nox/Kova.h"
#include "tests/support/Groups.h"
#include "tests/support/Matchers.h"
#include "tests/support/PluginFixture.h"

namespace Kovasvc {
namespace {

using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskResult;
using Nox::Fault::DuplicateDisks;
using Nox::Fault::InsufficientDisks;
using Nox::Kova::Host::DiskMapping;
using Nox::Kova::Host::DiskMapResult;
using Orbis::DataArray;
using Tessa::MakeRef;
using Tessa::NotInitializedException;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::StrEq;
using testing::Throws;
using testing::ThrowsMessage;
using TestSupport::AMapping;
using TestSupport::ARecord;
using TestSupport::AScsiDisk;
using TestSupport::Disks;
using TestSupport::Hdd;
using TestSupport::IsExactly;
using TestSupport::LogLineIs;
using TestSupport::Mappings;
using TestSupport::NamesDevice;
using TestSupport::Ssd;

constexpr const char* checking = "Checking %1 disks for uniqueness";
constexpr const char* checkedUnique = "Done checking disk uniqueness: %1";
constexpr const char* checkedTypes = "Done checking disk types: %1";
constexpr const char* checkedEligible = "Done checking for ineligible disks: %1";
constexpr const char* foundIneligible = "Found ineligible disk in mapping: %1";
constexpr const char* complete = "%1 Complete";

const auto isNotInitialized = ThrowsMessage<NotInitializedException>(StrEq("Not initialized"));

MATCHER(HasNoDevice, "names no device") {
  const auto* const fault = dynamic_cast<const Nox::Fault::KovaDiskFault*>(arg.Get());
  return fault != nullptr && !fault->HasDevice();
}

// ---- the request as a whole

class RequestCheck : public TestSupport::PluginFixture {
 protected:
  RequestCheck() : _manager(MakeManager()) {}

  void Check(const std::vector<Ref<DiskMapping>>& mappings) {
    _manager->ValidateDiskMappings(Mappings(mappings).Get());
  }
  // The request fails for want of disks, of which it names so many.
  void ExpectTooFew(const std::vector<Ref<DiskMapping>>& mappings, const char* count) {
    _logger->Clear();
    try {
      Check(mappings);
      ADD_FAILURE() << "the request passed";
    } catch (const InsufficientDisks::Exception& exception) {
      EXPECT_THAT(exception.GetFault(), IsExactly<InsufficientDisks>());
      EXPECT_THAT(exception.GetFault(), HasNoDevice());
    }
    EXPECT_THAT(_logger->Lines(),
                ElementsAre(LogLineIs(
                    LogLevel::Warning,
                    "Error checking disks (only found %1): insufficient disks in given mappings", count)));
  }
  // The request fails for the disk that it names twice.
  void ExpectDuplicate(const std::vector<Ref<DiskMapping>>& mappings, const char* disk) {
    _logger->Clear();
    try {
      Check(mappings);
      ADD_FAILURE() << "the request passed";
    } catch (const DuplicateDisks::Exception& exception) {
      EXPECT_THAT(exception.GetFault(), NamesDevice("DuplicateDisks", disk));
    }
    EXPECT_THAT(_logger->Lines(),
                ElementsAre(LogLineIs(LogLevel::Warning,
                                      "Error checking disk uniqueness, duplicate disks found in mappings: %1",
                                      disk)));
  }

  Ref<KovaManagerImpl> _manager;
};

TEST_F(RequestCheck, PassesTwoDifferentDisksInSilence) {
  EXPECT_NO_THROW(Check({AMapping(Ssd("s"), {Hdd("a")})}));
  EXPECT_NO_THROW(Check({AMapping(Ssd("s"), {}), AMapping(Ssd("t"), {})}));
  EXPECT_NO_THROW(Check({AMapping(Ssd(""), {Hdd("a"), Hdd(""), Hdd("b")})}));
  EXPECT_THAT(_logger->Lines(), IsEmpty());
  EXPECT_THAT(_timeline.Events(), IsEmpty()) << "neither lock, kernel nor agent is needed";
}

TEST_F(RequestCheck, RefusesFewerThanTwoNames) {
  ExpectTooFew({}, "0");
  ExpectTooFew({AMapping(Ssd(""), {})}, "0");
  ExpectTooFew({AMapping(Ssd("s"), {})}, "1");
  ExpectTooFew({AMapping(Ssd("s"), {Hdd("")}), AMapping(Ssd(""), {})}, "1");
}

TEST_F(RequestCheck, TreatsNoListAsAnEmptyOne) {
  EXPECT_THROW(_manager->ValidateDiskMappings(nullptr), InsufficientDisks::Exception);
}

TEST_F(RequestCheck, RefusesADiskThatIsNamedTwiceAnywhere) {
  ExpectDuplicate({AMapping(Ssd("a"), {Hdd("a")})}, "a");
  ExpectDuplicate({AMapping(Ssd("s"), {Hdd("a"), Hdd("b"), Hdd("a")})}, "a");
  ExpectDuplicate({AMapping(Ssd("s"), {Hdd("a")}), AMapping(Ssd("t"), {Hdd("s")})}, "s");
  ExpectDuplicate({AMapping(Ssd("s"), {Hdd("a")}), AMapping(Ssd("s"), {Hdd("b")})}, "s");
}

TEST_F(RequestCheck, NamesTheFirstDuplicateByTheOrderOfBytes) {
  ExpectDuplicate({AMapping(Ssd("z"), {Hdd("z"), Hdd("m")}), AMapping(Ssd("m"), {Hdd("Z")})}, "m");
}

TEST_F(RequestCheck, ComparesWholeNames) {
  EXPECT_NO_THROW(Check({AMapping(Ssd("naa.1"), {Hdd("naa.11"), Hdd("NAA.1"), Hdd("naa.")})}));
  ExpectDuplicate({AMapping(Ssd("naa.1"), {Hdd("naa.11"), Hdd("naa.1")})}, "naa.1");
}

TEST_F(RequestCheck, CountsTwiceTheSameDiskAsTwoDisks) {
  ExpectDuplicate({AMapping(Ssd("s"), {}), AMapping(Ssd("s"), {})}, "s");
}

TEST_F(RequestCheck, NeedsANameOfEveryDisk) {
  const auto check = [this](const Ref<DiskMapping>& mapping) {
    return [this, mapping] { Check({AMapping(Ssd("s"), {Hdd("s")}), mapping}); };
  };
  EXPECT_THAT(check(AMapping(AScsiDisk("x").Unnamed(), {})), isNotInitialized);
  EXPECT_THAT(check(AMapping(Ssd("t"), {AScsiDisk("x").Unnamed()})), isNotInitialized);
  EXPECT_THAT(check(AMapping(nullptr, {})), isNotInitialized);
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

// ---- one group

class GroupCheck : public TestSupport::PluginFixture {
 protected:
  GroupCheck() : _manager(MakeManager()) {
    Know({Ssd("s"), Hdd("a"), Hdd("b")}, {ARecord("s").Ssd(), ARecord("a"), ARecord("b")});
  }

  void Know(const Disks& disks, const std::vector<DiskResult>& records) {
    SetHost(disks, records);
    _manager->InvalidateKovaDiskCache();
    _manager->RefreshKovaDiskCache();
    _timeline.Take();
    _logger->Clear();
    _kernel.ForgetCalls();
  }
  // The fault of the group, or null.
  Ref<Orbis::MethodFault> Check(const Ref<DiskMapping>& mapping) {
    _manager->ValidateDiskMapping(mapping, _result);
    EXPECT_EQ(_result->GetMapping(), mapping);
    return _result->GetError();
  }
  // The disks of the result, in order.
  std::vector<std::string> ResultDisks() const {
    std::vector<std::string> names;
    for (const Nox::Kova::Host::DiskResult* result : *_result->GetDiskResult()) {
      names.push_back(result->GetDisk()->GetCanonicalName());
    }
    return names;
  }
  void ExpectNobodyAsked() const { EXPECT_THAT(_timeline.Events(), IsEmpty()); }

  Ref<KovaManagerImpl> _manager;
  Ref<DiskMapResult> _result = MakeRef<DiskMapResult>();
};

TEST_F(GroupCheck, PassesAGroupOfEligibleDisks) {
  EXPECT_FALSE(Check(AMapping(Ssd("s"), {Hdd("b"), Hdd("a")})));
  EXPECT_THAT(ResultDisks(), ElementsAre("s", "a", "b")) << "in the order of the cache";
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, checking, "3"),
                                            LogLineIs(LogLevel::Verbose, checkedUnique, "OK"),
                                            LogLineIs(LogLevel::Verbose, checkedTypes, "OK"),
                                            LogLineIs(LogLevel::Verbose, checkedEligible, "OK"),
                                            LogLineIs(LogLevel::Trivia, complete, "ValidateDiskMapping")));
}

TEST_F(GroupCheck, HoldsTheCacheLockForQueryAndMarshalling) {
  Check(AMapping(Ssd("s"), {Hdd("a")}));
  EXPECT_THAT(_timeline.Events(), ElementsAre("take KovaManager.diskCache", "GetStorageDeviceInfo",
                                              "release KovaManager.diskCache"));
}

TEST_F(GroupCheck, ReplacesEveryFieldOfTheResult) {
  const Ref<DiskMapResult> result = _result;
  _result->SetMapping(AMapping(Ssd("old"), {}));
  _result->SetError(MakeRef<InsufficientDisks>());
  EXPECT_FALSE(Check(AMapping(Ssd("s"), {Hdd("a")})));
  EXPECT_EQ(_result, result) << "filled, not exchanged";
}

TEST_F(GroupCheck, RefusesAGroupThatNamesNoDisk) {
  EXPECT_THAT(Check(AMapping(AScsiDisk("").Ssd(std::nullopt), {})), IsExactly<InsufficientDisks>());
  EXPECT_THAT(_result->GetError(), HasNoDevice());
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Warning, "Given invalid empty mapping"),
                                            LogLineIs(LogLevel::Trivia, complete, "ValidateDiskMapping")));
  EXPECT_THAT(ResultDisks(), IsEmpty());
  ExpectNobodyAsked();
  EXPECT_THAT(Check(AMapping(Ssd(""), {Hdd("")})), IsExactly<InsufficientDisks>());
}

TEST_F(GroupCheck, RefusesADiskThatIsNamedTwice) {
  EXPECT_THAT(Check(AMapping(Hdd("s"), {Hdd("b"), Hdd("s"), Hdd("b")})), NamesDevice("DuplicateDisks", "b"));
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Verbose, checking, "4"),
                          LogLineIs(LogLevel::Warning, "Duplicate disks found in mapping: %1", "b"),
                          LogLineIs(LogLevel::Verbose, checkedUnique, "FAIL"),
                          LogLineIs(LogLevel::Trivia, complete, "ValidateDiskMapping")));
  EXPECT_THAT(ResultDisks(), IsEmpty());
  ExpectNobodyAsked();
}

TEST_F(GroupCheck, RefusesAGroupWithoutCapacityDisks) {
  EXPECT_THAT(Check(AMapping(Hdd("s"), {})), IsExactly<InsufficientDisks>());
  EXPECT_THAT(_result->GetError(), HasNoDevice());
  EXPECT_THAT(
      _logger->Lines(),
      ElementsAre(
          LogLineIs(LogLevel::Verbose, checking, "1"), LogLineIs(LogLevel::Verbose, checkedUnique, "OK"),
          LogLineIs(LogLevel::Warning, "Error checking disk count: insufficient non-SSD disks in mapping"),
          LogLineIs(LogLevel::Trivia, complete, "ValidateDiskMapping")));
  ExpectNobodyAsked();
  const auto mapping = MakeRef<DiskMapping>();
  mapping->SetSsd(Ssd("s"));
  mapping->SetNonSsd(nullptr);
  EXPECT_THAT(Check(mapping), IsExactly<InsufficientDisks>());
}

TEST_F(GroupCheck, RefusesAnSsdThatIsNone) {
  const auto fault = Check(AMapping(Hdd("s"), {Hdd("a")}));
  ASSERT_THAT(fault, IsExactly<Orbis::Fault::InvalidArgument>());
  EXPECT_FALSE(dynamic_cast<Orbis::Fault::InvalidArgument&>(*fault).HasArgument());
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Verbose, checking, "2"),
                          LogLineIs(LogLevel::Verbose, checkedUnique, "OK"),
                          LogLineIs(LogLevel::Warning,
                                    "Error with SSD: invalid SSD in mapping (disk is not an SSD): %1", "s"),
                          LogLineIs(LogLevel::Verbose, checkedTypes, "FAIL"),
                          LogLineIs(LogLevel::Trivia, complete, "ValidateDiskMapping")));
  EXPECT_THAT(ResultDisks(), IsEmpty());
  ExpectNobodyAsked();
}

TEST_F(GroupCheck, DoesNotAskWhatTheCapacityDisksAre) {
  EXPECT_FALSE(Check(AMapping(Ssd("s"), {Ssd("a"), AScsiDisk("b").Ssd(std::nullopt)})));
}

TEST_F(GroupCheck, KnowsNoUpperLimit) {
  Disks disks;
  for (int number = 0; number < 20; ++number) {
    disks.push_back(Hdd("c" + std::to_string(number)));
  }
  EXPECT_FALSE(Check(AMapping(Ssd("s"), disks)));
}

TEST_F(GroupCheck, RefusesAnIneligibleDiskWithTheFaultOfItsResult) {
  Know({Ssd("s"), Hdd("a")}, {ARecord("s").Ssd(), ARecord("a").Ineligible(DiskReason::HasPartitions)});
  EXPECT_THAT(Check(AMapping(Ssd("s"), {Hdd("a")})), NamesDevice("DiskHasPartitions", "a"));
  EXPECT_EQ(_result->GetError(), (*_result->GetDiskResult())[1]->GetError()) << "shared";
  EXPECT_THAT(ResultDisks(), ElementsAre("s", "a"));
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, checking, "2"),
                                            LogLineIs(LogLevel::Verbose, checkedUnique, "OK"),
                                            LogLineIs(LogLevel::Verbose, checkedTypes, "OK"),
                                            LogLineIs(LogLevel::Warning, foundIneligible, "a"),
                                            LogLineIs(LogLevel::Verbose, checkedEligible, "FAIL"),
                                            LogLineIs(LogLevel::Trivia, complete, "ValidateDiskMapping")));
}

TEST_F(GroupCheck, ReportsOnlyTheFirstIneligibleDiskOfTheCache) {
  Know({Ssd("s"), Hdd("a"), Hdd("b")}, {ARecord("b").Ineligible(DiskReason::Usb), ARecord("s").Ssd(),
                                        ARecord("a").Ineligible(DiskReason::TooSmall)});
  EXPECT_THAT(Check(AMapping(Ssd("s"), {Hdd("a"), Hdd("b")})), NamesDevice("DiskIsUSB", "b"));
  EXPECT_THAT(_logger->Lines(LogLevel::Warning),
              ElementsAre(LogLineIs(LogLevel::Warning, foundIneligible, "b")));
}

TEST_F(GroupCheck, PassesAnIneligibleDiskWithoutAReasonOver) {
  Know({Ssd("s"), Hdd("a"), Hdd("b")}, {ARecord("s").Ssd(), ARecord("a").Ineligible(DiskReason::None),
                                        ARecord("b").Ineligible(DiskReason::NonLocal)});
  EXPECT_THAT(Check(AMapping(Ssd("s"), {Hdd("a"), Hdd("b")})), NamesDevice("DiskIsNonLocal", "b"));
  EXPECT_FALSE(Check(AMapping(Ssd("s"), {Hdd("a")})));
}

TEST_F(GroupCheck, PassesDisksInUseAndEligibleOnesWithAReason) {
  Know({Ssd("s"), Hdd("a")},
       {ARecord("s").Ssd().InUse("uuid").Reason(DiskReason::Usb), ARecord("a").Reason(DiskReason::TooSmall)});
  EXPECT_FALSE(Check(AMapping(Ssd("s"), {Hdd("a")})));
}

TEST_F(GroupCheck, PassesDisksThatTheKernelDoesNotKnow) {
  EXPECT_FALSE(Check(AMapping(Ssd("x"), {Hdd("a"), Hdd("y")})));
  EXPECT_THAT(ResultDisks(), ElementsAre("a"));
}

TEST_F(GroupCheck, LooksAtItsOwnDisksOnly) {
  Know({Ssd("s"), Hdd("a"), Hdd("b")},
       {ARecord("s").Ssd(), ARecord("a"), ARecord("b").Ineligible(DiskReason::Usb)});
  EXPECT_FALSE(Check(AMapping(Ssd("s"), {Hdd("a")})));
}

TEST_F(GroupCheck, ShowsDisksAsPlanningSeesThem) {
  Know({Ssd("s"), Ssd("a")}, {ARecord("s").Ssd(), ARecord("a").Ssd().CapacityFlash()});
  EXPECT_FALSE(Check(AMapping(Ssd("s"), {Ssd("a")})));
  EXPECT_FALSE((*_result->GetDiskResult())[1]->GetDisk()->GetSsd());
}

TEST_F(GroupCheck, ReadsTheCacheAsItIs) {
  _manager->InvalidateKovaDiskCache();
  _kernel.records.clear();
  Check(AMapping(Ssd("s"), {Hdd("a")}));
  EXPECT_THAT(ResultDisks(), ElementsAre("s", "a"));
  EXPECT_THAT(_kernel.Calls(), IsEmpty());
}

TEST_F(GroupCheck, SaysNothingBelowItsLevels) {
  _logger->SetLevel(LogLevel::Error);
  EXPECT_TRUE(Check(AMapping(Hdd("s"), {Hdd("a")})));
  EXPECT_TRUE(Check(AMapping(Ssd("s"), {})));
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

// ---- what is no outcome but an exception

class GroupCheckThrows : public GroupCheck {
 protected:
  GroupCheckThrows() {
    _result->SetMapping(_old);
    _result->SetError(_oldError);
    _result->SetDiskResult(_oldDisks);
  }
  auto Checking(const Ref<DiskMapping>& mapping) {
    return [this, mapping] { _manager->ValidateDiskMapping(mapping, _result); };
  }
  // As TearDown would find it.
  void ExpectResultUntouched() const {
    EXPECT_EQ(_result->GetMapping(), _old);
    EXPECT_EQ(_result->GetError(), _oldError);
    EXPECT_EQ(_result->GetDiskResult(), _oldDisks);
  }

  const Ref<DiskMapping> _old = AMapping(Ssd("old"), {});
  const Ref<Orbis::MethodFault> _oldError = MakeRef<InsufficientDisks>();
  const Ref<KovaManagerImpl::DiskResults> _oldDisks = MakeRef<KovaManagerImpl::DiskResults>();
};

TEST_F(GroupCheckThrows, WithoutANameOfEveryDisk) {
  EXPECT_THAT(Checking(AMapping(AScsiDisk("x").Unnamed(), {Hdd("a")})), isNotInitialized);
  EXPECT_THAT(Checking(AMapping(Ssd("s"), {AScsiDisk("x").Unnamed()})), isNotInitialized);
  EXPECT_THAT(Checking(AMapping(nullptr, {Hdd("a")})), isNotInitialized);
  EXPECT_THAT(Checking(AMapping(Ssd("s"), {nullptr})), isNotInitialized);
  ExpectResultUntouched();
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(GroupCheckThrows, WithoutTheSsdFlagOfTheSsd) {
  EXPECT_THAT(Checking(AMapping(AScsiDisk("s").Ssd(std::nullopt), {Hdd("a")})),
              ThrowsMessage<NotInitializedException>(StrEq("optional value not set")));
  ExpectResultUntouched();
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, checking, "2"),
                                            LogLineIs(LogLevel::Verbose, checkedUnique, "OK")));
}

TEST_F(GroupCheckThrows, ButNotForAFlagThatAnEarlierCheckSaves) {
  EXPECT_NO_THROW(Checking(AMapping(AScsiDisk("s").Ssd(std::nullopt), {}))());
  EXPECT_NO_THROW(Checking(AMapping(AScsiDisk("s").Ssd(std::nullopt), {Hdd("s")}))());
}

TEST_F(GroupCheckThrows, WithoutAnInventoryAndReleasesTheLock) {
  _app.SetObject("storageSystem", nullptr);
  EXPECT_THROW(Checking(AMapping(Ssd("s"), {Hdd("a")}))(), Orbis::Fault::SystemError::Exception);
  ExpectResultUntouched();
  EXPECT_THAT(_timeline.Events(), ElementsAre("take KovaManager.diskCache", "release KovaManager.diskCache"));
  EXPECT_THAT(_logger->Lines(LogLevel::Trivia), IsEmpty());
}

TEST_F(GroupCheckThrows, WhenTheInventoryHoldsAnUnnamedDiskBeforeAMatch) {
  _storage->SetDisks({AScsiDisk("x").Unnamed(), Ssd("s"), Hdd("a")});
  EXPECT_THAT(Checking(AMapping(Ssd("s"), {Hdd("a")})), isNotInitialized);
  ExpectResultUntouched();
  EXPECT_THAT(_locks.HeldHere(), IsEmpty());
}

}  // namespace
}  // namespace Kovasvc
