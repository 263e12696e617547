// Whoever reads the disk cache does so under its lock: what another thread changes just before the lock is
// taken is seen, and what it changes once the lock is free is not.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <ostream>
#include <string>
#include <utility>
#include <vector>

#include "tests/support/InitializeFixture.h"
#include "tests/support/SpyManager.h"

namespace Kovasvc {
namespace {

using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskResult;
using Nox::Kova::Host::DiskMapResult;
using Tessa::MakeRef;
using Tessa::Ref;
using TestSupport::AnInventory;
using TestSupport::ARecord;
using TestSupport::Hdd;
using TestSupport::SpyManager;
using TestSupport::Ssd;

// An operation that reads the cache, and a change that shows in what it says.
struct Reader {
  const char* title;
  int lock;  // which taking of the cache lock is the one to read under, from 1
  DiskResult changed;
  std::string (*read)(SpyManager& manager);
  std::string before;
  std::string after;
};
void PrintTo(const Reader& reader, std::ostream* out) {
  *out << reader.title;
}

std::string Listed(const std::vector<std::string>& texts) {
  return testing::PrintToString(texts);
}

std::string CheckOf(SpyManager& manager) {
  auto result = MakeRef<DiskMapResult>();
  manager.ValidateDiskMapping(TestSupport::AMapping(Ssd("s1"), {Hdd("a")}), result);
  return result->GetError() ? result->GetError()->GetType().name : "fine";
}

std::string UnmountedGroups(SpyManager& manager) {
  auto mappings = TestSupport::Mappings({});
  manager.ComputeNotMountedDiskMappings(AnInventory({Ssd("s1")}).Get(), mappings);
  return Listed(TestSupport::GroupTexts(*mappings));
}

std::string AllFlashGroups(SpyManager& manager) {
  Ref<Orbis::DataArray<KovaManagerImpl::Mapping>> mappings;
  std::vector<std::string> taken;
  bool limitReached = false;
  manager.ComputeAllFlashDiskMappings(AnInventory({Ssd("s1"), Hdd("a")}).Get(), mappings, taken,
                                      limitReached);
  return Listed(TestSupport::GroupTexts(*mappings));
}

std::string HowAGroupIsMade(SpyManager& manager) {
  auto result = MakeRef<DiskMapResult>();
  manager.InitializeMapping(TestSupport::AMapping(Ssd("s1"), {Hdd("a")}), "", 1, 0, result);
  return manager.calls.back().substr(0, manager.calls.back().find('('));
}

std::string PlanOfAnAddition(SpyManager& manager) {
  std::string fault;
  std::string result;
  manager.initializeDisksInt = [](auto&, auto&) {};
  manager.AddDisks(TestSupport::SoapTexts(TestSupport::Disks{Ssd("s1"), Hdd("a")}), "", fault, result);
  return manager.calls.back();
}

std::string StateInAQuery(SpyManager& manager) {
  std::vector<std::string> names = {"a"};
  std::string fault;
  std::string result;
  manager.QueryDisksForKova(names, fault, result);
  return (*TestSupport::ReadAnswer<KovaManagerImpl::DiskResults>(result))[0]->GetState();
}

const Reader readers[] = {
    {"TheCheckOfAGroup", 1, ARecord("a").Ineligible(DiskReason::Usb), &CheckOf, "fine", "DiskIsUSB"},
    {"TheSearchForUnmountedGroups", 1, ARecord("s1").Ssd().Reason(DiskReason::GroupNotMounted),
     &UnmountedGroups, "{}", R"({ "s1: b" })"},
    {"ThePlannerOfAllFlashGroups", 1, ARecord("a").CapacityFlash(), &AllFlashGroups, "{}", R"({ "s1: a" })"},
    {"TheLookUpOfTheSsd", 2, ARecord("s1").Ssd().Reason(DiskReason::GroupNotMounted), &HowAGroupIsMade,
     "FormatDiskMapping", "RestampDiskMapping"},
    {"ThePlannerOfAnAddition", 3, ARecord("a").InUse("uuid"), &PlanOfAnAddition,
     "InitializeDisksInt([s1: a], )", "InitializeDisksInt([], )"},
    {"AQuery", 1, ARecord("a").InUse("uuid"), &StateInAQuery, "eligible", "inUse"},
};

class CacheReader : public TestSupport::InitializeFixture, public testing::WithParamInterface<Reader> {
 protected:
  CacheReader() : _spy(UseManager<SpyManager>()) {
    _kernel.unmountedGroups = {TestSupport::AGroup("s1", {"b"})};
    _manager->RefreshKovaDiskCache();
  }

  // What an observer of the cache lock does at the reader's turn: the disk changes, and the cache learns of
  // it.
  std::function<void(const std::string&)> ChangeInTurn(std::function<void()> stop) {
    return [this, stop = std::move(stop)](const std::string& lock) {
      if (lock == TestSupport::diskCacheLock && ++_turn == GetParam().lock) {
        stop();
        SetRecord(GetParam().changed);
        _manager->InvalidateKovaDiskCache();
        _manager->RefreshKovaDiskCache();
      }
    };
  }

  const Ref<SpyManager> _spy;
  int _turn = 0;
};

INSTANTIATE_TEST_SUITE_P(Is, CacheReader, testing::ValuesIn(readers),
                         [](const auto& test) { return std::string(test.param.title); });

TEST_P(CacheReader, ThatSeesWhatChangedJustBeforeItTakesTheLock) {
  _locks.SetTakeObserver(ChangeInTurn([this] { _locks.SetTakeObserver({}); }));
  EXPECT_EQ(GetParam().read(*_spy), GetParam().after);
  EXPECT_GE(_turn, GetParam().lock) << "nothing has changed";
}

TEST_P(CacheReader, ThatDoesNotSeeWhatChangesOnceItsLockIsFree) {
  _locks.SetReleaseObserver(ChangeInTurn([this] { _locks.SetReleaseObserver({}); }));
  EXPECT_EQ(GetParam().read(*_spy), GetParam().before);
  EXPECT_GE(_turn, GetParam().lock) << "nothing has changed";
}

}  // namespace
}  // namespace Kovasvc
