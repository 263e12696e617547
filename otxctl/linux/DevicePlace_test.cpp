#include "otxctl/linux/DevicePlace.h"

#include <gtest/gtest.h>

#include "otxctl/linux/testing/SystemTree.h"

namespace OtxCtl::Linux {
namespace {

class DevicePlaceTest : public testing::Test {
 protected:
  std::string PlaceOfDisk(const std::string& name) const {
    const SysfsReader reader(_tree.Paths().sys);
    const BlockDevices devices(reader);
    return PlaceOf(reader, *devices.ByName(name));
  }

  SystemTree _tree;
};

TEST_F(DevicePlaceTest, IsTheBusAndTheWayBehindIt) {
  _tree.AddScsiDisk("sda", {});
  _tree.AddScsiDisk("sdb", {});
  _tree.AddNvmeDisk("nvme0n1", {});
  _tree.AddVirtioDisk("vda", {});
  EXPECT_EQ(PlaceOfDisk("sda"), "pci-0000:00:05.0-scsi-0:0:0:0");
  EXPECT_EQ(PlaceOfDisk("sdb"), "pci-0000:00:05.0-scsi-0:0:1:0");
  EXPECT_EQ(PlaceOfDisk("nvme0n1"), "pci-0000:01:00.0-nvme-1");
  EXPECT_EQ(PlaceOfDisk("vda"), "pci-0000:00:02.a");
  _tree.AddUsbDisk("sdc", {});
  EXPECT_EQ(PlaceOfDisk("sdc"), "pci-0000:00:06.0-usb-1:1.0-scsi-0:0:2:0");
}

TEST_F(DevicePlaceTest, HostsAreCountedFromTheFirstOfTheController) {
  const std::string pci = "sys/devices/pci0000:00/0000:00:1f.2";
  TestDisk disk;
  disk.place = pci + "/host4";
  _tree.AddScsiDisk("sda", disk);
  disk.place = pci + "/host6";
  _tree.AddScsiDisk("sdb", disk);
  _tree.Link(pci + "/subsystem", "../bus/pci");
  EXPECT_EQ(PlaceOfDisk("sda"), "pci-0000:00:1f.2-scsi-0:0:0:0");
  EXPECT_EQ(PlaceOfDisk("sdb"), "pci-0000:00:1f.2-scsi-2:0:1:0");
}

TEST_F(DevicePlaceTest, APortOfAtaIsTheController) {
  const std::string pci = "sys/devices/pci0000:00/0000:00:1f.2";
  TestDisk disk;
  disk.place = pci + "/ata5/host4";
  _tree.AddScsiDisk("sda", disk);
  _tree.Link(pci + "/subsystem", "../bus/pci");
  _tree.Write(pci + "/ata5/ata_port/ata5/port_no", "2\n");
  EXPECT_EQ(PlaceOfDisk("sda"), "pci-0000:00:1f.2-ata-2-scsi-0:0:0:0");
}

TEST_F(DevicePlaceTest, ADiskWithoutAPlaceHasItsName) {
  _tree.AddVirtual("nbd0", 512);
  EXPECT_EQ(PlaceOfDisk("nbd0"), "nbd0");
}

}  // namespace
}  // namespace OtxCtl::Linux
