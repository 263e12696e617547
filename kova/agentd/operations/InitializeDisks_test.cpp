// Making disk groups: what is asked of whom in which order, and what each failure becomes.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <ostream>
#include <stdexcept>
#include <string>
#include <vector>

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/include/HostCtlException.h"
#include "nox/Faults.h"
#include "nox/Kova.h"
#include "orbis/ParseException.h"
#include "tests/support/InitializeFixture.h"
#include "tests/support/KernelRefusals.h"
#include "tests/support/SpyManager.h"

namespace Kovasvc {
namespace {

using HostCtl::Kova::DiskReason;
using HostCtl::Lib::HostCtlException;
using HostCtl::Lib::KovaExceptionHasPartition;
using HostCtl::Lib::KovaStorageException;
using Nox::Fault::DiskHasPartitions;
using Nox::Fault::InsufficientDisks;
using Nox::Fault::KovaFault;
using Nox::Kova::Host::DiskMapping;
using Nox::Kova::Host::DiskMapResult;
using Orbis::Fault::SystemError;
using Tessa::MakeRef;
using Tessa::NotInitializedException;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::_;
using testing::AllOf;
using testing::Contains;
using testing::Each;
using testing::ElementsAre;
using testing::ExitedWithCode;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::StartsWith;
using testing::StrEq;
using testing::ThrowsMessage;
using TestSupport::AMapping;
using TestSupport::ARecord;
using TestSupport::AScsiDisk;
using TestSupport::Hdd;
using TestSupport::IsExactly;
using TestSupport::IsSystemError;
using TestSupport::KernelCall;
using TestSupport::KernelRefusal;
using TestSupport::LogLineIs;
using TestSupport::Mappings;
using TestSupport::NamesDevice;
using TestSupport::panicStatus;
using TestSupport::releaseCache;
using TestSupport::releaseOperation;
using TestSupport::SoapText;
using TestSupport::SoapTexts;
using TestSupport::SpyManager;
using TestSupport::Ssd;
using TestSupport::takeCache;
using TestSupport::takeOperation;

constexpr const char* formatting = "Formatting KOVA disks";
constexpr const char* formatted = "Done formatting KOVA disks";
constexpr const char* formatFailed = "Error formatting KOVA disks: %1";
constexpr const char* isInvalid = "Given mapping is invalid: %1";
const std::string uuid = "52e7b2b4-0a7c-3a1c-9d3e-2f4a5b6c7d8e";

SystemError::Exception AFault(const std::string& reason) {
  return SystemError::Exception(MakeRef<SystemError>(reason));
}

using InitializeDisks = TestSupport::InitializeFixture;
using InitializeDisksDeathTest = InitializeDisks;

// ---- the steps

TEST_F(InitializeDisks, RefreshesChecksFormatsAndAsksAgainInThisOrder) {
  Initialize({_first});
  EXPECT_THAT(
      _timeline.Events(),
      ElementsAre(takeOperation, takeCache, "RefreshKovaInfo()", "QueryDisks([], true)", releaseCache,
                  releaseOperation,                                 // refresh
                  takeCache, "GetStorageDeviceInfo", releaseCache,  // check
                  takeCache, releaseCache,                          // is it off-line?
                  takeOperation, "FormatDiskMapping(s1, [a], {tag, 1, 0})", releaseOperation,  // format
                  takeCache, releaseCache,                                                     // invalidate
                  takeOperation, takeCache, "RefreshKovaInfo()", "QueryDisks([], true)",
                  "GetStorageDeviceInfo", releaseCache, releaseOperation,  // collect
                  takeCache, releaseCache));                               // invalidate
}

TEST_F(InitializeDisks, SaysWhatItDoes) {
  Initialize({_first});
  EXPECT_THAT(_logger->Lines(LogLevel::Verbose),
              ElementsAre(LogLineIs(LogLevel::Verbose, "Checking %1 disks for uniqueness", "2"),
                          LogLineIs(LogLevel::Verbose, "Done checking disk uniqueness: %1", "OK"),
                          LogLineIs(LogLevel::Verbose, "Done checking disk types: %1", "OK"),
                          LogLineIs(LogLevel::Verbose, "Done checking for ineligible disks: %1", "OK"),
                          LogLineIs(LogLevel::Verbose, formatting), LogLineIs(LogLevel::Verbose, formatted),
                          LogLineIs(LogLevel::Verbose, TestSupport::noFaultLine)));
  EXPECT_THAT(_logger->Lines(LogLevel::Warning), IsEmpty());
}

TEST_F(InitializeDisks, FormatsUnderTheOperationLockAloneAndLogsOutsideOfIt) {
  LogIntoTimeline();
  Initialize({_first});
  std::vector<std::string> events = EventsFrom("log verbose: Formatting KOVA disks");
  ASSERT_GE(events.size(), 5U);
  events.resize(5);
  EXPECT_THAT(events, ElementsAre("log verbose: Formatting KOVA disks", takeOperation,
                                  "FormatDiskMapping(s1, [a], {tag, 1, 0})", releaseOperation,
                                  "log verbose: Done formatting KOVA disks"));
}

TEST_F(InitializeDisks, HoldsTheOperationLockAtEveryCallOfTheKernelAndTheCacheLockAtRefreshes) {
  InitializeAll();
  for (const KernelCall& call : _kernel.Calls()) {
    SCOPED_TRACE(call.text);
    if (call.operation == "FormatDiskMapping") {
      EXPECT_THAT(call.locksHeld, ElementsAre(TestSupport::operationLock));
    } else {
      EXPECT_THAT(call.locksHeld, ElementsAre(TestSupport::operationLock, TestSupport::diskCacheLock));
    }
  }
}

TEST_F(InitializeDisks, AnswersWithAResultForEachGroupInOrder) {
  InitializeAll();
  EXPECT_THAT(ResultTexts(), ElementsAre("s1: a", "s2: b", "s3: c"));
  EXPECT_FALSE(HasFault());
}

TEST_F(InitializeDisks, ReportsTheDisksAsTheKernelKnowsThemAfterTheFormat) {
  WhenFormatting("s1", [this] {
    SetRecord(ARecord("s1").Ssd().InUse(uuid));
    SetRecord(ARecord("a").InUse(uuid));
  });
  Initialize({_first});
  const auto results = Results();
  const DiskMapResult& result = *(*results)[0];
  EXPECT_THAT(DiskStates(result), ElementsAre("s1 inUse", "a inUse"));
  EXPECT_EQ((*result.GetDiskResult())[0]->GetKovaUuid(), uuid);
  EXPECT_EQ(TestSupport::GroupText(*result.GetMapping()), "s1: a") << "the group as it was requested";
}

TEST_F(InitializeDisks, ReportsTheDisksOfTheGroupOnlyAndInTheKernelsOrder) {
  _kernel.records = {ARecord("c"), ARecord("a"), ARecord("s1").Ssd(), ARecord("b"), ARecord("s2").Ssd()};
  Initialize({AMapping(Ssd("s1"), {Hdd("b"), Hdd("a")})});
  EXPECT_THAT(DiskStates(*(*Results())[0]), ElementsAre("a eligible", "s1 eligible", "b eligible"));
}

TEST_F(InitializeDisks, ReportsDisksAsPlanningSeesThem) {
  _kernel.records.push_back(ARecord("f").Ssd().CapacityFlash());
  _storage->SetDisks({Ssd("s1"), Ssd("f")});
  Initialize({AMapping(Ssd("s1"), {Ssd("f")})});
  EXPECT_FALSE((*(*Results())[0]->GetDiskResult())[1]->GetDisk()->GetSsd());
}

TEST_F(InitializeDisks, TellsTheKernelTheTagTheCountAndThePositionOfEachGroup) {
  InitializeAll();
  EXPECT_THAT(Formats(), ElementsAre("FormatDiskMapping(s1, [a], {tag, 3, 0})",
                                     "FormatDiskMapping(s2, [b], {tag, 3, 1})",
                                     "FormatDiskMapping(s3, [c], {tag, 3, 2})"));
}

TEST_F(InitializeDisks, NamesCapacityDisksInTheOrderOfTheRequest) {
  Initialize({AMapping(Ssd("s1"), {Hdd("c"), Hdd("a"), Hdd("b")})});
  EXPECT_THAT(Formats(), ElementsAre("FormatDiskMapping(s1, [c, a, b], {tag, 1, 0})"));
}

TEST_F(InitializeDisks, ReadsTheKernelAfreshAfterEachGroup) {
  InitializeAll();
  EXPECT_EQ(Calls("RefreshKovaInfo").size(), 4U);
  EXPECT_EQ(Calls("QueryDisks").size(), 4U);
}

TEST_F(InitializeDisks, UsesACacheThatIsStillValid) {
  _manager->RefreshKovaDiskCache();
  Forget();
  Initialize({_first});
  EXPECT_EQ(_logger->Lines(LogLevel::Verbose).front().format, "Disk cache is valid, no need to refresh.");
  EXPECT_EQ(Calls("RefreshKovaInfo").size(), 1U) << "after the format";
}

TEST_F(InitializeDisks, LeavesAnInvalidCacheBehind) {
  InitializeAll();
  EXPECT_FALSE(IsCacheValid());
}

TEST_F(InitializeDisks, HoldsNoLockFromOneGroupToTheNext) {
  std::vector<std::string> heldAtCheck;
  const auto spy = UseManager<SpyManager>();
  spy->initializeMapping = [&](const auto&, auto&) {
    for (const std::string& lock : _locks.HeldHere()) {
      heldAtCheck.push_back(lock);
    }
  };
  InitializeAll();
  EXPECT_THAT(spy->calls, Contains(StartsWith("InitializeMapping(")).Times(3));
  EXPECT_THAT(heldAtCheck, IsEmpty());
}

// ---- an empty request

TEST_F(InitializeDisks, RefusesAnEmptyRequestAfterTheRefresh) {
  InitializeTexts({});
  EXPECT_TRUE(Results()->IsEmpty());
  EXPECT_THAT(Fault(), IsExactly<InsufficientDisks>());
  EXPECT_THAT(_kernel.CallTexts(), ElementsAre("RefreshKovaInfo()", "QueryDisks([], true)"));
  EXPECT_FALSE(IsCacheValid());
}

TEST_F(InitializeDisks, RefusesTheWholeRequestForADiskNamedTwice) {
  Initialize({_first, AMapping(Ssd("s2"), {Hdd("a")})});
  EXPECT_TRUE(Results()->IsEmpty());
  EXPECT_THAT(Fault(), NamesDevice("DuplicateDisks", "a"));
  EXPECT_THAT(Formats(), IsEmpty());
  EXPECT_THAT(_logger->Lines(), Not(Contains(LogLineIs(LogLevel::Verbose, TestSupport::gotFaultLine, _))))
      << "it does not get as far as that";
}

// ---- a group that is refused

TEST_F(InitializeDisks, DoesNotFormatAnInvalidGroupAndGoesOn) {
  SetRecord(ARecord("b").Ineligible(DiskReason::Usb));
  InitializeAll();
  EXPECT_THAT(Formats(), ElementsAre("FormatDiskMapping(s1, [a], {tag, 3, 0})",
                                     "FormatDiskMapping(s3, [c], {tag, 3, 2})"));
  EXPECT_THAT(ResultTexts(), ElementsAre("s1: a", "s2: b !DiskIsUSB", "s3: c"));
  EXPECT_THAT(DiskStates(*(*Results())[1]), ElementsAre("s2 eligible", "b ineligible"));
  EXPECT_THAT(Fault(), NamesDevice("DiskIsUSB", "b"));
  EXPECT_THAT(
      _logger->Lines(LogLevel::Warning),
      ElementsAre(LogLineIs(LogLevel::Warning, "Found ineligible disk in mapping: %1", "b"),
                  LogLineIs(LogLevel::Warning, isInvalid, AllOf(HasSubstr("DiskIsUSB"), HasSubstr("b")))));
  EXPECT_FALSE(IsCacheValid());
}

TEST_F(InitializeDisks, AsksNobodyAgainAboutAnInvalidGroup) {
  Initialize({AMapping(Hdd("a"), {Hdd("b")})});
  EXPECT_THAT(_kernel.CallTexts(), ElementsAre("RefreshKovaInfo()", "QueryDisks([], true)"));
  EXPECT_THAT(ResultTexts(), ElementsAre("a: b !InvalidArgument"));
  EXPECT_THAT(Fault(), IsExactly<Orbis::Fault::InvalidArgument>());
}

TEST_F(InitializeDisks, WarnsOfAnInvalidGroupFromLevelWarningOn) {
  _logger->SetLevel(LogLevel::Warning);
  Initialize({AMapping(Hdd("a"), {Hdd("b")})});
  EXPECT_THAT(_logger->Lines(),
              Contains(LogLineIs(LogLevel::Warning, isInvalid, HasSubstr("InvalidArgument"))));
  _logger->Clear();
  _logger->SetLevel(LogLevel::Error);
  Initialize({AMapping(Hdd("a"), {Hdd("b")})});
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

// ---- a kernel that refuses

class InitializeDisksRefused : public InitializeDisks, public testing::WithParamInterface<KernelRefusal> {};

INSTANTIATE_TEST_SUITE_P(Kernel, InitializeDisksRefused, testing::ValuesIn(TestSupport::KernelRefusals()),
                         [](const auto& test) { return std::string(test.param.name); });

TEST_P(InitializeDisksRefused, TellsItInTheGroupsResultAndStillCollectsItsDisks) {
  GetParam().fail(_kernel, "FormatDiskMapping");
  Initialize({_first});
  const auto results = Results();
  EXPECT_THAT((*results)[0]->GetError(), GetParam().fault);
  EXPECT_THAT(DiskStates(*(*results)[0]), ElementsAre("s1 eligible", "a eligible"));
  EXPECT_THAT(Fault(), GetParam().fault);
  EXPECT_THAT(_logger->Lines(LogLevel::Warning),
              ElementsAre(LogLineIs(LogLevel::Warning, formatFailed, "no")));
  EXPECT_THAT(_logger->Lines(), Contains(LogLineIs(LogLevel::Verbose, formatting)));
  EXPECT_THAT(_logger->Lines(), Not(Contains(LogLineIs(LogLevel::Verbose, formatted))));
  EXPECT_FALSE(IsCacheValid());
}

TEST_P(InitializeDisksRefused, TellsARefusedRestampLikewise) {
  SetRecord(ARecord("s1").Ssd().Ineligible(DiskReason::GroupNotMounted));
  GetParam().fail(_kernel, "MountDiskMapping");
  Initialize({_first});
  EXPECT_THAT((*Results())[0]->GetError(), GetParam().fault);
  EXPECT_THAT(_logger->Lines(LogLevel::Warning),
              ElementsAre(LogLineIs(LogLevel::Warning, formatFailed, "no")));
}

TEST_F(InitializeDisks, InvalidatesTheCacheAfterARefusedFormatBeforeItCollects) {
  _kernel.Fail("FormatDiskMapping", KovaStorageException("no", "a"));
  Initialize({_first});
  EXPECT_THAT(EventsFrom("FormatDiskMapping(s1, [a], {tag, 1, 0})"),
              ElementsAre("FormatDiskMapping(s1, [a], {tag, 1, 0})", releaseOperation, takeCache,
                          releaseCache, takeOperation, takeCache, "RefreshKovaInfo()", "QueryDisks([], true)",
                          "GetStorageDeviceInfo", releaseCache, releaseOperation, takeCache, releaseCache));
}

TEST_F(InitializeDisks, MakesTheOtherGroupsWhenTheSecondOfThreeFails) {
  WhenFormatting("s2", [] { throw KovaExceptionHasPartition("partitions", "b"); });
  InitializeAll();
  EXPECT_THAT(ResultTexts(), ElementsAre("s1: a", "s2: b !DiskHasPartitions", "s3: c"));
  EXPECT_THAT(DiskStates(*(*Results())[1]), ElementsAre("s2 eligible", "b eligible"));
  EXPECT_THAT(Fault(), NamesDevice("DiskHasPartitions", "b"));
  EXPECT_THAT(Formats(), ElementsAre("FormatDiskMapping(s1, [a], {tag, 3, 0})",
                                     "FormatDiskMapping(s2, [b], {tag, 3, 1})",
                                     "FormatDiskMapping(s3, [c], {tag, 3, 2})"));
}

TEST_F(InitializeDisks, FoldsSeveralFaultsIntoOneWithAllTheirMessages) {
  const auto spy = UseManager<SpyManager>();
  spy->initializeMapping = [](const Ref<DiskMapping>& mapping, Ref<DiskMapResult>& result) {
    const std::string name = mapping->GetSsd()->GetCanonicalName();
    result->SetMapping(mapping);
    if (name != "s2") {
      result->SetError(
          TestSupport::WithMessages(MakeRef<DiskHasPartitions>(name), {name + ".1", name + ".2"}));
    }
  };
  InitializeAll();
  ASSERT_THAT(Fault(), IsExactly<KovaFault>());
  EXPECT_THAT(TestSupport::MessageKeys(*Fault()), ElementsAre("s1.1", "s1.2", "s3.1", "s3.2"));
  EXPECT_THAT(ResultTexts(), ElementsAre("s1: a !DiskHasPartitions", "s2: b", "s3: c !DiskHasPartitions"));
}

// ---- a run that is stopped by a fault

TEST_F(InitializeDisks, KeepsTheResultsOfBeforeAFaultStopsTheRun) {
  WhenFormatting("s2", [this] { _app.SetObject("storageSystem", nullptr); });
  InitializeAll();
  EXPECT_THAT(ResultTexts(), ElementsAre("s1: a"));
  EXPECT_THAT(Fault(), IsSystemError("Failed to lookup STORAGE_SYSTEM_MO."));
  EXPECT_EQ(Formats().size(), 2U) << "the third group is not touched";
  EXPECT_THAT(_logger->Lines(), Not(Contains(LogLineIs(LogLevel::Verbose, TestSupport::gotFaultLine, _))));
  EXPECT_FALSE(IsCacheValid());
}

TEST_F(InitializeDisks, PutsTheStoppingFaultInThePlaceOfWhatWasCombined) {
  const auto spy = UseManager<SpyManager>();
  int number = 0;
  spy->initializeMapping = [&](const Ref<DiskMapping>& mapping, Ref<DiskMapResult>& result) {
    if (++number == 3) {
      throw AFault("stop");
    }
    result->SetMapping(mapping);
    result->SetError(MakeRef<DiskHasPartitions>("x"));
  };
  InitializeAll();
  EXPECT_THAT(Fault(), IsSystemError("stop"));
  EXPECT_EQ(Results()->Size(), 2U);
}

TEST_F(InitializeDisks, TellsAFaultOfTheRefreshAndForgetsTheCache) {
  _kernel.Fail("QueryDisks", AFault("broken"));
  Initialize({_first});
  EXPECT_FALSE(HasResult());
  EXPECT_THAT(Fault(), IsSystemError("broken"));
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Verbose, TestSupport::gotFaultLine, "SystemError: broken"),
                          LogLineIs(LogLevel::Verbose, TestSupport::noResultLine)));
  EXPECT_THAT(_timeline.Events(),
              ElementsAre(takeOperation, takeCache, "RefreshKovaInfo()", "QueryDisks([], true)", releaseCache,
                          releaseOperation, takeCache, releaseCache));
}

