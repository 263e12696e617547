// The planner of hybrid groups: which disks it plans, whom it asks, and when it lets go of the manager's
// lock.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <future>
#include <stdexcept>
#include <string>
#include <thread>
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

using HostCtl::Lib::HostCtlException;
using Nox::Kova::Host::DiskMapping;
using Orbis::DataArray;
using Tessa::MakeRef;
using Tessa::NotInitializedException;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::StrEq;
using testing::ThrowsMessage;
using TestSupport::AGroup;
using TestSupport::AnInventory;
using TestSupport::AScsiDisk;
using TestSupport::Disks;
using TestSupport::FakeKernel;
using TestSupport::GroupTexts;
using TestSupport::Hdd;
using TestSupport::Hdds;
using TestSupport::LogLineIs;
using TestSupport::Numbered;
using TestSupport::operator+;
using TestSupport::Ssd;
using TestSupport::Ssds;

constexpr const char* managerLock = "KovaManager";
constexpr const char* kernelFailed = "Error retrieving disk mappings: %1";
constexpr const char* inventoryFailed = "GetDisksFromAgentd error %1";
constexpr const char* noStorageSystem = "Failed to lookup STORAGE_SYSTEM_MO.";

class HybridPlanner : public TestSupport::PluginFixture {
 protected:
  HybridPlanner() : _manager(MakeManager()) {}

  void Compute(const Disks& candidates, bool allFlash = false) {
    _manager->ComputeDiskMappings(AnInventory(candidates).Get(), allFlash, _mappings, _limitReached);
  }
  // The planned groups as texts.
  std::vector<std::string> Plan(const Disks& candidates, bool allFlash = false) {
    Compute(candidates, allFlash);
    return GroupTexts(*_mappings);
  }
  // Groups g1, g2, ... of so many disks each, whose cache disks are in the inventory.
  void SetGroups(const std::vector<int>& sizes) {
    Disks ssds;
    for (const int size : sizes) {
      const std::string name = "g" + std::to_string(ssds.size() + 1);
      _kernel.groups.push_back(AGroup(name, Numbered(name + "-", size)));
      ssds.push_back(Ssd(name));
    }
    _storage->SetDisks(ssds);
  }
  // Neither output was written to.
  void ExpectOutputsUntouched() const {
    EXPECT_EQ(_mappings, _mappingsBefore);
    EXPECT_TRUE(_limitReached);
  }

  Ref<KovaManagerImpl> _manager;
  const Ref<DataArray<DiskMapping>> _mappingsBefore = MakeRef<DataArray<DiskMapping>>();
  Ref<DataArray<DiskMapping>> _mappings = _mappingsBefore;
  bool _limitReached = true;  // the wrong answer for most hosts
};

// ---- new groups

TEST_F(HybridPlanner, DealsCapacityDisksRoundTheSsdsInOrderOfEntry) {
  EXPECT_THAT(Plan(Ssds("s", 2) + Hdds("c", 5)), ElementsAre("s1: c1 c3 c5", "s2: c2 c4"));
  EXPECT_FALSE(_limitReached);
}

TEST_F(HybridPlanner, TellsTheRolesByTheSsdFlagWhereverTheDisksStand) {
  EXPECT_THAT(Plan({Hdd("c1"), Ssd("s1"), Hdd("c2"), Ssd("s2"), Hdd("c3")}),
              ElementsAre("s1: c1 c3", "s2: c2"));
}

TEST_F(HybridPlanner, PlansTheCandidatesThemselvesAndNoCopies) {
  const Disks disks = {Ssd("s1"), Hdd("c1")};
  Compute(disks);
  EXPECT_EQ((*_mappings)[0]->GetSsd(), disks[0]);
  EXPECT_EQ((*(*_mappings)[0]->GetNonSsd())[0], disks[1].Get());
}

TEST_F(HybridPlanner, ReplacesTheListItIsGiven) {
  _mappingsBefore->Append(MakeRef<DiskMapping>());
  EXPECT_THAT(Plan({}), IsEmpty());
  EXPECT_NE(_mappings, _mappingsBefore);
  EXPECT_EQ(_mappingsBefore->Size(), 1U);
}

TEST_F(HybridPlanner, TakesFiveSsdsAtMost) {
  EXPECT_THAT(Plan(Ssds("s", 6) + Hdds("c", 10)),
              ElementsAre("s1: c1 c6", "s2: c2 c7", "s3: c3 c8", "s4: c4 c9", "s5: c5 c10"));
  EXPECT_FALSE(_limitReached);
}

