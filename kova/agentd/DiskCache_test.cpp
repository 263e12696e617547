// The manager's cache of the kernel's records.

#include "kova/agentd/KovaManagerImpl.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "kova/agentd/include/HostCtlException.h"
#include "nox/Kova.h"
#include "tests/support/Builders.h"
#include "tests/support/Matchers.h"
#include "tests/support/PluginFixture.h"

namespace Kovasvc {
namespace {

using HostCtl::Lib::HostCtlException;
using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;
using TestSupport::ARecord;
using TestSupport::AScsiDisk;
using TestSupport::FakeKernel;
using TestSupport::LogLineIs;
using TestSupport::ReadAnswer;
using Results = Orbis::DataArray<Nox::Kova::Host::DiskResult>;

constexpr const char* stillValid = "Disk cache is valid, no need to refresh.";
constexpr const char* refreshFailed = "Failed to refresh KOVA disk cache %1";

class ManagersDiskCache : public TestSupport::PluginFixture {
 protected:
  // How many disks the manager's cache holds, as a query of all disks sees it.
  std::size_t CachedDisks(KovaManagerImpl& manager) {
    KovaManagerImpl::Texts names;
    std::string fault;
    std::string result;
    manager.QueryDisksForKova(names, fault, result);
    return ReadAnswer<Results>(result)->Size();
  }
};

TEST_F(ManagersDiskCache, RefreshesTheKernelsViewAndThenReadsEveryDiskUnderItsLock) {
  const auto manager = MakeManager();
  manager->RefreshKovaDiskCache();
  EXPECT_THAT(_timeline.Events(), ElementsAre("take KovaManager.diskCache", "RefreshKovaInfo()",
                                              "QueryDisks([], true)", "release KovaManager.diskCache"));
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(ManagersDiskCache, IsNotRefreshedASecondTime) {
  const auto manager = MakeManager();
  manager->RefreshKovaDiskCache();
  _kernel.ForgetCalls();
  manager->RefreshKovaDiskCache();
  EXPECT_THAT(_kernel.Calls(), IsEmpty());
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, stillValid)));
}

TEST_F(ManagersDiskCache, AsksTheKernelAgainAfterAnInvalidation) {
  const auto manager = MakeManager();
  manager->RefreshKovaDiskCache();
  _timeline.Take();
  manager->InvalidateKovaDiskCache();
  EXPECT_THAT(_timeline.Take(), ElementsAre("take KovaManager.diskCache", "release KovaManager.diskCache"));
  manager->RefreshKovaDiskCache();
  EXPECT_THAT(_timeline.Events(), ElementsAre("take KovaManager.diskCache", "RefreshKovaInfo()",
                                              "QueryDisks([], true)", "release KovaManager.diskCache"));
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(ManagersDiskCache, IsInvalidatedUnderItsLock) {
  const auto manager = MakeManager();
  _locks.SetTakeObserver([&](const std::string&) {
    _locks.SetTakeObserver({});
    manager->RefreshKovaDiskCache();  // as another thread could, just before
  });
  manager->InvalidateKovaDiskCache();
  _kernel.ForgetCalls();
  manager->RefreshKovaDiskCache();
  EXPECT_FALSE(_kernel.Calls().empty());
}

TEST_F(ManagersDiskCache, ForgetsDisksThatHaveGoneSinceTheLastRefresh) {
  SetHost({AScsiDisk("naa.1"), AScsiDisk("naa.2")}, {ARecord("naa.1"), ARecord("naa.2")});
  const auto manager = MakeManager();
  manager->RefreshKovaDiskCache();
  _kernel.records = {ARecord("naa.2")};
  EXPECT_EQ(CachedDisks(*manager), 2U) << "still the records of before";
  manager->InvalidateKovaDiskCache();
  EXPECT_EQ(CachedDisks(*manager), 1U);
}

// Shows the records as they are in memory; a query would refresh them first.
class OpenManager final : public KovaManagerImpl {
 public:
  using KovaManagerImpl::GetDiskCache;
  using KovaManagerImpl::KovaManagerImpl;
  std::vector<HostCtl::Kova::DiskResult> Records() { return DiskCache::Locked(GetDiskCache()).Records(); }
};

TEST_F(ManagersDiskCache, IsNotLockedAgainForACallerThatHoldsTheLock) {
  Ref<Tessa::Service::Logger> logger = _logger;
  const auto manager = MakeRef<OpenManager>(logger);
  DiskCache::Locked cache(manager->GetDiskCache());
  _timeline.Take();
  manager->RefreshKovaDiskCacheLocked(cache);
  EXPECT_THAT(_timeline.Events(), ElementsAre("RefreshKovaInfo()", "QueryDisks([], true)"));
}

TEST_F(ManagersDiskCache, KeepsItsRecordsInMemoryWhenItIsInvalidated) {
  _kernel.records = {ARecord("naa.1")};
  Ref<Tessa::Service::Logger> logger = _logger;
  const auto manager = MakeRef<OpenManager>(logger);
  EXPECT_THAT(manager->Records(), IsEmpty());
  manager->RefreshKovaDiskCache();
  manager->InvalidateKovaDiskCache();
  EXPECT_THAT(manager->Records(), ElementsAre(HostCtl::Kova::DiskResult(ARecord("naa.1"))));
}

struct FailingRefresh {
  const char* operation;
  FakeKernel::When when;
};

class FailedRefresh : public ManagersDiskCache, public testing::WithParamInterface<FailingRefresh> {};

INSTANTIATE_TEST_SUITE_P(Kernel, FailedRefresh,
                         testing::Values(FailingRefresh{"RefreshKovaInfo", FakeKernel::When::BeforeEffect},
                                         FailingRefresh{"QueryDisks", FakeKernel::When::BeforeEffect},
                                         FailingRefresh{"QueryDisks", FakeKernel::When::AfterEffect}),
                         [](const auto& test) {
                           return std::string(test.param.operation) +
                                  (test.param.when == FakeKernel::When::AfterEffect ? "HalfWay" : "");
                         });

TEST_P(FailedRefresh, IsAWarningWithTheKernelsWords) {
  _kernel.Fail(GetParam().operation, HostCtlException("the kernel is away", "detail"), GetParam().when);
  const auto manager = MakeManager();
  EXPECT_NO_THROW(manager->RefreshKovaDiskCache());
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Warning, refreshFailed, "the kernel is away")));
}