TEST_F(InitializeDisks, GoesOnWhenTheKernelCannotBeReadAndFormatsWhatItIsTold) {
  _kernel.Fail("QueryDisks", HostCtlException("away"));
  Initialize({_first});
  EXPECT_THAT(Formats(), ElementsAre("FormatDiskMapping(s1, [a], {tag, 1, 0})"));
  EXPECT_THAT(ResultTexts(), ElementsAre("s1: a"));
  EXPECT_THAT(DiskStates(*(*Results())[0]), IsEmpty());
  EXPECT_FALSE(HasFault());
  EXPECT_THAT(_logger->Lines(LogLevel::Warning),
              Each(LogLineIs(LogLevel::Warning, "Failed to refresh KOVA disk cache %1", "away")));
}

TEST_F(InitializeDisks, KeepsAResultThatWasSetBeforeAFaultCameOut) {
  const auto spy = UseManager<SpyManager>();
  spy->initializeDisksInt = [](Ref<Orbis::Any>& result, Ref<Orbis::MethodFault>& fault) {
    EXPECT_FALSE(result);
    EXPECT_FALSE(fault);
    result = MakeRef<MapResults>();
    fault = MakeRef<DiskHasPartitions>("replaced");
    throw AFault("out");
  };
  Initialize({_first, _second});
  EXPECT_THAT(spy->calls, ElementsAre("InitializeDisksInt([s1: a, s2: b], tag)"));
  EXPECT_TRUE(Results()->IsEmpty());
  EXPECT_THAT(Fault(), IsSystemError("out"));
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Verbose, TestSupport::gotFaultLine, "SystemError: out")));
  EXPECT_FALSE(IsCacheValid());
}

