#include "host/RequestBounds.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>

#include "host/Gate.h"
#include "host/testing/Requests.h"

namespace Host {
namespace {

using namespace Host::Testing;
using testing::AllOf;
using testing::HasSubstr;
using testing::StartsWith;

std::string Verdict(const std::function<void()>& check) {
  try {
    check();
    return "fits";
  } catch (const Orbis::MethodFault::Exception& refused) {
    return OutcomeText(refused.GetFault().Get());
  }
}

// What is left of the request when it is bounded.
template <class Request>
Request Bounded(Request request) {
  BoundRequest(request);
  return request;
}

TEST(RequestBounds, KeepNameAndFlagOfADiskAndNothingElse) {
  const DiskRef full = ADisk("naa.1", true);
  full->SetVendor(std::string(100'000, 'v'));
  const auto request = Bounded(Op::AddDisks(Disks({full, ADisk("naa.2"), nullptr})));
  const DiskList& disks = *request.GetDisks();
  ASSERT_EQ(disks.Size(), 3u);
  EXPECT_EQ(disks[0]->GetCanonicalName(), "naa.1");
  EXPECT_TRUE(disks[0]->GetSsd());
  EXPECT_FALSE(disks[0]->HasVendor());
  EXPECT_FALSE(disks[1]->HasSsd());
  EXPECT_EQ(disks[2], nullptr) << "the gate says what is wrong with it";
}

TEST(RequestBounds, KeepGroupsAsTheyAre) {
  const auto request =
      Bounded(Op::InitializeDisks(Mappings({MappingOf("naa.1", {"naa.2", "naa.3"}), nullptr})));
  const MappingList& groups = *request.GetMappings();
  ASSERT_EQ(groups.Size(), 2u);
  EXPECT_EQ(groups[0]->GetSsd()->GetCanonicalName(), "naa.1");
  EXPECT_EQ((*groups[0]->GetNonSsd())[1]->GetCanonicalName(), "naa.3");
  EXPECT_EQ(groups[1], nullptr);
  const auto removal = Bounded(Op::RemoveDiskMapping(MappingOf("naa.1", {})));
  EXPECT_EQ(removal.GetMapping()->GetSsd()->GetCanonicalName(), "naa.1");
}

TEST(RequestBounds, KeepWhatIsNoDisk) {
  const auto request = Bounded(WithOptions(Op::RemoveDisk("naa.1"), {"p", "o", 1, 2}));
  EXPECT_EQ(request.GetDisk(), "naa.1");
  EXPECT_EQ(request.GetPassThrough(), "p");
  EXPECT_EQ(request.GetOptionSecond(), 2);
  EXPECT_FALSE(request.HasLabel());
  EXPECT_EQ(Bounded(Op::QueryDisksForKova(Names({"naa.1"}))).GetNames()->Items().size(), 1u);
}

TEST(RequestBounds, LeaveAListThatIsLeftOutAlone) {
  EXPECT_EQ(Bounded(Op::AddDisks()).GetDisks(), nullptr);
  EXPECT_EQ(Bounded(Op::QueryDisksForKova()).GetNames(), nullptr);
}

template <class Request>
std::string VerdictOn(const Request& request) {
  return Verdict([&request] { Bounded(request); });
}

TEST(RequestBounds, RefuseWhatIsTooMuch) {
  using Texts = std::vector<std::string>;
  const std::string longName(Gate::longestName + 1, 'n');
  EXPECT_THAT(VerdictOn(Op::AddDisks(DisksNamed(Texts(Gate::mostNames + 1, "n")))),
              AllOf(StartsWith("disks | "), HasSubstr("100000 disks")));
  EXPECT_THAT(VerdictOn(Op::AddDisks(DisksNamed({"n", longName}))), StartsWith("disks[1] | "));
  const MappingRef small = MappingOf("n", {});
  using Groups = std::vector<MappingRef>;
  EXPECT_EQ(VerdictOn(Op::InitializeDisks(Mappings(Groups(Gate::mostMappings, small)))), "fits");
  EXPECT_THAT(VerdictOn(Op::InitializeDisks(Mappings(Groups(Gate::mostMappings + 1, small)))),
              HasSubstr("10000 disk groups"));
  EXPECT_THAT(VerdictOn(Op::RemoveDiskMapping(MappingOf("n", Texts(Gate::mostDisksOfGroup + 1, "n")))),
              StartsWith("mapping.nonSsd | "));
  EXPECT_THAT(VerdictOn(Op::UnmountDiskMapping(Mappings({MappingOf(longName, {})}))),
              StartsWith("mappings[0].ssd | "));
  const MappingRef large = MappingOf("n", Texts(Gate::mostDisksOfGroup, "n"));
  EXPECT_THAT(VerdictOn(Op::InitializeDisks(Mappings(Groups(100, large)))), HasSubstr("100000 disks"));
}

TEST(RequestBounds, RefuseTextsThatAreTooLongOrUnfit) {
  const std::string longest(Gate::longestOption, 'o');
  EXPECT_EQ(VerdictOn(WithOptions(Op::RemoveDisk("n"), {longest, longest})), "fits");
  EXPECT_THAT(VerdictOn(WithOptions(Op::RemoveDisk("n"), {longest + "o", ""})),
              AllOf(StartsWith("passThrough | "), HasSubstr("4096 bytes")));
  EXPECT_THAT(VerdictOn(WithOptions(Op::RemoveDisk("n"), {"", "\n"})), StartsWith("optionText | "));
  EXPECT_THAT(VerdictOn(Op::RemoveDisk(std::string(Gate::longestName + 1, 'n'))), StartsWith("disk | "));
  EXPECT_THAT(VerdictOn(Op::QueryDisksForKova(Names({"naa.1", "\n"}))), StartsWith("names[1] | "));
}

TEST(RequestBounds, WeighDisksAndTheirNames) {
  const std::size_t one = WeightOf(Op::AddDisks(DisksNamed({"n"})));
  EXPECT_EQ(WeightOf(Op::AddDisks(DisksNamed({"n", "nn"}))), 2 * one + 1);
  EXPECT_EQ(WeightOf(Op::RemoveDiskMapping(MappingOf("n", {"n"}))), 2 * one);
  EXPECT_EQ(WeightOf(Op::InitializeDisks(Mappings({MappingOf("n", {"n"}), nullptr}))), 2 * one);
  EXPECT_EQ(WeightOf(WithOptions(Op::RemoveDisk("12"), {"345", "6789"})), 9u);
}

}  // namespace
}  // namespace Host
