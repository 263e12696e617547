// Adding every disk that the kernel offers: which those are, and how quiet an addition of nothing is.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <vector>

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/include/HostCtlException.h"
#include "nox/Faults.h"
#include "nox/Kova.h"
#include "tests/support/OperationFixture.h"
#include "tests/support/SpyManager.h"

namespace Kovasvc {
namespace {

using HostCtl::Kova::DiskReason;
using HostCtl::Lib::HostCtlException;
using Nox::Fault::KovaFault;
using Orbis::Fault::SystemError;
using Tessa::MakeRef;
using Tessa::NotInitializedException;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::_;
using testing::Contains;
using testing::ElementsAre;
using testing::ExitedWithCode;
using testing::IsEmpty;
using testing::Not;
using testing::StrEq;
using testing::ThrowsMessage;
using TestSupport::AGroup;
using TestSupport::ARecord;
using TestSupport::AScsiDisk;
using TestSupport::groupLine;
using TestSupport::Hdd;
using TestSupport::IsSystemError;
using TestSupport::LogLineIs;
using TestSupport::NamesDevice;
using TestSupport::noFaultLine;
using TestSupport::noResultLine;
using TestSupport::Numbered;
using TestSupport::panicStatus;
using TestSupport::releaseCache;
using TestSupport::releaseOperation;
using TestSupport::SpyManager;
using TestSupport::Ssd;
using TestSupport::takeCache;
using TestSupport::takeOperation;

constexpr const char* queried = "Queried %1 eligible disks to be added to KOVA";
constexpr const char* computed = "Computed %1 mappings from the queried %2 disks for KOVA";
constexpr const char* done = "DONE";
const std::string uuid = "52e7b2b4-0a7c-3a1c-9d3e-2f4a5b6c7d8e";

SystemError::Exception AFault(const std::string& reason) {
  return SystemError::Exception(MakeRef<SystemError>(reason));
}

class AddAllEligibleDisks : public TestSupport::OperationFixture {
 protected:
  // A group could be made, of s and a.
  AddAllEligibleDisks() { SetHost({Ssd("s"), Hdd("a")}, {ARecord("s").Ssd(), ARecord("a")}); }

