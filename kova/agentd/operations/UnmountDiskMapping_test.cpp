// Taking groups out of use without erasing them, and bringing them back.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <stdexcept>
#include <string>
#include <vector>

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/include/HostCtlException.h"
#include "nox/Faults.h"
#include "nox/Kova.h"
#include "orbis/ParseException.h"
#include "tessa/Formatter.h"
#include "tests/support/OperationFixture.h"
#include "tests/support/SpyManager.h"

namespace Kovasvc {
namespace {

using HostCtl::Lib::HostCtlException;
using HostCtl::Lib::KovaExceptionIncompatibleDiskMapping;
using HostCtl::Lib::KovaExceptionRescanError;
using HostCtl::Lib::KovaStorageException;
using Nox::Fault::DiskIsUSB;
using Nox::Fault::KovaFault;
using Nox::Kova::Host::DiskMapping;
using Orbis::Fault::InvalidArgument;
using Orbis::Fault::SystemError;
using Tessa::MakeRef;
using Tessa::NotInitializedException;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::AllOf;
using testing::ElementsAre;
using testing::ExitedWithCode;
using testing::HasSubstr;
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
using TestSupport::IsSystemError;
using TestSupport::LogLineIs;
using TestSupport::NamesDevice;
using TestSupport::noFaultLine;
using TestSupport::operationLock;
using TestSupport::panicStatus;
using TestSupport::releaseCache;
using TestSupport::releaseOperation;
using TestSupport::SoapText;
using TestSupport::SoapTexts;
using TestSupport::SpyManager;
using TestSupport::Ssd;
using TestSupport::takeCache;
using TestSupport::takeOperation;

constexpr const char* refused = "Error unmounting KOVA disk mapping: %1";
constexpr const char* notFound = "Failed to validate existing disk mapping:";
constexpr const char* stopped = "UnmountDiskMapping failed with exception: %1";
constexpr const char* claimFailed = "Mount diskgroup failed with exception %1 ";

SystemError::Exception AFault(const std::string& reason) {
  return SystemError::Exception(MakeRef<SystemError>(reason));
}

// The kernel has three groups, of s1 and a, s2 and b, s3 and c.
class Unmount : public TestSupport::OperationFixture {
 protected:
  Unmount() { _kernel.groups = {AGroup("s1", {"a"}), AGroup("s2", {"b"}), AGroup("s3", {"c"})}; }

  void Run(const std::vector<Ref<DiskMapping>>& mappings) { RunTexts(SoapTexts(mappings)); }
  void RunTexts(const std::vector<std::string>& texts) {
    _manager->UnmountDiskMapping(texts, "tag", _faultText, _resultText);
  }
  std::vector<std::string> Unmounts() const { return Calls("UnmountDiskMapping"); }

  const Ref<DiskMapping> _first = AMapping(Ssd("s1"), {Hdd("a")});
  const Ref<DiskMapping> _second = AMapping(Ssd("s2"), {Hdd("b")});
  const Ref<DiskMapping> _third = AMapping(Ssd("s3"), {Hdd("c")});
  const Ref<DiskMapping> _unknown = AMapping(Ssd("x"), {Hdd("a")});
};
using UnmountDeathTest = Unmount;

// ---- the steps

TEST_F(Unmount, RefreshesAndTakesTheOperationLockAnewForEachGroup) {
  Run({_first, _second});
  EXPECT_THAT(_timeline.Events(),
              ElementsAre(takeOperation, takeCache, "RefreshKovaInfo()", "QueryDisks([], true)", releaseCache,
                          releaseOperation, takeOperation, "GetDiskMappings(false)", "UnmountDiskMapping(s1)",
                          releaseOperation, takeOperation, "GetDiskMappings(false)", "UnmountDiskMapping(s2)",
                          releaseOperation, takeCache, releaseCache));
  for (const TestSupport::KernelCall& call : _kernel.Calls()) {
    if (call.operation != "RefreshKovaInfo" && call.operation != "QueryDisks") {
      EXPECT_THAT(call.locksHeld, ElementsAre(operationLock)) << call.text;
    }
  }
}

TEST_F(Unmount, AnswersWithAResultForEachGroupInOrder) {
  Run({_third, _first});
  EXPECT_THAT(ResultTexts(), ElementsAre("s3: c", "s1: a"));
  EXPECT_THAT(DiskStates(*(*Results())[0]), IsEmpty());
  EXPECT_FALSE(HasFault());
  EXPECT_FALSE(IsCacheValid());
}

TEST_F(Unmount, SaysWhichGroupsItUnmounts) {
  Run({_first, _second});
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Verbose, groupLine, "LogDiskMappings", "0", "s1", "a"),
                          LogLineIs(LogLevel::Verbose, groupLine, "LogDiskMappings", "0", "s2", "b"),
                          LogLineIs(LogLevel::Verbose, noFaultLine)));
}

