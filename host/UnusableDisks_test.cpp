#include "host/UnusableDisks.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "nox/Faults.h"
#include "nox/Kova.h"

namespace Host {
namespace {

using Nox::Kova::Host::DiskResult;
using Tessa::MakeRef;
using Tessa::Ref;

Ref<DiskResult> ADisk(const std::string& name, const char* state, Ref<Orbis::MethodFault> error = nullptr) {
  auto result = MakeRef<DiskResult>();
  result->GetDisk()->SetCanonicalName(name);
  result->SetState(state);
  result->SetError(std::move(error));
  return result;
}

// The messages of a fault beside such an answer.
std::vector<std::string> MessagesAbout(const std::vector<Ref<DiskResult>>& disks) {
  const auto results = MakeRef<Orbis::DataArray<DiskResult>>();
  for (const auto& disk : disks) {
    results->Append(disk);
  }
  Nox::Fault::InsufficientDisks fault;
  NameUnusableDisks({.result = results, .fault = nullptr}, fault);
  std::vector<std::string> texts;
  for (const Orbis::LocalizableMessage* message : *fault.GetFaultMessage()) {
    texts.push_back(message->GetMessage());
  }
  return texts;
}

TEST(UnusableDisks, AreNamedWithTheirReasons) {
  EXPECT_THAT(
      MessagesAbout({ADisk("naa.1", DiskResult::STATE_ELIGIBLE),
                     ADisk("naa.2", DiskResult::STATE_INELIGIBLE, MakeRef<Nox::Fault::DiskIsUSB>("naa.2")),
                     ADisk("naa.3", DiskResult::STATE_INUSE), ADisk("naa.4", DiskResult::STATE_INELIGIBLE)}),
      testing::ElementsAre("naa.2: attached by USB; naa.3: in use already; naa.4: not to be used"));
}

TEST(UnusableDisks, AreNotMentionedWhereThereAreNone) {
  EXPECT_THAT(MessagesAbout({ADisk("naa.1", DiskResult::STATE_ELIGIBLE)}), testing::IsEmpty());
  Nox::Fault::InsufficientDisks fault;
  NameUnusableDisks({}, fault);
  EXPECT_TRUE(fault.GetFaultMessage()->IsEmpty());
}

TEST(UnusableDisks, BeyondASentenceAreCounted) {
  std::vector<Ref<DiskResult>> many;
  for (int i = 1; i <= 7; ++i) {
    many.push_back(ADisk("naa." + std::to_string(i), DiskResult::STATE_INUSE));
  }
  EXPECT_THAT(MessagesAbout(many),
              testing::ElementsAre(testing::EndsWith("naa.5: in use already; and 2 more")));
  many.resize(5);
  EXPECT_THAT(MessagesAbout(many), testing::ElementsAre(testing::EndsWith("naa.5: in use already")));
}

}  // namespace
}  // namespace Host
