// Taking disks and groups out of the service: by name, and by UUID for a device that has left.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

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
#include "tests/support/KernelRefusals.h"
#include "tests/support/OperationFixture.h"
#include "tests/support/SpyManager.h"

namespace Kovasvc {
namespace {

using HostCtl::Lib::HostCtlException;
using HostCtl::Lib::KovaExceptionLastRemainingHDD;
using HostCtl::Lib::KovaStorageException;
using Nox::Kova::Host::DiskMapping;
using Orbis::Fault::InvalidArgument;
using Orbis::Fault::SystemError;
using Tessa::MakeRef;
using Tessa::NotInitializedException;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::Contains;
using testing::ElementsAre;
using testing::ExitedWithCode;
using testing::IsEmpty;
using testing::Not;
using testing::StrEq;
using testing::ThrowsMessage;
using TestSupport::AGroup;
using TestSupport::AMapping;
using TestSupport::AScsiDisk;
using TestSupport::groupLine;
using TestSupport::Hdd;
using TestSupport::IsExactly;
using TestSupport::KernelRefusal;
using TestSupport::LogLineIs;
using TestSupport::NamesDevice;
using TestSupport::noFaultLine;
using TestSupport::noResultLine;
using TestSupport::operationLock;
using TestSupport::panicStatus;
using TestSupport::releaseCache;
using TestSupport::releaseOperation;
using TestSupport::SoapText;
using TestSupport::SpyManager;
using TestSupport::Ssd;
using TestSupport::takeCache;
using TestSupport::takeOperation;

constexpr const char* givenUuid = "Given PDL'd disk input (KOVA UUID: '%1')";
constexpr const char* diskRefused = "Error removing KOVA disks: %1";
constexpr const char* mappingRefused = "Error removing KOVA disk mapping: %1";
constexpr const char* lostMappingRefused = "Error removing PDL'd KOVA disk mapping: %1";
constexpr const char* notFound = "Failed to validate existing disk mapping: %1";
const std::string uuid = "52e7b2b4-0a7c-3a1c-9d3e-2f4a5b6c7d8e";

SystemError::Exception AFault(const std::string& reason) {
  return SystemError::Exception(MakeRef<SystemError>(reason));
}

// ---- one disk

class RemoveDisk : public TestSupport::OperationFixture {
 protected:
  void Remove(const std::string& disk) { _manager->RemoveDisk(disk, "pass", "text", 11, -22, _faultText); }
  void RemoveThroughHook(const std::string& disk) {
    Publish();
    RemoveDisksHookFn(disk, "pass", "text", 11, -22, _faultText);
  }
};
using RemoveDiskDeathTest = RemoveDisk;

TEST_F(RemoveDisk, RefreshesAndRemovesUnderOneHoldOfTheOperationLock) {
  Remove("a");
  EXPECT_THAT(_timeline.Events(),
              ElementsAre(takeOperation, takeCache, "RefreshKovaInfo()", "QueryDisks([], true)", releaseCache,
                          "RemoveDisk(a, pass, {text, 11, -22})", releaseOperation, takeCache, releaseCache));
  EXPECT_THAT(_kernel.Calls().back().locksHeld, ElementsAre(operationLock));
}

TEST_F(RemoveDisk, LeavesTheFaultTextAloneWhenItSucceeds) {
  Remove("a");
  ExpectTextsUntouched();
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, noResultLine),
                                            LogLineIs(LogLevel::Verbose, noFaultLine)));
  EXPECT_FALSE(IsCacheValid());
}

TEST_F(RemoveDisk, RemovesALostDeviceByItsUuidAndKeepsTheOptionsBack) {
  Remove("kova:" + uuid);
  EXPECT_THAT(_kernel.CallTexts(), ElementsAre("RefreshKovaInfo()", "QueryDisks([], true)",
                                               "RemoveDiskByUuid(" + uuid + ", pass)"));
  EXPECT_THAT(_kernel.Calls().back().locksHeld, ElementsAre(operationLock));
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, givenUuid, uuid),
                                            LogLineIs(LogLevel::Verbose, noResultLine),
                                            LogLineIs(LogLevel::Verbose, noFaultLine)));
  ExpectTextsUntouched();
}

