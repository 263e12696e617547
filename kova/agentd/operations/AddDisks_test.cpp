// Adding disks: which of them end in which groups, and what is said when none do.

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
#include "orbis/ParseException.h"
#include "tests/support/OperationFixture.h"
#include "tests/support/SpyManager.h"

namespace Kovasvc {
namespace {

using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskResult;
using HostCtl::Lib::HostCtlException;
using Nox::Fault::InsufficientDisks;
using Nox::Fault::KovaFault;
using Nox::Host::ScsiDisk;
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
using TestSupport::AMapping;
using TestSupport::ARecord;
using TestSupport::AScsiDisk;
using TestSupport::Disks;
using TestSupport::groupLine;
using TestSupport::Hdd;
using TestSupport::Hdds;
using TestSupport::IsExactly;
using TestSupport::IsSystemError;
using TestSupport::LogLineIs;
using TestSupport::NamesDevice;
using TestSupport::Numbered;
using TestSupport::operator+;
using TestSupport::panicStatus;
using TestSupport::releaseCache;
using TestSupport::releaseOperation;
using TestSupport::SoapText;
using TestSupport::SoapTexts;
using TestSupport::SpyManager;
using TestSupport::Ssd;
using TestSupport::Ssds;
using TestSupport::takeCache;
using TestSupport::takeOperation;

constexpr const char* computed = "Computed %1 mappings from the given %3 disks for KOVA";
constexpr const char* repeated = "Error checking disk uniqueness, duplicate disks found in mappings: %1";
constexpr const char* done = "DONE";
constexpr const char* allFlashExceed = "nox.agentd.kovaDiskOperation.allFlashExceed";
constexpr const char* hybridExceed = "nox.agentd.kovaDiskOperation.hybridExceed";
const std::string uuid = "52e7b2b4-0a7c-3a1c-9d3e-2f4a5b6c7d8e";

SystemError::Exception AFault(const std::string& reason) {
  return SystemError::Exception(MakeRef<SystemError>(reason));
}

// A flash disk that the kernel has tagged for capacity.
DiskResult TaggedFlash(const std::string& name) {
  return ARecord(name).Ssd().CapacityFlash();
}

class AddDisks : public TestSupport::OperationFixture {
 protected:
  // The inventory, and eligible records of all of it unless others are given.
  void Know(const Disks& disks, std::vector<DiskResult> records = {}) {
    if (records.empty()) {
      for (const Ref<ScsiDisk>& disk : disks) {
        records.push_back(ARecord(disk->GetCanonicalName()).Ssd(disk->GetSsd()));
      }
    }
    SetHost(disks, records);
  }
  void Add(const Disks& disks) { AddTexts(SoapTexts(disks)); }
  void AddTexts(const std::vector<std::string>& texts) {
    _manager->AddDisks(texts, "tag", _faultText, _resultText);
  }
  // The groups that go on to be made, in order.
  std::string PlanOf(const Disks& disks) {
    const auto spy = UseManager<SpyManager>();
    Add(disks);
    return spy->calls.empty() ? "nothing" : spy->calls.front();
  }
  // Five groups that can take no more disks of a request: there is no sixth.
  void FillTheHost() {
    for (const std::string& name : Numbered("g", 5)) {
      _kernel.groups.push_back(AGroup(name, Numbered(name + "-", 7)));
    }
  }
  std::vector<std::string> Formats() const { return Calls("FormatDiskMapping"); }
};
using AddDisksDeathTest = AddDisks;

// ---- the steps

TEST_F(AddDisks, RefreshesPlansAndMakesTheGroupsInThisOrder) {
  const Disks disks = {Ssd("s"), Hdd("a")};
  Know(disks);
  Add(disks);
  EXPECT_THAT(
      _timeline.Events(),
      ElementsAre(takeOperation, takeCache, "RefreshKovaInfo()", "QueryDisks([], true)", releaseCache,
                  releaseOperation,  // refresh
                  takeCache, "GetStorageDeviceInfo", releaseCache,
                  "GetDiskMappings(true)",                          // all-flash groups
                  takeCache, "GetStorageDeviceInfo", releaseCache,  // the eligible
                  "GetDiskMappings(true)",                          // hybrid groups
                  takeCache, releaseCache,                          // unmounted groups
                  takeCache, "GetStorageDeviceInfo", releaseCache, takeCache, releaseCache, takeOperation,
                  "FormatDiskMapping(s, [a], {tag, 1, 0})", releaseOperation, takeCache, releaseCache,
                  takeOperation, takeCache, "RefreshKovaInfo()", "QueryDisks([], true)",
                  "GetStorageDeviceInfo", releaseCache, releaseOperation,  // the group
                  takeCache, releaseCache));                               // invalidate
}

TEST_F(AddDisks, ForgetsTheCacheAndThenSaysDone) {
  const Disks disks = {Ssd("s"), Hdd("a")};
  Know(disks);
  LogIntoTimeline();
  Add(disks);
  EXPECT_THAT(LastEvents(4), ElementsAre(takeCache, releaseCache, "log verbose: DONE",
                                         std::string("log verbose: ") + TestSupport::noFaultLine));
}

TEST_F(AddDisks, SaysWhatItPlannedAndThenEachGroup) {
  const Disks disks = Ssds("s", 2) + Hdds("c", 3);
  Know(disks);
  UseManager<SpyManager>()->initializeDisksInt = [](auto&, auto&) {};
  Add(disks);
  const auto lines = _logger->Lines();
  ASSERT_GE(lines.size(), 6U);
  EXPECT_THAT(
      std::vector<TestSupport::LogLine>(lines.end() - 6, lines.end()),
      ElementsAre(LogLineIs(LogLevel::Verbose, computed, "2", "5"),
                  LogLineIs(LogLevel::Verbose, groupLine, "LogDiskMappings", "0", "s1", "c1, c3"),
                  LogLineIs(LogLevel::Verbose, groupLine, "LogDiskMappings", "1", "s2", "c2"),
                  LogLineIs(LogLevel::Verbose, done), LogLineIs(LogLevel::Verbose, TestSupport::noResultLine),
                  LogLineIs(LogLevel::Verbose, TestSupport::noFaultLine)));
}

TEST_F(AddDisks, SaysEachGroupBeforeItMakesAny) {
  const Disks disks = {Ssd("s"), Hdd("a")};
  Know(disks);
  LogIntoTimeline();
  Add(disks);
  const std::vector<std::string> events =
      EventsFrom("log verbose: LogDiskMappings: Mapping[0]: { SSD: s, MDs: a }");
  EXPECT_THAT(events, testing::Contains("log verbose: Formatting KOVA disks"));
}

TEST_F(AddDisks, PrintsTheNumberOfGroupsAndNeverThatOfTheDisks) {
  const Disks disks = Ssds("s", 2) + Hdds("c", 3);
  Know(disks);
  LogIntoTimeline();
  Add(disks);
  EXPECT_THAT(_timeline.Events(),
              Contains("log verbose: Computed 2 mappings from the given %3 disks for KOVA"));
}

TEST_F(AddDisks, AnswersWithAResultForEachGroup) {
  const Disks disks = Ssds("s", 2) + Hdds("c", 3);
  Know(disks);
  Add(disks);
  EXPECT_THAT(ResultTexts(), ElementsAre("s1: c1 c3", "s2: c2"));
  EXPECT_FALSE(HasFault());
  EXPECT_FALSE(IsCacheValid());
}

TEST_F(AddDisks, HandsTheTagDownToTheKernel) {
  const Disks disks = Ssds("s", 2) + Hdds("c", 2);
  Know(disks);
  _manager->AddDisks(SoapTexts(disks), "another tag", _faultText, _resultText);
  EXPECT_THAT(Formats(), ElementsAre("FormatDiskMapping(s1, [c1], {another tag, 2, 0})",
                                     "FormatDiskMapping(s2, [c2], {another tag, 2, 1})"));
}

// ---- what is planned

TEST_F(AddDisks, PlansHybridGroupsThenUnmountedOnesThenAllFlashOnes) {
  const Disks disks = {Ssd("f"), Ssd("tagged"), Ssd("u"), Ssd("s"), Hdd("a"), Hdd("m")};
  // The planner of all-flash groups takes the first cache disk and leaves the second.
  Know(disks, {ARecord("f").Ssd(), TaggedFlash("tagged"), ARecord("s").Ssd(), ARecord("a"),
               ARecord("u").Ssd().Ineligible(DiskReason::GroupNotMounted),
               ARecord("m").Ineligible(DiskReason::GroupNotMounted)});
  _kernel.unmountedGroups = {AGroup("u", {"m"})};
  EXPECT_EQ(PlanOf(disks), "InitializeDisksInt([s: a, u: m, f: tagged], tag)");
  EXPECT_THAT(Formats(), ElementsAre("FormatDiskMapping(s, [a], {tag, 3, 0})",
                                     "FormatDiskMapping(f, [tagged], {tag, 3, 2})"));
  EXPECT_THAT(Calls("MountDiskMapping"), ElementsAre("MountDiskMapping(u, false)"));
}

TEST_F(AddDisks, AsksTheCacheForNoHybridCandidatesWhenNoDiskIsLeft) {
  const Disks disks = {Ssd("f"), Ssd("tagged")};
  Know(disks, {ARecord("f").Ssd(), TaggedFlash("tagged")});
  EXPECT_EQ(PlanOf(disks), "InitializeDisksInt([f: tagged], tag)");
  const std::vector<std::string> events = _timeline.Events();
  ASSERT_GE(events.size(), 13U);
  EXPECT_THAT(std::vector<std::string>(events.begin() + 6, events.begin() + 13),
              ElementsAre(takeCache, "GetStorageDeviceInfo", releaseCache, "GetDiskMappings(true)",
                          "GetDiskMappings(true)", takeCache, releaseCache))
      << "all-flash groups, then hybrid and unmounted ones";
}

TEST_F(AddDisks, PlansWithTheEligibleDisksOnlyAndWhateverTheirReason) {
  const Disks disks = {Ssd("s"), Hdd("a"), Hdd("b"), Hdd("c"), Hdd("d")};
  Know(disks, {ARecord("s").Ssd(), ARecord("a").Reason(DiskReason::TooSmall), ARecord("b").InUse(uuid),
               ARecord("c").Ineligible(DiskReason::Usb)});
  EXPECT_EQ(PlanOf(disks), "InitializeDisksInt([s: a], tag)");
}

TEST_F(AddDisks, LooksAtTheGivenDisksOnly) {
  Know(Ssds("s", 2) + Hdds("c", 2));
  EXPECT_EQ(PlanOf({Ssd("s2"), Hdd("c1")}), "InitializeDisksInt([s2: c1], tag)");
}

TEST_F(AddDisks, PlansWithTheKernelsOrderAndTheInventorysDisks) {
  Know({Ssd("s"), Hdd("b"), Hdd("a")}, {ARecord("b"), ARecord("a"), ARecord("s").Ssd()});
  EXPECT_EQ(PlanOf({Ssd("a"), Hdd("b"), Ssd("s")}), "InitializeDisksInt([s: b a], tag)")
      << "the request calls a a flash disk, the inventory does not";
}

TEST_F(AddDisks, ExtendsTheGroupsThereAreWhenNoSsdIsGiven) {
  Know({Ssd("g"), Hdd("a"), Hdd("m")},
       {ARecord("g").Ssd().InUse(uuid), ARecord("a"), ARecord("m").InUse(uuid)});
  _kernel.groups = {AGroup("g", {"m"})};
  EXPECT_EQ(PlanOf({Hdd("a")}), "InitializeDisksInt([g: a], tag)");
}

TEST_F(AddDisks, DoesNotRefreshTheCacheWhilePlanning) {
  const Disks disks = {Ssd("s"), Hdd("a")};
  Know(disks);
  _locks.SetReleaseObserver([this](const std::string& lock) {
    if (lock == TestSupport::operationLock) {
      _locks.SetReleaseObserver({});
      _manager->InvalidateKovaDiskCache();
      _kernel.records.clear();
    }
  });
  EXPECT_EQ(PlanOf(disks), "InitializeDisksInt([s: a], tag)") << "what the refresh found counts";
}

TEST_F(AddDisks, HoldsNoLockWhilePlanning) {
  const Disks disks = {Ssd("s"), Hdd("a")};
  Know(disks);
  Add(disks);
  for (const TestSupport::KernelCall& call : _kernel.Calls()) {
    if (call.operation == "GetDiskMappings") {
      EXPECT_THAT(call.locksHeld, IsEmpty());
    }
  }
}

// ---- repeated names

struct Repeat {
  const char* title;
  std::vector<std::string> names;
  const char* told;  // null: it passes
};
void PrintTo(const Repeat& repeat, std::ostream* out) {
  *out << repeat.title;
}
const Repeat repeats[] = {
    {"TwoAtTheEnd", {"a", "b", "b"}, "b"},
    {"Apart", {"a", "b", "a"}, nullptr},
    {"TwoInFrontTellTheOneBehind", {"a", "a", "b"}, "b"},
    {"TwoPairs", {"a", "a", "b", "b"}, "b"},
    {"ThreeTimes", {"a", "a", "a"}, "a"},
    {"InTheMiddle", {"a", "b", "b", "c"}, "c"},
    {"TwoAlone", {"a", "a"}, "a"},
    {"Different", {"a", "b", "c"}, nullptr},
    {"OnePartOfTheOther", {"a", "aa", "A"}, nullptr},
    {"Alone", {"a"}, nullptr},
    {"PairsApart", {"a", "b", "b", "a", "a", "c"}, "a"},
};

class RepeatedNames : public AddDisks, public testing::WithParamInterface<Repeat> {
 protected:
  // Hard disks that the kernel does not know: all are left for hybrid groups, none is planned.
  void AddAll() {
    Disks disks;
    for (const std::string& name : GetParam().names) {
      disks.push_back(Hdd(name));
    }
    Add(disks);
  }
};

INSTANTIATE_TEST_SUITE_P(Of, RepeatedNames, testing::ValuesIn(repeats),
                         [](const auto& test) { return std::string(test.param.title); });

TEST_P(RepeatedNames, AreAFaultWhenTheyAreNeighbours) {
  AddAll();
  if (GetParam().told == nullptr) {
    EXPECT_THAT(Fault(), IsExactly<InsufficientDisks>());
    EXPECT_THAT(_logger->Lines(), Not(Contains(LogLineIs(LogLevel::Warning, repeated, _))));
    return;
  }
  EXPECT_THAT(Fault(), NamesDevice("DuplicateDisks", GetParam().told));
  EXPECT_FALSE(HasResult());
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Warning, repeated, GetParam().told),
                          LogLineIs(LogLevel::Verbose, TestSupport::gotFaultLine, "DuplicateDisks"),
                          LogLineIs(LogLevel::Verbose, TestSupport::noResultLine)));
  EXPECT_TRUE(IsCacheValid());
}