TEST_F(InitializeDisks, SaysNothingOfAFaultBelowVerbose) {
  _logger->SetLevel(LogLevel::Info);
  _kernel.Fail("QueryDisks", AFault("broken"));
  Initialize({_first});
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

// ---- what is no answer

TEST_F(InitializeDisks, LetsAMissingNameOutAndSerializesNothing) {
  const std::vector<Ref<DiskMapping>> requests[] = {
      {AMapping(AScsiDisk("x").Unnamed().Ssd(), {Hdd("a")})},
      {AMapping(Ssd("s1"), {AScsiDisk("x").Unnamed()})},
      {_first, AMapping(Ssd("s2"), {AScsiDisk("x").Unnamed()})}};
  for (const auto& request : requests) {
    EXPECT_THAT([&] { Initialize(request); },
                ThrowsMessage<NotInitializedException>(StrEq("Not initialized")));
    ExpectTextsUntouched();
    EXPECT_THAT(_locks.HeldHere(), IsEmpty());
  }
  EXPECT_THAT(Formats(), IsEmpty());
  EXPECT_TRUE(IsCacheValid()) << "nothing was changed";
}

TEST_F(InitializeDisks, LetsExceptionsOfNoFamilyOutWithTheLocksReleased) {
  for (const std::string operation : {"FormatDiskMapping", "RefreshKovaInfo"}) {
    _manager->InvalidateKovaDiskCache();
    _kernel.Fail(operation, std::runtime_error("not the kernel's"));
    EXPECT_THROW(Initialize({_first}), std::runtime_error) << operation;
    EXPECT_EQ(_timeline.Events().back(), releaseOperation) << operation;
    ExpectTextsUntouched();
    _kernel.Heal(operation);
  }
}

TEST_F(InitializeDisks, LetsOutWhatTheDecoderSays) {
  for (const std::string text : {"", "no XML", "<object"}) {
    EXPECT_THROW(InitializeTexts({SoapText(*_first), text}), Orbis::ParseException) << text;
  }
  ExpectTextsUntouched();
  EXPECT_THAT(_timeline.Events(), IsEmpty());
}

TEST_F(InitializeDisksDeathTest, EndsTheProcessOverATextOfAnotherType) {
  for (const std::string& text :
       {SoapText(*Ssd("s1")), SoapText(*MakeRef<MapResults>()), SoapText(*MakeRef<DiskMapResult>())}) {
    EXPECT_EXIT(InitializeTexts({SoapText(*_first), text}), ExitedWithCode(panicStatus),
                "^panic: NOT_REACHED kova/agentd/KovaLibManager:2070\n$");
  }
}

// ---- through the hook

TEST_F(InitializeDisks, AnswersThroughItsHookTheSame) {
  Publish();
  InitializeDisksHookFn(SoapTexts(std::vector<Ref<DiskMapping>>{_first, _second}), "of the hook", _faultText,
                        _resultText);
  EXPECT_THAT(ResultTexts(), ElementsAre("s1: a", "s2: b"));
  EXPECT_THAT(Formats(), ElementsAre("FormatDiskMapping(s1, [a], {of the hook, 2, 0})",
                                     "FormatDiskMapping(s2, [b], {of the hook, 2, 1})"));
}

TEST_F(InitializeDisks, LetsExceptionsOfNoFamilyThroughItsHook) {
  Publish();
  _kernel.Fail("FormatDiskMapping", std::runtime_error("not the kernel's"));
  EXPECT_THROW(InitializeDisksHookFn({SoapText(*_first)}, "", _faultText, _resultText), std::runtime_error);
}

TEST_F(InitializeDisksDeathTest, EndsTheProcessInItsHookOverWhatIsNoAnswer) {
  Publish();
  _logger->SetLevel(LogLevel::Error);
  const auto call = [this](const std::string& text) {
    InitializeDisksHookFn({text}, "", _faultText, _resultText);
  };
  EXPECT_EXIT(call(SoapText(*AMapping(Ssd("s1"), {AScsiDisk("x").Unnamed()}))), ExitedWithCode(panicStatus),
              "^panic: Not initialized\n$");
  EXPECT_EXIT(call("no XML"), ExitedWithCode(panicStatus), "^panic: ");
  EXPECT_EXIT(call(SoapText(*Ssd("s1"))), ExitedWithCode(panicStatus),
              "^panic: NOT_REACHED kova/agentd/KovaLibManager:2070\n$");
}

// ---- the shared core, on its own

class InitializeDisksCore : public InitializeDisks {
 protected:
  void Run(const std::vector<Ref<DiskMapping>>& mappings) {
    _manager->InitializeDisksInt(Mappings(mappings).Get(), "tag", _result, _fault);
  }
  const MapResults& Filled() const { return dynamic_cast<const MapResults&>(*_result); }

  const Ref<MapResults> _resultOfBefore = MakeRef<MapResults>();
  const Ref<Orbis::MethodFault> _faultOfBefore = MakeRef<KovaFault>();
  Ref<Orbis::Any> _result = _resultOfBefore;
  Ref<Orbis::MethodFault> _fault = _faultOfBefore;
};

TEST_F(InitializeDisksCore, ReplacesAndReleasesWhatItsOutputsHeld) {
  Run({_first});
  EXPECT_EQ(Filled().Size(), 1U);
  EXPECT_EQ(Filled()[0]->GetMapping(), _first) << "the very object of the request";
  EXPECT_FALSE(_fault);
  EXPECT_EQ(_resultOfBefore->GetRefCount(), 1);
  EXPECT_EQ(_faultOfBefore->GetRefCount(), 1);
}

TEST_F(InitializeDisksCore, LeavesItsOutputsAloneWhenItThrows) {
  EXPECT_THROW(Run({AMapping(Ssd("s1"), {AScsiDisk("x").Unnamed()})}), NotInitializedException);
  EXPECT_EQ(_result, _resultOfBefore);
  EXPECT_EQ(_fault, _faultOfBefore);
}

TEST_F(InitializeDisksCore, NeitherRefreshesFirstNorInvalidatesLast) {
  _manager->RefreshKovaDiskCache();
  Forget();
  Run({_first});
  EXPECT_EQ(_kernel.CallTexts().front(), "FormatDiskMapping(s1, [a], {tag, 1, 0})");
  EXPECT_TRUE(IsCacheValid());
}

TEST_F(InitializeDisksCore, GoesThroughTheOperationTable) {
  const auto spy = UseManager<SpyManager>();
  _manager->RefreshKovaDiskCache();
  Run({_first, _second});
  EXPECT_THAT(spy->calls,
              ElementsAre("InitializeDisksInt([s1: a, s2: b], tag)", "ValidateDiskMappings([s1: a, s2: b])",
                          "InitializeMapping(s1: a, tag, 2, 0)", "ValidateDiskMapping(s1: a)",
                          "FormatDiskMapping(s1, [a], tag, 2, 0)", "InitializeMapping(s2: b, tag, 2, 1)",
                          "ValidateDiskMapping(s2: b)", "FormatDiskMapping(s2, [b], tag, 2, 1)"));
}

TEST_F(InitializeDisksCore, TakesADerivedManagersWordThatARequestIsFine) {
  const auto spy = UseManager<SpyManager>();
  spy->validateDiskMappings = [] {};
  Run({});
  EXPECT_EQ(Filled().Size(), 0U);
  EXPECT_FALSE(_fault);
}

TEST_F(InitializeDisksCore, KeepsTheResultObjectThatAnOperationPutInPlace) {
  const auto spy = UseManager<SpyManager>();
  const auto other = MakeRef<DiskMapResult>();
  spy->initializeMapping = [&](const auto&, Ref<DiskMapResult>& result) {
    EXPECT_FALSE(result->GetError());
    result = other;
    other->SetError(MakeRef<DiskHasPartitions>("a"));
  };
  Run({_first});
  EXPECT_EQ(Filled()[0], other.Get());
  EXPECT_EQ(_fault, other->GetError()) << "a single fault is shared";
}

}  // namespace
}  // namespace Kovasvc