TEST_F(RemoveDisk, TakesAMarkedNameThatHoldsNoUuidForAnEmptyOne) {
  for (const std::string& name : {std::string("kova:"), "kova:" + uuid + "0", std::string("kova:short")}) {
    Forget();
    Remove(name);
    EXPECT_EQ(_kernel.CallTexts().back(), "RemoveDiskByUuid(, pass)") << name;
    EXPECT_THAT(_logger->Lines(), Contains(LogLineIs(LogLevel::Verbose, givenUuid, "")));
  }
}

TEST_F(RemoveDisk, TakesEveryOtherNameForADevice) {
  for (const std::string& name :
       {std::string(), uuid, "KOVA:" + uuid, " kova:" + uuid, std::string("kova")}) {
    Remove(name);
    EXPECT_EQ(_kernel.CallTexts().back(), "RemoveDisk(" + name + ", pass, {text, 11, -22})");
  }
}

TEST_F(RemoveDisk, UsesACacheThatIsStillValid) {
  _manager->RefreshKovaDiskCache();
  Forget();
  Remove("a");
  EXPECT_THAT(_kernel.CallTexts(), ElementsAre("RemoveDisk(a, pass, {text, 11, -22})"));
  EXPECT_EQ(_logger->Lines().front().format, "Disk cache is valid, no need to refresh.");
}

TEST_F(RemoveDisk, GoesOnWhenTheKernelCannotBeRead) {
  _kernel.Fail("QueryDisks", HostCtlException("away"));
  Remove("a");
  EXPECT_EQ(_kernel.CallTexts().back(), "RemoveDisk(a, pass, {text, 11, -22})");
  EXPECT_THAT(_logger->Lines(LogLevel::Warning),
              ElementsAre(LogLineIs(LogLevel::Warning, "Failed to refresh KOVA disk cache %1", "away")));
  ExpectTextsUntouched();
}

class RefusedRemoval : public RemoveDisk, public testing::WithParamInterface<KernelRefusal> {
 protected:
  // The kernel's operation refused; the answer and the log say so.
  void ExpectRefused(const char* warning) {
    EXPECT_THAT(Fault(), GetParam().fault);
    EXPECT_THAT(_logger->Lines(LogLevel::Warning), ElementsAre(LogLineIs(LogLevel::Warning, warning, "no")));
    EXPECT_THAT(_logger->Lines(LogLevel::Verbose).back(), LogLineIs(LogLevel::Verbose, noResultLine));
    EXPECT_THAT(_locks.HeldHere(), IsEmpty());
    EXPECT_FALSE(IsCacheValid());
  }
};

INSTANTIATE_TEST_SUITE_P(Kernel, RefusedRemoval, testing::ValuesIn(TestSupport::KernelRefusals()),
                         [](const auto& test) { return std::string(test.param.name); });

TEST_P(RefusedRemoval, OfADiskIsToldAsAFault) {
  GetParam().fail(_kernel, "RemoveDisk");
  Remove("a");
  ExpectRefused(diskRefused);
}

TEST_P(RefusedRemoval, OfALostDiskIsToldAsAFault) {
  GetParam().fail(_kernel, "RemoveDiskByUuid");
  Remove("kova:" + uuid);
  ExpectRefused(diskRefused);
}

TEST_P(RefusedRemoval, OfAGroupIsToldAsAFault) {
  _kernel.groups = {AGroup("s", {"a"})};
  GetParam().fail(_kernel, "RemoveDiskMapping");
  _manager->RemoveDiskMapping(SoapText(*AMapping(Ssd("s"), {Hdd("a")})), "", "", 0, 0, _faultText);
  ExpectRefused(mappingRefused);
}

TEST_P(RefusedRemoval, OfAGroupWithoutItsSsdIsToldAsAFault) {
  GetParam().fail(_kernel, "RemoveDiskByUuid");
  _manager->RemoveDiskMapping(SoapText(*AMapping(Ssd("kova:" + uuid), {Hdd("a")})), "", "", 0, 0, _faultText);
  ExpectRefused(lostMappingRefused);
}

TEST_F(RemoveDisk, WarnsBeforeItLetsGoOfTheLock) {
  LogIntoTimeline();
  _kernel.Fail("RemoveDisk", KovaStorageException("no", "a"));
  Remove("a");
  EXPECT_THAT(
      LastEvents(6),
      ElementsAre("RemoveDisk(a, pass, {text, 11, -22})", "log warning: Error removing KOVA disks: no",
                  releaseOperation, takeCache, releaseCache, std::string("log verbose: ") + noResultLine));
}