TEST_F(AddDisks, LooksForRepeatsBeforeItAsksForEligibleDisks) {
  Know({Hdd("a"), Hdd("b")});
  _app.SetObject("storageSystem", nullptr);
  Add({Hdd("a"), Hdd("a")});
  EXPECT_THAT(Fault(), NamesDevice("DuplicateDisks", "a"))
      << "the question needs an inventory, the check none";
}

TEST_F(AddDisks, LooksForRepeatsAmongTheDisksThatAreLeft) {
  const Disks known = {Ssd("f"), Ssd("tagged"), Ssd("s"), Hdd("a")};
  Know(known, {ARecord("f").Ssd(), TaggedFlash("tagged"), ARecord("s").Ssd(), ARecord("a")});
  EXPECT_EQ(PlanOf({Ssd("f"), Ssd("tagged"), Ssd("tagged"), Ssd("s"), Hdd("a")}),
            "InitializeDisksInt([s: a, f: tagged], tag)")
      << "the repeated one is taken for an all-flash group";
  const auto spy = UseManager<SpyManager>();
  Add({Hdd("a"), Ssd("tagged"), Hdd("a")});
  EXPECT_THAT(Fault(), NamesDevice("DuplicateDisks", "a")) << "neighbours once the tagged one is taken";
  EXPECT_THAT(spy->calls, IsEmpty());
}

