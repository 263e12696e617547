#include "kova/agentd/KovaManagerImpl.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <vector>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/ProviderFactory.h"
#include "tests/support/Builders.h"
#include "tests/support/PluginFixture.h"

namespace Kovasvc {
namespace {

using HostCtl::Lib::HostCtlException;
using Tessa::MakeRef;
using Tessa::Ref;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;
using TestSupport::AGroup;

using ManagerLife = TestSupport::PluginFixture;
using ManagerGroups = TestSupport::PluginFixture;

TEST_F(ManagerLife, MakesItsOwnLockThenTheProviderThenTheTwoLocks) {
  Ref<Tessa::Service::Logger> logger = _logger;
  const auto manager = MakeRef<KovaManagerImpl>(logger);
  EXPECT_THAT(_timeline.Events(), ElementsAre("make KovaManager", "GetKovaInfo", "make KovaManager.operation",
                                              "make KovaManager.diskCache"));
}

// Notes with each event whether there is a helper, as its shared logger tells.
class HelperLife : public ManagerLife {
 protected:
  HelperLife() {
    _timeline.SetObserver([this](const std::string& event) {
      _events.push_back(event + (Util::KovaUtil::_logger ? ", with a helper" : ""));
    });
  }
  ~HelperLife() override { _timeline.SetObserver({}); }

  std::vector<std::string> _events;
};

TEST_F(HelperLife, BeginsWhenAllElseIsMade) {
  Ref<Tessa::Service::Logger> logger = _logger;
  const auto manager = MakeRef<KovaManagerImpl>(logger);
  EXPECT_EQ(Util::KovaUtil::_logger, logger);
  EXPECT_THAT(_events, ElementsAre("make KovaManager", "GetKovaInfo", "make KovaManager.operation",
                                   "make KovaManager.diskCache"));
}

TEST_F(HelperLife, EndsBehindTheProviderAndTheLocks) {
  auto manager = MakeManager();
  _events.clear();
  manager.Reset();
  EXPECT_THAT(_events,
              ElementsAre("delete provider, with a helper", "destroy KovaManager.diskCache, with a helper",
                          "destroy KovaManager.operation, with a helper", "destroy KovaManager"));
}

TEST_F(ManagerLife, AsksTheKernelNothingWhenItIsMade) {
  const auto manager = MakeManager();
  EXPECT_THAT(_kernel.Calls(), IsEmpty());
}

TEST_F(ManagerLife, RefersToItsLoggerAndLeavesTheCallersReferenceAlone) {
  Ref<Tessa::Service::Logger> logger = MakeRef<TestSupport::RecordingLogger>();
  const auto manager = MakeRef<KovaManagerImpl>(logger);
  EXPECT_EQ(logger->GetRefCount(), 3) << "the caller, the manager and its helper";
}

TEST_F(ManagerLife, GoesDownProviderFirstThenLocksThenHelperAndLogger) {
  auto own = MakeRef<TestSupport::RecordingLogger>();
  own->SetEndObserver([this](const std::string&) {
    EXPECT_FALSE(Util::KovaUtil::_logger);
    _timeline.Note("destroy logger");
  });
  Ref<Tessa::Service::Logger> logger = own;
  auto manager = MakeRef<KovaManagerImpl>(logger);
  own.Reset();
  logger.Reset();
  _timeline.Take();
  manager.Reset();
  EXPECT_THAT(_timeline.Events(),
              ElementsAre("delete provider", "destroy KovaManager.diskCache", "destroy KovaManager.operation",
                          "destroy logger", "destroy KovaManager"));
}

TEST_F(ManagerLife, DeletesTheProviderExactlyOnce) {
  auto manager = MakeManager();
  manager.Reset();
  EXPECT_THAT(_timeline.Events(), Contains("delete provider").Times(1));
}

TEST_F(ManagerLife, UnwindsWhatWasBuiltWhenTheDiskCacheLockCannotBeMade) {
  _locks.SetFailure(TestSupport::diskCacheLock, [] { throw std::runtime_error("no more locks"); });
  Ref<Tessa::Service::Logger> logger = _logger;
  EXPECT_THROW(MakeRef<KovaManagerImpl>(logger), std::runtime_error);
  EXPECT_THAT(_timeline.Events(),
              ElementsAre("make KovaManager", "GetKovaInfo", "make KovaManager.operation",
                          "destroy KovaManager.operation", "delete provider", "destroy KovaManager"));
}

TEST_F(ManagerLife, UnwindsTheProviderWhenTheOperationLockCannotBeMade) {
  _locks.SetFailure(TestSupport::operationLock, [] { throw std::runtime_error("no more locks"); });
  Ref<Tessa::Service::Logger> logger = _logger;
  EXPECT_THROW(MakeRef<KovaManagerImpl>(logger), std::runtime_error);
  EXPECT_THAT(_timeline.Events(),
              ElementsAre("make KovaManager", "GetKovaInfo", "delete provider", "destroy KovaManager"));
  EXPECT_FALSE(Util::KovaUtil::_logger);
}

TEST_F(ManagerLife, MakesNoLockOfItsOwnWithoutAProvider) {
  OtxCtl::Kova::SetProviderFactory({});
  Ref<Tessa::Service::Logger> logger = _logger;
  EXPECT_THROW(MakeRef<KovaManagerImpl>(logger), HostCtlException);
  EXPECT_THAT(_timeline.Events(), ElementsAre("make KovaManager", "destroy KovaManager"));
}

TEST_F(ManagerLife, AsksForNoProviderWithoutALockOfItsBase) {
  _locks.SetFailure("KovaManager", [] { throw std::runtime_error("no more locks"); });
  Ref<Tessa::Service::Logger> logger = _logger;
  EXPECT_THROW(MakeRef<KovaManagerImpl>(logger), std::runtime_error);
  EXPECT_THAT(_timeline.Events(), IsEmpty());
}

TEST_F(ManagerLife, IsALockableObjectWithALockOfItsOwn) {
  const auto manager = MakeManager();
  manager->Lock();
  EXPECT_TRUE(manager->IsLocked());
  EXPECT_THAT(_locks.HeldHere(), ElementsAre("KovaManager"));
  manager->RefreshKovaDiskCache();
  manager->Unlock();
  EXPECT_FALSE(manager->IsLocked());
}

TEST_F(ManagerGroups, ReadsTheMountedGroupsBehindWhatTheListHoldsWithoutLockOrLine) {
  _kernel.groups = {AGroup("naa.1", {"naa.2"})};
  _kernel.unmountedGroups = {AGroup("naa.8", {"naa.9"})};
  const auto manager = MakeManager();
  std::vector<HostCtl::Kova::DiskMapping> mappings = {AGroup("naa.before", {})};
  manager->GetKovaDiskMapping(mappings);
  ASSERT_THAT(mappings, SizeIs(2));
  EXPECT_EQ(mappings[1].ssd.deviceName, "naa.1");
  EXPECT_THAT(_timeline.Events(), ElementsAre("GetDiskMappings(false)"));
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(ManagerGroups, LetsTheProvidersExceptionsPassWhenReadingGroups) {
  _kernel.Fail("GetDiskMappings", HostCtl::Lib::KovaStorageException("busy", "naa.1"));
  const auto manager = MakeManager();
  std::vector<HostCtl::Kova::DiskMapping> mappings;
  EXPECT_THROW(manager->GetKovaDiskMapping(mappings), HostCtl::Lib::KovaStorageException);
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

}  // namespace
}  // namespace Kovasvc