TEST_F(Unmount, SaysSoBeforeItAsksTheKernel) {
  LogIntoTimeline();
  Run({_first});
  EXPECT_THAT(
      EventsFrom("GetDiskMappings(false)"),
      ElementsAre("GetDiskMappings(false)", "log verbose: LogDiskMappings: Mapping[0]: { SSD: s1, MDs: a }",
                  "UnmountDiskMapping(s1)", releaseOperation, takeCache, releaseCache,
                  std::string("log verbose: ") + noFaultLine));
}

TEST_F(Unmount, AnswersNothingToDoWithAnEmptyList) {
  RunTexts({});
  EXPECT_TRUE(Results()->IsEmpty());
  EXPECT_FALSE(HasFault());
  EXPECT_THAT(_kernel.CallTexts(), ElementsAre("RefreshKovaInfo()", "QueryDisks([], true)"));
  EXPECT_FALSE(IsCacheValid());
}

TEST_F(Unmount, DoesNotReadTheTagInTheWholeRequest) {
  const auto spy = UseManager<SpyManager>();
  Run({_first, _second});
  EXPECT_THAT(spy->calls, ElementsAre("UnmountDiskMappingInt(s1: a, tag)", "DiskMappingExists(s1: a)",
                                      "UnmountDiskMappingInt(s2: b, tag)", "DiskMappingExists(s2: b)"));
  for (const std::string& call : _kernel.CallTexts()) {
    EXPECT_THAT(call, Not(HasSubstr("tag")));
  }
}

TEST_F(Unmount, LetsAnotherOperationWorkBetweenTwoGroups) {
  int releases = 0;
  _locks.SetReleaseObserver([&](const std::string& lock) {
    if (lock == operationLock && ++releases == 2) {
      _locks.SetReleaseObserver({});
      std::string fault;
      _manager->RemoveDisk("z", "", "", 0, 0, fault);
    }
  });
  Run({_first, _second});
  EXPECT_THAT(_kernel.CallTexts(),
              ElementsAre("RefreshKovaInfo()", "QueryDisks([], true)", "GetDiskMappings(false)",
                          "UnmountDiskMapping(s1)", "RemoveDisk(z, , {, 0, 0})", "GetDiskMappings(false)",
                          "UnmountDiskMapping(s2)"));
  EXPECT_THAT(ResultTexts(), ElementsAre("s1: a", "s2: b"));
}

// ---- groups that fail

TEST_F(Unmount, GoesOnAfterAGroupThatTheKernelDoesNotHave) {
  Run({_unknown, _second});
  EXPECT_THAT(ResultTexts(), ElementsAre("x: a !InvalidArgument", "s2: b"));
  ASSERT_THAT(Fault(), IsExactly<InvalidArgument>());
  EXPECT_FALSE(dynamic_cast<const InvalidArgument&>(*Fault()).HasArgument());
  EXPECT_THAT(TestSupport::MessageKeys(*Fault()), IsEmpty());
  EXPECT_THAT(Unmounts(), ElementsAre("UnmountDiskMapping(s2)"));
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Verbose, notFound),
                          LogLineIs(LogLevel::Verbose, groupLine, "LogDiskMappings", "0", "s2", "b")));
  EXPECT_FALSE(IsCacheValid());
}

TEST_F(Unmount, DoesNotFindAGroupThatIsUnmountedAlready) {
  _kernel.unmountedGroups = {AGroup("u", {"m"})};
  Run({AMapping(Ssd("u"), {Hdd("m")})});
  EXPECT_THAT(ResultTexts(), ElementsAre("u: m !InvalidArgument"));
}

TEST_F(Unmount, DoesNotFindAGroupWithoutCapacityDisks) {
  Run({AMapping(Ssd("s1"), {})});
  EXPECT_THAT(Results()->Size(), 1U);
  EXPECT_THAT(Fault(), IsExactly<InvalidArgument>());
}