  void AddAll() { _manager->AddAllEligibleDisks("tag", _faultText, _resultText); }
  std::string Plan() {
    const auto spy = UseManager<SpyManager>();
    AddAll();
    return spy->calls.empty() ? "nothing" : spy->calls.front();
  }
  void ExpectNothingSaid() {
    ExpectTextsUntouched();
    EXPECT_THAT(_logger->Lines(LogLevel::Verbose).back(), LogLineIs(LogLevel::Verbose, noFaultLine));
    EXPECT_THAT(_logger->Lines(LogLevel::Verbose), Contains(LogLineIs(LogLevel::Verbose, done)));
    EXPECT_THAT(_logger->Lines(LogLevel::Warning), IsEmpty());
    EXPECT_FALSE(IsCacheValid());
  }
};
using AddAllEligibleDisksDeathTest = AddAllEligibleDisks;

// ---- the steps

TEST_F(AddAllEligibleDisks, AsksUnderBothLocksAndPlansUnderNone) {
  AddAll();
  EXPECT_THAT(
      _timeline.Events(),
      ElementsAre(takeOperation, takeCache, "RefreshKovaInfo()", "QueryDisks([], true)",
                  "GetStorageDeviceInfo", releaseCache, releaseOperation,  // what is offered
                  takeCache, "GetStorageDeviceInfo", releaseCache,
                  "GetDiskMappings(true)",  // all-flash groups
                  "GetDiskMappings(true)",  // hybrid groups
                  takeCache, "GetStorageDeviceInfo", releaseCache, takeCache, releaseCache, takeOperation,
                  "FormatDiskMapping(s, [a], {tag, 1, 0})", releaseOperation, takeCache, releaseCache,
                  takeOperation, takeCache, "RefreshKovaInfo()", "QueryDisks([], true)",
                  "GetStorageDeviceInfo", releaseCache, releaseOperation,  // the group
                  takeCache, releaseCache));                               // invalidate
  for (const TestSupport::KernelCall& call : _kernel.Calls()) {
    if (call.operation == "GetDiskMappings") {
      EXPECT_THAT(call.locksHeld, IsEmpty());
    }
  }
}

TEST_F(AddAllEligibleDisks, SaysDoneAndThenForgetsTheCache) {
  LogIntoTimeline();
  AddAll();
  EXPECT_THAT(LastEvents(4), ElementsAre("log verbose: DONE", takeCache, releaseCache,
                                         std::string("log verbose: ") + noFaultLine));
}

TEST_F(AddAllEligibleDisks, SaysWhatItFoundAndPlanned) {
  UseManager<SpyManager>()->initializeDisksInt = [](auto&, auto&) {};
  AddAll();
  EXPECT_THAT(
      _logger->Lines(),
      ElementsAre(
          LogLineIs(LogLevel::Verbose, queried, "2"),
          LogLineIs(LogLevel::Verbose, "Queried %1 All-Flash eligible disks to be added to KOVA", "1"),
          LogLineIs(LogLevel::Verbose, "Computed %1 All-Flash mappings from the queried %2 disks for KOVA",
                    "0", "1"),
          LogLineIs(LogLevel::Verbose, computed, "1", "2"),
          LogLineIs(LogLevel::Verbose, groupLine, "LogDiskMappings", "0", "s", "a"),
          LogLineIs(LogLevel::Verbose, done), LogLineIs(LogLevel::Verbose, noResultLine),
          LogLineIs(LogLevel::Verbose, noFaultLine)));
}

TEST_F(AddAllEligibleDisks, AnswersWithAResultForEachGroup) {
  AddAll();
  EXPECT_THAT(ResultTexts(), ElementsAre("s: a"));
  EXPECT_FALSE(HasFault());
  EXPECT_FALSE(IsCacheValid());
}

TEST_F(AddAllEligibleDisks, PlansHybridGroupsThenAllFlashOnes) {
  SetHost({Ssd("f"), Ssd("tagged"), Ssd("s"), Hdd("a")},
          {ARecord("f").Ssd(), ARecord("tagged").Ssd().CapacityFlash(), ARecord("s").Ssd(), ARecord("a")});
  EXPECT_EQ(Plan(), "InitializeDisksInt([s: a, f: tagged], tag)");
  EXPECT_THAT(_logger->Lines(), Contains(LogLineIs(LogLevel::Verbose, computed, "2", "4")));
  EXPECT_THAT(ResultTexts(), ElementsAre("s: a", "f: tagged"));
}

TEST_F(AddAllEligibleDisks, CallsCapacityFlashNoSsd) {
  SetHost({Ssd("tagged"), Ssd("s")}, {ARecord("tagged").Ssd().CapacityFlash(), ARecord("s").Ssd()});
  EXPECT_EQ(Plan(), "InitializeDisksInt([s: tagged], tag)");
}

TEST_F(AddAllEligibleDisks, TakesTheDisksThatAreOfferedWithoutAReasonAgainstThem) {
  SetHost({Ssd("s"), Hdd("a"), Hdd("b"), Hdd("c"), Hdd("d")},
          {ARecord("s").Ssd(), ARecord("a").Reason(DiskReason::TooSmall), ARecord("b").InUse(uuid),
           ARecord("c").Ineligible(DiskReason::None), ARecord("d")});
  EXPECT_EQ(Plan(), "InitializeDisksInt([s: d], tag)");
}

TEST_F(AddAllEligibleDisks, LooksForNoGroupsThatAreNotMounted) {
  SetHost({Ssd("s"), Hdd("a"), Ssd("u"), Hdd("m")},
          {ARecord("s").Ssd(), ARecord("a"), ARecord("u").Ssd().Reason(DiskReason::GroupNotMounted)});
  _kernel.unmountedGroups = {AGroup("u", {"m"})};
  EXPECT_EQ(Plan(), "InitializeDisksInt([s: a], tag)");
}

TEST_F(AddAllEligibleDisks, CountsTheDisksThatTheInventoryHas) {
  _kernel.records.push_back(ARecord("only the kernel's"));
  AddAll();
  EXPECT_THAT(_logger->Lines(), Contains(LogLineIs(LogLevel::Verbose, queried, "2")));
}

TEST_F(AddAllEligibleDisks, LooksForNoRepeatedNames) {
  _kernel.records.push_back(ARecord("a"));
  EXPECT_EQ(Plan(), "InitializeDisksInt([s: a a], tag)");
  EXPECT_THAT(Fault(), NamesDevice("DuplicateDisks", "a")) << "as the check of every request says";
}

TEST_F(AddAllEligibleDisks, UsesACacheThatIsStillValid) {
  _manager->RefreshKovaDiskCache();
  Forget();
  AddAll();
  EXPECT_EQ(_logger->Lines().front().format, "Disk cache is valid, no need to refresh.");
}

// ---- nothing to do

TEST_F(AddAllEligibleDisks, SaysNothingWhenNoDiskIsOffered) {
  SetHost({Ssd("s"), Hdd("a"), Hdd("b")},
          {ARecord("s").Ssd().Reason(DiskReason::TooSmall), ARecord("a").InUse(uuid),
           ARecord("b").Ineligible(DiskReason::Usb)});
  AddAll();
  EXPECT_THAT(
      _logger->Lines(),
      ElementsAre(LogLineIs(LogLevel::Verbose, queried, "0"), LogLineIs(LogLevel::Verbose, done),
                  LogLineIs(LogLevel::Verbose, noResultLine), LogLineIs(LogLevel::Verbose, noFaultLine)));
  EXPECT_THAT(_timeline.Events(),
              ElementsAre(takeOperation, takeCache, "RefreshKovaInfo()", "QueryDisks([], true)",
                          "GetStorageDeviceInfo", releaseCache, releaseOperation, takeCache, releaseCache))
      << "nobody plans";
  ExpectNothingSaid();
}

TEST_F(AddAllEligibleDisks, SaysNothingWhenTheOfferedDisksMakeNoGroup) {
  SetHost({Hdd("a")}, {ARecord("a")});
  EXPECT_EQ(Plan(), "nothing");
  EXPECT_THAT(_logger->Lines(), Contains(LogLineIs(LogLevel::Verbose, computed, "0", "1")));
  ExpectNothingSaid();
}

TEST_F(AddAllEligibleDisks, SaysNothingOfALimit) {
  for (const std::string& name : Numbered("g", 5)) {
    _kernel.groups.push_back(AGroup(name, Numbered(name + "-", 7)));
  }
  SetHost({Ssd("s"), Hdd("a"), Ssd("tagged")},
          {ARecord("s").Ssd(), ARecord("a"), ARecord("tagged").Ssd().CapacityFlash()});
  EXPECT_EQ(Plan(), "nothing");
  ExpectNothingSaid();
}

TEST_F(AddAllEligibleDisks, SaysNothingWhenTheKernelCannotBeReadButTheLog) {
  _kernel.Fail("QueryDisks", HostCtlException("away"));
  AddAll();
  ExpectTextsUntouched();
  EXPECT_THAT(_logger->Lines().front(),
              LogLineIs(LogLevel::Warning, "Failed to refresh KOVA disk cache %1", "away"));
  EXPECT_THAT(_logger->Lines(), Contains(LogLineIs(LogLevel::Verbose, queried, "0")));
}

// ---- faults and exceptions

TEST_F(AddAllEligibleDisks, TellsAFaultOfTheRefreshAndForgetsTheCache) {
  _kernel.Fail("RefreshKovaInfo", AFault("broken"));
  AddAll();
  EXPECT_THAT(Fault(), IsSystemError("broken"));
  EXPECT_FALSE(HasResult());
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Verbose, TestSupport::gotFaultLine, "SystemError: broken"),
                          LogLineIs(LogLevel::Verbose, noResultLine)));
  EXPECT_THAT(_timeline.Events(), ElementsAre(takeOperation, takeCache, "RefreshKovaInfo()", releaseCache,
                                              releaseOperation, takeCache, releaseCache));
}