TEST_F(RemoveDisk, LetsOtherExceptionsOutWithTheLockReleased) {
  _kernel.Fail("RemoveDisk", std::runtime_error("not the kernel's"));
  EXPECT_THROW(Remove("a"), std::runtime_error);
  EXPECT_EQ(_timeline.Events().back(), releaseOperation);
  _kernel.Fail("RemoveDisk", AFault("a fault is no answer here"));
  EXPECT_THROW(Remove("a"), SystemError::Exception);
  EXPECT_EQ(_timeline.Events().back(), releaseOperation);
  EXPECT_TRUE(IsCacheValid());
  _manager->InvalidateKovaDiskCache();
  _kernel.Fail("RefreshKovaInfo", AFault("nor here"));
  EXPECT_THROW(Remove("a"), SystemError::Exception);
  EXPECT_EQ(_timeline.Events().back(), releaseOperation);
  ExpectTextsUntouched();
}

TEST_F(RemoveDisk, AnswersThroughItsHookTheSame) {
  _kernel.Fail("RemoveDisk", KovaExceptionLastRemainingHDD("last", "a"));
  RemoveThroughHook("a");
  EXPECT_EQ(_kernel.CallTexts().back(), "RemoveDisk(a, pass, {text, 11, -22})");
  EXPECT_THAT(Fault(), NamesDevice("DiskIsLastRemainingNonSSD", "a"));
}

TEST_F(RemoveDiskDeathTest, EndsTheProcessInItsHookOverOtherExceptions) {
  _logger->SetLevel(LogLevel::Error);
  _kernel.Fail("RemoveDisk", std::runtime_error("not the kernel's"));
  EXPECT_EXIT(RemoveThroughHook("a"), ExitedWithCode(panicStatus), "^panic: not the kernel's\n$");
  _kernel.Fail("RefreshKovaInfo", AFault("broken"));
  EXPECT_EXIT(RemoveThroughHook("a"), ExitedWithCode(panicStatus), "panic: SystemError: broken\n$");
}

// ---- a whole group

class RemoveGroup : public TestSupport::OperationFixture {
 protected:
  RemoveGroup() { _kernel.groups = {AGroup("s", {"a", "b"})}; }

  void Remove(const Ref<DiskMapping>& mapping) { RemoveText(SoapText(*mapping)); }
  void RemoveText(const std::string& text) {
    _manager->RemoveDiskMapping(text, "pass", "text", 11, -22, _faultText);
  }
  // The one argument of the fault's one message.
  std::string NotFoundText() {
    const auto fault = Fault();
    EXPECT_THAT(fault, IsExactly<InvalidArgument>());
    EXPECT_THAT(TestSupport::MessageKeys(*fault),
                ElementsAre("nox.agentd.kovaDiskOperation.diskMappingNotFound"));
    const Orbis::LocalizableMessage& message = *(*fault->GetFaultMessage())[0];
    EXPECT_FALSE(message.HasMessage());
    EXPECT_EQ(message.GetArg()->Size(), 1U);
    EXPECT_EQ((*message.GetArg())[0]->GetKey(), "diskMap");
    return Tessa::NarrowToType<Orbis::Boxed<std::string>>((*message.GetArg())[0]->GetValue())->GetValue();
  }

  const Ref<DiskMapping> _group = AMapping(Ssd("s"), {Hdd("b"), Hdd("a")});
};
using RemoveGroupDeathTest = RemoveGroup;

TEST_F(RemoveGroup, LooksForTheGroupAndRemovesItUnderOneHoldOfTheOperationLock) {
  Remove(_group);
  EXPECT_THAT(_timeline.Events(),
              ElementsAre(takeOperation, takeCache, "RefreshKovaInfo()", "QueryDisks([], true)", releaseCache,
                          "GetDiskMappings(false)", "RemoveDiskMapping(s, pass, {text, 11, -22})",
                          releaseOperation, takeCache, releaseCache));
  EXPECT_THAT(_kernel.Calls().at(2).locksHeld, ElementsAre(operationLock));
  EXPECT_THAT(_kernel.Calls().at(3).locksHeld, ElementsAre(operationLock));
}

TEST_F(RemoveGroup, LeavesTheFaultTextAloneWhenItSucceeds) {
  Remove(_group);
  ExpectTextsUntouched();
  EXPECT_THAT(
      _logger->Lines(),
      ElementsAre(LogLineIs(LogLevel::Verbose, groupLine, "LogDiskMappings", "0", "s", "b, a"),
                  LogLineIs(LogLevel::Verbose, noResultLine), LogLineIs(LogLevel::Verbose, noFaultLine)));
  EXPECT_FALSE(IsCacheValid());
}

