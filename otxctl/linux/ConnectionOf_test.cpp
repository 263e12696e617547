#include "otxctl/linux/ConnectionOf.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "otxctl/linux/testing/SystemTree.h"

namespace OtxCtl::Linux {
namespace {

using Disks::Attachment;
using testing::HasSubstr;

class ConnectionOfTest : public testing::Test {
 protected:
  // "machine sata", or why it is unknown.
  std::string Told(const std::string& name = "sda") const {
    const SysfsReader reader(_tree.Paths().sys);
    const BlockDevices devices(reader);
    const Disks::Fact<Disks::Connection> connection = ConnectionOf(reader, *devices.ByName(name));
    if (!connection.IsKnown()) {
      return "unknown: " + connection.WhyUnknown();
    }
    static const char* const words[] = {"machine", "usb", "firewire", "card", "remote", "virtual"};
    const std::string& transport = connection.Get().transport;
    return std::string(words[static_cast<int>(connection.Get().attachment)]) +
           (transport.empty() ? "" : " ") + transport;
  }
  bool IsPluggable(const std::string& name = "sda") const {
    const SysfsReader reader(_tree.Paths().sys);
    const BlockDevices devices(reader);
    return IsHotPlug(reader, *devices.ByName(name)).Get();
  }
  // A SCSI disk below `place`, of which every folder is given a subsystem: "pci0000:00", "0=pci", "host1".
  void AddAt(const std::string& place, const std::vector<std::pair<std::string, std::string>>& buses) {
    TestDisk disk;
    disk.place = "sys/devices/" + place;
    _tree.AddScsiDisk("sda", disk);
    for (const auto& [path, subsystem] : buses) {
      _tree.Link("sys/devices/" + path + "/subsystem", "../bus/" + subsystem);
    }
  }