TEST_F(AddAllEligibleDisks, TellsThatThereIsNoInventoryAndForgetsTheCache) {
  _app.SetObject("storageSystem", nullptr);
  AddAll();
  EXPECT_THAT(Fault(), IsSystemError("Failed to lookup STORAGE_SYSTEM_MO."));
  EXPECT_FALSE(HasResult());
  EXPECT_THAT(_logger->Lines(), Not(Contains(LogLineIs(LogLevel::Verbose, done))));
  EXPECT_THAT(_logger->Lines(), Not(Contains(LogLineIs(LogLevel::Verbose, queried, _))));
  EXPECT_FALSE(IsCacheValid());
}

TEST_F(AddAllEligibleDisks, KeepsAResultThatWasMadeBeforeTheFault) {
  const auto spy = UseManager<SpyManager>();
  spy->initializeDisksInt = [](Ref<Orbis::Any>& result, Ref<Orbis::MethodFault>& fault) {
    EXPECT_FALSE(result);
    EXPECT_FALSE(fault);
    result = MakeRef<MapResults>();
    fault = MakeRef<KovaFault>();
    throw AFault("out");
  };
  AddAll();
  EXPECT_THAT(spy->calls, ElementsAre("InitializeDisksInt([s: a], tag)"));
  EXPECT_TRUE(Results()->IsEmpty());
  EXPECT_THAT(Fault(), IsSystemError("out"));
  EXPECT_FALSE(IsCacheValid());
}