TEST_F(RemoveGroup, RemovesAGroupWithoutItsSsdByUuidAndDoesNotLookForIt) {
  Remove(AMapping(Ssd("kova:" + uuid), {Hdd("nobody knows")}));
  EXPECT_THAT(_kernel.CallTexts(), ElementsAre("RefreshKovaInfo()", "QueryDisks([], true)",
                                               "RemoveDiskByUuid(" + uuid + ", pass)"));
  EXPECT_THAT(_kernel.Calls().back().locksHeld, ElementsAre(operationLock));
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, groupLine, "LogDiskMappings", "0",
                                                      "kova:" + uuid, "nobody knows"),
                                            LogLineIs(LogLevel::Verbose, givenUuid, uuid),
                                            LogLineIs(LogLevel::Verbose, noResultLine),
                                            LogLineIs(LogLevel::Verbose, noFaultLine)));
  ExpectTextsUntouched();
}

TEST_F(RemoveGroup, TakesAMarkedNameThatHoldsNoUuidForAnEmptyOne) {
  Remove(AMapping(Ssd("kova:no uuid"), {}));
  EXPECT_EQ(_kernel.CallTexts().back(), "RemoveDiskByUuid(, pass)");
}

struct MissingGroup {
  const char* title;
  std::string ssd;
  std::vector<std::string> disks;
  std::string text;
};
void PrintTo(const MissingGroup& row, std::ostream* out) {
  *out << row.title;
}

class MissingGroups : public RemoveGroup, public testing::WithParamInterface<MissingGroup> {};

INSTANTIATE_TEST_SUITE_P(
    Are, MissingGroups,
    testing::Values(MissingGroup{"OfAnotherDisk", "s", {"b", "x"}, "SSD: s, Disks: b, x"},
                    MissingGroup{"WithoutCapacityDisks", "s", {}, "SSD: s, Disks: "},
                    MissingGroup{"OfAnotherSsd", "x", {"a", "b"}, "SSD: x, Disks: a, b"},
                    MissingGroup{"ASubset", "s", {"a"}, "SSD: s, Disks: a"},
                    MissingGroup{"WithoutAnyName", "", {""}, "SSD: , Disks: "}),
    [](const auto& test) { return std::string(test.param.title); });

TEST_P(MissingGroups, AreNotFoundAndNothingIsRemoved) {
  TestSupport::Disks disks;
  for (const std::string& name : GetParam().disks) {
    disks.push_back(Hdd(name));
  }
  Remove(AMapping(Ssd(GetParam().ssd), disks));
  EXPECT_EQ(NotFoundText(), GetParam().text);
  EXPECT_THAT(_logger->Lines(LogLevel::Warning),
              ElementsAre(LogLineIs(LogLevel::Warning, notFound, GetParam().text)));
  EXPECT_THAT(Calls("RemoveDiskMapping"), IsEmpty());
  EXPECT_FALSE(dynamic_cast<const InvalidArgument&>(*Fault()).HasArgument());
  EXPECT_FALSE(IsCacheValid());
}

TEST_F(RemoveGroup, SaysWhichGroupBeforeItLooksForIt) {
  LogIntoTimeline();
  Remove(AMapping(Ssd("x"), {Hdd("a")}));
  const std::string group = "log verbose: LogDiskMappings: Mapping[0]: { SSD: x, MDs: a }";
  EXPECT_THAT(
      EventsFrom(group),
      ElementsAre(group, "GetDiskMappings(false)",
                  "log warning: Failed to validate existing disk mapping: SSD: x, Disks: a", releaseOperation,
                  takeCache, releaseCache, std::string("log verbose: ") + noResultLine));
}

TEST_F(RemoveGroup, DoesNotFindAnUnmountedGroup) {
  _kernel.unmountedGroups = _kernel.groups;
  _kernel.groups.clear();
  Remove(_group);
  EXPECT_EQ(NotFoundText(), "SSD: s, Disks: b, a");
}

TEST_F(RemoveGroup, DoesNotFindTheGroupWhenTheKernelCannotSay) {
  _kernel.Fail("GetDiskMappings", HostCtlException("away"));
  Remove(_group);
  EXPECT_EQ(NotFoundText(), "SSD: s, Disks: b, a");
  EXPECT_THAT(_logger->Lines(LogLevel::Warning),
              ElementsAre(LogLineIs(LogLevel::Warning, "Failed to validate disk mapping: %1", "away"),
                          LogLineIs(LogLevel::Warning, notFound, "SSD: s, Disks: b, a")));
}

