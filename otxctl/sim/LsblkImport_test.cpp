#include "otxctl/sim/LsblkImport.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

#include "otxctl/sim/HostFile.h"
#include "otxctl/sim/SimRules.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Sim {
namespace {

using nlohmann::json;
using testing::ElementsAre;
using testing::StartsWith;

constexpr std::int64_t kGibibyte = std::int64_t{1} << 30;

std::string LabText() {
  return ReadTextFile(KOVA_EXAMPLE_HOSTS "/lab-lsblk.json", 1 << 20);
}

// A device as lsblk shows it, changed by `changes`.
json Device(const std::string& changes = "{}") {
  json device =
      json::parse(R"({"name": "sda", "type": "disk", "size": 4294967296, "log-sec": 512, "rota": true,
    "ro": false, "tran": "sas", "wwn": "0x5000C50000000100", "vendor": "LAB     ", "model": "HDD 4G ",
    "serial": " S1 ", "fstype": null, "pttype": null, "subsystems": "block:scsi:pci", "mountpoints": [null],
    "pkname": null})");
  device.update(json::parse(changes));
  return device;
}

HostDescription Import(const std::vector<json>& devices) {
  return ImportLsblk(json{{"blockdevices", devices}}.dump());
}

HostDisk ImportOne(const std::string& changes) {
  return Import({Device(changes)}).disks.at(0);
}

std::string ErrorOf(std::string_view text) {
  try {
    ImportLsblk(text);
  } catch (const HostDescriptionError& error) {
    EXPECT_TRUE(Tessa::IsPrintable(error.what()));
    return error.what();
  }
  return "accepted";
}

TEST(LsblkImport, TakesTheLabMachineOver) {
  const HostDescription host = ImportLsblk(LabText());
  EXPECT_EQ(host.name, "imported");
  EXPECT_EQ(host.minimumDiskBytes, kGibibyte);
  std::vector<std::string> lines;
  for (const HostDisk& disk : host.disks) {
    const HostVerdict verdict = VerdictOn(host, disk, nullptr);
    lines.push_back(disk.name + (disk.ssd ? " ssd " : " hdd ") + std::to_string(verdict.state) + "/" +
                    std::to_string(verdict.reason));
  }
  EXPECT_THAT(lines,
              ElementsAre("naa.5000c50000000100 ssd 1/0", "naa.5000c50000000101 ssd 1/0",
                          "naa.5000c50000000200 hdd 1/0", "naa.5000c50000000201 hdd 1/0",
                          "naa.5000c50000000202 hdd 1/0", "naa.5000c50000000203 hdd 1/0",
                          "naa.5000c50000000204 hdd 1/0", "naa.5000c50000000205 hdd 1/0",
                          "naa.5000c50000000300 hdd 2/2", "naa.5000c50000000400 hdd 2/5",
                          "t10.QEMU_QEMU_HARDDISK_USBSTICK0001 hdd 2/3",
                          "nvme.1b36-4e564d4530303030353030-51454d55204e564d65204374726c-00000001 ssd 1/0"));
}

TEST(LsblkImport, TakesTheDetailsOfADiskOver) {
  const HostDisk disk = ImportOne("{}");
  EXPECT_EQ(disk.name, "naa.5000c50000000100");
  EXPECT_EQ(disk.bytes, 4294967296);
  EXPECT_EQ(disk.blockSize, 512);
  EXPECT_EQ(disk.transport, "sas");
  EXPECT_EQ(disk.vendor, "LAB");
  EXPECT_EQ(disk.model, "HDD 4G");
  EXPECT_EQ(disk.serial, "S1");
  EXPECT_EQ(disk.displayName, "LAB HDD 4G (sda)");
  EXPECT_TRUE(disk.local);
  EXPECT_EQ(disk.partitions, 0);
  EXPECT_FALSE(disk.verdict);
}

struct NameRow {
  const char* changes;
  const char* name;
};