TEST_F(HybridPlanner, LeavesOutInSilenceWhatIsBeyondSevenDisksOfAGroup) {
  EXPECT_THAT(Plan(Ssds("s", 1) + Hdds("c", 9)), ElementsAre("s1: c1 c2 c3 c4 c5 c6 c7"));
  EXPECT_FALSE(_limitReached);
}

TEST_F(HybridPlanner, MakesNoGroupOfAnSsdThatGotNothing) {
  EXPECT_THAT(Plan(Ssds("s", 3) + Hdds("c", 2)), ElementsAre("s1: c1", "s2: c2"));
  EXPECT_THAT(Plan(Ssds("s", 6)), IsEmpty());
  EXPECT_FALSE(_limitReached);
}

TEST_F(HybridPlanner, CountsTheKernelsGroupsAgainstTheFive) {
  SetGroups({1, 1});
  _kernel.unmountedGroups = {AGroup("u1", {"u1-1"})};
  EXPECT_THAT(Plan(Ssds("s", 3) + Hdds("c", 3)), ElementsAre("s1: c1 c3", "s2: c2"));
}

TEST_F(HybridPlanner, NeverExtendsAGroupWhenAnSsdWasTaken) {
  SetGroups({1});
  _timeline.Take();
  EXPECT_THAT(Plan(Ssds("s", 1) + Hdds("c", 8)), ElementsAre("s1: c1 c2 c3 c4 c5 c6 c7"));
  EXPECT_THAT(_timeline.Events(), ElementsAre("GetDiskMappings(true)")) << "no one asked for the inventory";
}