// ---- nothing to plan

struct Limits {
  const char* title;
  Disks disks;
  std::vector<DiskResult> records;
  const char* key;  // null: no limit is told
};
void PrintTo(const Limits& limits, std::ostream* out) {
  *out << limits.title;
}

class ReachedLimits : public AddDisks, public testing::WithParamInterface<Limits> {};

INSTANTIATE_TEST_SUITE_P(
    On, ReachedLimits,
    testing::Values(
        Limits{"HybridGroups", {Ssd("s"), Hdd("a")}, {ARecord("s").Ssd(), ARecord("a")}, hybridExceed},
        Limits{
            "AllFlashGroups", {Ssd("s"), Ssd("f")}, {ARecord("s").Ssd(), TaggedFlash("f")}, allFlashExceed},
        Limits{"BothTellTheFirst",
               {Ssd("s"), Ssd("f"), Hdd("a")},
               {ARecord("s").Ssd(), TaggedFlash("f"), ARecord("a")},
               allFlashExceed}),
    [](const auto& test) { return std::string(test.param.title); });

TEST_P(ReachedLimits, AreTheFaultWhenTheyLeaveNothing) {
  FillTheHost();
  Know(GetParam().disks, GetParam().records);
  const auto spy = UseManager<SpyManager>();
  Add(GetParam().disks);
  ASSERT_THAT(Fault(), IsExactly<KovaFault>());
  const auto messages = Fault()->GetFaultMessage();
  ASSERT_EQ(messages->Size(), 1U);
  EXPECT_EQ((*messages)[0]->GetKey(), GetParam().key);
  EXPECT_FALSE((*messages)[0]->HasMessage());
  EXPECT_TRUE(!(*messages)[0]->GetArg() || (*messages)[0]->GetArg()->IsEmpty());
  EXPECT_FALSE(HasResult());
  EXPECT_THAT(spy->calls, IsEmpty()) << "nothing is made";
  EXPECT_THAT(_logger->Lines(), Contains(LogLineIs(LogLevel::Verbose, computed, "0", _)));
  EXPECT_THAT(_logger->Lines(), Contains(LogLineIs(LogLevel::Verbose, done)));
  EXPECT_THAT(_logger->Lines(), Not(Contains(LogLineIs(LogLevel::Verbose, TestSupport::gotFaultLine, _))));
  EXPECT_FALSE(IsCacheValid());
}