TEST_F(RemoveGroup, AsksADerivedManagerWhetherTheGroupExists) {
  const auto spy = UseManager<SpyManager>();
  spy->diskMappingExists = [] { return true; };
  Remove(AMapping(Ssd("x"), {}));
  EXPECT_THAT(spy->calls, ElementsAre("DiskMappingExists(x:)"));
  EXPECT_EQ(_kernel.CallTexts().back(), "RemoveDiskMapping(x, pass, {text, 11, -22})");
}

TEST_F(RemoveGroup, LetsAMissingNameOutWithTheLockReleased) {
  for (const Ref<DiskMapping>& mapping : {AMapping(AScsiDisk("x").Unnamed(), {Hdd("a")}),
                                          AMapping(Ssd("s"), {Hdd("a"), AScsiDisk("x").Unnamed()}),
                                          AMapping(Ssd("kova:" + uuid), {AScsiDisk("x").Unnamed()})}) {
    EXPECT_THAT([&] { Remove(mapping); }, ThrowsMessage<NotInitializedException>(StrEq("Not initialized")));
    EXPECT_EQ(_timeline.Events().back(), releaseOperation);
  }
  ExpectTextsUntouched();
  EXPECT_THAT(_kernel.CallTexts(), ElementsAre("RefreshKovaInfo()", "QueryDisks([], true)"));
}

TEST_F(RemoveGroup, LetsOtherExceptionsOutWithTheLockReleased) {
  for (const std::string operation : {"RefreshKovaInfo", "GetDiskMappings", "RemoveDiskMapping"}) {
    _manager->InvalidateKovaDiskCache();
    _kernel.Fail(operation, std::runtime_error("not the kernel's"));
    EXPECT_THROW(Remove(_group), std::runtime_error) << operation;
    EXPECT_EQ(_timeline.Events().back(), releaseOperation) << operation;
    _kernel.Heal(operation);
  }
  _kernel.Fail("RemoveDiskMapping", AFault("a fault is no answer here"));
  EXPECT_THROW(Remove(_group), SystemError::Exception);
  EXPECT_EQ(_timeline.Events().back(), releaseOperation);
  ExpectTextsUntouched();
}

TEST_F(RemoveGroup, LetsOutWhatTheDecoderSays) {
  EXPECT_THROW(RemoveText("no XML"), Orbis::ParseException);
  EXPECT_THROW(RemoveText(""), Orbis::ParseException);
  EXPECT_THAT(_timeline.Events(), IsEmpty());
}

TEST_F(RemoveGroupDeathTest, EndsTheProcessOverATextOfAnotherType) {
  EXPECT_EXIT(RemoveText(SoapText(*Ssd("s"))), ExitedWithCode(panicStatus),
              "^panic: NOT_REACHED kova/agentd/KovaLibManager:2280\n$");
}

TEST_F(RemoveGroup, AnswersThroughItsHookTheSame) {
  Publish();
  RemoveDiskMappingHookFn(SoapText(*_group), "p", "o", 1, 2, _faultText);
  EXPECT_EQ(_kernel.CallTexts().back(), "RemoveDiskMapping(s, p, {o, 1, 2})");
  ExpectTextsUntouched();
  RemoveDiskMappingHookFn(SoapText(*AMapping(Ssd("x"), {})), "", "", 0, 0, _faultText);
  EXPECT_EQ(NotFoundText(), "SSD: x, Disks: ");
}

TEST_F(RemoveGroupDeathTest, EndsTheProcessInItsHookOverWhatIsNoAnswer) {
  Publish();
  _logger->SetLevel(LogLevel::Error);
  const auto call = [this](const std::string& text) {
    RemoveDiskMappingHookFn(text, "", "", 0, 0, _faultText);
  };
  EXPECT_EXIT(call(SoapText(*Ssd("s"))), ExitedWithCode(panicStatus),
              "^panic: NOT_REACHED kova/agentd/KovaLibManager:2280\n$");
  EXPECT_EXIT(call("no XML"), ExitedWithCode(panicStatus), "^panic: ");
  EXPECT_EXIT(call(SoapText(*AMapping(AScsiDisk("x").Unnamed(), {}))), ExitedWithCode(panicStatus),
              "^panic: Not initialized\n$");
}

}  // namespace
}  // namespace Kovasvc
