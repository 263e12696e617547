#include "kovactl/FaultAdvice.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <vector>

#include "nox/Faults.h"
#include "orbis/TypeDescriptor.h"

namespace Kovactl {
namespace {

using Orbis::LocalizableMessage;
using Orbis::MethodFault;
using Tessa::MakeRef;
using Tessa::Ref;
using testing::HasSubstr;

// Every fault class there is, made without anything set.
std::vector<Ref<MethodFault>> EveryFault() {
  std::vector<Ref<MethodFault>> faults;
  for (const Orbis::TypeDescriptor* type : Orbis::AllTypes()) {
    if (type->kind == Orbis::TypeKind::DataObject && type->IsA(MethodFault::StaticType()) &&
        !type->IsAbstract()) {
      faults.emplace_back(static_cast<MethodFault*>(type->create().Get()));
    }
  }
  return faults;
}

// A fault with one message, which has only its key.
template <class Fault>
Ref<Fault> WithKey(const std::string& key) {
  const auto message = MakeRef<LocalizableMessage>();
  message->SetKey(key);
  const auto fault = MakeRef<Fault>();
  fault->GetFaultMessage()->Append(message);
  return fault;
}

TEST(FaultAdvice, SaysHowToMakeRoomWhenALimitStoppedPlanning) {
  for (const char* key :
       {"nox.agentd.kovaDiskOperation.allFlashExceed", "nox.agentd.kovaDiskOperation.hybridExceed"}) {
    EXPECT_THAT(Advise(*WithKey<Nox::Fault::KovaFault>(key)), HasSubstr("make room")) << key;
  }
}

TEST(FaultAdvice, SaysWhereGroupsThatAreNotMountedAre) {
  EXPECT_THAT(
      Advise(*WithKey<Orbis::Fault::InvalidArgument>("nox.agentd.kovaDiskOperation.diskMappingNotFound")),
      HasSubstr("kovactl claim"));
}

TEST(FaultAdvice, SaysWhatToDoAboutEachKindOfFault) {
  for (const auto& fault : EveryFault()) {
    const bool isBare = &fault->GetType() == &Nox::Fault::KovaFault::StaticType();
    EXPECT_EQ(Advise(*fault).empty(), isBare) << fault->GetType().name;
  }
  EXPECT_THAT(Advise(Nox::Fault::DiskHasPartitions("naa.1")), HasSubstr("lsblk"));
  EXPECT_THAT(Advise(Nox::Fault::DiskIsLastRemainingNonSSD("naa.1")), HasSubstr("kovactl remove-group"));
}

TEST(FaultAdvice, SaysWhenABusyHostMayBeAskedAgain) {
  Nox::Fault::Busy busy;
  EXPECT_EQ(Advise(busy), "Try again later.");
  busy.SetRetryAfterSeconds(30);
  EXPECT_EQ(Advise(busy), "Try again in 30 s.");
}

}  // namespace
}  // namespace Kovactl