TEST_F(AddDisks, RefusesAsTooFewWhatNoLimitHinders) {
  Know({Hdd("a"), Hdd("b")});
  EXPECT_EQ(PlanOf({Hdd("a"), Hdd("b")}), "InitializeDisksInt([], tag)");
  EXPECT_TRUE(Results()->IsEmpty());
  EXPECT_THAT(Fault(), IsExactly<InsufficientDisks>());
  EXPECT_THAT(_logger->Lines(), Contains(LogLineIs(LogLevel::Verbose, done)));
  EXPECT_FALSE(IsCacheValid());
}

TEST_F(AddDisks, RefusesNoDisksAsTooFew) {
  Know({Ssd("s"), Hdd("a")});
  AddTexts({});
  EXPECT_THAT(Fault(), IsExactly<InsufficientDisks>()) << "no disks are not all disks";
  EXPECT_TRUE(Results()->IsEmpty());
  EXPECT_THAT(Formats(), IsEmpty());
}

TEST_F(AddDisks, MakesWhatFitsAndTellsNoLimit) {
  for (const std::string& name : Numbered("g", 5)) {
    _kernel.groups.push_back(AGroup(name, Numbered(name + "-", name == "g3" ? 6 : 7)));
  }
  const Disks known = {Ssd("s"), Ssd("f"), Ssd("g3"), Hdd("a"), Hdd("b")};
  Know(known,
       {ARecord("s").Ssd(), TaggedFlash("f"), ARecord("a"), ARecord("b"), ARecord("g3").Ssd().InUse(uuid)});
  EXPECT_EQ(PlanOf({Ssd("s"), Ssd("f"), Hdd("a"), Hdd("b")}), "InitializeDisksInt([g3: a], tag)");
  EXPECT_THAT(ResultTexts(), ElementsAre("g3: a"));
  EXPECT_FALSE(HasFault());
}

