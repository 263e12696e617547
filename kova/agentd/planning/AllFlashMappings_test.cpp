// The planner of all-flash groups, and the switch that hands the rest to the planner of hybrid ones.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <string_view>
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
using HostCtl::Kova::DiskState;
using HostCtl::Lib::HostCtlException;
using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;
using Orbis::DataArray;
using Tessa::MakeRef;
using Tessa::NotInitializedException;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::Contains;
using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::IsEmpty;
using testing::Not;
using testing::StrEq;
using testing::ThrowsMessage;
using TestSupport::AGroup;
using TestSupport::AnInventory;
using TestSupport::ARecord;
using TestSupport::AScsiDisk;
using TestSupport::Disks;
using TestSupport::DiskTexts;
using TestSupport::Elements;
using TestSupport::GroupTexts;
using TestSupport::Hdd;
using TestSupport::LogLineIs;
using TestSupport::Numbered;
using TestSupport::operator+;
using TestSupport::Ssd;
using TestSupport::Ssds;

constexpr const char* queried = "Queried %1 All-Flash eligible disks to be added to KOVA";
constexpr const char* computed = "Computed %1 All-Flash mappings from the queried %2 disks for KOVA";
constexpr const char* gotFault = "Got fault %1";
constexpr const char* groupLine = "%1: Mapping[%2]: { SSD: %3, MDs: %4 }";
constexpr const char* noStorageSystem = "Failed to lookup STORAGE_SYSTEM_MO.";

// The kernel's records of flash disks: those for the cache and those tagged for capacity.
std::vector<DiskResult> CacheFlash(const std::vector<std::string>& names) {
  std::vector<DiskResult> records;
  for (const std::string& name : names) {
    records.push_back(ARecord(name).Ssd());
  }
  return records;
}
std::vector<DiskResult> CapacityFlash(const std::vector<std::string>& names) {
  std::vector<DiskResult> records;
  for (const std::string& name : names) {
    records.push_back(ARecord(name).Ssd().CapacityFlash());
  }
  return records;
}
std::vector<DiskResult> operator+(std::vector<DiskResult> left, const std::vector<DiskResult>& right) {
  left.insert(left.end(), right.begin(), right.end());
  return left;
}

Nox::Fault::DiskIsUSB::Exception AFault() {
  return Nox::Fault::DiskIsUSB::Exception(MakeRef<Nox::Fault::DiskIsUSB>("naa.1"));
}

// Throws a fault instead of writing a line of that format, the first so many times.
class FaultyLogger final : public Tessa::Service::Logger {
 public:
  FaultyLogger(Ref<TestSupport::RecordingLogger> journal, std::string format, int times)
      : _journal(std::move(journal)), _format(std::move(format)), _times(times) {}

  LogLevel GetLevel() const noexcept override { return LogLevel::Trivia; }
  void CreateChild(const std::string&, Ref<Tessa::Service::Logger>& child) override { child = this; }
  void Write(LogLevel level, std::string_view format,
             std::span<const Tessa::Service::LogArgument> arguments) override {
    if (format == _format && _times > 0) {
      --_times;
      throw AFault();
    }
    _journal->Write(level, format, arguments);
  }

 private:
  const Ref<TestSupport::RecordingLogger> _journal;
  const std::string _format;
  int _times;
};

class AllFlash : public TestSupport::PluginFixture {
 protected:
  AllFlash() : _manager(MakeManager()) {}

  // The disks are in the inventory, and the records in the manager's cache.
  void Know(const Disks& disks, const std::vector<DiskResult>& records) {
    SetHost(disks, records);
    _manager->InvalidateKovaDiskCache();
    _manager->RefreshKovaDiskCache();
    _candidates = AnInventory(disks);
    Forget();
  }
  void Forget() {
    _timeline.Take();
    _logger->Clear();
    _kernel.ForgetCalls();
  }
  // From now on the manager's log line of that format throws a fault, so many times.
  void FailLine(const std::string& format, int times = 1) {
    Ref<Tessa::Service::Logger> logger = MakeRef<FaultyLogger>(_logger, format, times);
    _manager = MakeRef<KovaManagerImpl>(logger);
    _manager->RefreshKovaDiskCache();
    Forget();
  }

