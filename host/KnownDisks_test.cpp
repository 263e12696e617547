#include "host/KnownDisks.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/AgentApp.h"
#include "host/Inventory.h"
#include "host/testing/Requests.h"
#include "machines/SimulatedInventory.h"
#include "otxctl/sim/HostBuilder.h"

namespace Host {
namespace {

using Nox::Host::ScsiLun;
using Nox::Host::StorageDeviceInfo;
using OtxCtl::Sim::AHost;
using Tessa::MakeRef;
using Tessa::Ref;

const std::string uuid = "01234567-89ab-cdef-0123-456789abcdef";

TEST(KnownDisks, AreFoundByTheirCanonicalName) {
  const KnownDisks known(Machines::DescribeInventory(AHost().WithSsd("naa.1").WithHdd("naa.2").Build()));
  EXPECT_TRUE(known.Find("naa.1")->GetSsd());
  EXPECT_FALSE(known.Find("naa.2")->GetSsd());
  EXPECT_FALSE(known.Find("naa.3"));
  EXPECT_FALSE(known.Find(""));
}

TEST(KnownDisks, AreNoOtherUnitsNorDisksWithoutAName) {
  const auto units = MakeRef<Orbis::DataArray<ScsiLun>>();
  const auto tape = MakeRef<ScsiLun>();
  tape->SetCanonicalName("tape0");
  units->Append(tape);
  units->Append(nullptr);
  units->Append(MakeRef<Nox::Host::ScsiDisk>());
  units->Append(Testing::ADisk("naa.1", true));
  const auto info = MakeRef<StorageDeviceInfo>();
  info->SetScsiLun(units);
  const KnownDisks known(info);
  EXPECT_FALSE(known.Find("tape0"));
  EXPECT_TRUE(known.Find("naa.1"));
}

TEST(KnownDisks, OfOneNameAreTheFirst) {
  const auto units = MakeRef<Orbis::DataArray<ScsiLun>>();
  const Ref<Nox::Host::ScsiDisk> first = Testing::ADisk("naa.1", true);
  units->Append(first);
  units->Append(Testing::ADisk("naa.1", false));
  const auto info = MakeRef<StorageDeviceInfo>();
  info->SetScsiLun(units);
  EXPECT_TRUE(KnownDisks(info).Find("naa.1")->GetSsd());
}

TEST(KnownDisks, ComeWithoutTheFieldsThatNoAnswerShows) {
  const Ref<Nox::Host::ScsiDisk> listed = Testing::ADisk("naa.1", true);
  listed->SetVendor("ACME");
  listed->SetDurableName(MakeRef<Nox::Host::DurableName>());
  const auto names = MakeRef<Orbis::DataArray<Nox::Host::DurableName>>();
  names->Append(MakeRef<Nox::Host::DurableName>());
  listed->SetAlternateName(names);
  listed->SetStandardInquiry(MakeRef<Orbis::Binary>(std::vector<unsigned char>{1, 2}));
  const auto units = MakeRef<Orbis::DataArray<ScsiLun>>();
  units->Append(listed);
  const auto info = MakeRef<StorageDeviceInfo>();
  info->SetScsiLun(units);
  const KnownDisks known(info);
  const auto found = known.Find("naa.1");
  EXPECT_EQ(found->GetVendor(), "ACME");
  EXPECT_FALSE(found->GetDurableName());
  EXPECT_FALSE(found->GetAlternateName());
  EXPECT_FALSE(found->GetStandardInquiry());
  EXPECT_EQ(known.Find("naa.1"), found) << "it is copied once";
  EXPECT_TRUE(listed->GetAlternateName()) << "the inventory stays as it is";
}

TEST(KnownDisks, NowAreThoseOfTheRegisteredStorageSystem) {
  EXPECT_FALSE(KnownDisks::Now().Find("naa.1")) << "there is no application";
  AgentApp app;
  Tessa::Service::SetApp(&app);
  EXPECT_FALSE(KnownDisks::Now().Find("naa.1")) << "it has no storage system";
  const auto inventory = MakeRef<Inventory>();
  app.SetObject("storageSystem", inventory);
  EXPECT_FALSE(KnownDisks::Now().Find("naa.1")) << "which has no inventory yet";
  inventory->Replace(Machines::DescribeInventory(AHost().WithSsd("naa.1").Build()));
  const KnownDisks known = KnownDisks::Now();
  inventory->Replace(nullptr);
  EXPECT_TRUE(known.Find("naa.1")) << "a snapshot stays as it was";
  Tessa::Service::SetApp(nullptr);
}

TEST(AbsentDisks, AreNamedByThePrefixAndAWholeUuid) {
  EXPECT_TRUE(IsAbsentName("kova:" + uuid));
  EXPECT_FALSE(IsAbsentName("kova:" + uuid + "0"));
  EXPECT_FALSE(IsAbsentName("kova:" + uuid.substr(1)));
  EXPECT_FALSE(IsAbsentName("KOVA:" + uuid));
  EXPECT_FALSE(IsAbsentName("kova:"));
  EXPECT_FALSE(IsAbsentName(""));
  EXPECT_EQ(AbsentName(uuid), "kova:" + uuid);
}

TEST(AbsentDisks, AreStoodInForByADiskInErrorWithTheirName) {
  const auto disk = AbsentDisk(uuid, true);
  EXPECT_EQ(disk->GetCanonicalName(), "kova:" + uuid);
  EXPECT_TRUE(disk->GetSsd());
  EXPECT_EQ(disk->GetUuid(), uuid);
  EXPECT_THAT(disk->GetOperationalState()->Items(), testing::ElementsAre("error"));
  EXPECT_THAT(disk->GetDisplayName(), testing::HasSubstr(uuid));
}

}  // namespace
}  // namespace Host
