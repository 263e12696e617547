// What programs built apart from the plug-in count on: the order of operations in their tables, and virtual
// bases.

#include "tests/support/OperationTable.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <vector>

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/include/KovaInfo.h"
#include "kova/agentd/include/KovaNetwork.h"

namespace Kovasvc {
namespace {

using Tessa::ObjectImpl;
using Tessa::System::LockableObject;
using Tessa::System::LockableObjectImpl;
using TestSupport::hasVirtualBase;

static_assert(hasVirtualBase<ObjectImpl, Tessa::Object>);
static_assert(hasVirtualBase<LockableObject, Tessa::Object>);
static_assert(hasVirtualBase<LockableObjectImpl, LockableObject>);
static_assert(!hasVirtualBase<LockableObjectImpl, ObjectImpl>);
static_assert(!hasVirtualBase<KovaManagerImpl, LockableObjectImpl>);
static_assert(hasVirtualBase<Tessa::Session, Tessa::Object>);
static_assert(hasVirtualBase<Tessa::SessionMixin, Tessa::Session>);
static_assert(hasVirtualBase<Util::KovaUtil, ObjectImpl>);
static_assert(!hasVirtualBase<Util::SessionImpl, Tessa::SessionMixin>);
static_assert(!hasVirtualBase<Util::SessionImpl, LockableObjectImpl>);

#ifdef TEST_SUPPORT_KNOWS_OPERATION_TABLES

using testing::ElementsAre;
using TestSupport::SlotOf;

// The bases' operations, protected ones included.
class OpenObject : public LockableObjectImpl {
 public:
  using LockableObjectImpl::FinalDecRef;
  using LockableObjectImpl::FirstIncRef;
};

TEST(ManagerOperationTable, BeginsWithTheOperationsOfTheBasesInTheirOrder) {
  using O = OpenObject;
  EXPECT_THAT((std::vector<std::size_t>{SlotOf(&O::IncRef), SlotOf(&O::DecRef), SlotOf(&O::ToString),
                                        SlotOf(&O::GetRefCount)}),
              ElementsAre(0, 1, 2, 3));
  // 4 and 5 are the destructors.
  EXPECT_THAT((std::vector<std::size_t>{SlotOf(&O::FirstIncRef), SlotOf(&O::FinalDecRef), SlotOf(&O::Lock),
                                        SlotOf(&O::Unlock), SlotOf(&O::IsLocked)}),
              ElementsAre(6, 7, 8, 9, 10));
}

TEST(ManagerOperationTable, IsTheSameForWhoeverKnowsThatTheManagerIsLockable) {
  using L = LockableObject;
  EXPECT_THAT((std::vector<std::size_t>{SlotOf(&L::Lock), SlotOf(&L::Unlock), SlotOf(&L::IsLocked)}),
              ElementsAre(8, 9, 10));
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
  for (std::size_t i = 0; i < slots.size(); ++i) {
    EXPECT_EQ(slots[i], 11 + i) << "operation " << i + 1;
  }
}

TEST(ProviderOperationTable, HasTheSixteenOperationsInTheirOrderBehindTheDestructors) {
  using P = HostCtl::Kova::KovaInfo;
  const std::vector<std::size_t> slots = {SlotOf(&P::QueryDisks),
                                          SlotOf(&P::GetDiskMappings),
                                          SlotOf(&P::FormatDiskMapping),
                                          SlotOf(&P::RestampDiskMapping),
                                          SlotOf(&P::MountDiskMapping),
                                          SlotOf(&P::RestampDiskMappingByUuid),
                                          SlotOf(&P::RemoveDisk),
                                          SlotOf(&P::RemoveDiskMapping),
                                          SlotOf(&P::UnmountDiskMapping),
                                          SlotOf(&P::RemoveDiskByUuid),
                                          SlotOf(&P::IsAutoModeEnabled),
                                          SlotOf(&P::GetKovaOtxNicConfigs),
                                          SlotOf(&P::GetClusterInfoDetailed),
                                          SlotOf(&P::GetFaultDomainName),
                                          SlotOf(&P::ClaimUnmountedDiskgroups),
                                          SlotOf(&P::RefreshKovaInfo)};
  for (std::size_t i = 0; i < slots.size(); ++i) {
    EXPECT_EQ(slots[i], 2 + i) << "operation " << i + 1;
  }
}

TEST(ProviderOperationTable, OfAnInterfaceHasItsGettersInTheirOrder) {
  using N = HostCtl::Kova::KovaOtxNicConfig;
  EXPECT_THAT((std::vector<std::size_t>{SlotOf(&N::GetOtxnicName), SlotOf(&N::GetMasterMulticastGroup),
                                        SlotOf(&N::GetAgentMulticastGroup)}),
              ElementsAre(2, 3, 4));
}

#endif

}  // namespace
}  // namespace Kovasvc