TEST_F(HybridPlanner, PlansNothingOfNothing) {
  EXPECT_THAT(Plan({}), IsEmpty());
  EXPECT_FALSE(_limitReached);
  _limitReached = true;
  _manager->ComputeDiskMappings(nullptr, false, _mappings, _limitReached);
  EXPECT_TRUE(_mappings->IsEmpty());
  EXPECT_FALSE(_limitReached);
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(HybridPlanner, PlansNothingOfCapacityDisksAloneOnAHostWithoutGroups) {
  EXPECT_THAT(Plan(Hdds("c", 3)), IsEmpty());
  EXPECT_FALSE(_limitReached);
  EXPECT_THAT(_timeline.Events(), ElementsAre("GetDiskMappings(true)"));
}

TEST_F(HybridPlanner, MakesOneGroupOfAnSsdThatIsNamedTwice) {
  const Ref<Nox::Host::ScsiDisk> ssd = Ssd("s1");
  EXPECT_THAT(Plan(Disks{ssd, ssd} + Hdds("c", 3)), ElementsAre("s1: c1 c2 c3"));
  const Ref<Nox::Host::ScsiDisk> other = Ssd("s2");
  EXPECT_THAT(Plan(Disks{ssd, other, ssd} + Hdds("c", 4)), ElementsAre("s1: c1 c3 c4", "s2: c2"));
}

TEST_F(HybridPlanner, TellsSsdsApartByObjectAndNotByName) {
  EXPECT_THAT(Plan(Disks{Ssd("s1"), Ssd("s1")} + Hdds("c", 2)), ElementsAre("s1: c1", "s1: c2"));
}

TEST_F(HybridPlanner, NeedsNoNamesToPlanNewGroups) {
  EXPECT_THAT(Plan({AScsiDisk("x").Unnamed().Ssd(), AScsiDisk("y").Unnamed()}),
              ElementsAre("unnamed: unnamed"));
}

// ---- more disks for the groups there are

TEST_F(HybridPlanner, ExtendsTheEmptiestGroupWhenThereIsNoSsd) {
  SetGroups({7, 5});
  EXPECT_THAT(Plan(Hdds("c", 4)), ElementsAre("g2: c1 c2"));
  EXPECT_FALSE(_limitReached);
}

TEST_F(HybridPlanner, HeadsAnExtensionWithTheInventorysOwnDisk) {
  const Ref<Nox::Host::ScsiDisk> ssd = Ssd("g1");
  SetGroups({1});
  _storage->SetDisks({Ssd("g0"), ssd});
  Compute(Hdds("c", 1));
  ASSERT_EQ(_mappings->Size(), 1U);
  EXPECT_EQ((*_mappings)[0]->GetSsd(), ssd);
}

TEST_F(HybridPlanner, ListsExtendedGroupsInTheOrderOfTheirFirstDisks) {
  SetGroups({3, 1, 3});
  EXPECT_THAT(Plan(Hdds("c", 6)), ElementsAre("g2: c1 c2 c4", "g1: c3 c6", "g3: c5"));
}

TEST_F(HybridPlanner, ExtendsGroupsWhenEverySsdIsBeyondTheLimit) {
  SetGroups({7, 6, 7, 7, 7});
  EXPECT_THAT(Plan(Ssds("s", 2) + Hdds("c", 3)), ElementsAre("g2: c1"));
  EXPECT_FALSE(_limitReached);
}

TEST_F(HybridPlanner, ReportsTheLimitWhenSsdsWereDroppedAndNoGroupHasRoom) {
  SetGroups({7, 7, 7, 7, 7});
  EXPECT_THAT(Plan(Ssds("s", 1) + Hdds("c", 1)), IsEmpty());
  EXPECT_TRUE(_limitReached);
  EXPECT_THAT(Plan(Ssds("s", 1)), IsEmpty());
  EXPECT_FALSE(_limitReached) << "no capacity disk was offered";
}

TEST_F(HybridPlanner, ReportsTheLimitWhenSsdsWereDroppedAndNoGroupIsOfTheKind) {
  SetGroups({1, 1, 1, 1, 1});
  EXPECT_THAT(Plan(Ssds("s", 1) + Hdds("c", 1), true), IsEmpty());
  EXPECT_TRUE(_limitReached);
}

TEST_F(HybridPlanner, ReportsTheLimitWhenEveryGroupIsFull) {
  SetGroups({7, 7});
  _limitReached = false;
  EXPECT_THAT(Plan(Hdds("c", 1)), IsEmpty());
  EXPECT_TRUE(_limitReached);
}

TEST_F(HybridPlanner, ReportsNoLimitWhenNoGroupIsOfTheKind) {
  SetGroups({7});
  EXPECT_THAT(Plan(Hdds("c", 1), true), IsEmpty());
  EXPECT_FALSE(_limitReached);
}

TEST_F(HybridPlanner, ExtendsOnlyGroupsOfTheWantedKind) {
  _kernel.groups = {AGroup("g1", {"x"}).AllFlash(), AGroup("g2", {"y"})};
  _storage->SetDisks(Ssds("g", 2));
  EXPECT_THAT(Plan(Hdds("c", 2), false), ElementsAre("g2: c1 c2"));
  EXPECT_THAT(Plan(Hdds("c", 2), true), ElementsAre("g1: c1 c2"));
}

TEST_F(HybridPlanner, LeavesAGroupAloneThatTheKernelHoldsBack) {
  _kernel.groups = {AGroup("g1", {"x"}).ThirdFlag(), AGroup("g2", {"y", "z"})};
  _storage->SetDisks(Ssds("g", 2));
  EXPECT_THAT(Plan(Hdds("c", 1)), ElementsAre("g2: c1"));
}

TEST_F(HybridPlanner, ExtendsAnUnmountedGroupThatTheKernelDoesNotHoldBack) {
  _kernel.unmountedGroups = {AGroup("g1", {"x"})};
  _storage->SetDisks({Ssd("g1")});
  EXPECT_THAT(Plan(Hdds("c", 1)), ElementsAre("g1: c1"));
}

TEST_F(HybridPlanner, SkipsAGroupWhoseSsdTheInventoryLacks) {
  SetGroups({0, 3});
  _storage->SetDisks({Ssd("g2")});
  EXPECT_THAT(Plan(Hdds("c", 1)), ElementsAre("g2: c1"));
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(HybridPlanner, ExtendsOneSsdOfTwoGroupsOnce) {
  _kernel.groups = {AGroup("g1", {"x"}), AGroup("g1", {"y", "z"})};
  _storage->SetDisks({Ssd("g1")});
  EXPECT_THAT(Plan(Hdds("c", 3)), ElementsAre("g1: c1 c2 c3"));
}

TEST_F(HybridPlanner, AsksForTheInventoryOnceHoweverManyGroups) {
  SetGroups({1, 2, 3});
  Compute(Hdds("c", 9));
  EXPECT_THAT(_timeline.Events(), ElementsAre("GetDiskMappings(true)", "GetStorageDeviceInfo"));
}

TEST_F(HybridPlanner, MeetsAnUnnamedDiskOfTheInventoryOnlyBeforeAMatch) {
  SetGroups({1});
  _storage->SetDisks({Ssd("g1"), AScsiDisk("x").Unnamed()});
  EXPECT_THAT(Plan(Hdds("c", 1)), ElementsAre("g1: c1"));
  _storage->SetDisks({AScsiDisk("x").Unnamed(), Ssd("g1")});
  _mappings = _mappingsBefore;
  _limitReached = true;
  EXPECT_THAT([&] { Compute(Hdds("c", 1)); },
              ThrowsMessage<NotInitializedException>(StrEq("Not initialized")));
  ExpectOutputsUntouched();
  EXPECT_THAT(Plan(Hdds("c", 1), true), IsEmpty()) << "no group of the kind, so none was looked up";
}

// ---- failures

TEST_F(HybridPlanner, PlansAsIfThereWereNoGroupsWhenTheKernelFails) {
  SetGroups({7, 7, 7, 7, 7});
  for (const auto when : {FakeKernel::When::BeforeEffect, FakeKernel::When::AfterEffect}) {
    _logger->Clear();
    _kernel.Fail("GetDiskMappings", HostCtlException("the kernel is away"), when);
    EXPECT_THAT(Plan(Ssds("s", 1) + Hdds("c", 2)), ElementsAre("s1: c1 c2"));
    EXPECT_THAT(_logger->Lines(),
                ElementsAre(LogLineIs(LogLevel::Warning, kernelFailed, "the kernel is away")));
  }
}

TEST_F(HybridPlanner, ExtendsNothingThatAFailingKernelFilledIn) {
  SetGroups({1});
  _kernel.Fail("GetDiskMappings", HostCtlException("half way"), FakeKernel::When::AfterEffect);
  EXPECT_THAT(Plan(Hdds("c", 1)), IsEmpty());
  EXPECT_FALSE(_limitReached);
  EXPECT_THAT(_timeline.Events(), ElementsAre("GetDiskMappings(true)"));
}

TEST_F(HybridPlanner, WarnsOfAFailingKernelFromLevelWarningOn) {
  _kernel.Fail("GetDiskMappings", HostCtlException("x"));
  _logger->SetLevel(LogLevel::Error);
  Compute({});
  EXPECT_THAT(_logger->Lines(), IsEmpty());
  _logger->SetLevel(LogLevel::Warning);
  Compute({});
  EXPECT_EQ(_logger->Lines().size(), 1U);
}

TEST_F(HybridPlanner, LetsOtherExceptionsOfTheKernelThrough) {
  _kernel.Fail("GetDiskMappings", std::runtime_error("not the kernel's"));
  EXPECT_THROW(Compute(Ssds("s", 1)), std::runtime_error);
  ExpectOutputsUntouched();
}

TEST_F(HybridPlanner, ExtendsNothingWithoutAnInventory) {
  SetGroups({1});
  _app.SetObject("storageSystem", nullptr);
  EXPECT_THAT(Plan(Hdds("c", 1)), IsEmpty());
  EXPECT_FALSE(_limitReached);
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Warning, inventoryFailed, noStorageSystem)));
}

