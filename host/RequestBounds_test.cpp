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
using Names = std::vector<std::string>;

std::string Verdict(const std::function<void()>& check) {
  try {
    check();
    return "fits";
  } catch (const Orbis::MethodFault::Exception& refused) {
    return Told(refused.GetFault().Get());
  }
}

TEST(RequestBounds, KeepNameAndFlagOfADiskAndNothingElse) {
  const DiskRef fat = ADisk("naa.1", true);
  fat->SetVendor(std::string(100'000, 'v'));
  const auto lean = Lean("disks", *Disks({fat, ADisk("naa.2"), nullptr}));
  ASSERT_EQ(lean->Size(), 3u);
  EXPECT_EQ((*lean)[0]->GetCanonicalName(), "naa.1");
  EXPECT_TRUE((*lean)[0]->GetSsd());
  EXPECT_FALSE((*lean)[0]->HasVendor());
  EXPECT_FALSE((*lean)[1]->HasSsd());
  EXPECT_EQ((*lean)[2], nullptr) << "the gate says what is wrong with it";
}

TEST(RequestBounds, KeepGroupsAsTheyAre) {
  const auto lean = Lean(*Mappings({MappingOf("naa.1", {"naa.2", "naa.3"}), nullptr}));
  ASSERT_EQ(lean->Size(), 2u);
  EXPECT_EQ((*lean)[0]->GetSsd()->GetCanonicalName(), "naa.1");
  EXPECT_EQ((*(*lean)[0]->GetNonSsd())[1]->GetCanonicalName(), "naa.3");
  EXPECT_EQ(Lean(*MappingOf("naa.1", {}))->GetSsd()->GetCanonicalName(), "naa.1");
}

TEST(RequestBounds, RefuseWhatIsTooMuch) {
  const std::string longName(Gate::longestName + 1, 'n');
  EXPECT_THAT(Verdict([] { Lean("disks", *DisksNamed(Names(Gate::mostNames + 1, "n"))); }),
              AllOf(StartsWith("disks | "), HasSubstr("100000 disks")));
  EXPECT_THAT(Verdict([&] { Lean("disks", *DisksNamed({"n", longName})); }), StartsWith("disks[1] | "));
  const MappingRef small = MappingOf("n", {});
  EXPECT_EQ(Verdict([&] { Lean(*Mappings(std::vector<MappingRef>(Gate::mostMappings, small))); }), "fits");
  EXPECT_THAT(Verdict([&] { Lean(*Mappings(std::vector<MappingRef>(Gate::mostMappings + 1, small))); }),
              HasSubstr("10000 disk groups"));
  EXPECT_THAT(Verdict([] { Lean(*MappingOf("n", Names(Gate::mostDisksOfGroup + 1, "n"))); }),
              StartsWith("mapping.nonSsd | "));
  EXPECT_THAT(Verdict([&] { Lean(*Mappings({MappingOf(longName, {})})); }), StartsWith("mappings[0].ssd | "));
  const MappingRef large = MappingOf("n", Names(Gate::mostDisksOfGroup, "n"));
  EXPECT_THAT(Verdict([&] { Lean(*Mappings(std::vector<MappingRef>(100, large))); }),
              HasSubstr("100000 disks"));
}

TEST(RequestBounds, WeighDisksAndTheirNames) {
  const std::size_t one = WeightOf(*DisksNamed({"n"}));
  EXPECT_EQ(WeightOf(*DisksNamed({"n", "nn"})), 2 * one + 1);
  EXPECT_EQ(WeightOf(*MappingOf("n", {"n"})), 2 * one);
  EXPECT_EQ(WeightOf(*Mappings({MappingOf("n", {"n"}), nullptr})), 2 * one);
}

}  // namespace
}  // namespace Host