TEST_F(Unmount, DoesNotFindAnyGroupWhenTheKernelCannotSay) {
  _kernel.Fail("GetDiskMappings", HostCtlException("away"));
  Run({_first});
  EXPECT_THAT(ResultTexts(), ElementsAre("s1: a !InvalidArgument"));
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Warning, "Failed to validate disk mapping: %1", "away"),
                          LogLineIs(LogLevel::Verbose, notFound)));
}

TEST_F(Unmount, TellsARefusalInTheGroupsResultAndGoesOn) {
  _kernel.onCall = [](const TestSupport::KernelCall& call) {
    if (call.text == "UnmountDiskMapping(s1)") {
      throw KovaExceptionRescanError("busy", "s1");
    }
  };
  Run({_first, _second});
  EXPECT_THAT(ResultTexts(), ElementsAre("s1: a !KovaDiskFault", "s2: b"));
  EXPECT_THAT(Fault(), NamesDevice("KovaDiskFault", "busy"));
  EXPECT_THAT(_logger->Lines(LogLevel::Warning), ElementsAre(LogLineIs(LogLevel::Warning, refused, "busy")));
  EXPECT_THAT(Unmounts(), ElementsAre("UnmountDiskMapping(s1)", "UnmountDiskMapping(s2)"));
}

TEST_F(Unmount, FoldsSeveralFaultsIntoOneWithAllTheirMessages) {
  UseManager<SpyManager>()->unmountDiskMappingInt = [](Ref<DiskMapping>& mapping,
                                                       Ref<Orbis::MethodFault>& fault) {
    EXPECT_FALSE(fault) << "each group starts without one";
    const std::string name = mapping->GetSsd()->GetCanonicalName();
    if (name != "s2") {
      fault = TestSupport::WithMessages(MakeRef<DiskIsUSB>(name), {name});
    }
  };
  Run({_first, _second, _third});
  ASSERT_THAT(Fault(), IsExactly<KovaFault>());
  EXPECT_THAT(TestSupport::MessageKeys(*Fault()), ElementsAre("s1", "s3"));
  EXPECT_THAT(ResultTexts(), ElementsAre("s1: a !DiskIsUSB", "s2: b", "s3: c !DiskIsUSB"));
}

TEST_F(Unmount, StopsAtAFaultThatIsThrownAndKeepsTheResultsOfBefore) {
  UseManager<SpyManager>()->unmountDiskMappingInt = [](Ref<DiskMapping>& mapping,
                                                       Ref<Orbis::MethodFault>& fault) {
    fault = MakeRef<DiskIsUSB>("replaced");
    if (mapping->GetSsd()->GetCanonicalName() == "s2") {
      throw DiskIsUSB::Exception(
          TestSupport::WithMessages(MakeRef<DiskIsUSB>("s2"), {"first key", "second key"}));
    }
  };
  Run({_first, _second, _third});
  EXPECT_THAT(ResultTexts(), ElementsAre("s1: a !DiskIsUSB"));
  EXPECT_THAT(Fault(), NamesDevice("DiskIsUSB", "s2"));
  std::string messages;
  Tessa::PrintFormatter::FormatObject(Fault()->GetFaultMessage()).PrintTo(messages);
  EXPECT_THAT(messages, AllOf(HasSubstr("first key"), HasSubstr("second key"), Not(HasSubstr("DiskIsUSB"))));
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Warning, stopped, messages)));
  EXPECT_FALSE(IsCacheValid());
}

TEST_F(Unmount, KeepsTheMappingThatTheOperationPutInPlace) {
  UseManager<SpyManager>()->unmountDiskMappingInt = [this](Ref<DiskMapping>& mapping, auto&) {
    mapping = _third;
  };
  Run({_first});
  EXPECT_THAT(ResultTexts(), ElementsAre("s3: c"));
}

// ---- what is no answer

TEST_F(Unmount, LetsAMissingNameOutWithTheLockReleased) {
  for (const Ref<DiskMapping>& mapping :
       {AMapping(AScsiDisk("x").Unnamed(), {Hdd("a")}), AMapping(Ssd("s1"), {AScsiDisk("x").Unnamed()})}) {
    EXPECT_THAT(
        [&] {
          Run({_first, mapping});
        },
        ThrowsMessage<NotInitializedException>(StrEq("Not initialized")));
    EXPECT_EQ(_timeline.Events().back(), releaseOperation);
  }
  ExpectTextsUntouched();
}