TEST_F(HybridPlanner, WithoutAnInventoryStillReportsTheLimitOfSsds) {
  SetGroups({1, 1, 1, 1, 1});
  _app.SetObject("storageSystem", nullptr);
  _limitReached = false;
  EXPECT_THAT(Plan(Ssds("s", 1) + Hdds("c", 1)), IsEmpty());
  EXPECT_TRUE(_limitReached);
}

TEST_F(HybridPlanner, RefusesADiskThatIsNotKnownToBeFlashOrNot) {
  SetGroups({1});
  _timeline.Take();
  EXPECT_THAT(
      [&] {
        Compute({Hdd("c1"), AScsiDisk("x").Ssd(std::nullopt)});
      },
      ThrowsMessage<NotInitializedException>(StrEq("optional value not set")));
  ExpectOutputsUntouched();
  EXPECT_THAT(_timeline.Events(), ElementsAre("GetDiskMappings(true)"))
      << "after the kernel, before the agent";
}

TEST_F(HybridPlanner, RefusesAMissingDisk) {
  EXPECT_THROW(Compute({Hdd("c1"), nullptr}), NotInitializedException);
  ExpectOutputsUntouched();
}

// ---- the manager's own lock

class HybridPlannerLock : public HybridPlanner {
 protected:
  HybridPlannerLock() {
    SetGroups({1});
    _storage->SetObserver([this] { _heldAtTheAgent = _locks.HeldHere(); });
  }

