#include "host/RequestTexts.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>

#include "host/testing/Requests.h"
#include "orbis/Soap.h"

namespace Host {
namespace {

using namespace Host::Testing;
using testing::AllOf;
using testing::HasSubstr;
using testing::SizeIs;
using testing::StartsWith;

std::string Refusal(const std::function<void()>& write) {
  try {
    write();
    return "written";
  } catch (const Orbis::MethodFault::Exception& refused) {
    return OutcomeText(refused.GetFault().Get());
  }
}

// A name that control characters have no part in, but that XML cannot hold.
const std::string unwritable = "naa.\xEF\xBF\xBF";

TEST(RequestTexts, AreOneForEachDiskOrGroup) {
  EXPECT_THAT(ToTexts(*DisksNamed({"naa.1", "naa.2"})), SizeIs(2));
  EXPECT_THAT(ToTexts(*Mappings({MappingOf("naa.1", {"naa.2"})})), SizeIs(1));
  Tessa::Ref<Orbis::Any> read;
  Orbis::DeserializeSoapToObject(ToText(*MappingOf("naa.1", {"naa.2"})), read);
  EXPECT_EQ(dynamic_cast<const Nox::Kova::Host::DiskMapping&>(*read).GetSsd()->GetCanonicalName(), "naa.1");
}

TEST(RequestTexts, AreRefusedWhenANameComesOutOtherwise) {
  EXPECT_THAT(Refusal([] { ToTexts(*DisksNamed({"naa.1", unwritable})); }), StartsWith("disks[1] | "));
  EXPECT_THAT(Refusal([] { ToTexts(*Mappings({MappingOf("naa.1", {unwritable})})); }),
              StartsWith("mappings[0] | "));
  EXPECT_THAT(Refusal([] { ToText(*MappingOf(unwritable, {})); }), StartsWith("mapping | "));
}

TEST(RequestTexts, AreRefusedWhenTheReaderOfThePluginWouldNotTakeThem) {
  const DiskRef disk = ADisk("naa.1");
  disk->SetVendor(std::string(Orbis::Limits::OwnOutput().textBytes + 1, 'v'));
  EXPECT_THAT(Refusal([&] { ToTexts(*Disks({disk})); }),
              AllOf(StartsWith("disks[0] | "), HasSubstr("cannot be handed to the host")));
}

TEST(RequestTexts, AreBoundedTogether) {
  const auto disks = DisksNamed({"naa.1", "naa.2"});
  const Kovasvc::Texts texts = ToTexts(*disks);
  const std::size_t bytes = texts[0].size() + texts[1].size();
  EXPECT_EQ(ToTexts(*disks, bytes), texts);
  EXPECT_THAT(Refusal([&] { ToTexts(*disks, bytes - 1); }),
              AllOf(StartsWith("disks[1] | "), HasSubstr(std::to_string(bytes - 1) + " bytes")));
}

}  // namespace
}  // namespace Host