TEST_F(AddAllEligibleDisks, TellsTheGroupsThatFailed) {
  _kernel.Fail("FormatDiskMapping", HostCtl::Lib::KovaExceptionHasPartition("parts", "a"));
  AddAll();
  EXPECT_THAT(ResultTexts(), ElementsAre("s: a !DiskHasPartitions"));
  EXPECT_THAT(Fault(), NamesDevice("DiskHasPartitions", "a"));
  EXPECT_THAT(_logger->Lines(), Contains(LogLineIs(LogLevel::Verbose, done)));
}

TEST_F(AddAllEligibleDisks, LetsAMissingSsdFlagOut) {
  SetHost({AScsiDisk("s").Ssd(std::nullopt)}, {ARecord("s").Ssd()});
  EXPECT_THAT([this] { AddAll(); }, ThrowsMessage<NotInitializedException>(StrEq("optional value not set")));
  ExpectTextsUntouched();
}

TEST_F(AddAllEligibleDisks, LetsExceptionsOfNoFamilyOutWithTheLocksReleased) {
  for (const std::string operation : {"QueryDisks", "GetDiskMappings", "FormatDiskMapping"}) {
    _manager->InvalidateKovaDiskCache();
    _kernel.Fail(operation, std::runtime_error("not the kernel's"));
    EXPECT_THROW(AddAll(), std::runtime_error) << operation;
    EXPECT_THAT(_locks.HeldHere(), IsEmpty()) << operation;
    _kernel.Heal(operation);
  }
  ExpectTextsUntouched();
}

// ---- through the hook

TEST_F(AddAllEligibleDisks, AnswersThroughItsHookTheSame) {
  Publish();
  AddAllEligibleDisksHookFn("of the hook", _faultText, _resultText);
  EXPECT_THAT(ResultTexts(), ElementsAre("s: a"));
  EXPECT_THAT(Calls("FormatDiskMapping"), ElementsAre("FormatDiskMapping(s, [a], {of the hook, 1, 0})"));
}

TEST_F(AddAllEligibleDisks, AnswersThroughItsHookWithAFaultOfTheRefresh) {
  Publish();
  _kernel.Fail("RefreshKovaInfo", AFault("broken"));
  AddAllEligibleDisksHookFn("", _faultText, _resultText);
  EXPECT_THAT(Fault(), IsSystemError("broken"));
}

TEST_F(AddAllEligibleDisksDeathTest, EndsTheProcessInItsHookOverAnyException) {
  Publish();
  _logger->SetLevel(LogLevel::Error);
  _kernel.Fail("GetDiskMappings", std::runtime_error("not the kernel's"));
  EXPECT_EXIT(AddAllEligibleDisksHookFn("", _faultText, _resultText), ExitedWithCode(panicStatus),
              "^panic: not the kernel's\n$");
  _storage->SetDisks({AScsiDisk("s").Ssd(std::nullopt)});
  EXPECT_EXIT(AddAllEligibleDisksHookFn("", _faultText, _resultText), ExitedWithCode(panicStatus),
              "^panic: optional value not set\n$");
}

}  // namespace
}  // namespace Kovasvc