TEST_F(Unmount, LetsAFaultOfTheRefreshOut) {
  _kernel.Fail("QueryDisks", AFault("broken"));
  EXPECT_THROW(Run({_first}), SystemError::Exception);
  ExpectTextsUntouched();
  EXPECT_EQ(_timeline.Events().back(), releaseOperation);
}

TEST_F(Unmount, LetsOtherExceptionsOutWithTheLockReleased) {
  for (const std::string operation : {"RefreshKovaInfo", "GetDiskMappings", "UnmountDiskMapping"}) {
    _manager->InvalidateKovaDiskCache();
    _kernel.Fail(operation, std::runtime_error("not the kernel's"));
    EXPECT_THROW(Run({_first}), std::runtime_error) << operation;
    EXPECT_EQ(_timeline.Events().back(), releaseOperation) << operation;
    _kernel.Heal(operation);
  }
  ExpectTextsUntouched();
}

TEST_F(Unmount, LetsOutWhatTheDecoderSays) {
  EXPECT_THROW(RunTexts({SoapText(*_first), "no XML"}), Orbis::ParseException);
  EXPECT_THAT(_timeline.Events(), IsEmpty());
  ExpectTextsUntouched();
}

TEST_F(UnmountDeathTest, EndsTheProcessOverATextOfAnotherType) {
  EXPECT_EXIT(RunTexts({SoapText(*_first), SoapText(*Ssd("s"))}), ExitedWithCode(panicStatus),
              "^panic: NOT_REACHED kova/agentd/KovaLibManager:2549\n$");
}

// ---- one group

TEST_F(Unmount, SetsNoFaultForAGroupThatItUnmounts) {
  Ref<DiskMapping> mapping = _first;
  const Ref<Orbis::MethodFault> before = MakeRef<DiskIsUSB>("before");
  Ref<Orbis::MethodFault> fault = before;
  _manager->UnmountDiskMappingInt(mapping, "", fault);
  EXPECT_EQ(fault, before) << "left as it was";
  EXPECT_EQ(mapping, _first);
  EXPECT_THAT(_timeline.Events(), ElementsAre(takeOperation, "GetDiskMappings(false)",
                                              "UnmountDiskMapping(s1)", releaseOperation));
}

TEST_F(Unmount, AsksADerivedManagerWhetherTheGroupExists) {
  const auto spy = UseManager<SpyManager>();
  spy->diskMappingExists = [] { return true; };
  Run({_unknown});
  EXPECT_THAT(Unmounts(), ElementsAre("UnmountDiskMapping(x)"));
  EXPECT_THAT(ResultTexts(), ElementsAre("x: a"));
}

TEST_F(Unmount, ReadsTheNameOfTheSsdBeforeItAsksADerivedManager) {
  const auto spy = UseManager<SpyManager>();
  spy->diskMappingExists = [] { return false; };
  auto unnamed = AMapping(AScsiDisk("x").Unnamed(), {Hdd("a")});
  Ref<Orbis::MethodFault> fault;
  EXPECT_THROW(_manager->UnmountDiskMappingInt(unnamed, "", fault), NotInitializedException);
  EXPECT_THAT(spy->calls, ElementsAre(testing::StartsWith("UnmountDiskMappingInt(")));
}

TEST_F(Unmount, StopsAtAFaultOfTheExistenceCheck) {
  UseManager<SpyManager>()->diskMappingExists = []() -> bool { throw AFault("check"); };
  Run({_first});
  EXPECT_THAT(Fault(), IsSystemError("check"));
  EXPECT_TRUE(Results()->IsEmpty());
  EXPECT_THAT(_locks.HeldHere(), IsEmpty());
}

// ---- through the hook

TEST_F(Unmount, AnswersThroughItsHookTheSame) {
  Publish();
  UnmountDiskMappingHookFn(SoapTexts(std::vector<Ref<DiskMapping>>{_unknown, _second}), "", _faultText,
                           _resultText);
  EXPECT_THAT(ResultTexts(), ElementsAre("x: a !InvalidArgument", "s2: b"));
  EXPECT_THAT(Fault(), IsExactly<InvalidArgument>());
}

