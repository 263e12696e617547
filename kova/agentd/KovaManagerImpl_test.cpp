#include "kova/agentd/KovaManagerImpl.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstring>
#include <stdexcept>
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

TEST_F(ManagerLife, MakesItsHelperLastWithItsLogger) {
  Ref<Tessa::Service::Logger> logger = _logger;
  OtxCtl::Kova::SetProviderFactory([this] {
    EXPECT_FALSE(Util::KovaUtil::_logger);
    return _kernel.MakeProvider();
  });
  const auto manager = MakeRef<KovaManagerImpl>(logger);
  EXPECT_EQ(Util::KovaUtil::_logger, logger);
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

#if defined(__x86_64__) && defined(__GXX_ABI_VERSION)
// Where the operation stands in the table: a pointer to a virtual member holds its offset plus one.
template <class Method>
std::size_t SlotOf(Method method) {
  std::size_t words[2] = {};
  static_assert(sizeof method == sizeof words);
  std::memcpy(words, &method, sizeof words);
  EXPECT_EQ(words[0] % sizeof(void*), 1U) << "not virtual";
  return words[0] / sizeof(void*);
}

TEST(ManagerOperationTable, HasTheNineteenOperationsInTheirOrderBehindTheBases) {
  using M = KovaManagerImpl;
  const std::vector<std::size_t> slots = {SlotOf(&M::AddDisks),
                                          SlotOf(&M::InitializeDisks),
                                          SlotOf(&M::RemoveDisk),
                                          SlotOf(&M::RemoveDiskMapping),
                                          SlotOf(&M::QueryDisksForKova),
                                          SlotOf(&M::AddAllEligibleDisks),
                                          SlotOf(&M::UnmountDiskMapping),
                                          SlotOf(&M::GetStorageInfo),
                                          SlotOf(&M::GetConfigInfo),
                                          SlotOf(&M::ClaimUnmountedDiskgroup),
                                          SlotOf(&M::GetKovaDiskMapping),
                                          SlotOf(&M::InitializeDisksInt),
                                          SlotOf(&M::ValidateDiskMapping),
                                          SlotOf(&M::ValidateDiskMappings),
                                          SlotOf(&M::DiskMappingExists),
                                          SlotOf(&M::FormatDiskMapping),
                                          SlotOf(&M::RestampDiskMapping),
                                          SlotOf(&M::InitializeMapping),
                                          SlotOf(&M::UnmountDiskMappingInt)};
  for (std::size_t i = 1; i < slots.size(); ++i) {
    EXPECT_EQ(slots[i], slots[0] + i) << "operation " << i + 1;
  }
  EXPECT_EQ(SlotOf(&Tessa::System::LockableObjectImpl::IsLocked) + 1, slots[0]);
}
#endif

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
