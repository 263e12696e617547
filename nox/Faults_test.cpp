// The exceptions of the faults mirror the tree of the faults.
#include "nox/Faults.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>
#include <string>
#include <type_traits>

#include "orbis/TypeDescriptor.h"
#include "orbis/Types.h"

namespace Nox {
namespace {

using Orbis::AllTypes;
using Orbis::MakeRef;
using Orbis::MethodFault;
using Orbis::Ref;
using Orbis::TypeDescriptor;

// What is known at compile time of one fault: itself, its base, and the base of its exception.
struct Branch {
  const TypeDescriptor* type;
  const TypeDescriptor* base;
};

template <class Fault, class Base>
Branch MakeBranch() {
  static_assert(std::is_base_of_v<Base, Fault>);
  static_assert(std::is_base_of_v<typename Base::Exception, typename Fault::Exception>);
  static_assert(std::is_convertible_v<typename Fault::Exception*, std::exception*>,
                "one std::exception only");
  if constexpr (!std::is_abstract_v<Fault> && std::is_default_constructible_v<Fault>) {
    const Ref<Fault> fault = MakeRef<Fault>();
    try {
      throw typename Fault::Exception(fault);
    } catch (const typename Base::Exception& exception) {
      EXPECT_EQ(&exception.GetFault()->GetType(), &Fault::StaticType());
    }
    try {
      throw typename Fault::Exception(fault);
    } catch (const std::exception& exception) {
      EXPECT_THAT(exception.what(), ::testing::StartsWith(Fault::StaticType().name));
    }
  }
  return {&Fault::StaticType(), &Base::StaticType()};
}

TEST(FaultTree, IsTheTreeOfTheExceptionsToo) {
  using namespace Fault;
  using Orbis::Fault::InvalidArgument;
  using Orbis::Fault::SystemError;
  std::map<const TypeDescriptor*, const TypeDescriptor*> expected;
  for (const Branch& branch :
       {MakeBranch<Orbis::ServiceFault, MethodFault>(), MakeBranch<SystemError, Orbis::ServiceFault>(),
        MakeBranch<InvalidArgument, Orbis::ServiceFault>(), MakeBranch<Busy, Orbis::ServiceFault>(),
        MakeBranch<HostChanged, Orbis::ServiceFault>(), MakeBranch<NotPermitted, Orbis::ServiceFault>(),
        MakeBranch<KovaFault, MethodFault>(), MakeBranch<KovaDiskFault, KovaFault>(),
        MakeBranch<DiskHasPartitions, KovaDiskFault>(),
        MakeBranch<DiskIsLastRemainingNonSSD, KovaDiskFault>(),
        MakeBranch<KovaIncompatibleDiskMapping, KovaDiskFault>(), MakeBranch<DiskIsNonLocal, KovaDiskFault>(),
        MakeBranch<DiskIsUSB, KovaDiskFault>(), MakeBranch<DiskTooSmall, KovaDiskFault>(),
        MakeBranch<DuplicateDisks, KovaDiskFault>(), MakeBranch<InsufficientDisks, KovaDiskFault>()}) {
    expected[branch.type] = branch.base;
  }
  for (const TypeDescriptor* type : AllTypes()) {
    if (type->IsA(MethodFault::StaticType()) && type != &MethodFault::StaticType()) {
      ASSERT_EQ(expected.count(type), 1u) << type->name << " wants a row";
      EXPECT_EQ(type->base, expected[type]) << type->name;
    }
  }
}

Ref<Orbis::LocalizableMessage> AMessage(const char* key) {
  const Ref<Orbis::LocalizableMessage> message = MakeRef<Orbis::LocalizableMessage>();
  message->SetKey(key);
  return message;
}

TEST(FaultException, SaysTheTypeAndTheKeysOfItsMessages) {
  const Ref<Fault::KovaFault> fault = MakeRef<Fault::KovaFault>();
  fault->GetFaultMessage()->Append(AMessage("key1"));
  fault->GetFaultMessage()->Append(AMessage("key2"));
  EXPECT_STREQ(Fault::KovaFault::Exception(fault).what(), "KovaFault: key1, key2");
  EXPECT_STREQ(Fault::DiskIsUSB::Exception(MakeRef<Fault::DiskIsUSB>("naa.5")).what(), "DiskIsUSB");
}

TEST(DiskFault, IsMadeFromTheDevice) {
  EXPECT_EQ(MakeRef<Fault::DiskIsUSB>("naa.5")->GetDevice(), "naa.5");
  EXPECT_FALSE(MakeRef<Fault::DiskIsUSB>()->HasDevice());
  EXPECT_FALSE(MakeRef<Fault::DiskIsUSB>(std::nullopt)->HasDevice());
}

TEST(DiskFault, IsCaughtAsAnyDiskFault) {
  try {
    throw Fault::DiskHasPartitions::Exception(MakeRef<Fault::DiskHasPartitions>("naa.5"));
  } catch (const Fault::KovaDiskFault::Exception& exception) {
    const auto* fault = dynamic_cast<const Fault::KovaDiskFault*>(exception.GetFault().Get());
    ASSERT_NE(fault, nullptr);
    EXPECT_EQ(fault->GetDevice(), "naa.5");
  }
}

}  // namespace
}  // namespace Nox