TEST_P(FailedRefresh, LeavesTheCacheEmpty) {
  SetHost({AScsiDisk("naa.1")}, {ARecord("naa.1")});
  const auto manager = MakeManager();
  manager->RefreshKovaDiskCache();
  manager->InvalidateKovaDiskCache();
  _kernel.Fail(GetParam().operation, HostCtlException("the kernel is away"), GetParam().when);
  EXPECT_EQ(CachedDisks(*manager), 0U);
}

TEST_P(FailedRefresh, LeavesNoRecordInMemoryWhateverWasThrown) {
  _kernel.records = {ARecord("naa.1")};
  Ref<Tessa::Service::Logger> logger = _logger;
  const auto manager = MakeRef<OpenManager>(logger);
  manager->RefreshKovaDiskCache();
  manager->InvalidateKovaDiskCache();
  _kernel.Fail(GetParam().operation, HostCtlException("the kernel is away"), GetParam().when);
  manager->RefreshKovaDiskCache();
  EXPECT_THAT(manager->Records(), IsEmpty());
  _kernel.Fail(GetParam().operation, std::runtime_error("not the kernel's"), GetParam().when);
  EXPECT_THROW(manager->RefreshKovaDiskCache(), std::runtime_error);
  EXPECT_THAT(manager->Records(), IsEmpty());
}

TEST_P(FailedRefresh, IsTriedAgainByTheNextOne) {
  SetHost({AScsiDisk("naa.1")}, {ARecord("naa.1")});
  _kernel.Fail(GetParam().operation, HostCtlException("the kernel is away"), GetParam().when);
  const auto manager = MakeManager();
  manager->RefreshKovaDiskCache();
  _kernel.Heal(GetParam().operation);
  EXPECT_EQ(CachedDisks(*manager), 1U);
}

TEST_P(FailedRefresh, IsHandledTheSameForEveryExceptionOfTheKernel) {
  _kernel.Fail(GetParam().operation, HostCtl::Lib::KovaExceptionIncompatibleDiskMapping("mixed"),
               GetParam().when);
  const auto manager = MakeManager();
  EXPECT_NO_THROW(manager->RefreshKovaDiskCache());
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Warning, refreshFailed, "mixed")));
}

TEST_P(FailedRefresh, ByAnyOtherExceptionPassesWithTheLockReleasedAndNoLine) {
  _kernel.Fail(GetParam().operation, std::runtime_error("not the kernel's"), GetParam().when);
  const auto manager = MakeManager();
  EXPECT_THROW(manager->RefreshKovaDiskCache(), std::runtime_error);
  EXPECT_THAT(_locks.HeldHere(), IsEmpty());
  EXPECT_EQ(_timeline.Events().back(), "release KovaManager.diskCache");
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_P(FailedRefresh, ByAnyOtherExceptionLeavesAnInvalidCacheToo) {
  SetHost({AScsiDisk("naa.1")}, {ARecord("naa.1")});
  const auto manager = MakeManager();
  _kernel.Fail(GetParam().operation, std::runtime_error("not the kernel's"), GetParam().when);
  EXPECT_THROW(manager->RefreshKovaDiskCache(), std::runtime_error);
  _kernel.Heal(GetParam().operation);
  _kernel.ForgetCalls();
  EXPECT_EQ(CachedDisks(*manager), 1U);
  EXPECT_THAT(_kernel.CallTexts(), ElementsAre("RefreshKovaInfo()", "QueryDisks([], true)"));
}

TEST_F(ManagersDiskCache, ThatAFailedRefreshEmptiedIsNotTakenForValid) {
  _kernel.Fail("QueryDisks", HostCtlException("the kernel is away"));
  const auto manager = MakeManager();
  manager->RefreshKovaDiskCache();
  manager->RefreshKovaDiskCache();
  EXPECT_THAT(_kernel.Calls(), SizeIs(4));
  EXPECT_THAT(_logger->Lines(LogLevel::Verbose), IsEmpty());
}

TEST_F(ManagersDiskCache, StaysSoundWhileEightThreadsQueryAndInvalidate) {
  SetHost({AScsiDisk("naa.1"), AScsiDisk("naa.2").Ssd()}, {ARecord("naa.1"), ARecord("naa.2")});
  _logger->SetLevel(LogLevel::Info);
  const auto manager = MakeManager();
  _kernel.onCall = [](const TestSupport::KernelCall& call) {
    EXPECT_THAT(call.locksHeld, ElementsAre(TestSupport::diskCacheLock));
  };
  std::vector<std::thread> threads;
  for (int thread = 0; thread < 8; ++thread) {
    threads.emplace_back([this, &manager, thread] {
      for (int round = 0; round < 50; ++round) {
        if (thread % 4 == 3) {
          manager->InvalidateKovaDiskCache();
        } else {
          EXPECT_EQ(CachedDisks(*manager), 2U);
        }
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

#ifndef NDEBUG
TEST(DiskCacheDeath, IsNotMadeWithoutALock) {
  EXPECT_DEATH(DiskCache(nullptr), "_lock");
}
#endif

}  // namespace
}  // namespace Kovasvc