  void Compute() {
    _manager->ComputeAllFlashDiskMappings(_candidates.Get(), _mappings, _taken, _limitReached);
  }
  std::vector<std::string> Plan() {
    Compute();
    return GroupTexts(*_mappings);
  }
  void Switch() {
    _manager->AllFlashDiskMappingSwitch(_candidates.Get(), _mappings, _remaining, _limitReached);
  }

  Ref<KovaManagerImpl> _manager;
  Ref<DataArray<ScsiDisk>> _candidates = AnInventory({});
  const Ref<DataArray<DiskMapping>> _mappingsBefore = MakeRef<DataArray<DiskMapping>>();
  const Ref<DataArray<ScsiDisk>> _remainingBefore = MakeRef<DataArray<ScsiDisk>>();
  Ref<DataArray<DiskMapping>> _mappings = _mappingsBefore;
  Ref<DataArray<ScsiDisk>> _remaining = _remainingBefore;
  std::vector<std::string> _taken;
  bool _limitReached = true;
};

// ---- the planner

TEST_F(AllFlash, PlansSevenCapacityDisksRoundAnSsdAndTakesAllOfThem) {
  Know(Ssds("s", 1) + Ssds("c", 9), CacheFlash({"s1"}) + CapacityFlash(Numbered("c", 9)));
  EXPECT_THAT(Plan(), ElementsAre("s1: c1 c2 c3 c4 c5 c6 c7"));
  std::vector<std::string> taken = Numbered("c", 9);
  taken.push_back("s1");
  EXPECT_THAT(_taken, ElementsAreArray(taken));
  EXPECT_FALSE(_limitReached);
}

TEST_F(AllFlash, HoldsTheCacheLockForQueryAndMarshallingOnly) {
  Know(Ssds("s", 1) + Ssds("c", 1), CacheFlash({"s1"}) + CapacityFlash({"c1"}));
  Compute();
  EXPECT_THAT(_timeline.Events(), ElementsAre("take KovaManager.diskCache", "GetStorageDeviceInfo",
                                              "release KovaManager.diskCache", "GetDiskMappings(true)"));
}

TEST_F(AllFlash, SaysWhatItQueriedAndPlanned) {
  Know(Ssds("s", 1) + Ssds("c", 2), CacheFlash({"s1"}) + CapacityFlash({"c1", "c2"}));
  Compute();
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Verbose, queried, "3"),
                          LogLineIs(LogLevel::Verbose, computed, "1", "3"),
                          LogLineIs(LogLevel::Verbose, groupLine, "LogDiskMappings", "0", "s1", "c1, c2")));
}

TEST_F(AllFlash, WorksOnTheCacheAsItIs) {
  Know(Ssds("s", 1) + Ssds("c", 1), CacheFlash({"s1"}) + CapacityFlash({"c1"}));
  _manager->InvalidateKovaDiskCache();
  _kernel.records.clear();
  EXPECT_THAT(Plan(), ElementsAre("s1: c1"));
  EXPECT_THAT(_kernel.CallTexts(), ElementsAre("GetDiskMappings(true)"));
}

TEST_F(AllFlash, KeepsTheOrderOfTheRecordsAndNotThatOfTheCandidates) {
  Know({Ssd("c1"), Ssd("s1"), Ssd("c2")}, CapacityFlash({"c2", "c1"}) + CacheFlash({"s1"}));
  EXPECT_THAT(Plan(), ElementsAre("s1: c2 c1"));
  EXPECT_THAT(_taken, ElementsAre("c2", "c1", "s1"));
}

TEST_F(AllFlash, LooksAtTheCandidatesOnly) {
  Know(Ssds("s", 2) + Ssds("c", 2), CacheFlash({"s1", "s2"}) + CapacityFlash({"c1", "c2"}));
  _candidates = AnInventory({Ssd("s2"), Ssd("c1")});
  EXPECT_THAT(Plan(), ElementsAre("s2: c1"));
  EXPECT_THAT(_taken, ElementsAre("c1", "s2"));
}