TEST(LsblkImport, FindsTheMostTellingName) {
  const std::vector<NameRow> rows = {
      {R"({"wwn": "eui.0025385B71B00600"})", "eui.0025385b71b00600"},
      {R"({"wwn": "0x"})", "t10.LAB_HDD_4G_S1"},
      {R"({"wwn": null})", "t10.LAB_HDD_4G_S1"},
      {R"({"wwn": null, "vendor": null})", "t10.HDD_4G_S1"},
      {R"-({"wwn": null, "serial": "a/b\n c;$(d)"})-", "t10.LAB_HDD_4G_a_b_c_d"},
      {R"({"wwn": null, "serial": null})", "path.sda"},
      {R"({"wwn": "", "serial": "", "name": "vda", "vendor": "0x1af4", "model": null})", "path.vda"},
      {R"({"wwn": null, "serial": null, "name": "\u00e9"})", "path.disk"},
  };
  for (const NameRow& row : rows) {
    EXPECT_EQ(ImportOne(row.changes).name, row.name) << row.changes;
  }
}

TEST(LsblkImport, MakesNamesUnique) {
  const HostDescription host =
      Import({Device(), Device(R"({"name": "sdb"})"),
              Device(R"({"name": "sdc", "wwn": "naa.5000c50000000100.2"})"), Device(R"({"name": "sdd"})")});
  EXPECT_EQ(host.disks.at(0).name, "naa.5000c50000000100");
  EXPECT_EQ(host.disks.at(1).name, "naa.5000c50000000100.2");
  EXPECT_EQ(host.disks.at(2).name, "naa.5000c50000000100.2.2");
  EXPECT_EQ(host.disks.at(3).name, "naa.5000c50000000100.3");
}

TEST(LsblkImport, LeavesOutWhatIsNoWholeDisk) {
  for (const char* const changes :
       {R"({"type": "part"})", R"({"type": "loop"})", R"({"type": "rom"})", R"({"type": "lvm"})",
        R"({"size": 0})", R"({"size": null})", R"({"name": "zram0"})", R"({"name": "loop3"})",
        R"({"name": "sr0"})", R"({"name": "dm-1"})", R"({"name": "ram0"})"}) {
    EXPECT_TRUE(Import({Device(changes)}).disks.empty()) << changes;
  }
}

TEST(LsblkImport, ADiskThatIsUsedCountsAsPartitioned) {
  EXPECT_EQ(ImportOne(R"({"fstype": "ext4"})").partitions, 1);
  EXPECT_EQ(ImportOne(R"({"mountpoints": ["/"]})").partitions, 1);
  EXPECT_EQ(ImportOne(R"({"mountpoints": null, "mountpoint": "[SWAP]"})").partitions, 1);
  EXPECT_EQ(ImportOne(R"({"children": [{"name": "vg-lv", "type": "lvm", "size": 1}]})").partitions, 1);
  EXPECT_EQ(ImportOne(R"({"children": [{"name": "mpatha", "type": "mpath", "size": 1}]})").partitions, 1);
}

TEST(LsblkImport, CountsPartitions) {
  EXPECT_EQ(ImportOne(R"({"pttype": "gpt", "children": [{"name": "sda1", "type": "part", "size": 1},
                          {"name": "sda2", "type": "part", "size": 1}]})")
                .partitions,
            2);
  EXPECT_EQ(ImportOne(R"({"pttype": "gpt"})").partitions, 0) << "an empty partition table keeps no data";
}

TEST(LsblkImport, ReadsTheFlatFormToo) {
  const HostDescription host =
      Import({Device(), Device(R"({"name": "sda1", "type": "part", "pkname": "sda"})")});
  ASSERT_EQ(host.disks.size(), 1U);
  EXPECT_EQ(host.disks[0].partitions, 1);
}

TEST(LsblkImport, ReadsTheTextsOfOldVersions) {
  const HostDisk disk = ImportOne(R"({"size": "4096", "log-sec": "4096", "rota": "0", "ro": "1"})");
  EXPECT_EQ(disk.bytes, 4096);
  EXPECT_EQ(disk.blockSize, 4096);
  EXPECT_TRUE(disk.ssd);
  EXPECT_TRUE(disk.verdict);
}

TEST(LsblkImport, ARemoteDiskIsNotLocal) {
  for (const char* const changes : {R"({"tran": "iscsi"})", R"({"tran": "fc"})", R"({"tran": "fcoe"})",
                                    R"({"name": "rbd0", "tran": null})", R"({"name": "nbd0", "tran": null})",
                                    R"({"tran": null, "subsystems": "block:rbd"})"}) {
    EXPECT_FALSE(ImportOne(changes).local) << changes;
  }
}

