#include "otxctl/linux/DeviceIdentity.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "otxctl/linux/testing/SystemTree.h"

namespace OtxCtl::Linux {
namespace {

using Disks::DiskIdentity;
using testing::HasSubstr;

class DeviceIdentityTest : public testing::Test {
 protected:
  template <typename Question>
  auto Ask(Question question, const std::string& name = "sda") const {
    const SysfsReader reader(_tree.Paths().sys);
    const BlockDevices devices(reader);
    return question(reader, *devices.ByName(name));
  }
  std::string Told(const std::string& name = "sda") const {
    const Disks::Fact<DiskIdentity> identity = Ask(IdentityOf, name);
    if (!identity.IsKnown()) {
      return identity.WhyUnknown();
    }
    const DiskIdentity& told = identity.Get();
    return told.worldWideName + "|" + told.vendor + "|" + told.model + "|" + told.serial;
  }

  SystemTree _tree;
};

std::string DeviceOf(const std::string& path) {
  return path.substr(0, path.rfind("/block/"));
}

TEST_F(DeviceIdentityTest, EachKindOfDiskIsAskedInItsPlace) {
  _tree.AddScsiDisk("sda", {.worldWideName = "naa.5000C50000000201", .serial = "S1"});
  _tree.AddNvmeDisk("nvme0n1", {.worldWideName = "eui.0025385b71b00600", .model = "FAST", .serial = "N1"});
  _tree.AddVirtioDisk("vda", {.serial = "V1"});
  _tree.AddNvmeMultipathDisk("nvme1n1", {{"nvme7", "pcie"}},
                             {.worldWideName = "eui.1", .model = "TWO PORTS", .serial = "N2"});
  _tree.AddVirtual("nbd0", 512);
  EXPECT_EQ(Told("sda"), "naa.5000c50000000201|LAB|HDD|S1");
  EXPECT_EQ(Told("nvme0n1"), "eui.0025385b71b00600||FAST|N1");
  EXPECT_EQ(Told("vda"), "|||V1");
  EXPECT_EQ(Told("nvme1n1"), "eui.1||TWO PORTS|N2");
  EXPECT_EQ(Told("nbd0"), "|||");
}

TEST_F(DeviceIdentityTest, TextsOfDisksAreCleaned) {
  const std::string device =
      DeviceOf(_tree.AddScsiDisk("sda", {.vendor = "L\x1B[1mAB", .serial = "S\n\"1\xFF\x7F"}));
  EXPECT_EQ(Told(), "|L[1mAB|HDD|S\"1\xEF\xBF\xBD");
  _tree.Write(device + "/wwid", "\n; $(reboot)\n");
  EXPECT_EQ(Told().substr(0, 7), "reboot|");
}

TEST_F(DeviceIdentityTest, WithoutAPageTheSerialNumberIsAnAttribute) {
  const std::string device = DeviceOf(_tree.AddScsiDisk("sda", {}));
  EXPECT_EQ(Told(), "|LAB|HDD|");
  _tree.Write(device + "/serial", "S2\n");
  EXPECT_EQ(Told(), "|LAB|HDD|S2");
  _tree.Write(device + "/vpd_pg80", std::string("\0\x80\0\x04    ", 8));
  EXPECT_EQ(Told(), "|LAB|HDD|S2") << "blanks are no serial number";
}

TEST_F(DeviceIdentityTest, OnUsbWithoutANumberOfItsOwnADiskHasThatOfTheUsbDevice) {
  const std::string device = DeviceOf(_tree.AddUsbDisk("sda", {}));
  const std::string usb = device.substr(0, device.find("/2-1/") + 4);
  _tree.Write(usb.substr(0, usb.rfind('/')) + "/serial", "of the hub\n");
  EXPECT_EQ(Told(), "|LAB|HDD|") << "what has no vendor's id is no USB device";
  _tree.Write(usb + "/idVendor", "46f4\n");
  EXPECT_EQ(Told(), "|LAB|HDD|");
  _tree.Write(usb + "/serial", "STICK1\n");
  EXPECT_EQ(Told(), "|LAB|HDD|STICK1");
  _tree.Write(device + "/vpd_pg80", std::string("\0\x80\0\x02S1", 6));
  EXPECT_EQ(Told(), "|LAB|HDD|S1");
}

TEST_F(DeviceIdentityTest, APartThatCannotBeReadMakesAllOfItUnknown) {
  const std::string device = DeviceOf(_tree.AddScsiDisk("sda", {.worldWideName = "naa.1", .serial = "S1"}));
  for (const char* const name : {"/wwid", "/vpd_pg80", "/vendor", "/model"}) {
    _tree.Remove(device + name);
    _tree.MakeFolder(device + name);
    EXPECT_THAT(Told(), HasSubstr(std::string(name) + ": Is a directory"));
    _tree.Remove(device + name);
  }
  _tree.Write(device + "/vpd_pg80", std::string("\0\x80\0\x05S123", 8));
  EXPECT_THAT(Told(), HasSubstr("/vpd_pg80: not a page of a serial number"));
}

TEST_F(DeviceIdentityTest, ADeviceThatLeadsNowhereIsUnknown) {
  const std::string path = _tree.AddScsiDisk("sda", {.serial = "S1"});
  _tree.Link(path + "/device", "../../../gone");
  EXPECT_THAT(Told(), HasSubstr("/device: No such file"));
  EXPECT_FALSE(Ask(StateOf).IsKnown());
  EXPECT_FALSE(Ask(WhyNoDisk).IsKnown());
}

TEST_F(DeviceIdentityTest, TheStateIsTheKernelsWord) {
  const std::string device = DeviceOf(_tree.AddScsiDisk("sda", {}));
  _tree.AddNvmeDisk("nvme0n1", {});
  _tree.AddVirtioDisk("vda", {});
  EXPECT_TRUE(Ask(StateOf).Is("running"));
  EXPECT_TRUE(Ask(StateOf, "nvme0n1").Is("live"));
  EXPECT_TRUE(Ask(StateOf, "vda").Is(""));
  _tree.Remove(device + "/state");
  EXPECT_THAT(Ask(StateOf).WhyUnknown(), HasSubstr("/state: does not exist"));
}

TEST_F(DeviceIdentityTest, OnlyDisksAreDisks) {
  const std::string device = DeviceOf(_tree.AddScsiDisk("sda", {}));
  EXPECT_TRUE(Ask(WhyNoDisk).Is(""));
  _tree.Write(device + "/type", "5\n");
  EXPECT_TRUE(Ask(WhyNoDisk).Is("an optical drive"));
  _tree.Write(device + "/type", "20\n");
  EXPECT_TRUE(Ask(WhyNoDisk).Is("a zoned disk"));
  _tree.Write(device + "/type", "31\n");
  EXPECT_TRUE(Ask(WhyNoDisk).Is("a SCSI device of kind 31"));
  _tree.Remove(device + "/type");
  EXPECT_FALSE(Ask(WhyNoDisk).IsKnown());
}

TEST(ParseSerialPage, ChecksEveryLength) {
  using std::string;
  EXPECT_EQ(ParseSerialPage(string("\0\x80\0\x02S1", 6)), "S1");
  EXPECT_EQ(ParseSerialPage(string("\0\x80\0\x01S1", 6)), "S") << "what follows is not part of it";
  EXPECT_EQ(ParseSerialPage(string("\0\x80\0\0", 4)), "");
  EXPECT_EQ(ParseSerialPage(string("\0\x80\0\x03S1", 6)), std::nullopt);
  EXPECT_EQ(ParseSerialPage(string("\0\x80\x01\0S1", 6)), std::nullopt);
  EXPECT_EQ(ParseSerialPage(string("\0\x83\0\x02S1", 6)), std::nullopt);
  EXPECT_EQ(ParseSerialPage(string("\0\x80\0", 3)), std::nullopt);
  EXPECT_EQ(ParseSerialPage(""), std::nullopt);
}

}  // namespace
}  // namespace OtxCtl::Linux