TEST_F(AllFlash, LeavesHardDisksAlone) {
  Know({Ssd("s1"), Hdd("h1"), Ssd("c1")},
       CacheFlash({"s1"}) + std::vector<DiskResult>{ARecord("h1")} + CapacityFlash({"c1"}));
  EXPECT_THAT(Plan(), ElementsAre("s1: c1"));
  EXPECT_THAT(_logger->Lines(), Contains(LogLineIs(LogLevel::Verbose, queried, "2")));
}

TEST_F(AllFlash, TakesAHardDiskThatIsTaggedForCapacity) {
  Know({Ssd("s1"), Hdd("c1")}, CacheFlash({"s1"}) + std::vector<DiskResult>{ARecord("c1").CapacityFlash()});
  EXPECT_THAT(Plan(), ElementsAre("s1: c1"));
}

TEST_F(AllFlash, TakesEligibleDisksOnly) {
  Know({Ssd("s1"), Ssd("c1"), Ssd("c2"), Ssd("c3")},
       CacheFlash({"s1"}) +
           std::vector<DiskResult>{ARecord("c1").Ssd().CapacityFlash().InUse("uuid"),
                                   ARecord("c2").Ssd().CapacityFlash().Ineligible(DiskReason::Usb),
                                   ARecord("c3").Ssd().CapacityFlash()});
  EXPECT_THAT(Plan(), ElementsAre("s1: c3"));
  EXPECT_THAT(_taken, ElementsAre("c3", "s1"));
}

TEST_F(AllFlash, AsksForTheStateAndNotForTheReason) {
  Know({Ssd("s1"), Ssd("c1")},
       std::vector<DiskResult>{ARecord("s1").Ssd().Reason(DiskReason::TooSmall)} + CapacityFlash({"c1"}));
  EXPECT_THAT(Plan(), ElementsAre("s1: c1"));
}

TEST_F(AllFlash, PlansCopiesThatCallCapacityFlashNoSsd) {
  const Disks disks = {Ssd("s1"), Ssd("c1")};
  Know(disks, CacheFlash({"s1"}) + CapacityFlash({"c1"}));
  Compute();
  const DiskMapping& mapping = *(*_mappings)[0];
  EXPECT_TRUE(mapping.GetSsd()->GetSsd());
  EXPECT_FALSE((*mapping.GetNonSsd())[0]->GetSsd());
  EXPECT_TRUE(disks[1]->GetSsd()) << "the agent's own disk stays what it is";
  EXPECT_NE(mapping.GetSsd(), disks[0]);
}

TEST_F(AllFlash, TakesAnSsdOnlyWhenItHeadsAGroup) {
  Know(Ssds("s", 3) + Ssds("c", 2), CacheFlash({"s1", "s2", "s3"}) + CapacityFlash({"c1", "c2"}));
  EXPECT_THAT(Plan(), ElementsAre("s1: c1", "s2: c2"));
  EXPECT_THAT(_taken, ElementsAre("c1", "c2", "s1", "s2"));
}

TEST_F(AllFlash, PlansAndTakesNothingWithoutCapacityFlash) {
  Know(Ssds("s", 2), CacheFlash({"s1", "s2"}));
  EXPECT_THAT(Plan(), IsEmpty());
  EXPECT_THAT(_taken, IsEmpty());
  EXPECT_FALSE(_limitReached);
}

TEST_F(AllFlash, ExtendsAllFlashGroupsOnly) {
  Know({Ssd("g1"), Ssd("g2"), Ssd("c1")}, CapacityFlash({"c1"}));
  _kernel.groups = {AGroup("g1", {"x"}), AGroup("g2", {"y"}).AllFlash()};
  EXPECT_THAT(Plan(), ElementsAre("g2: c1"));
  EXPECT_THAT(_taken, ElementsAre("c1", "g2"));
}

TEST_F(AllFlash, ReportsTheLimitOfItsOwnPlan) {
  Know({Ssd("g1"), Ssd("c1")}, CapacityFlash({"c1"}));
  _kernel.groups = {AGroup("g1", Numbered("x", 7)).AllFlash()};
  _limitReached = false;
  EXPECT_THAT(Plan(), IsEmpty());
  EXPECT_TRUE(_limitReached);
  EXPECT_THAT(_taken, ElementsAre("c1"));
}

