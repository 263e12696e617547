#include "kova/agentd/marshal/ExceptionMarshal.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <ostream>
#include <string>

#include "kova/agentd/include/HostCtlException.h"
#include "nox/Faults.h"
#include "tests/support/Builders.h"
#include "tests/support/Matchers.h"

namespace Kovasvc {
namespace {

using namespace HostCtl::Lib;  // every class of it
using Orbis::MethodFault;
using Orbis::Fault::SystemError;
using Tessa::MakeRef;
using Tessa::Ref;
using testing::ElementsAre;
using testing::IsEmpty;
using TestSupport::IsExactly;
using TestSupport::IsSystemError;
using TestSupport::MessageKeys;
using TestSupport::NamesDevice;
using TestSupport::WithMessages;

Ref<MethodFault> Marshal(const HostCtlException& exception) {
  Ref<MethodFault> fault;
  MarshalHostCtlException(exception, fault);
  return fault;
}

// Classes that no table knows.
class NewStorageFailure : public KovaStorageException {
  using KovaStorageException::KovaStorageException;
};
class NewPartitionFailure : public KovaExceptionHasPartition {
  using KovaExceptionHasPartition::KovaExceptionHasPartition;
};
// An exception whose words are not the ones it was made with.
class Rewording : public HostCtlException {
 public:
  using HostCtlException::HostCtlException;
  std::string Describe() const override { return "in other words"; }
};

TEST(KernelException, WithoutADiskBecomesASystemErrorWithItsText) {
  EXPECT_THAT(Marshal(HostCtlException("the kernel is away", "detail")), IsSystemError("the kernel is away"));
}

TEST(KernelException, IsAskedForItsTextByItsOwnAccessor) {
  EXPECT_THAT(Marshal(Rewording("plain words")), IsSystemError("in other words"));
}

TEST(KernelException, AboutPartitionsNamesTheDisk) {
  EXPECT_THAT(Marshal(KovaExceptionHasPartition("text", "naa.1")), NamesDevice("DiskHasPartitions", "naa.1"));
}

TEST(KernelException, AboutTheLastCapacityDiskNamesTheDisk) {
  EXPECT_THAT(Marshal(KovaExceptionLastRemainingHDD("text", "naa.1")),
              NamesDevice("DiskIsLastRemainingNonSSD", "naa.1"));
}

TEST(KernelException, AboutRescanAndAutomaticModeCarriesItsTextWhereOthersNameTheDisk) {
  EXPECT_THAT(Marshal(KovaExceptionRescanError("text 1", "naa.1")), NamesDevice("KovaDiskFault", "text 1"));
  EXPECT_THAT(Marshal(KovaExceptionRemoveMappingAutoModeEnabled("text 2", "naa.1")),
              NamesDevice("KovaDiskFault", "text 2"));
  EXPECT_THAT(Marshal(KovaExceptionRemoveDiskAutoModeEnabled("text 3", "naa.1")),
              NamesDevice("KovaDiskFault", "text 3"));
}

TEST(KernelException, AboutAnIncompatibleMappingIsAnyFailureBecauseItIsNoStorageException) {
  EXPECT_THAT(Marshal(KovaExceptionIncompatibleDiskMapping("mixed")), IsSystemError("mixed"));
}

TEST(KernelException, AboutADiskButOfNoKnownClassBecomesASystemErrorWithItsText) {
  EXPECT_THAT(Marshal(KovaStorageException("busy", "naa.1")), IsSystemError("busy"));
  EXPECT_THAT(Marshal(NewStorageFailure("brand new", "naa.1")), IsSystemError("brand new"));
}

TEST(KernelException, OfADerivedClassIsTakenForItsBase) {
  EXPECT_THAT(Marshal(NewPartitionFailure("text", "naa.1")), NamesDevice("DiskHasPartitions", "naa.1"));
}

TEST(KernelException, ReplacesAndReleasesTheFaultThatTheReferenceHeld) {
  const Ref<MethodFault> old = MakeRef<Nox::Fault::DiskIsUSB>("naa.1");
  Ref<MethodFault> fault = old;
  MarshalHostCtlException(HostCtlException("new"), fault);
  EXPECT_THAT(fault, IsSystemError("new"));
  EXPECT_EQ(old->GetRefCount(), 1);
  EXPECT_EQ(fault->GetRefCount(), 1);
}

TEST(KernelException, LeavesTheMessageListOfItsFaultEmpty) {
  EXPECT_THAT(MessageKeys(*Marshal(KovaExceptionHasPartition("text", "naa.1"))), IsEmpty());
}

// ---- folding

Ref<MethodFault> AFault(const std::vector<std::string>& keys) {
  return WithMessages(MakeRef<Nox::Fault::DiskIsUSB>("naa.1"), keys);
}

TEST(FoldedFault, OfOneFailureIsThatVeryFault) {
  const auto fault = AFault({"a"});
  Ref<MethodFault> combined;
  PrepareKovaDiskFault(fault, combined);
  EXPECT_EQ(combined, fault);
  EXPECT_THAT(MessageKeys(*combined), ElementsAre("a"));
}

TEST(FoldedFault, OfNothingIsNothing) {
  Ref<MethodFault> combined;
  PrepareKovaDiskFault(nullptr, combined);
  EXPECT_FALSE(combined);
}

TEST(FoldedFault, OfTwoFailuresIsAGeneralOneWithTheMessagesOfBothInOrder) {
  const auto first = AFault({"a", "b"});
  const auto second = WithMessages(MakeRef<SystemError>("away"), {"c", "d"});
  Ref<MethodFault> combined;
  PrepareKovaDiskFault(first, combined);
  PrepareKovaDiskFault(second, combined);
  EXPECT_THAT(combined, IsExactly<Nox::Fault::KovaFault>());
  EXPECT_THAT(MessageKeys(*combined), ElementsAre("a", "b", "c", "d"));
}

TEST(FoldedFault, GrowsWithEachFurtherFailure) {
  Ref<MethodFault> combined;
  for (const char* key : {"a", "b", "c", "d"}) {
    PrepareKovaDiskFault(AFault({key}), combined);
  }
  EXPECT_THAT(combined, IsExactly<Nox::Fault::KovaFault>());
  EXPECT_THAT(MessageKeys(*combined), ElementsAre("a", "b", "c", "d"));
}

TEST(FoldedFault, IsANewOneEachTimeAndReleasesTheOneBefore) {
  Ref<MethodFault> combined = MakeRef<Nox::Fault::KovaFault>();
  const auto before = combined;
  PrepareKovaDiskFault(AFault({"a"}), combined);
  EXPECT_NE(combined, before);
  EXPECT_EQ(before->GetRefCount(), 1);
}

TEST(FoldedFault, DropsTypeFieldsAndCauseOfTheFirst) {
  Ref<MethodFault> first = AFault({"a"});
  first->SetCause(MakeRef<SystemError>("cause"));
  PrepareKovaDiskFault(AFault({"b"}), first);
  EXPECT_FALSE(first->GetCause());
}

TEST(FoldedFault, TakesTheListOfTheFirstOverAsItIs) {
  const auto first = AFault({"a"});
  const auto list = first->GetFaultMessage();
  Ref<MethodFault> combined = first;
  PrepareKovaDiskFault(AFault({"b"}), combined);
  EXPECT_EQ(combined->GetFaultMessage(), list);
  EXPECT_THAT(MessageKeys(*first), ElementsAre("a", "b")) << "they share it";
}

TEST(FoldedFault, LeavesTheFaultThatIsFoldedInUnchanged) {
  const auto second = AFault({"b"});
  Ref<MethodFault> combined = AFault({"a"});
  PrepareKovaDiskFault(second, combined);
  EXPECT_THAT(MessageKeys(*second), ElementsAre("b"));
  EXPECT_NE(second->GetFaultMessage(), combined->GetFaultMessage());
}

TEST(FoldedFault, SharesTheMessagesThemselves) {
  const auto second = AFault({"b"});
  Ref<MethodFault> combined = AFault({"a"});
  PrepareKovaDiskFault(second, combined);
  EXPECT_EQ((*combined->GetFaultMessage())[1], (*second->GetFaultMessage())[0]);
}

TEST(FoldedFault, OfFaultsWithoutMessagesHasNoneAndIsGeneralAllTheSame) {
  Ref<MethodFault> combined = AFault({});
  PrepareKovaDiskFault(AFault({}), combined);
  EXPECT_THAT(combined, IsExactly<Nox::Fault::KovaFault>());
  EXPECT_THAT(MessageKeys(*combined), IsEmpty());
}

TEST(FoldedFault, IsLeftAsItIsByANullFault) {
  const auto first = AFault({"a"});
  Ref<MethodFault> combined = first;
  PrepareKovaDiskFault(nullptr, combined);
  EXPECT_EQ(combined, first);
  EXPECT_THAT(MessageKeys(*combined), ElementsAre("a"));
}

TEST(FoldedFault, OfOneFaultWithItselfHasItsMessagesTwiceAndEnds) {
  const auto fault = AFault({"a", "b"});
  Ref<MethodFault> combined = fault;
  PrepareKovaDiskFault(fault, combined);
  EXPECT_THAT(MessageKeys(*combined), ElementsAre("a", "b", "a", "b"));
}

TEST(FoldedFault, KeepsANullMessageInItsPlace) {
  const auto second = AFault({});
  second->GetFaultMessage()->Append(nullptr);
  Ref<MethodFault> combined = AFault({"a"});
  PrepareKovaDiskFault(second, combined);
  ASSERT_EQ(combined->GetFaultMessage()->Size(), 2U);
  EXPECT_EQ((*combined->GetFaultMessage())[1], nullptr);
}

}  // namespace
}  // namespace Kovasvc