// ---- groups that are there but not mounted

TEST_F(AddDisks, MountsAGroupThatIsThereAndDoesNotFormatIt) {
  const Disks disks = {Ssd("u"), Hdd("m")};
  Know(disks, {ARecord("u").Ssd().Ineligible(DiskReason::GroupNotMounted),
               ARecord("m").Ineligible(DiskReason::GroupNotMounted)});
  _kernel.unmountedGroups = {AGroup("u", {"m"})};
  Add(disks);
  EXPECT_THAT(Formats(), IsEmpty());
  EXPECT_THAT(Calls("RestampDiskMapping"), ElementsAre("RestampDiskMapping(u, [m])"));
  EXPECT_THAT(ResultTexts(), ElementsAre("u: m"));
  EXPECT_FALSE(HasFault());
}

TEST_F(AddDisks, CannotNameAMemberThatTheInventoryLacks) {
  Know({Ssd("u")}, {ARecord("u").Ssd().Ineligible(DiskReason::GroupNotMounted)});
  _kernel.unmountedGroups = {AGroup("u", {"gone"})};
  EXPECT_THAT([this] { Add({Ssd("u")}); }, ThrowsMessage<NotInitializedException>(StrEq("Not initialized")));
  ExpectTextsUntouched();
  EXPECT_TRUE(IsCacheValid());
}