TEST_F(AllFlash, AppendsToTheNamesThatWereTakenBefore) {
  Know({Ssd("s1"), Ssd("c1")}, CacheFlash({"s1"}) + CapacityFlash({"c1"}));
  _taken = {"before"};
  Compute();
  EXPECT_THAT(_taken, ElementsAre("before", "c1", "s1"));
}

TEST_F(AllFlash, WithoutEligibleFlashPlansNothingAndTouchesNoLimit) {
  Know({Hdd("h1"), Ssd("s1")}, {ARecord("h1"), ARecord("s1").Ssd().Ineligible(DiskReason::Usb)});
  for (const bool limitReached : {true, false}) {
    _limitReached = limitReached;
    _mappings = _mappingsBefore;
    Compute();
    EXPECT_FALSE(_mappings);
    EXPECT_EQ(_limitReached, limitReached);
  }
  EXPECT_THAT(_taken, IsEmpty());
  EXPECT_THAT(_logger->Lines(), IsEmpty());
  EXPECT_THAT(_kernel.Calls(), IsEmpty());
}

TEST_F(AllFlash, WithoutCandidatesPlansNoDiskThatNobodyNamed) {
  Know(Ssds("s", 1) + Ssds("c", 1), CacheFlash({"s1"}) + CapacityFlash({"c1"}));
  _candidates = AnInventory({});
  Compute();
  EXPECT_FALSE(_mappings);
  EXPECT_TRUE(_limitReached);
  _candidates = nullptr;
  _mappings = _mappingsBefore;
  Compute();
  EXPECT_FALSE(_mappings);
  EXPECT_THAT(_timeline.Events(), Not(Contains("GetStorageDeviceInfo")));
  EXPECT_THAT(_kernel.Calls(), IsEmpty());
}

TEST_F(AllFlash, LeavesOutWhatTheInventoryLacks) {
  Know({Ssd("s1"), Ssd("c1")}, CacheFlash({"s1"}) + CapacityFlash({"c9", "c1"}));
  _candidates = AnInventory({Ssd("s1"), Ssd("c9"), Ssd("c1")});
  EXPECT_THAT(Plan(), ElementsAre("s1: c1"));
  EXPECT_THAT(_taken, ElementsAre("c1", "s1"));
}

TEST_F(AllFlash, NeedsANameOfEveryCandidate) {
  Know({Ssd("s1")}, CacheFlash({"s1"}));
  for (const Ref<ScsiDisk>& bad : Disks{AScsiDisk("x").Unnamed(), nullptr}) {
    _candidates = AnInventory({Ssd("s1"), bad});
    EXPECT_THAT([this] { Compute(); }, ThrowsMessage<NotInitializedException>(StrEq("Not initialized")));
    EXPECT_EQ(_mappings, _mappingsBefore);
    EXPECT_TRUE(_limitReached);
    EXPECT_THAT(_locks.HeldHere(), IsEmpty());
  }
  EXPECT_THAT(_logger->Lines(), IsEmpty()) << "no fault, so no line";
}

TEST_F(AllFlash, NeedsTheSsdFlagOfEveryResult) {
  Know({AScsiDisk("s1").Ssd(std::nullopt)}, CacheFlash({"s1"}));
  EXPECT_THAT([this] { Compute(); }, ThrowsMessage<NotInitializedException>(StrEq("optional value not set")));
  EXPECT_EQ(_mappings, _mappingsBefore);
  EXPECT_THAT(_kernel.Calls(), IsEmpty());
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, queried, "1")));
}

TEST_F(AllFlash, HasTakenTheDisksBeforeOneWithoutItsFlag) {
  Know({Ssd("c1"), Ssd("c2"), AScsiDisk("s1").Ssd(std::nullopt), Ssd("c3")},
       CapacityFlash({"c1", "c2"}) + CacheFlash({"s1"}) + CapacityFlash({"c3"}));
  _taken = {"before"};
  EXPECT_THROW(Compute(), NotInitializedException);
  EXPECT_THAT(_taken, ElementsAre("before", "c1", "c2"));
}

TEST_F(AllFlash, MeetsAnUnnamedDiskOfTheInventoryBeforeAMatch) {
  Know({Ssd("s1"), Ssd("c1")}, CacheFlash({"s1"}) + CapacityFlash({"c1"}));
  _storage->SetDisks({AScsiDisk("x").Unnamed(), Ssd("s1"), Ssd("c1")});
  EXPECT_THROW(Compute(), NotInitializedException);
  EXPECT_THAT(_locks.HeldHere(), IsEmpty());
}