  SystemTree _tree;
};

const std::string pci = "pci0000:00/0000:00:1f.2";

TEST_F(ConnectionOfTest, DisksOnBusesOfTheMachineAreAttachedToIt) {
  _tree.AddScsiDisk("sda", {});
  _tree.AddNvmeDisk("nvme0n1", {});
  _tree.AddVirtioDisk("vda", {});
  EXPECT_EQ(Told("sda"), "machine");
  EXPECT_EQ(Told("nvme0n1"), "machine nvme");
  EXPECT_EQ(Told("vda"), "machine virtio");
  EXPECT_FALSE(IsPluggable("sda"));
  EXPECT_FALSE(IsPluggable("nvme0n1"));
}

TEST_F(ConnectionOfTest, AHostTellsItsTransport) {
  AddAt(pci + "/host1", {{pci, "pci"}});
  EXPECT_EQ(Told(), "machine");
  _tree.MakeFolder("sys/devices/" + pci + "/host1/spi_host/host1");
  EXPECT_EQ(Told(), "machine spi");
  _tree.MakeFolder("sys/devices/" + pci + "/host1/sas_host/host1");
  EXPECT_EQ(Told(), "machine sas");
  _tree.MakeFolder("sys/devices/" + pci + "/host1/srp_host/host1");
  EXPECT_EQ(Told(), "remote srp");
  _tree.MakeFolder("sys/devices/" + pci + "/host1/fc_host/host1");
  EXPECT_EQ(Told(), "remote fc");
  _tree.MakeFolder("sys/devices/" + pci + "/host1/iscsi_host/host1");
  EXPECT_EQ(Told(), "remote iscsi");
}

TEST_F(ConnectionOfTest, AtaIsToldFromItsFolderAndDriver) {
  AddAt(pci + "/ata1/host1", {{pci, "pci"}});
  EXPECT_EQ(Told(), "machine ata");
  _tree.Write("sys/devices/" + pci + "/ata1/host1/scsi_host/host1/proc_name", "ahci\n");
  EXPECT_EQ(Told(), "machine sata");
}

TEST_F(ConnectionOfTest, ISCSIWithoutHardwareIsRemoteToo) {
  AddAt("platform/host3", {});
  _tree.MakeFolder("sys/devices/platform/host3/iscsi_host/host3");
  EXPECT_EQ(Told(), "remote iscsi");
}

TEST_F(ConnectionOfTest, UsbAnywhereInTheChainIsUsb) {
  _tree.AddUsbDisk("sda", {});
  EXPECT_EQ(Told(), "usb usb");
  EXPECT_TRUE(IsPluggable());
}

TEST_F(ConnectionOfTest, FireWireAndMemoryCardsAreTheirOwn) {
  AddAt(pci + "/fw0/fw0.0/host1", {{pci, "pci"}, {pci + "/fw0", "firewire"}});
  EXPECT_EQ(Told(), "firewire sbp");
  _tree.Link("sys/devices/" + pci + "/fw0/subsystem", "../bus/mmc");
  EXPECT_EQ(Told(), "card mmc");
  EXPECT_TRUE(IsPluggable());
}

TEST_F(ConnectionOfTest, SimulatedHostsAreNotHardware) {
  AddAt("pseudo_0/adapter0/host3", {{"pseudo_0/adapter0", "pseudo"}});
  EXPECT_EQ(Told(), "unknown: what sda hangs on: no bus of a machine that is known: block:scsi:pseudo");
  // Not even on a bus: what is not understood may be anything.
  _tree.Link("sys/devices/pseudo_0/subsystem", "../bus/pci");
  EXPECT_EQ(Told(), "unknown: what sda hangs on: no bus of a machine that is known: block:scsi:pseudo:pci");
  _tree.Remove("sys/devices/pseudo_0/adapter0/subsystem");
  EXPECT_EQ(Told(), "machine");
  _tree.Remove("sys/devices/pseudo_0/subsystem");
  EXPECT_EQ(Told(), "unknown: what sda hangs on: no bus of a machine that is known: block:scsi");
}

TEST_F(ConnectionOfTest, DevicesWithoutHardwareAreVirtualOrBehindANetwork) {
  for (const char* const name : {"loop0", "zram0", "md0", "nullb0"}) {
    _tree.AddVirtual(name, 512);
    EXPECT_EQ(Told(name), "virtual") << name;
  }
  _tree.AddVirtual("nbd0", 512);
  _tree.AddVirtual("drbd0", 512);
  _tree.AddVirtual("etherd!e0.0", 512);
  EXPECT_EQ(Told("nbd0"), "remote nbd");
  EXPECT_EQ(Told("drbd0"), "remote drbd");
  EXPECT_EQ(Told("etherd!e0.0"), "remote etherd");
  AddAt("rbd/0/host1", {{"rbd/0", "rbd"}});
  EXPECT_EQ(Told(), "remote rbd");
}

TEST_F(ConnectionOfTest, ADiskOfNvmeIsAsLocalAsItsController) {
  const std::string controller = "sys/devices/pci0000:00/0000:01:00.0/nvme/nvme0";
  _tree.AddNvmeDisk("nvme0n1", {});
  for (const auto& [transport, told] : std::vector<std::pair<std::string, std::string>>{
           {"tcp", "remote nvme by tcp"}, {"rdma", "remote nvme by rdma"}, {"fc", "remote nvme by fc"}}) {
    _tree.Write(controller + "/transport", transport + "\n");
    EXPECT_EQ(Told("nvme0n1"), told);
  }
  _tree.Write(controller + "/transport", "loop\n");
  EXPECT_NE(Told("nvme0n1").substr(0, 7), "machine");
  _tree.Write(controller + "/transport", "new\n");
  EXPECT_THAT(Told("nvme0n1"), HasSubstr("unknown: a transport of NVMe that is not known: \"new\""));
  _tree.Remove(controller + "/transport");
  EXPECT_THAT(Told("nvme0n1"), HasSubstr("unknown: "));
}

TEST_F(ConnectionOfTest, AFabricsControllerIsWhatItSays) {
  const std::string place = "sys/devices/virtual/nvme-fabrics/ctl";
  TestDisk disk;
  disk.place = place;
  _tree.AddNvmeDisk("nvme0n1", disk);
  _tree.Remove(place + "/subsystem");
  _tree.Write(place + "/nvme/nvme0/transport", "tcp\n");
  EXPECT_EQ(Told("nvme0n1"), "remote nvme by tcp");
  _tree.Write(place + "/nvme/nvme0/transport", "loop\n");
  EXPECT_EQ(Told("nvme0n1"), "virtual nvme by loop");
  _tree.Write(place + "/nvme/nvme0/transport", "pcie\n");
  EXPECT_THAT(Told("nvme0n1"), HasSubstr("unknown: "));
}

using Controllers = std::vector<std::vector<std::string>>;

TEST_F(ConnectionOfTest, ADiskBehindSeveralControllersIsAsLocalAsTheWorst) {
  const auto toldWith = [&](const Controllers& controllers) {
    _tree.Remove("sys/devices/virtual/nvme-subsystem");
    _tree.AddNvmeMultipathDisk("nvme0n1", controllers, {});
    return Told("nvme0n1");
  };
  EXPECT_EQ(toldWith({{"nvme0", "pcie"}}), "machine nvme");
  EXPECT_EQ(toldWith({{"nvme0", "pcie"}, {"nvme1", "pcie"}}), "machine nvme");
  EXPECT_EQ(toldWith({{"nvme0", "pcie"}, {"nvme1", "tcp"}}), "remote nvme by tcp");
  EXPECT_EQ(toldWith({{"nvme0", "rdma"}, {"nvme1", "pcie"}}), "remote nvme by rdma");
  EXPECT_THAT(toldWith({{"nvme0", "pcie"}, {"nvme1", "odd"}, {"nvme2", "pcie"}}), HasSubstr("unknown: "));
  EXPECT_THAT(toldWith({{"nvme0", "odd"}, {"nvme1", "pcie"}}), HasSubstr("unknown: "));
  EXPECT_EQ(toldWith({}), "unknown: what nvme0n1 hangs on: no controller leads to it");
}

TEST_F(ConnectionOfTest, AControllerThatCannotBeReadIsUnknown) {
  _tree.AddNvmeMultipathDisk("nvme0n1", {{"nvme0", "pcie"}, {"nvme1", "pcie"}}, {});
  _tree.Link("sys/devices/virtual/nvme-subsystem/nvme-subsys0/nvme1", "gone");
  EXPECT_THAT(Told("nvme0n1"), HasSubstr("unknown: "));
}

TEST_F(ConnectionOfTest, APortOutsideOfTheMachineMakesItPluggable) {
  AddAt(pci + "/host1", {{pci, "pci"}});
  _tree.Write("sys/devices/" + pci + "/removable", "fixed\n");
  EXPECT_FALSE(IsPluggable());
  _tree.Write("sys/devices/" + pci + "/removable", "removable\n");
  EXPECT_TRUE(IsPluggable());
}

}  // namespace
}  // namespace OtxCtl::Linux