// ---- faults and exceptions

TEST_F(AddDisks, TellsAFaultOfThePlanningAndKeepsTheCache) {
  const Disks disks = {Ssd("s"), Hdd("a")};
  Know(disks);
  _app.SetObject("storageSystem", nullptr);
  Add(disks);
  EXPECT_THAT(Fault(), IsSystemError("Failed to lookup STORAGE_SYSTEM_MO."));
  EXPECT_FALSE(HasResult());
  EXPECT_THAT(_logger->Lines(LogLevel::Verbose).back(),
              LogLineIs(LogLevel::Verbose, TestSupport::noResultLine));
  EXPECT_THAT(_logger->Lines(LogLevel::Verbose),
              Contains(LogLineIs(LogLevel::Verbose, TestSupport::gotFaultLine,
                                 "SystemError: Failed to lookup STORAGE_SYSTEM_MO.")));
  EXPECT_THAT(_logger->Lines(), Not(Contains(LogLineIs(LogLevel::Verbose, done))));
  EXPECT_TRUE(IsCacheValid());
}

TEST_F(AddDisks, KeepsAResultThatWasMadeBeforeTheFault) {
  const Disks disks = {Ssd("s"), Hdd("a")};
  Know(disks);
  UseManager<SpyManager>()->initializeDisksInt = [](Ref<Orbis::Any>& result, Ref<Orbis::MethodFault>& fault) {
    EXPECT_FALSE(result);
    EXPECT_FALSE(fault);
    result = MakeRef<MapResults>();
    fault = MakeRef<KovaFault>();
    throw AFault("out");
  };
  Add(disks);
  EXPECT_TRUE(Results()->IsEmpty());
  EXPECT_THAT(Fault(), IsSystemError("out")) << "in place of the one before";
  EXPECT_THAT(_logger->Lines().back(),
              LogLineIs(LogLevel::Verbose, TestSupport::gotFaultLine, "SystemError: out"));
  EXPECT_TRUE(IsCacheValid());
}