// ---- faults inside the planner

TEST_F(AllFlash, WithoutAnInventoryGivesUpWithALine) {
  Know({Ssd("s1"), Ssd("c1")}, CacheFlash({"s1"}) + CapacityFlash({"c1"}));
  _app.SetObject("storageSystem", nullptr);
  EXPECT_NO_THROW(Compute());
  EXPECT_FALSE(_mappings);
  EXPECT_THAT(_taken, IsEmpty());
  EXPECT_TRUE(_limitReached) << "not touched";
  EXPECT_THAT(
      _logger->Lines(),
      ElementsAre(LogLineIs(LogLevel::Warning, "GetDisksFromAgentd %1", noStorageSystem),
                  LogLineIs(LogLevel::Verbose, gotFault, std::string("SystemError: ") + noStorageSystem)));
  EXPECT_EQ(_timeline.Events().back(), "release KovaManager.diskCache");
}

TEST_F(AllFlash, HasNoPlanWhenAFaultComesBeforeItsEnd) {
  Know({Ssd("g1"), Ssd("c1")}, CapacityFlash({"c1"}));
  _kernel.groups = {AGroup("g1", {"x"}).AllFlash()};
  int reading = 0;
  _storage->SetObserver([&reading] {
    if (++reading == 2) {  // the marshalling was first
      throw AFault();
    }
  });
  EXPECT_NO_THROW(Compute());
  EXPECT_FALSE(_mappings);
  EXPECT_THAT(_taken, ElementsAre("c1"));
  EXPECT_TRUE(_limitReached) << "not touched";
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, queried, "1"),
                                            LogLineIs(LogLevel::Verbose, gotFault, AFault().what())));
}

TEST_F(AllFlash, KeepsThePlanWhenAFaultComesBehindIt) {
  Know({Ssd("s1"), Ssd("c1")}, CacheFlash({"s1"}) + CapacityFlash({"c1"}));
  FailLine(computed);
  EXPECT_THAT(Plan(), ElementsAre("s1: c1"));
  EXPECT_THAT(_taken, ElementsAre("c1")) << "the cache disk would have come later";
  EXPECT_FALSE(_limitReached);
  EXPECT_THAT(_logger->Lines(), Contains(LogLineIs(LogLevel::Verbose, gotFault, AFault().what())));
}

TEST_F(AllFlash, HasNotTakenACacheDiskBeforeItsGroupIsLogged) {
  Know({Ssd("s1"), Ssd("c1")}, CacheFlash({"s1"}) + CapacityFlash({"c1"}));
  FailLine(groupLine);
  EXPECT_THAT(Plan(), ElementsAre("s1: c1"));
  EXPECT_THAT(_taken, ElementsAre("c1"));
}

TEST_F(AllFlash, LetsWhatIsNoFaultThrough) {
  Know({Ssd("s1"), Ssd("c1")}, CacheFlash({"s1"}) + CapacityFlash({"c1"}));
  _kernel.Fail("GetDiskMappings", std::runtime_error("not the kernel's"));
  EXPECT_THROW(Compute(), std::runtime_error);
  EXPECT_EQ(_mappings, _mappingsBefore);
}

TEST_F(AllFlash, PlansWithoutTheKernelsGroupsWhenTheKernelFails) {
  Know({Ssd("s1"), Ssd("c1")}, CacheFlash({"s1"}) + CapacityFlash({"c1"}));
  _kernel.Fail("GetDiskMappings", HostCtlException("away"));
  EXPECT_THAT(Plan(), ElementsAre("s1: c1"));
}

// ---- the switch

