#include "kova/agentd/util/KovaUtil.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "tests/support/Builders.h"
#include "tests/support/Matchers.h"
#include "tests/support/PluginFixture.h"

namespace Kovasvc::Util {
namespace {

using Nox::Host::ScsiDisk;
using Nox::Host::ScsiLun;
using Orbis::DataArray;
using Orbis::Fault::SystemError;
using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::Logger;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;
using TestSupport::AScsiDisk;
using TestSupport::CarriesSystemError;
using TestSupport::Elements;
using TestSupport::RecordingLogger;

using UtilTest = TestSupport::PluginFixture;

// ---- the shared logger

TEST_F(UtilTest, KeepsTheLoggerForAll) {
  Ref<Logger> logger = _logger;
  const auto util = MakeRef<KovaUtil>(logger);
  EXPECT_EQ(KovaUtil::_logger, logger);
}

TEST_F(UtilTest, ReplacesAndReleasesTheLoggerOfTheOneBefore) {
  Ref<Logger> first = MakeRef<RecordingLogger>();
  Ref<Logger> second = MakeRef<RecordingLogger>();
  const auto one = MakeRef<KovaUtil>(first);
  const auto two = MakeRef<KovaUtil>(second);
  EXPECT_EQ(KovaUtil::_logger, second);
  EXPECT_EQ(first->GetRefCount(), 1);
}

TEST_F(UtilTest, DestroyingEitherOfTwoTakesTheLoggerFromBoth) {
  Ref<Logger> first = MakeRef<RecordingLogger>();
  Ref<Logger> second = MakeRef<RecordingLogger>();
  auto one = MakeRef<KovaUtil>(first);
  const auto two = MakeRef<KovaUtil>(second);
  one.Reset();
  EXPECT_FALSE(KovaUtil::_logger);
  EXPECT_EQ(second->GetRefCount(), 1);
}

TEST_F(UtilTest, LeavesTheSessionAloneWhenDestroyed) {
  Ref<Logger> logger = _logger;
  auto util = MakeRef<KovaUtil>(logger);
  Ref<Tessa::Session> session;
  KovaUtil::GetSession(session);
  util.Reset();
  EXPECT_EQ(Ref<Tessa::Session>(KovaUtil::_session), session);
}

// ---- the session

using Session = UtilTest;

TEST_F(Session, IsRegisteredFirstAndThenAuthorizedAsTheBuiltInUser) {
  Ref<Tessa::Session> session;
  KovaUtil::GetSession(session);
  ASSERT_TRUE(session);
  EXPECT_THAT(_timeline.Events(), ElementsAre("make KovaSession", "RegisterSession", "AddConnection"));
  EXPECT_THAT(_app.Sessions(), ElementsAre(session));
  ASSERT_THAT(_authorization->Connections(), SizeIs(1));
  const auto& connection = _authorization->Connections().front();
  EXPECT_EQ(connection.session, session);
  EXPECT_EQ(connection.user, "System");
  EXPECT_FALSE(connection.hasToken);
  EXPECT_TRUE(connection.system);
}

TEST_F(Session, IsTheSameOneTheSecondTimeWithoutAskingAnybody) {
  Ref<Tessa::Session> first;
  KovaUtil::GetSession(first);
  _timeline.Take();
  Ref<Tessa::Session> second;
  KovaUtil::GetSession(second);
  EXPECT_EQ(first, second);
  EXPECT_THAT(_timeline.Events(), IsEmpty());
}

// Counts how often it is handed out.
class CountingAuthorization final : public Tessa::Authorize::AuthorizeManager {
 public:
  void IncRef() const override {
    ++_references;
    AuthorizeManager::IncRef();
  }
  void AddConnection(const Ref<Tessa::Session>&, const std::string&,
                     const Ref<Tessa::System::AuthTokenHelper>&, bool) override {
    ++connections;
  }
  int TakeReferences() const { return std::exchange(_references, 0); }

  int connections = 0;