TEST(LsblkImport, TransportIsWhatLsblkSaysAndUsbWhereTheDeviceHangsOnIt) {
  EXPECT_EQ(ImportOne(R"({"tran": null})").transport, std::nullopt);
  EXPECT_EQ(ImportOne(R"({"tran": null, "subsystems": "block:scsi:usb:pci"})").transport, "usb");
  EXPECT_EQ(ImportOne(R"({"tran": "nvme", "subsystems": "block:nvme:pci"})").transport, "nvme");
}

TEST(LsblkImport, AReadOnlyDiskIsNeverOffered) {
  const HostDescription host = Import({Device(R"({"ro": true})")});
  EXPECT_EQ(VerdictOn(host, host.disks.at(0), nullptr), (HostVerdict{2, 0}));
}

TEST(LsblkImport, CleansTextsOfDevices) {
  const HostDisk disk = ImportOne(R"({"model": "\u001b[31mX\u0000\u0085 ", "vendor": "\t"})");
  EXPECT_EQ(disk.model, "[31mX");
  EXPECT_EQ(disk.displayName, "[31mX (sda)");
}

TEST(LsblkImport, BadInputIsRefusedWithItsPath) {
  EXPECT_THAT(ErrorOf(""), StartsWith("line 1, column 1: "));
  EXPECT_THAT(ErrorOf("{}"), StartsWith("blockdevices: "));
  EXPECT_THAT(ErrorOf("[]"), StartsWith("blockdevices: "));
  EXPECT_THAT(ErrorOf(R"({"blockdevices": {}})"), StartsWith("blockdevices: "));
  EXPECT_THAT(ErrorOf(R"({"blockdevices": [1]})"), StartsWith("blockdevices[0]: "));
  EXPECT_THAT(ErrorOf(R"({"blockdevices": [{"type": "disk"}]})"), StartsWith("blockdevices[0].name: "));
  EXPECT_THAT(ErrorOf(R"({"blockdevices": [{"name": "sda"}]})"), StartsWith("blockdevices[0].type: "));
  EXPECT_THAT(ErrorOf(json{{"blockdevices", {Device(), Device(R"({"size": "4G"})")}}}.dump()),
              StartsWith("blockdevices[1].size: "));
  EXPECT_THAT(ErrorOf(json{{"blockdevices", {Device(R"({"size": -1})")}}}.dump()),
              StartsWith("blockdevices[0].size: "));
  EXPECT_THAT(ErrorOf(json{{"blockdevices", {Device(R"({"rota": "maybe"})")}}}.dump()),
              StartsWith("blockdevices[0].rota: "));
  EXPECT_THAT(ErrorOf(json{{"blockdevices", {Device(R"({"children": [{"name": 1}]})")}}}.dump()),
              StartsWith("blockdevices[0].children[0].name: "));
}

// The partitioned disk, the USB stick and the NVMe disk of the lab, without the blanks.
TEST(LsblkImport, ATextCutOffAnywhereIsRefused) {
  json lab = json::parse(LabText());
  json& devices = lab["blockdevices"];
  devices = json::array({devices[8], devices[10], devices[11]});
  const std::string whole = lab.dump();
  ASSERT_EQ(ErrorOf(whole), "accepted");
  for (std::size_t length = 0; length < whole.size(); ++length) {
    ASSERT_NE(ErrorOf(std::string_view(whole).substr(0, length)), "accepted") << length;
  }
}

TEST(LsblkImport, ATextWithOneByteChangedNeverDoesWorseThanAnError) {
  const std::string whole =
      json{{"blockdevices", {Device(R"({"children": [{"name": "p", "type": "part"}]})")}}}.dump();
  for (std::size_t position = 0; position < whole.size(); ++position) {
    for (const char byte : {'\0', '"', '{', ']', '\xFF', '9'}) {
      std::string changed = whole;
      changed[position] = byte;
      ErrorOf(changed);
    }
  }
}

TEST(LsblkImport, ManyDisksOfOneNameTakeLinearTime) {
  std::string text = R"({"blockdevices": [)";
  for (int number = 0; number < 50'000; ++number) {
    text += number == 0 ? "" : ",";
    text += R"({"name": "sda", "type": "disk", "size": 1, "wwn": "0x1"})";
  }
  EXPECT_EQ(ImportLsblk(text + "]}").disks.size(), 50'000U);
}

}  // namespace
}  // namespace OtxCtl::Sim