TEST_F(AddDisks, ForgetsTheCacheThoughAGroupFailed) {
  const Disks disks = Ssds("s", 2) + Hdds("c", 2);
  Know(disks);
  _kernel.onCall = [](const TestSupport::KernelCall& call) {
    if (call.text.starts_with("FormatDiskMapping(s1,")) {
      throw HostCtl::Lib::KovaExceptionHasPartition("parts", "c1");
    }
  };
  Add(disks);
  EXPECT_THAT(ResultTexts(), ElementsAre("s1: c1 !DiskHasPartitions", "s2: c2"));
  EXPECT_THAT(Fault(), NamesDevice("DiskHasPartitions", "c1"));
  EXPECT_THAT(_logger->Lines(), Contains(LogLineIs(LogLevel::Verbose, done)));
  EXPECT_FALSE(IsCacheValid());
}

TEST_F(AddDisks, PlansNothingWhenTheKernelCannotBeRead) {
  const Disks disks = {Ssd("s"), Hdd("a")};
  Know(disks);
  _kernel.Fail("RefreshKovaInfo", HostCtlException("away"));
  Add(disks);
  EXPECT_THAT(Fault(), IsExactly<InsufficientDisks>());
  EXPECT_THAT(_logger->Lines(LogLevel::Warning).front(),
              LogLineIs(LogLevel::Warning, "Failed to refresh KOVA disk cache %1", "away"));
}

TEST_F(AddDisks, LetsAFaultOfTheRefreshOut) {
  const Disks disks = {Ssd("s"), Hdd("a")};
  Know(disks);
  _kernel.Fail("QueryDisks", AFault("broken"));
  EXPECT_THROW(Add(disks), SystemError::Exception);
  ExpectTextsUntouched();
  EXPECT_THAT(_logger->Lines(), IsEmpty());
  EXPECT_THAT(_timeline.Events(), ElementsAre(takeOperation, takeCache, "RefreshKovaInfo()",
                                              "QueryDisks([], true)", releaseCache, releaseOperation));
}

TEST_F(AddDisks, LetsAMissingNameOut) {
  Know({Ssd("s"), Hdd("a")});
  for (const Disks& disks :
       {Disks{Ssd("s"), AScsiDisk("x").Unnamed()}, Disks{AScsiDisk("x").Unnamed().Ssd()}}) {
    EXPECT_THAT([&] { Add(disks); }, ThrowsMessage<NotInitializedException>(StrEq("Not initialized")));
    EXPECT_THAT(_locks.HeldHere(), IsEmpty());
  }
  ExpectTextsUntouched();
}

TEST_F(AddDisks, LetsAMissingSsdFlagOut) {
  Know({Ssd("s"), Hdd("a")});
  EXPECT_THAT(
      [this] {
        Add({Ssd("s"), AScsiDisk("a").Ssd(std::nullopt)});
      },
      ThrowsMessage<NotInitializedException>(StrEq("optional value not set")));
  ExpectTextsUntouched();
}