 private:
  mutable int _references = 0;
};

TEST_F(Session, AsksForTheAuthorizationManagerOnceAndNeverAgain) {
  const auto authorization = MakeRef<CountingAuthorization>();
  Tessa::Authorize::AuthorizeManager::SetInstance(authorization);
  authorization->TakeReferences();
  EXPECT_TRUE(Tessa::Authorize::AuthorizeManager::GetInstance());
  const int once = authorization->TakeReferences();
  Ref<Tessa::Session> session;
  KovaUtil::GetSession(session);
  EXPECT_EQ(authorization->TakeReferences(), once);
  EXPECT_EQ(authorization->connections, 1);
  KovaUtil::GetSession(session);
  EXPECT_EQ(authorization->TakeReferences(), 0);
}

TEST_F(Session, IsNeverClosed) {
  Ref<Logger> logger = _logger;
  auto util = MakeRef<KovaUtil>(logger);
  Ref<Tessa::Session> session;
  KovaUtil::GetSession(session);
  KovaUtil::GetSession(session);
  EXPECT_FALSE(session->IsClosed());
  util.Reset();
  EXPECT_FALSE(session->IsClosed());
  KovaUtil::_session.Reset();
  EXPECT_FALSE(session->IsClosed());
}

TEST_F(Session, IsKeptByThePluginAlone) {
  Ref<Tessa::Session> session;
  KovaUtil::GetSession(session);
  EXPECT_EQ(session->GetRefCount(), 4) << "the plug-in, the registry, the authorization and the caller";
}

TEST_F(Session, ReplacesWhatTheCallersReferenceHeld) {
  const Ref<Tessa::Session> old = MakeRef<SessionImpl>();
  Ref<Tessa::Session> session = old;
  KovaUtil::GetSession(session);
  EXPECT_NE(session, old);
  EXPECT_EQ(old->GetRefCount(), 1);
}

TEST_F(Session, IsALockableObjectAndASessionWithOneCount) {
  const auto session = MakeRef<SessionImpl>();
  EXPECT_EQ(session->GetRefCount(), 1);
  session->Lock();
  EXPECT_THAT(_locks.HeldHere(), ElementsAre("KovaSession"));
  session->Unlock();
  session->SetUserBinding("System");
  EXPECT_TRUE(session->IsAuthenticated());
}

TEST_F(Session, IsRefusedWithoutAnAuthorizationManager) {
  Tessa::Authorize::AuthorizeManager::SetInstance(nullptr);
  const Ref<Tessa::Session> old = MakeRef<SessionImpl>();
  Ref<Tessa::Session> session = old;
  EXPECT_THAT(
      [&] { KovaUtil::GetSession(session); },
      testing::Throws<SystemError::Exception>(CarriesSystemError("Failed to get authorized instance.")));
  EXPECT_EQ(session, old);
  EXPECT_FALSE(KovaUtil::_session);
  ASSERT_THAT(_app.Sessions(), SizeIs(1)) << "it was registered before";
  EXPECT_EQ(_app.Sessions().front()->GetRefCount(), 1);
}

TEST_F(Session, IsMadeAgainAfterAFailure) {
  _authorization->SetFailure([] { throw std::runtime_error("not now"); });
  Ref<Tessa::Session> session;
  EXPECT_THROW(KovaUtil::GetSession(session), std::runtime_error);
  EXPECT_FALSE(session);
  EXPECT_FALSE(KovaUtil::_session);
  _authorization->SetFailure({});
  KovaUtil::GetSession(session);
  EXPECT_TRUE(session);
}

TEST_F(Session, IsRefusedWithoutAnApplication) {
  Tessa::Service::SetApp(nullptr);
  Ref<Tessa::Session> session;
  EXPECT_THAT(
      [&] { KovaUtil::GetSession(session); },
      testing::Throws<SystemError::Exception>(CarriesSystemError("Failed to get application instance.")));
  EXPECT_FALSE(KovaUtil::_session);
  Tessa::Service::SetApp(&_app);
}

// Takes the authorization manager away when a session is registered.
class ClosingApp final : public Tessa::Service::App {
 public:
  Ref<Tessa::Object> LookupObject(const std::string&) const override { return {}; }
  void RegisterSession(const Ref<Tessa::Session>&) override {
    Tessa::Authorize::AuthorizeManager::SetInstance(nullptr);
  }
};

TEST_F(Session, AsksForTheAuthorizationManagerOnceTheSessionIsRegistered) {
  ClosingApp app;
  Tessa::Service::SetApp(&app);
  Ref<Tessa::Session> session;
  EXPECT_THROW(KovaUtil::GetSession(session), SystemError::Exception);
  Tessa::Service::SetApp(&_app);
}

// ---- the inventory

class Inventory : public UtilTest {
 protected:
  // What the test compares with when the reference must not have been touched.
  const Ref<DataArray<ScsiDisk>> _old = MakeRef<DataArray<ScsiDisk>>();
  Ref<DataArray<ScsiDisk>> _disks = _old;
};

TEST_F(Inventory, HoldsTheAgentsOwnDisksInItsOrder) {
  const Ref<ScsiDisk> first = AScsiDisk("naa.2");
  const Ref<ScsiDisk> second = AScsiDisk("naa.1");
  _storage->SetDisks({first, second, first});
  KovaUtil::GetDisksFromAgentd(_disks);
  EXPECT_THAT(Elements(*_disks), ElementsAre(first.Get(), second.Get(), first.Get()));
  EXPECT_NE(_disks, _old);
  EXPECT_EQ(_old->GetRefCount(), 1) << "what the caller held is released";
}

TEST_F(Inventory, IsReadAnewEachTime) {
  KovaUtil::GetDisksFromAgentd(_disks);
  KovaUtil::GetDisksFromAgentd(_disks);
  EXPECT_THAT(_timeline.Events(), ElementsAre("GetStorageDeviceInfo", "GetStorageDeviceInfo"));
}

TEST_F(Inventory, PassesOverNullsAndUnitsThatAreNoDisks) {
  const Ref<ScsiDisk> disk = AScsiDisk("naa.1");
  _storage->SetUnits({MakeRef<ScsiLun>(), nullptr, disk, MakeRef<ScsiLun>()});
  KovaUtil::GetDisksFromAgentd(_disks);
  EXPECT_THAT(Elements(*_disks), ElementsAre(disk.Get()));
}

TEST_F(Inventory, IsEmptyWhenNoUnitIsADisk) {
  _storage->SetUnits({MakeRef<ScsiLun>(), MakeRef<ScsiLun>()});
  KovaUtil::GetDisksFromAgentd(_disks);
  EXPECT_TRUE(_disks->IsEmpty());
  EXPECT_NE(_disks, _old);
}

TEST_F(Inventory, IsEmptyWithoutInformationOrWithoutAList) {
  for (const auto& info : {Ref<Nox::Host::StorageDeviceInfo>(), MakeRef<Nox::Host::StorageDeviceInfo>()}) {
    _storage->SetInfo(info);
    _disks = _old;
    KovaUtil::GetDisksFromAgentd(_disks);
    EXPECT_NE(_disks, _old);
    EXPECT_TRUE(_disks->IsEmpty());
  }
}

TEST_F(Inventory, CannotBeReadWithoutAStorageSystem) {
  _app.SetObject("storageSystem", nullptr);
  EXPECT_THAT(
      [&] { KovaUtil::GetDisksFromAgentd(_disks); },
      testing::Throws<SystemError::Exception>(CarriesSystemError("Failed to lookup STORAGE_SYSTEM_MO.")));
  EXPECT_EQ(_disks, _old);
}

TEST_F(Inventory, CannotBeReadFromAnObjectOfAnotherType) {
  _app.SetObject("storageSystem", MakeRef<RecordingLogger>());
  EXPECT_THROW(KovaUtil::GetDisksFromAgentd(_disks), Tessa::TypeMismatchException);
  EXPECT_EQ(_disks, _old);
}

TEST_F(Inventory, StaysAsItWasWhenTheStorageSystemFails) {
  _storage->SetObserver([] { throw std::runtime_error("not now"); });
  EXPECT_THROW(KovaUtil::GetDisksFromAgentd(_disks), std::runtime_error);
  EXPECT_EQ(_disks, _old);
  EXPECT_EQ(_storage->GetRefCount(), 2) << "the registry and the test";
}

TEST_F(Inventory, LeavesNoReferencesBehind) {
  const Ref<ScsiDisk> disk = AScsiDisk("naa.1");
  _storage->SetDisks({disk});
  KovaUtil::GetDisksFromAgentd(_disks);
  EXPECT_EQ(disk->GetRefCount(), 3) << "the agent, the array and the test";
  EXPECT_EQ(_storage->GetRefCount(), 2);
  EXPECT_EQ(_disks->GetRefCount(), 1);
}

TEST_F(Inventory, TakesNoLockAndWritesNoLine) {
  KovaUtil::GetDisksFromAgentd(_disks);
  EXPECT_THAT(_timeline.Events(), ElementsAre("GetStorageDeviceInfo"));
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(Inventory, OrNoneIsTheHostsDisks) {
  _storage->SetDisks({AScsiDisk("naa.1")});
  EXPECT_THAT(Elements(*InventoryOrNone(*_logger)), SizeIs(1));
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(Inventory, OrNoneIsAWarningAndNullWithoutAStorageSystem) {
  _app.SetObject("storageSystem", nullptr);
  EXPECT_FALSE(InventoryOrNone(*_logger));
  EXPECT_THAT(_logger->Lines(), ElementsAre(TestSupport::LogLineIs(Tessa::Service::LogLevel::Warning,
                                                                   "GetDisksFromAgentd error %1",
                                                                   "Failed to lookup STORAGE_SYSTEM_MO.")));
}

TEST(Reason, IsReadFromAThrownSystemError) {
  EXPECT_EQ(ReasonOf(SystemError::Exception(MakeRef<SystemError>("no such host"))), "no such host");
}

}  // namespace
}  // namespace Kovasvc::Util
