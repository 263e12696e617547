#include "kovactl/replay/ReplayTexts.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/AgentApp.h"
#include "host/Inventory.h"
#include "machines/SimulatedInventory.h"
#include "nox/Host.h"
#include "nox/Kova.h"
#include "orbis/Engine.h"
#include "orbis/Soap.h"
#include "otxctl/sim/HostBuilder.h"
#include "tessa/Narrow.h"

namespace Kovactl {
namespace {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;
using OtxCtl::Sim::AHost;
using Tessa::MakeRef;
using Tessa::Ref;
using testing::ElementsAre;

// An application whose inventory holds a flash disk "naa.1" and a hard disk "naa.2".
class ReplayTexts : public testing::Test {
 protected:
  ReplayTexts() : _before(Tessa::Service::SetApp(&_app)) {
    const auto inventory = MakeRef<Host::Inventory>();
    inventory->Replace(Machines::DescribeInventory(AHost().WithSsd("naa.1").WithHdd("naa.2").Build()));
    _app.SetObject("storageSystem", inventory);
  }
  ~ReplayTexts() override { Tessa::Service::SetApp(_before); }

  static std::vector<std::string> TextsOf(const char* line) {
    ReplayRequest request = ParseReplayRequest(line);
    AddTexts(request);
    return request.arguments.texts;
  }

  template <class T>
  static Ref<T> Read(const std::string& text) {
    Ref<Orbis::Any> value;
    Orbis::DeserializeSoapToObject(text, value);
    return Tessa::NarrowToType<T>(value);
  }

  // A disk of which nothing is known but the name.
  static void ExpectOnlyName(const ScsiDisk& disk, const std::string& name) {
    ScsiDisk unknown;
    unknown.SetCanonicalName(name);
    EXPECT_TRUE(Orbis::Equal(&disk, &unknown)) << disk.ToString();
  }

  Host::AgentApp _app;

 private:
  Tessa::Service::App* _before;
};

TEST_F(ReplayTexts, ANameIsTheInventorysDisk) {
  const auto texts = TextsOf(R"({"operation": "AddDisks", "disks": ["naa.2", "naa.1"]})");
  ASSERT_EQ(texts.size(), 2u);
  const auto hdd = Read<ScsiDisk>(texts[0]);
  EXPECT_EQ(hdd->GetUuid(), "naa.2");
  EXPECT_FALSE(hdd->GetSsd());
  EXPECT_GT(hdd->GetCapacity()->GetBlock(), 0);
  EXPECT_TRUE(Read<ScsiDisk>(texts[1])->GetSsd());
}

TEST_F(ReplayTexts, ANameThatTheInventoryLacksIsADiskOfOnlyThatName) {
  const auto texts = TextsOf(R"({"operation": "AddDisks", "disks": ["naa.9", ""]})");
  ASSERT_EQ(texts.size(), 2u);
  ExpectOnlyName(*Read<ScsiDisk>(texts[0]), "naa.9");
  ExpectOnlyName(*Read<ScsiDisk>(texts[1]), "");
}

TEST_F(ReplayTexts, AnObjectIsTakenAsItIsWhateverTheInventorySays) {
  const auto texts =
      TextsOf(R"({"operation": "AddDisks", "disks": [{"canonicalName": "naa.2", "ssd": true}]})");
  const auto disk = Read<ScsiDisk>(texts.at(0));
  EXPECT_TRUE(disk->GetSsd());
  EXPECT_EQ(disk->GetUuid(), "");
}

TEST_F(ReplayTexts, AMappingIsOneTextWithItsDisksInOrder) {
  const auto texts = TextsOf(
      R"({"operation": "InitializeDisks", "mappings": [{"ssd": "naa.1", "nonSsd": ["naa.9", "naa.2"]}, {}]})");
  ASSERT_EQ(texts.size(), 2u);
  const auto mapping = Read<DiskMapping>(texts[0]);
  EXPECT_TRUE(mapping->GetSsd()->GetSsd());
  ASSERT_EQ(mapping->GetNonSsd()->Size(), 2u);
  ExpectOnlyName(*(*mapping->GetNonSsd())[0], "naa.9");
  EXPECT_EQ((*mapping->GetNonSsd())[1]->GetUuid(), "naa.2");
  EXPECT_FALSE(Read<DiskMapping>(texts[1])->GetSsd()->HasCanonicalName());
}

TEST_F(ReplayTexts, WithoutAnInventoryEveryNameIsUnknown) {
  _app.SetObject("storageSystem", nullptr);
  const auto texts = TextsOf(R"({"operation": "AddDisks", "disks": ["naa.1"]})");
  ExpectOnlyName(*Read<ScsiDisk>(texts.at(0)), "naa.1");
}

TEST_F(ReplayTexts, OfARawRequestAreUntouched) {
  EXPECT_THAT(TextsOf(R"({"operation": "raw", "hook": "AddDisksHookFn", "texts": ["naa.1", "<x", ""]})"),
              ElementsAre("naa.1", "<x", ""));
}

TEST_F(ReplayTexts, OfARequestWithoutDisksAreNone) {
  EXPECT_THAT(TextsOf(R"({"operation": "QueryDisksForKova", "names": ["naa.1"]})"), ElementsAre());
  EXPECT_THAT(TextsOf(R"({"operation": "AddDisks"})"), ElementsAre());
  EXPECT_THAT(TextsOf(R"({"operation": "RemoveDiskMapping"})"), ElementsAre());
}

}  // namespace
}  // namespace Kovactl
