#include "host/FaultWords.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <set>

#include "host/testing/Faults.h"
#include "nox/Faults.h"
#include "orbis/Any.h"

namespace Host {
namespace {

using Tessa::MakeRef;
using Testing::EveryFault;
using testing::HasSubstr;
using testing::Not;
using Testing::WithKey;

TEST(FaultWords, StandForEveryFaultThatThereIs) {
  std::set<std::string> words;
  std::size_t count = 0;
  for (const auto& fault : EveryFault()) {
    const std::string& type = fault->GetType().name;
    EXPECT_THAT(Explain(*fault), Not(HasSubstr(type))) << "the bare name of a class tells people nothing";
    words.insert(Explain(*fault));
    ++count;
  }
  EXPECT_GE(count, 15u);
  EXPECT_EQ(words.size(), count) << "no two faults sound the same";
}

TEST(FaultWords, OfAFaultGoOnWithWhatItCarries) {
  EXPECT_EQ(Explain(Orbis::Fault::SystemError("no cable")), "something in the host failed: no cable");
  EXPECT_EQ(Explain(Nox::Fault::DiskTooSmall("naa.1")), "too small: naa.1");
  EXPECT_EQ(Explain(Nox::Fault::DiskTooSmall()), "too small");
  Nox::Fault::NotPermitted notPermitted;
  notPermitted.SetRole("operator");
  EXPECT_EQ(Explain(notPermitted), "the caller's role does not allow this: operator");
  Nox::Fault::HostChanged changed;
  EXPECT_EQ(Explain(changed), "the host has changed since it was looked at");
  changed.SetExpected("g1");
  changed.SetActual("g2");
  EXPECT_EQ(Explain(changed), "the host has changed since it was looked at: g1, now g2");
}

TEST(FaultWords, OfAFaultEndWithItsMessagesOrTheirKeys) {
  Nox::Fault::KovaFault fault;
  const auto told = MakeRef<Orbis::LocalizableMessage>();
  told->SetKey("a.b");
  told->SetMessage("first");
  const auto untold = MakeRef<Orbis::LocalizableMessage>();
  untold->SetKey("c.d");
  fault.GetFaultMessage()->Append(told);
  fault.GetFaultMessage()->Append(untold);
  EXPECT_EQ(Explain(fault), "the storage service refused; first; c.d");
}

TEST(FaultWords, StandForTheKeysThatSayWhichLimitStoppedPlanning) {
  const auto allFlash = WithKey<Nox::Fault::KovaFault>("nox.agentd.kovaDiskOperation.allFlashExceed");
  EXPECT_THAT(Explain(*allFlash), HasSubstr("every all-flash disk group is full"));
  const auto hybrid = WithKey<Nox::Fault::KovaFault>("nox.agentd.kovaDiskOperation.hybridExceed");
  EXPECT_THAT(Explain(*hybrid), HasSubstr("every hybrid disk group is full"));
}

TEST(FaultWords, OfAGroupThatIsNotThereGoOnWithTheGroup) {
  const auto fault =
      WithKey<Orbis::Fault::InvalidArgument>("nox.agentd.kovaDiskOperation.diskMappingNotFound");
  const auto argument = MakeRef<Orbis::KeyAnyValue>();
  argument->SetKey("diskMap");
  argument->SetValue(MakeRef<Orbis::Boxed<std::string>>("SSD: naa.1, Disks: naa.2"));
  const auto arguments = MakeRef<Orbis::DataArray<Orbis::KeyAnyValue>>();
  arguments->Append(argument);
  (*fault->GetFaultMessage())[0]->SetArg(arguments);
  EXPECT_THAT(Explain(*fault),
              HasSubstr("; the host has no such disk group mounted (SSD: naa.1, Disks: naa.2)"));
}

}  // namespace
}  // namespace Host