TEST_F(UnmountDeathTest, EndsTheProcessInItsHookOverWhatIsNoAnswer) {
  Publish();
  _logger->SetLevel(LogLevel::Error);
  const auto call = [this](const Orbis::Any& object) {
    UnmountDiskMappingHookFn({SoapText(object)}, "", _faultText, _resultText);
  };
  EXPECT_EXIT(call(*Ssd("s")), ExitedWithCode(panicStatus),
              "^panic: NOT_REACHED kova/agentd/KovaLibManager:2549\n$");
  EXPECT_EXIT(call(*AMapping(AScsiDisk("x").Unnamed(), {})), ExitedWithCode(panicStatus),
              "^panic: Not initialized\n$");
  _kernel.Fail("UnmountDiskMapping", std::runtime_error("not the kernel's"));
  EXPECT_EXIT(call(*_first), ExitedWithCode(panicStatus), "^panic: not the kernel's\n$");
  _kernel.Fail("RefreshKovaInfo", AFault("broken"));
  EXPECT_EXIT(call(*_first), ExitedWithCode(panicStatus), "panic: SystemError: broken\n$");
}

// ---- bringing groups back

class Claim : public TestSupport::OperationFixture {};
using ClaimDeathTest = Claim;

TEST_F(Claim, AsksTheKernelUnderTheOperationLockAndForgetsTheCache) {
  _manager->RefreshKovaDiskCache();
  Forget();
  _manager->ClaimUnmountedDiskgroup();
  EXPECT_THAT(_timeline.Take(), ElementsAre(takeOperation, "ClaimUnmountedDiskgroups()", releaseOperation,
                                            takeCache, releaseCache));
  EXPECT_THAT(_kernel.Calls().at(0).locksHeld, ElementsAre(operationLock));
  EXPECT_THAT(_logger->Lines(), IsEmpty());
  EXPECT_FALSE(IsCacheValid());
}

TEST_F(Claim, OnlyLogsARefusalOnceTheLockIsFreeAndForgetsTheCacheAllTheSame) {
  _manager->RefreshKovaDiskCache();
  Forget();
  _kernel.Fail("ClaimUnmountedDiskgroups", KovaExceptionIncompatibleDiskMapping("mixed"));
  EXPECT_NO_THROW(_manager->ClaimUnmountedDiskgroup());
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Warning, claimFailed, "mixed")));
  EXPECT_FALSE(IsCacheValid());
  LogIntoTimeline();
  _manager->ClaimUnmountedDiskgroup();
  EXPECT_THAT(_timeline.Events(), ElementsAre(takeOperation, "ClaimUnmountedDiskgroups()", releaseOperation,
                                              "log warning: Mount diskgroup failed with exception mixed ",
                                              takeCache, releaseCache));
}

TEST_F(Claim, LetsOtherExceptionsOutWithTheLockReleased) {
  _manager->RefreshKovaDiskCache();
  _kernel.Fail("ClaimUnmountedDiskgroups", std::runtime_error("not the kernel's"));
  EXPECT_THROW(_manager->ClaimUnmountedDiskgroup(), std::runtime_error);
  EXPECT_EQ(_timeline.Events().back(), releaseOperation);
  _kernel.Fail("ClaimUnmountedDiskgroups", AFault("a fault is no answer here"));
  EXPECT_THROW(_manager->ClaimUnmountedDiskgroup(), SystemError::Exception);
  EXPECT_EQ(_timeline.Events().back(), releaseOperation);
}

TEST_F(Claim, AsksThroughItsHookTheSame) {
  Publish();
  ClaimUnmountedDiskgroupHookFn();
  _kernel.Fail("ClaimUnmountedDiskgroups", KovaStorageException("no", "s"));
  EXPECT_NO_THROW(ClaimUnmountedDiskgroupHookFn());
  EXPECT_THAT(_kernel.CallTexts(), ElementsAre("ClaimUnmountedDiskgroups()", "ClaimUnmountedDiskgroups()"));
}

TEST_F(ClaimDeathTest, EndsTheProcessInItsHookOverOtherExceptions) {
  Publish();
  _kernel.Fail("ClaimUnmountedDiskgroups", std::runtime_error("not the kernel's"));
  EXPECT_EXIT(ClaimUnmountedDiskgroupHookFn(), ExitedWithCode(panicStatus), "^panic: not the kernel's\n$");
}

}  // namespace
}  // namespace Kovasvc
