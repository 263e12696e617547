#include "machines/SimulatedInventory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>

#include "nox/Host.h"
#include "orbis/Types.h"
#include "otxctl/sim/HostBuilder.h"

namespace Machines {
namespace {

using Nox::Host::ScsiDisk;
using Nox::Host::ScsiLun;
using Nox::Host::StorageDeviceInfo;
using OtxCtl::Sim::AHost;
using OtxCtl::Sim::HostDescription;
using OtxCtl::Sim::HostDisk;
using Tessa::Ref;
using testing::ElementsAre;

// Canonical names in order; "null" for a null entry.
std::vector<std::string> NamesOf(const StorageDeviceInfo& info) {
  std::vector<std::string> names;
  for (const ScsiLun* unit : *info.GetScsiLun()) {
    names.push_back(unit == nullptr ? "null" : unit->GetCanonicalName());
  }
  return names;
}

// The one disk of a host, as the inventory shows it.
Ref<ScsiDisk> Listed(const std::function<void(HostDisk&)>& edit) {
  const auto info = DescribeInventory(AHost().WithDisk("naa.1", true, edit).Build());
  return Ref<ScsiDisk>(dynamic_cast<ScsiDisk*>((*info->GetScsiLun())[0]));
}

TEST(SimulatedInventory, ShowsWhatADiskMustHave) {
  const auto disk = Listed([](HostDisk& described) {
    described.bytes = 4096 * 10 + 4095;
    described.blockSize = 4096;
  });
  ASSERT_TRUE(disk);
  EXPECT_EQ(disk->GetDeviceName(), "naa.1");
  EXPECT_EQ(disk->GetDeviceType(), "disk");
  EXPECT_EQ(disk->GetUuid(), "naa.1");
  EXPECT_EQ(disk->GetCanonicalName(), "naa.1");
  EXPECT_EQ(disk->GetLunType(), "disk");
  EXPECT_THAT(disk->GetOperationalState()->Items(), ElementsAre("ok"));
  EXPECT_EQ(disk->GetCapacity()->GetBlockSize(), 4096);
  EXPECT_EQ(disk->GetCapacity()->GetBlock(), 10) << "a block that is not whole does not count";
  EXPECT_TRUE(disk->GetSsd());
  EXPECT_TRUE(disk->GetLocal());
}

TEST(SimulatedInventory, LeavesUnsetWhatADiskDoesNotSay) {
  const auto disk = Listed({});
  EXPECT_FALSE(disk->HasDisplayName());
  EXPECT_FALSE(disk->HasVendor());
  EXPECT_FALSE(disk->HasModel());
  EXPECT_FALSE(disk->HasSerialNumber());
  EXPECT_FALSE(disk->HasTransport());
  EXPECT_FALSE(disk->GetDurableName());
  EXPECT_TRUE(!disk->GetAlternateName() || disk->GetAlternateName()->IsEmpty());
  EXPECT_FALSE(disk->GetStandardInquiry());
  EXPECT_FALSE(disk->GetKovaDiskInfo());
}

TEST(SimulatedInventory, ShowsEverythingThatADiskSays) {
  const auto disk = Listed([](HostDisk& described) {
    described.ssd = false;
    described.local = false;
    described.transport = "sas";
    described.vendor = "LAB";
    described.model = "HDD-4T";
    described.serial = "S1";
    described.displayName = "Disk 1";
    described.durableName = OtxCtl::Sim::DurableName{"t10", "one"};
    described.alternateName = {{"naa", "two"}, {"eui", "three"}};
    described.standardInquiry = std::vector<std::uint8_t>{0, 255};
  });
  EXPECT_FALSE(disk->GetSsd());
  EXPECT_FALSE(disk->GetLocal());
  EXPECT_EQ(disk->GetTransport(), "sas");
  EXPECT_EQ(disk->GetVendor(), "LAB");
  EXPECT_EQ(disk->GetModel(), "HDD-4T");
  EXPECT_EQ(disk->GetSerialNumber(), "S1");
  EXPECT_EQ(disk->GetDisplayName(), "Disk 1");
  EXPECT_EQ(disk->GetDurableName()->GetAuthority(), "t10");
  EXPECT_EQ(disk->GetDurableName()->GetIdentifier(), "one");
  ASSERT_EQ(disk->GetAlternateName()->Size(), 2u);
  EXPECT_EQ((*disk->GetAlternateName())[0]->GetAuthority(), "naa");
  EXPECT_EQ((*disk->GetAlternateName())[1]->GetIdentifier(), "three");
  EXPECT_THAT(disk->GetStandardInquiry()->GetValue(), ElementsAre(0, 255));
}

TEST(SimulatedInventory, KeepsAnEmptyTransportApartFromNone) {
  const auto disk = Listed([](HostDisk& described) { described.transport = ""; });
  ASSERT_TRUE(disk->HasTransport());
  EXPECT_EQ(disk->GetTransport(), "");
}

TEST(SimulatedInventory, LeavesOutDisksThatHaveLeftOrThatTheAgentDoesNotList) {
  const auto info =
      DescribeInventory(AHost()
                            .WithSsd("naa.1")
                            .WithDisk("naa.2", false, [](HostDisk& disk) { disk.absent = true; })
                            .WithDisk("naa.3", false, [](HostDisk& disk) { disk.inInventory = false; })
                            .WithDisk("naa.4", false, [](HostDisk& disk) { disk.inKernel = false; })
                            .Build());
  EXPECT_THAT(NamesOf(*info), ElementsAre("naa.1", "naa.4"));
}

TEST(SimulatedInventory, ListsOtherUnitsBehindTheDisksNamedByKindAndPlace) {
  const auto info = DescribeInventory(AHost()
                                          .WithHdds({"naa.2", "naa.1"})
                                          .Edit([](HostDescription& host) {
                                            host.otherLuns = {"tape", std::nullopt, "tape", "enclosure"};
                                          })
                                          .Build());
  EXPECT_THAT(NamesOf(*info), ElementsAre("naa.2", "naa.1", "tape0", "null", "tape2", "enclosure3"));
  const ScsiLun& tape = *(*info->GetScsiLun())[2];
  EXPECT_EQ(dynamic_cast<const ScsiDisk*>(&tape), nullptr);
  EXPECT_EQ(tape.GetDeviceName(), "tape0");
  EXPECT_EQ(tape.GetUuid(), "tape0");
  EXPECT_EQ(tape.GetDeviceType(), "tape");
  EXPECT_EQ(tape.GetLunType(), "tape");
  EXPECT_THAT(tape.GetOperationalState()->Items(), ElementsAre("ok"));
}

TEST(SimulatedInventory, OfAnEmptyHostIsAnEmptyList) {
  const auto info = DescribeInventory(HostDescription());
  ASSERT_TRUE(info->GetScsiLun());
  EXPECT_TRUE(info->GetScsiLun()->IsEmpty());
}

}  // namespace
}  // namespace Machines