TEST_F(AddDisks, LetsExceptionsOfNoFamilyOutWithTheLocksReleased) {
  const Disks disks = {Ssd("s"), Hdd("a")};
  Know(disks);
  for (const std::string operation : {"RefreshKovaInfo", "GetDiskMappings", "FormatDiskMapping"}) {
    _manager->InvalidateKovaDiskCache();
    _kernel.Fail(operation, std::runtime_error("not the kernel's"));
    EXPECT_THROW(Add(disks), std::runtime_error) << operation;
    EXPECT_THAT(_locks.HeldHere(), IsEmpty()) << operation;
    _kernel.Heal(operation);
  }
  ExpectTextsUntouched();
}

TEST_F(AddDisks, LetsOutWhatTheDecoderSays) {
  EXPECT_THROW(AddTexts({SoapText(*Ssd("s")), "no XML"}), Orbis::ParseException);
  ExpectTextsUntouched();
  EXPECT_THAT(_timeline.Events(), IsEmpty());
}

TEST_F(AddDisksDeathTest, EndsTheProcessOverATextOfAnotherType) {
  const auto mapping = AMapping(Ssd("s"), {Hdd("a")});
  EXPECT_EXIT(AddTexts({SoapText(*Ssd("s")), SoapText(*mapping)}), ExitedWithCode(panicStatus),
              "^panic: NOT_REACHED kova/agentd/KovaLibManager:1908\n$");
  EXPECT_EXIT(AddTexts({SoapText(*MakeRef<Nox::Host::ScsiLun>())}), ExitedWithCode(panicStatus),
              "^panic: NOT_REACHED kova/agentd/KovaLibManager:1908\n$");
}

// ---- through the hook

TEST_F(AddDisks, AnswersThroughItsHookTheSame) {
  const Disks disks = {Ssd("s"), Hdd("a")};
  Know(disks);
  Publish();
  AddDisksHookFn(SoapTexts(disks), "of the hook", _faultText, _resultText);
  EXPECT_THAT(ResultTexts(), ElementsAre("s: a"));
  EXPECT_THAT(Formats(), ElementsAre("FormatDiskMapping(s, [a], {of the hook, 1, 0})"));
}

TEST_F(AddDisks, LetsExceptionsOfNoFamilyThroughItsHook) {
  Publish();
  _kernel.Fail("RefreshKovaInfo", std::runtime_error("not the kernel's"));
  EXPECT_THROW(AddDisksHookFn({SoapText(*Ssd("s"))}, "", _faultText, _resultText), std::runtime_error);
}

TEST_F(AddDisksDeathTest, EndsTheProcessInItsHookOverWhatIsNoAnswer) {
  Know({Ssd("u")}, {ARecord("u").Ssd().Ineligible(DiskReason::GroupNotMounted)});
  _kernel.unmountedGroups = {AGroup("u", {"gone"})};
  Publish();
  _logger->SetLevel(LogLevel::Error);
  const auto call = [this](const Orbis::Any& object) {
    AddDisksHookFn({SoapText(object)}, "", _faultText, _resultText);
  };
  EXPECT_EXIT(call(*Ssd("u")), ExitedWithCode(panicStatus), "^panic: Not initialized\n$");
  EXPECT_EXIT(call(*AScsiDisk("x").Unnamed().Build()), ExitedWithCode(panicStatus),
              "^panic: Not initialized\n$");
  EXPECT_EXIT(call(*MakeRef<Nox::Host::ScsiLun>()), ExitedWithCode(panicStatus),
              "^panic: NOT_REACHED kova/agentd/KovaLibManager:1908\n$");
  _kernel.Fail("RefreshKovaInfo", AFault("broken"));
  EXPECT_EXIT(call(*Ssd("s")), ExitedWithCode(panicStatus), "panic: SystemError: broken\n$");
}

}  // namespace
}  // namespace Kovasvc
