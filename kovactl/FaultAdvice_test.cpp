#include "kovactl/FaultAdvice.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/testing/Faults.h"
#include "nox/Faults.h"

namespace Kovactl {
namespace {

using Host::Testing::EveryFault;
using Host::Testing::WithKey;
using testing::HasSubstr;

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