  // Plans on a thread that holds the lock, and checks that it does so still.
  void ComputeLocked(const Disks& candidates) {
    _manager->Lock();
    _timeline.Take();
    try {
      Compute(candidates);
    } catch (...) {
      EXPECT_TRUE(_manager->IsLocked());
      _manager->Unlock();
      throw;
    }
    EXPECT_TRUE(_manager->IsLocked());
    _events = _timeline.Take();
    _manager->Unlock();
  }

  std::vector<std::string> _events;
  std::vector<std::string> _heldAtTheAgent = {"not asked"};
};

TEST_F(HybridPlannerLock, IsLetGoOnlyWhileTheAgentIsAsked) {
  ComputeLocked(Hdds("c", 1));
  EXPECT_THAT(GroupTexts(*_mappings), ElementsAre("g1: c1"));
  EXPECT_THAT(_events, ElementsAre("GetDiskMappings(true)", "release KovaManager", "GetStorageDeviceInfo",
                                   "take KovaManager"));
  EXPECT_THAT(_kernel.Calls().back().locksHeld, ElementsAre(managerLock));
  EXPECT_THAT(_heldAtTheAgent, IsEmpty());
}

TEST_F(HybridPlannerLock, IsNotTouchedWhenItIsNotHeld) {
  _timeline.Take();
  Compute(Hdds("c", 1));
  EXPECT_THAT(_timeline.Events(), ElementsAre("GetDiskMappings(true)", "GetStorageDeviceInfo"));
}

TEST_F(HybridPlannerLock, IsNotTouchedWhenAnotherThreadHoldsIt) {
  std::promise<void> locked;
  std::promise<void> planned;
  std::thread other([&] {
    _manager->Lock();
    locked.set_value();
    planned.get_future().wait();
    _manager->Unlock();
  });
  locked.get_future().wait();
  _timeline.Take();
  Compute(Hdds("c", 1));
  EXPECT_THAT(_timeline.Events(), ElementsAre("GetDiskMappings(true)", "GetStorageDeviceInfo"));
  planned.set_value();
  other.join();
}

TEST_F(HybridPlannerLock, IsKeptWhenNoGroupIsToBeExtended) {
  ComputeLocked({Ssd("s1"), Hdd("c1")});
  EXPECT_THAT(_events, ElementsAre("GetDiskMappings(true)"));
  _kernel.groups.clear();
  ComputeLocked({Hdd("c1")});
  EXPECT_THAT(_events, ElementsAre("GetDiskMappings(true)"));
}

TEST_F(HybridPlannerLock, IsTakenAgainWithoutAnInventory) {
  _app.SetObject("storageSystem", nullptr);
  ComputeLocked(Hdds("c", 1));
  EXPECT_THAT(_events, ElementsAre("GetDiskMappings(true)", "release KovaManager", "take KovaManager"));
}

TEST_F(HybridPlannerLock, IsTakenAgainWhenTheAgentThrows) {
  _storage->SetObserver(
      [] { throw Nox::Fault::DiskIsUSB::Exception(MakeRef<Nox::Fault::DiskIsUSB>("naa.1")); });
  EXPECT_THROW(ComputeLocked(Hdds("c", 1)), Nox::Fault::DiskIsUSB::Exception);
  ExpectOutputsUntouched();
  _app.SetObject("storageSystem", _logger);
  EXPECT_THROW(ComputeLocked(Hdds("c", 1)), Tessa::TypeMismatchException);
}

TEST_F(HybridPlannerLock, IsTakenAgainWhenALookUpMeetsAnUnnamedDisk) {
  _storage->SetDisks({AScsiDisk("x").Unnamed()});
  EXPECT_THROW(ComputeLocked(Hdds("c", 1)), NotInitializedException);
  ExpectOutputsUntouched();
}

TEST_F(HybridPlannerLock, IsKeptWhenACandidateIsRefused) {
  EXPECT_THROW(ComputeLocked({AScsiDisk("x").Ssd(std::nullopt)}), NotInitializedException);
  EXPECT_EQ(_heldAtTheAgent, std::vector<std::string>{"not asked"});
}

}  // namespace
}  // namespace Kovasvc