TEST_F(AllFlash, HandsBackWhatItDidNotTakeInOrder) {
  const Disks disks = {Hdd("h2"), Ssd("c2"), Ssd("s2"), Ssd("s1"), Ssd("c1"), Hdd("h1")};
  Know(disks, CacheFlash({"s2", "s1"}) + CapacityFlash({"c2"}) +
                  std::vector<DiskResult>{ARecord("h1"), ARecord("h2"),
                                          ARecord("c1").Ssd().CapacityFlash().Ineligible(DiskReason::Usb)});
  Switch();
  EXPECT_THAT(GroupTexts(*_mappings), ElementsAre("s2: c2"));
  EXPECT_THAT(Elements(*_remaining),
              ElementsAre(disks[0].Get(), disks[3].Get(), disks[4].Get(), disks[5].Get()))
      << "the candidates themselves";
  EXPECT_NE(_remaining, _remainingBefore);
  EXPECT_EQ(_candidates->Size(), 6U);
}

TEST_F(AllFlash, HandsBackNeitherOfTwoLeftOverCapacityDisks) {
  Know(Ssds("s", 1) + Ssds("c", 9), CacheFlash({"s1"}) + CapacityFlash(Numbered("c", 9)));
  Switch();
  EXPECT_THAT(GroupTexts(*_mappings), ElementsAre("s1: c1 c2 c3 c4 c5 c6 c7"));
  EXPECT_TRUE(_remaining->IsEmpty());
}

TEST_F(AllFlash, HandsBackEveryCandidateWithoutEligibleFlash) {
  Know({Hdd("h1"), Ssd("s1"), Hdd("h1")}, {});
  Switch();
  EXPECT_FALSE(_mappings);
  EXPECT_THAT(DiskTexts(*_remaining), ElementsAre("h1", "s1", "h1"));
  EXPECT_NE(_remaining, _candidates);
  EXPECT_TRUE(_limitReached) << "not touched";
}

TEST_F(AllFlash, HandsBackSsdsThatHadNoCapacityFlash) {
  Know(Ssds("s", 2), CacheFlash({"s1", "s2"}));
  Switch();
  ASSERT_TRUE(_mappings);
  EXPECT_TRUE(_mappings->IsEmpty());
  EXPECT_THAT(DiskTexts(*_remaining), ElementsAre("s1", "s2"));
  EXPECT_FALSE(_limitReached);
}

TEST_F(AllFlash, TakesEveryCandidateOfATakenName) {
  Know({Ssd("s1"), Ssd("c1"), Ssd("c1")}, CacheFlash({"s1"}) + CapacityFlash({"c1"}));
  Switch();
  EXPECT_TRUE(_remaining->IsEmpty());
}

TEST_F(AllFlash, HandsBackNothingOfNoCandidates) {
  _candidates = nullptr;
  Switch();
  EXPECT_FALSE(_mappings);
  EXPECT_TRUE(_remaining->IsEmpty());
}

TEST_F(AllFlash, HandsBackWhatWasNotTakenBeforeAFault) {
  Know({Ssd("s1"), Ssd("c1"), Hdd("h1")}, CacheFlash({"s1"}) + CapacityFlash({"c1"}));
  FailLine(computed);
  Switch();
  EXPECT_THAT(GroupTexts(*_mappings), ElementsAre("s1: c1"));
  EXPECT_THAT(DiskTexts(*_remaining), ElementsAre("s1", "h1"));
}

TEST_F(AllFlash, HandsBackTheCandidatesThemselvesWhenAFaultEscapes) {
  Know({Ssd("s1"), Ssd("c1")}, CacheFlash({"s1"}) + CapacityFlash({"c1"}));
  FailLine(gotFault);  // as the planner tells of a fault of its own
  _app.SetObject("storageSystem", nullptr);
  Switch();
  EXPECT_FALSE(_mappings);
  EXPECT_EQ(_remaining, _candidates);
  EXPECT_THAT(_logger->Lines(LogLevel::Verbose),
              ElementsAre(LogLineIs(LogLevel::Verbose, gotFault, AFault().what())));
}

TEST_F(AllFlash, LeavesTheSwitchesOutputsUntouchedWhenACandidateHasNoName) {
  Know({Ssd("s1")}, CacheFlash({"s1"}));
  _candidates = AnInventory({Ssd("s1"), AScsiDisk("x").Unnamed()});
  EXPECT_THAT([this] { Switch(); }, ThrowsMessage<NotInitializedException>(StrEq("Not initialized")));
  EXPECT_EQ(_mappings, _mappingsBefore);
  EXPECT_EQ(_remaining, _remainingBefore);
}

}  // namespace
}  // namespace Kovasvc
