#include "kova/agentd/include/HostCtlException.h"

#include <gtest/gtest.h>

#include <type_traits>
#include <vector>

namespace HostCtl::Lib {
namespace {

TEST(HostCtlException, SaysItsMessageInEveryWay) {
  const HostCtlException exception("disk is gone", "detail", EvtMessage{"evt.1", {"a", "b"}});
  EXPECT_STREQ(exception.what(), "disk is gone");
  EXPECT_EQ(exception.Describe(), "disk is gone");
  EXPECT_EQ(exception.GetDetail(), "detail");
  EXPECT_EQ(exception.GetEvent().id, "evt.1");
  EXPECT_EQ(exception.GetEvent().arguments.size(), 2U);
}

TEST(HostCtlException, KeepsEverythingWhenCopiedAndAssigned) {
  const KovaStorageException original("busy", "naa.1", "detail", EvtMessage{"evt.1", {"a", "b"}});
  const KovaStorageException copy(original);
  KovaStorageException assigned("other", "naa.2");
  assigned = original;
  const std::vector<const KovaStorageException*> copies = {&copy, &assigned};
  for (const KovaStorageException* const one : copies) {
    EXPECT_STREQ(one->what(), "busy");
    EXPECT_EQ(one->GetDiskName(), "naa.1");
    EXPECT_EQ(one->GetDetail(), "detail");
    EXPECT_EQ(one->GetEvent().id, "evt.1");
    EXPECT_EQ(one->GetEvent().arguments, original.GetEvent().arguments);
  }
}

template <typename Exception>
class DiskException : public testing::Test {};

using DiskExceptions =
    testing::Types<KovaStorageException, KovaExceptionHasPartition, KovaExceptionLastRemainingHDD,
                   KovaExceptionRescanError, KovaExceptionRemoveMappingAutoModeEnabled,
                   KovaExceptionRemoveDiskAutoModeEnabled>;
TYPED_TEST_SUITE(DiskException, DiskExceptions, );

TYPED_TEST(DiskException, IsCaughtAsAStorageExceptionWithItsDisk) {
  try {
    throw TypeParam("no", "naa.7");
  } catch (const KovaStorageException& caught) {
    EXPECT_STREQ(caught.what(), "no");
    EXPECT_EQ(caught.GetDiskName(), "naa.7");
  }
}

TYPED_TEST(DiskException, CarriesTheDetailAndTheEventOfItsFailure) {
  const TypeParam exception("no", "naa.7", "the second text", EvtMessage{"evt.2", {"c"}});
  EXPECT_EQ(exception.GetDiskName(), "naa.7");
  EXPECT_EQ(exception.GetDetail(), "the second text");
  EXPECT_EQ(exception.GetEvent().id, "evt.2");
  EXPECT_EQ(exception.GetEvent().arguments, std::vector<std::string>{"c"});
}

TYPED_TEST(DiskException, HasNoDetailAndNoEventUnlessItIsGivenThem) {
  const TypeParam exception("no", "naa.7");
  EXPECT_EQ(exception.GetDetail(), "");
  EXPECT_EQ(exception.GetEvent().id, "");
  EXPECT_TRUE(exception.GetEvent().arguments.empty());
}

TEST(IncompatibleDiskMapping, IsNoStorageExceptionOnPurpose) {
  EXPECT_FALSE((std::is_base_of_v<KovaStorageException, KovaExceptionIncompatibleDiskMapping>));
  EXPECT_THROW(throw KovaExceptionIncompatibleDiskMapping("mixed"), HostCtlException);
}

}  // namespace
}  // namespace HostCtl::Lib
