#include "machines/LinuxMachine.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/HostError.h"
#include "kova/agentd/include/KovaInfo.h"
#include "machines/LinuxInventory.h"
#include "machines/LinuxVolumes.h"
#include "machines/Machines.h"
#include "nox/Host.h"
#include "orbis/Types.h"
#include "otxctl/linux/testing/TestMachine.h"
#include "tessa/Logger.h"
#include "tests/support/RecordingLogger.h"

namespace Machines {
namespace {

using Nox::Host::ScsiDisk;
using OtxCtl::Linux::TestMachine;
using testing::ElementsAre;

std::vector<std::string> NamesIn(const Tessa::Ref<Nox::Host::StorageDeviceInfo>& info) {
  std::vector<std::string> names;
  for (const Nox::Host::ScsiLun* unit : *info->GetScsiLun()) {
    names.push_back(unit->GetCanonicalName());
  }
  return names;
}

const ScsiDisk& DiskIn(const Tessa::Ref<Nox::Host::StorageDeviceInfo>& info, std::size_t index) {
  return dynamic_cast<const ScsiDisk&>(*(*info->GetScsiLun())[index]);
}

TEST(LinuxMachine, ListsItsDisksAsTheyAre) {
  TestMachine machine;
  machine.tree.AddScsiDisk(
      "sda", {.worldWideName = "naa.5000", .vendor = "LAB", .model = "SSD", .serial = "S1", .isFlash = true});
  machine.tree.AddUsbDisk("sdb", {.vendor = "", .model = "", .serial = "S2"});
  LinuxMachine served(machine.Host());
  const auto info = served.GetInventory();
  ASSERT_TRUE(info);
  ASSERT_EQ(info->GetScsiLun()->Size(), 2U);
  const ScsiDisk& flash = DiskIn(info, 0);
  EXPECT_EQ(flash.GetCanonicalName(), "naa.5000");
  EXPECT_EQ(flash.GetUuid(), "naa.5000");
  EXPECT_EQ(flash.GetLunType(), "disk");
  EXPECT_EQ(flash.GetDisplayName(), "LAB SSD (sda)");
  EXPECT_EQ(flash.GetVendor(), "LAB");
  EXPECT_EQ(flash.GetModel(), "SSD");
  EXPECT_EQ(flash.GetSerialNumber(), "S1");
  EXPECT_EQ(flash.GetDurableName()->GetAuthority(), "naa");
  EXPECT_EQ(flash.GetDurableName()->GetIdentifier(), "5000");
  EXPECT_THAT(flash.GetOperationalState()->Items(), ElementsAre("ok"));
  EXPECT_EQ(flash.GetCapacity()->GetBlock() * flash.GetCapacity()->GetBlockSize(), std::int64_t{4} << 30);
  EXPECT_TRUE(flash.GetSsd());
  EXPECT_TRUE(flash.GetLocal());
  EXPECT_FALSE(flash.HasDetail());
  const ScsiDisk& stick = DiskIn(info, 1);
  EXPECT_FALSE(stick.GetSsd());
  EXPECT_EQ(stick.GetTransport(), "usb");
  EXPECT_FALSE(stick.GetDurableName());
  EXPECT_FALSE(stick.HasVendor());
  EXPECT_THAT(stick.GetDetail(), testing::HasSubstr("attached by USB"));
}

TEST(LinuxMachine, ADiskThatIsNotRunningIsOff) {
  TestMachine machine;
  const std::string path = machine.tree.AddScsiDisk("sda", {.worldWideName = "naa.1", .serial = "S1"});
  machine.tree.Write(path + "/device/state", "offline\n");
  LinuxMachine served(machine.Host());
  EXPECT_THAT(DiskIn(served.GetInventory(), 0).GetOperationalState()->Items(), ElementsAre("off"));
}

TEST(LinuxInventory, SaysOfADiskBehindANetworkThatItIsNotLocal) {
  TestMachine machine;
  machine.tree.AddScsiDisk("sda", {.worldWideName = "naa.1", .serial = "S1"});
  OtxCtl::Linux::LinuxSnapshot seen = *machine.Host()->Look();
  seen.disks[0].facts.connection = OtxCtl::Disks::Connection{OtxCtl::Disks::Attachment::Remote, "iscsi"};
  EXPECT_FALSE(DiskIn(DescribeInventory(seen), 0).GetLocal());
  seen.disks[0].facts.connection = OtxCtl::Disks::Fact<OtxCtl::Disks::Connection>::Unknown("why");
  EXPECT_FALSE(DiskIn(DescribeInventory(seen), 0).HasLocal()) << "nobody knows";
}

TEST(LinuxMachine, TellsItsListenerWhenALookShowsSomethingElse) {
  TestMachine machine;
  const auto host = machine.Host();
  LinuxMachine served(host);
  EXPECT_THAT(NamesIn(served.GetInventory()), ElementsAre());
  std::vector<std::string> seen;
  served.SetListener([&] { seen = NamesIn(served.GetInventory()); });
  machine.tree.AddScsiDisk("sda", {.worldWideName = "naa.1", .serial = "S1"});
  served.MakeProvider()->RefreshKovaInfo();
  EXPECT_THAT(seen, ElementsAre("naa.1"));
  served.SetListener({});
  machine.tree.AddScsiDisk("sdb", {.worldWideName = "naa.2", .serial = "S2"});
  host->Look();
  EXPECT_THAT(seen, ElementsAre("naa.1"));
}

TEST(LinuxMachine, ThatCannotBeLookedAtListsNothingUntilItCan) {
  const auto logger = Tessa::MakeRef<TestSupport::RecordingLogger>();
  const auto before = Tessa::Service::GetDefaultLogger();
  Tessa::Service::SetDefaultLogger(logger);
  TestMachine machine;
  machine.tree.Remove("sys/class/block");
  LinuxMachine served(machine.Host());
  EXPECT_FALSE(served.GetInventory());
  Tessa::Service::SetDefaultLogger(before);
  const auto lines = logger->Lines(Tessa::Service::LogLevel::Warning);
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_EQ(lines[0].format, "This machine cannot be looked at: %1");
  machine.tree.MakeFolder("sys/class/block");
  machine.tree.AddScsiDisk("sda", {.worldWideName = "naa.1", .serial = "S1"});
  EXPECT_THAT(NamesIn(served.GetInventory()), ElementsAre("naa.1"));
}

TEST(LinuxMachine, ItsProvidersOutliveIt) {
  TestMachine machine;
  machine.tree.AddScsiDisk("sda", {.worldWideName = "naa.1", .serial = "S1"});
  auto served = std::make_unique<LinuxMachine>(machine.Host());
  const auto provider = served->MakeProvider();
  served.reset();
  std::vector<HostCtl::Kova::DiskResult> records;
  provider->QueryDisks({}, records, true);
  EXPECT_EQ(records.size(), 1U);
}

TEST(LinuxMachine, IsLookedAtOnceWhileALookIsHeld) {
  TestMachine machine;
  LinuxMachine served(machine.Host());
  const auto provider = served.MakeProvider();
  std::vector<HostCtl::Kova::DiskResult> records;
  auto look = served.HoldLook();
  provider->RefreshKovaInfo();
  machine.tree.AddScsiDisk("sda", {.worldWideName = "naa.1", .serial = "S1"});
  provider->RefreshKovaInfo();
  provider->QueryDisks({}, records, true);
  EXPECT_EQ(records.size(), 0U);
  look.reset();
  provider->QueryDisks({}, records, true);
  EXPECT_EQ(records.size(), 1U);
}

// "DISK PATH BYTES CACHESTATE"
std::vector<std::string> Lines(const std::vector<Host::DataVolume>& volumes) {
  std::vector<std::string> lines;
  for (const Host::DataVolume& volume : volumes) {
    lines.push_back(volume.disk + " " + volume.path + " " + std::to_string(volume.bytes) + " " +
                    volume.cacheState);
  }
  return lines;
}

TEST(LinuxVolumes, AreToldOfEachCapacityDiskThatHasOne) {
  OtxCtl::Linux::LinuxSnapshot seen;
  OtxCtl::Linux::DiskGroup& group = seen.groups.emplace_back();
  group.cache.canonicalName = "naa.1";
  for (const char* const name : {"naa.2", "naa.3", ""}) {
    OtxCtl::Linux::GroupMember& member = group.capacity.emplace_back();
    member.canonicalName = name;
    member.kovaUuid = std::string("u-") + name;
  }
  EXPECT_THAT(DescribeVolumes(seen), testing::IsEmpty());
  group.capacity[0].volume.path = "/dev/vg/data_2";
  group.capacity[0].volume.bytes = 4096;
  group.capacity[0].volume.cacheState = "cached, 37% used";
  group.capacity[2].volume.path = "/dev/vg/data_4";
  group.capacity[2].volume.cacheState = "inactive";
  EXPECT_THAT(Lines(DescribeVolumes(seen)),
              ElementsAre("naa.2 /dev/vg/data_2 4096 cached, 37% used", "kova:u- /dev/vg/data_4 0 inactive"));
}

TEST(LinuxMachine, WithoutDiskGroupsHasNoDataVolumes) {
  TestMachine machine;
  machine.tree.AddScsiDisk("sda", {.worldWideName = "naa.1", .serial = "S1"});
  EXPECT_THAT(LinuxMachine(machine.Host()).GetDataVolumes(), testing::IsEmpty());
}

TEST(LinuxMachine, IsNoSimulation) {
  TestMachine machine;
  EXPECT_EQ(LinuxMachine(machine.Host()).GetSimulation(), nullptr);
}

TEST(Machines, ThisMachineIsServedByItsName) {
  const auto machine = MakeMachine({.host = "linux", .settings = "/no/such/settings.json"});
  EXPECT_EQ(machine->GetSimulation(), nullptr);
  EXPECT_NO_THROW(machine->GetInventory());
  EXPECT_THROW(MakeMachine({.host = "linux", .save = true}), Host::HostError);
  EXPECT_THROW(MakeMachine({.host = "linux", .settings = "/dev/null"}), Host::HostError);
}

}  // namespace
}  // namespace Machines
