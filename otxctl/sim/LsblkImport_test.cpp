#include "otxctl/sim/LsblkImport.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <nlohmann/json.hpp>

#include "otxctl/sim/HostFile.h"
#include "otxctl/sim/SimRules.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Sim {
namespace {

using nlohmann::json;
using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::StartsWith;

constexpr std::int64_t gibibyte = std::int64_t{1} << 30;

std::string LabText() {
  return ReadTextFile(KOVA_EXAMPLE_HOSTS "/lab-lsblk.json", 1 << 20);
}

// A free disk as lsblk shows it, changed by `changes`.
json Device(const std::string& changes = "{}") {
  json device = json::parse(R"({"name": "sda", "kname": "sda", "type": "disk", "size": 4294967296,
    "log-sec": 512, "rota": true, "ro": false, "rm": false, "hotplug": false, "state": "running", "tran": "sas",
    "wwn": "0x5000C50000000100", "vendor": "LAB     ", "model": "HDD 4G ", "serial": " S1 ", "fstype": null,
    "fsver": null, "label": null, "uuid": null, "pttype": null, "ptuuid": null, "zoned": "none",
    "subsystems": "block:scsi:pci", "mountpoints": [null], "pkname": null})");
  device.update(json::parse(changes));
  return device;
}

// Another disk than that of Device(): another name, WWN and serial number.
json OtherDevice(const std::string& name, const std::string& changes = "{}") {
  json device = Device(json{{"name", name}, {"kname", name}, {"wwn", "0x" + name}, {"serial", name}}.dump());
  device.update(json::parse(changes));
  return device;
}

// A device that stands on another.
json Above(const std::string& name, const std::string& type, const std::string& changes = "{}") {
  json device = Device(json{
      {"name", name},
      {"kname", name},
      {"type", type},
      {"wwn", nullptr},
      {"serial", nullptr},
      {"subsystems", "block"},
      {"tran", nullptr}}.dump());
  device.update(json::parse(changes));
  return device;
}

json With(json device, const std::vector<json>& children) {
  device["children"] = children;
  return device;
}

std::string Capture(const std::vector<json>& devices) {
  return json{{"blockdevices", devices}}.dump();
}

LsblkImport Import(const std::vector<json>& devices) {
  return ImportLsblk(Capture(devices));
}

HostDisk ImportOne(const std::string& changes) {
  return Import({Device(changes)}).host.disks.at(0);
}

// "1/0" and the like, and why.
std::string VerdictOf(const HostDescription& host, const HostDisk& disk) {
  const HostVerdict verdict = VerdictOn(host, disk, nullptr);
  return std::to_string(verdict.state) + "/" + std::to_string(verdict.reason) +
         (disk.detail.empty() ? "" : " " + disk.detail);
}

std::vector<std::string> VerdictsOf(const LsblkImport& import) {
  std::vector<std::string> verdicts;
  for (const HostDisk& disk : import.host.disks) {
    verdicts.push_back(disk.name + " " + VerdictOf(import.host, disk));
  }
  return verdicts;
}

std::string VerdictOnOne(const json& device) {
  const LsblkImport import = Import({device});
  return VerdictOf(import.host, import.host.disks.at(0));
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

std::string ErrorOf(const std::vector<json>& devices) {
  return ErrorOf(Capture(devices));
}

TEST(LsblkImport, TakesTheLabMachineOver) {
  const LsblkImport import = ImportLsblk(LabText());
  EXPECT_EQ(import.host.name, "imported");
  EXPECT_EQ(import.host.minimumDiskBytes, gibibyte);
  std::vector<std::string> lines;
  for (const HostDisk& disk : import.host.disks) {
    lines.push_back(disk.name + (disk.ssd ? " ssd " : " hdd ") + VerdictOf(import.host, disk));
  }
  EXPECT_THAT(lines,
              ElementsAre("naa.5000c50000000100 ssd 1/0", "naa.5000c50000000101 ssd 1/0",
                          "naa.5000c50000000200 hdd 1/0", "naa.5000c50000000201 hdd 1/0",
                          "naa.5000c50000000202 hdd 1/0", "naa.5000c50000000203 hdd 1/0",
                          "naa.5000c50000000204 hdd 1/0", "naa.5000c50000000205 hdd 1/0",
                          "naa.5000c50000000300 hdd 2/2 gpt partition table with 1 partition",
                          "naa.5000c50000000400 hdd 2/5 64 MiB, smaller than 1 GiB",
                          "t10.QEMU_QEMU_HARDDISK_USBSTICK0001 hdd 2/3 attached by USB, removable, hot-plug",
                          "nvme.1b36-4e564d4530303030353030-51454d55204e564d65204374726c-00000001 ssd 1/0"));
  EXPECT_THAT(import.kernelNames, ElementsAre("sda", "sdb", "sdc", "sdd", "sde", "sdf", "sdg", "sdh", "sdi",
                                              "sdj", "sdk", "nvme0n1"));
  EXPECT_THAT(import.leftOut, IsEmpty());
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
  EXPECT_EQ(disk.detail, "");
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
      Import({Device(), Device(R"({"name": "sdb", "kname": "sdb"})"),
              Device(R"({"name": "sdc", "kname": "sdc", "wwn": "naa.5000c50000000100.2"})"),
              Device(R"({"name": "sdd", "kname": "sdd"})")})
          .host;
  EXPECT_EQ(host.disks.at(0).name, "naa.5000c50000000100");
  EXPECT_EQ(host.disks.at(1).name, "naa.5000c50000000100.2");
  EXPECT_EQ(host.disks.at(2).name, "naa.5000c50000000100.2.2");
  EXPECT_EQ(host.disks.at(3).name, "naa.5000c50000000100.3");
}

TEST(LsblkImport, LeavesOutWhatIsNoDiskAndSaysWhy) {
  for (const auto& [changes, why] : std::vector<std::pair<const char*, const char*>>{
           {R"({"type": "loop"})", "no disk, but of type loop"},
           {R"({"type": "rom"})", "no disk, but of type rom"},
           {R"({"size": 0})", "without a medium"},
           {R"({"name": "zram0", "subsystems": "block", "tran": null})",
            "a virtual device: attached to no hardware"}}) {
    const LsblkImport import = Import({Device(changes)});
    EXPECT_THAT(import.host.disks, IsEmpty()) << changes;
    ASSERT_EQ(import.leftOut.size(), 1U);
    EXPECT_EQ(import.leftOut[0].why, why);
  }
}

TEST(LsblkImport, ADiskThatIsUsedIsNeitherOfferedNorFormatted) {
  for (const auto& [changes, detail] : std::vector<std::pair<const char*, const char*>>{
           {R"({"fstype": "ext4", "label": "DATA"})", "ext4 file system \"DATA\""},
           {R"({"fstype": "ext4", "mountpoints": ["/data", null]})", "ext4 file system, mounted at /data"},
           {R"({"fstype": "swap", "mountpoints": null, "mountpoint": "[SWAP]"})",
            "swap space, mounted at [SWAP]"},
           {R"({"fstype": "mpath_member"})", "path of a multipath device"},
           {R"({"uuid": "1234"})", "UUID 1234"},
           {R"({"label": "DATA"})", "label DATA"},
           {R"({"fsver": "1.0"})", "FSVER 1.0"},
           {R"({"partuuid": "7"})", "PARTUUID 7"},
           {R"({"pttype": "gpt"})", "gpt partition table"},
           {R"({"ptuuid": "1234"})", "unnamed partition table"}}) {
    const HostDisk disk = ImportOne(changes);
    EXPECT_EQ(VerdictOnOne(Device(changes)), std::string("2/2 ") + detail);
    EXPECT_GT(disk.partitions, 0) << changes;
  }
}

TEST(LsblkImport, WhatStandsOnADiskUsesIt) {
  EXPECT_EQ(
      VerdictOnOne(With(Device(), {Above("vg-lv", "lvm", R"({"fstype": "xfs", "mountpoints": ["/srv"]})")})),
      "2/2 mounted at /srv (vg-lv), held by vg-lv (lvm)");
  EXPECT_EQ(VerdictOnOne(With(Device(), {Above("bcache0", "disk")})), "2/2 held by bcache0 (disk)");
  EXPECT_EQ(VerdictOnOne(With(Device(R"({"pttype": "gpt"})"),
                              {With(Above("sda1", "part", R"({"pttype": "gpt"})"),
                                    {Above("md0", "raid1", R"({"fstype": "ext4", "mountpoints": ["/"]})")}),
                               Above("sda2", "part", R"({"pttype": "gpt"})")})),
            "2/2 gpt partition table with 2 partitions, mounted at / (md0)");
}

TEST(LsblkImport, ReadsTheFlatFormToo) {
  const LsblkImport import = Import(
      {Device(R"({"pttype": "dos"})"), Above("sda1", "part", R"({"pkname": "sda", "pttype": "dos"})")});
  EXPECT_THAT(VerdictsOf(import),
              ElementsAre("naa.5000c50000000100 2/2 dos partition table with 1 partition"));
}

TEST(LsblkImport, ReadsNamesWithAndWithoutFoldersAlike) {
  const LsblkImport import =
      Import({Device(R"({"name": "/dev/sda", "kname": "/dev/sda", "pttype": "dos"})"),
              Above("/dev/sda1", "part", R"({"pkname": "/dev/sda", "pttype": "dos"})")});
  EXPECT_THAT(import.kernelNames, ElementsAre("sda"));
  EXPECT_EQ(import.host.disks.at(0).displayName, "LAB HDD 4G (sda)");
  EXPECT_EQ(import.host.disks.at(0).partitions, 1);
}

TEST(LsblkImport, ReadsTheTextsOfOldVersions) {
  const HostDisk disk =
      ImportOne(R"({"size": "4096", "log-sec": "4096", "rota": "0", "ro": "1", "rm": "0", "hotplug": "0"})");
  EXPECT_EQ(disk.bytes, 4096);
  EXPECT_EQ(disk.blockSize, 4096);
  EXPECT_TRUE(disk.ssd);
  EXPECT_THAT(disk.detail, HasSubstr("read-only"));
}

TEST(LsblkImport, ReadsTheEscapedBytesOfOldVersions) {
  std::string capture = Capture({Device(R"({"model": "HDD@4G@@"})")});
  for (std::size_t at = capture.find('@'); at != std::string::npos; at = capture.find('@')) {
    capture.replace(at, 1, "\\x20");
  }
  EXPECT_EQ(ImportLsblk(capture).host.disks.at(0).model, "HDD 4G");
}

TEST(LsblkImport, ADiskThatIsNotFitIsNeverOffered) {
  for (const auto& [changes, verdict] : std::vector<std::pair<const char*, const char*>>{
           {R"({"ro": true})", "2/4 read-only"},
           {R"({"rm": true})", "2/4 removable"},
           {R"({"hotplug": true})", "2/4 hot-plug"},
           {R"({"state": "offline"})", "2/4 not running: offline"},
           {R"({"zoned": "host-managed"})", "2/4 zoned: host-managed"},
           {R"({"zoned": "host-aware"})", "2/4 zoned: host-aware"},
           {R"({"tran": "sbp"})", "2/4 attached by FireWire"},
           {R"({"tran": null, "subsystems": "block:mmc:mmc_host:pci"})", "2/4 an SD or MMC device"},
           {R"({"tran": "usb"})", "2/3 attached by USB"},
           {R"({"tran": "iscsi"})", "2/1 not local: iscsi"},
           {R"({"tran": null, "subsystems": "block:rbd"})", "2/1 not local"},
           {R"({"size": 1073741823})", "2/5 1073741823 bytes, smaller than 1 GiB"}}) {
    EXPECT_EQ(VerdictOnOne(Device(changes)), verdict) << changes;
  }
}

TEST(LsblkImport, WhatTheCaptureDoesNotSayIsNotTakenForNo) {
  for (const auto& [changes, why] : std::vector<std::pair<const char*, const char*>>{
           {R"({"rota": null})", "the capture has no ROTA of sda"},
           {R"({"ro": null})", "the capture has no RO of sda"},
           {R"({"rm": null})", "the capture has no RM of sda"},
           {R"({"hotplug": null})", "the capture has no HOTPLUG of sda"},
           {R"({"size": null})", "the capture has no SIZE of sda"},
           {R"({"subsystems": null, "tran": null})", "the capture has no SUBSYSTEMS of sda"},
           {R"({"wwn": null, "serial": null})",
            "it has neither a world wide name nor a serial number to be told by"}}) {
    EXPECT_EQ(VerdictOnOne(Device(changes)), std::string("2/4 nobody knows: ") + why);
    EXPECT_FALSE(ImportOne(R"({"rota": null})").ssd);
  }
}

TEST(LsblkImport, NullIsAnAnswerWhereThereMayBeNone) {
  EXPECT_EQ(VerdictOnOne(Device(R"({"state": null, "tran": null, "zoned": null, "vendor": null, "model": null,
                                 "log-sec": null, "subsystems": "block:virtio:pci"})")),
            "1/0");
}

TEST(LsblkImport, AMissingColumnIsAnErrorThatNamesItAndTheCommand) {
  for (const char* const column :
       {"kname", "fstype", "label", "uuid", "pttype", "ptuuid", "ro", "rm", "hotplug", "serial", "size",
        "state", "rota", "model", "wwn", "subsystems", "tran", "zoned", "mountpoints"}) {
    json device = Device();
    device.erase(column);
    std::string name = column;
    std::transform(name.begin(), name.end(), name.begin(),
                   [](char c) { return static_cast<char>(toupper(c)); });
    EXPECT_THAT(ErrorOf({device}),
                AllOf(StartsWith("blockdevices[0]: the capture has no column " + name + ";"),
                      HasSubstr("run: lsblk --json -O -b")));
  }
  json device = Device();
  device.erase("fsver");
  device.erase("pkname");
  device.erase("vendor");
  EXPECT_EQ(ErrorOf({device}), "accepted") << "nothing hangs on these";
}

TEST(LsblkImport, OldVersionsHaveOneMountPoint) {
  json device = Device(R"({"fstype": "ext4", "mountpoint": "/data"})");
  device.erase("mountpoints");
  EXPECT_EQ(VerdictOnOne(device), "2/2 ext4 file system, mounted at /data");
}

TEST(LsblkImport, ADeviceWithoutTheOneItStandsOnIsRefused) {
  for (const char* const type : {"part", "lvm", "crypt", "raid1", "md", "mpath", "dm", "linear"}) {
    EXPECT_THAT(ErrorOf({Device(), Above("x", type)}),
                AllOf(StartsWith("blockdevices[1]: x is of type " + std::string(type)),
                      HasSubstr("run: lsblk --json -O -b")));
  }
  EXPECT_THAT(ErrorOf({Device(), Above("sdb1", "part", R"({"pkname": "sdb"})")}),
              StartsWith("blockdevices[1]: sdb1 stands on sdb, which the capture does not show"));
}

TEST(LsblkImport, ACaptureWithoutWhatStandsOnDisksIsRefused) {
  json lab = json::parse(LabText());
  for (json& device : lab["blockdevices"]) {
    device.erase("children");
  }
  EXPECT_THAT(ErrorOf(lab.dump()), AllOf(StartsWith("blockdevices[8]: sdi carries"), HasSubstr("-d")));
  EXPECT_THAT(ErrorOf({Device(), OtherDevice("sdb", R"({"fstype": "LVM2_member"})")}),
              StartsWith("blockdevices[1]: sdb carries"));
}

TEST(LsblkImport, ACaptureOfALsblkThatSawNothingOnTheDisksIsRefused) {
  EXPECT_THAT(ErrorOf({Device(R"({"mountpoints": ["/"]})")}),
              AllOf(StartsWith("blockdevices[0]: sda is mounted at /"), HasSubstr("udev")));
  EXPECT_THAT(ErrorOf({With(Device(), {Above("sda1", "part", R"({"mountpoints": ["/boot"]})")})}),
              AllOf(StartsWith("blockdevices[0].children[0]: sda1 is mounted at /boot"), HasSubstr("udev")));
  EXPECT_THAT(ErrorOf({With(Device(), {Above("sda1", "part")}), OtherDevice("sdb")}),
              AllOf(StartsWith("blockdevices[0].children[0]: sda1 is a partition"), HasSubstr("udev")));
}

TEST(LsblkImport, TwoPathsToOneDiskAreNotOfferedAndEachNamesTheOther) {
  EXPECT_THAT(VerdictsOf(Import({Device(), Device(R"({"name": "sdb", "kname": "sdb"})")})),
              ElementsAre("naa.5000c50000000100 2/4 same disk as naa.5000c50000000100.2 (sdb): two paths",
                          "naa.5000c50000000100.2 2/4 same disk as naa.5000c50000000100 (sda): two paths"));
  EXPECT_THAT(VerdictsOf(Import(
                  {Device(R"({"wwn": null})"), Device(R"({"wwn": null, "name": "sdb", "kname": "sdb"})")})),
              ElementsAre(HasSubstr("two paths"), HasSubstr("two paths")));
}

TEST(LsblkImport, OneDeviceThatIsListedTwiceIsOne) {
  EXPECT_THAT(VerdictsOf(Import({Device(), Device()})), ElementsAre("naa.5000c50000000100 1/0"));
  EXPECT_THAT(VerdictsOf(Import({Device(), Device(R"({"fstype": "ext4"})")})),
              ElementsAre("naa.5000c50000000100 2/2 ext4 file system"));
  EXPECT_THAT(VerdictsOf(Import({Device(), Device(R"({"rota": false})")})),
              ElementsAre("naa.5000c50000000100 2/4 nobody knows: the capture has no ROTA of sda"));
  EXPECT_THAT(ErrorOf({Device(), Device(R"({"serial": "S2"})")}), StartsWith("blockdevices[1]: is sda of"));
}

TEST(LsblkImport, AMultipathDeviceIsOfferedAsTheDiskItIs) {
  const json map = Above("mpatha", "mpath", R"({"kname": "dm-0"})");
  const LsblkImport import =
      Import({With(Device(R"({"fstype": "mpath_member"})"), {map}),
              With(Device(R"({"name": "sdb", "kname": "sdb", "fstype": "mpath_member"})"), {map})});
  EXPECT_THAT(VerdictsOf(import), ElementsAre("naa.5000c50000000100 1/0"));
  EXPECT_THAT(import.kernelNames, ElementsAre("mpatha"));
  EXPECT_EQ(import.host.disks.at(0).displayName, "LAB HDD 4G (mpatha)");
  ASSERT_EQ(import.leftOut.size(), 2U);
  EXPECT_EQ(import.leftOut[0].name, "sda");
  EXPECT_THAT(import.leftOut[0].why, HasSubstr("a path of the multipath device mpatha"));
}

TEST(LsblkImport, AMultipathDeviceIsAsUnfitAsItsPathsAndAsUsedAsItself) {
  const auto verdict = [](const char* ofSecondPath, const json& map) {
    json second = Device(R"({"name": "sdb", "kname": "sdb"})");
    second.update(json::parse(ofSecondPath));
    return VerdictsOf(Import({With(Device(), {map}), With(second, {map})})).at(0);
  };
  const json map = Above("mpatha", "mpath", R"({"kname": "dm-0"})");
  EXPECT_EQ(verdict(R"({"tran": "fc"})", map), "naa.5000c50000000100 2/1 not local: fc");
  EXPECT_EQ(verdict(R"({"rm": true})", map), "naa.5000c50000000100 2/4 removable");
  EXPECT_EQ(verdict(R"({"fstype": "ext4"})", map), "naa.5000c50000000100 2/2 ext4 file system");
  EXPECT_THAT(verdict(R"({"serial": "S2"})", map),
              HasSubstr("the paths of mpatha do not say the same of it"));
  EXPECT_EQ(verdict("{}", With(map, {Above("mpatha1", "part", R"({"pttype": "gpt"})")}))
                .substr(0, std::string("naa.5000c50000000100 2/2").size()),
            "naa.5000c50000000100 2/2");
}

TEST(LsblkImport, CleansTextsOfDevices) {
  const HostDisk disk = ImportOne(R"({"model": "\u001b[31mX\u0000\u0085 ", "vendor": "\t"})");
  EXPECT_EQ(disk.model, "[31mX");
  EXPECT_EQ(disk.displayName, "[31mX (sda)");
}

TEST(LsblkImport, WhatIsNoCaptureIsRefusedWithAWordOnHowToMakeOne) {
  EXPECT_EQ(ErrorOf(""), "the capture is empty; run: lsblk --json -O -b");
  EXPECT_EQ(ErrorOf(" \n"), "the capture is empty; run: lsblk --json -O -b");
  EXPECT_THAT(ErrorOf("NAME MAJ:MIN RM SIZE RO TYPE\nsda 8:0 0 4G 0 disk\n"),
              AllOf(StartsWith("line 1, column 1: "), HasSubstr("run: lsblk --json -O -b")));
  for (const char* const text : {"{}", "[]"}) {
    EXPECT_THAT(ErrorOf(text), AllOf(StartsWith("blockdevices: "), HasSubstr("run: lsblk --json -O -b")));
  }
}

TEST(LsblkImport, BadInputIsRefusedWithItsPath) {
  EXPECT_THAT(ErrorOf(R"({"blockdevices": {}})"), StartsWith("blockdevices: "));
  EXPECT_THAT(ErrorOf(R"({"blockdevices": [1]})"), StartsWith("blockdevices[0]: "));
  EXPECT_THAT(ErrorOf(R"({"blockdevices": [{"type": "disk"}]})"), StartsWith("blockdevices[0].name: "));
  EXPECT_THAT(ErrorOf(R"({"blockdevices": [{"name": "sda"}]})"), StartsWith("blockdevices[0].type: "));
  for (const auto& [changes, path] :
       std::vector<std::pair<const char*, const char*>>{{R"({"size": "4G"})", "size"},
                                                        {R"({"size": -1})", "size"},
                                                        {R"({"size": 4.5})", "size"},
                                                        {R"({"rota": "maybe"})", "rota"},
                                                        {R"({"fstype": 1})", "fstype"},
                                                        {R"({"mountpoints": "/"})", "mountpoints"},
                                                        {R"({"mountpoints": [1]})", "mountpoints"}}) {
    EXPECT_THAT(ErrorOf({OtherDevice("sdb"), Device(changes)}),
                StartsWith(std::string("blockdevices[1].") + path + ": "));
  }
  EXPECT_THAT(ErrorOf({Device(R"({"children": [{"name": 1}]})")}),
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
  const std::string whole = Capture({With(Device(R"({"pttype": "gpt"})"), {Above("p", "part")})});
  for (std::size_t position = 0; position < whole.size(); ++position) {
    for (const char byte : {'\0', '"', ']', '\xFF', '\\'}) {
      std::string changed = whole;
      changed[position] = byte;
      ErrorOf(changed);
    }
  }
}

// Dropping what a capture says of a device, or adding a trace of use, never makes a disk of it eligible.
TEST(LsblkImport, ACaptureThatSaysLessNeverOffersMore) {
  const json lab = json::parse(LabText());
  std::vector<std::string> free;
  const auto freeIn = [](const json& capture) {
    std::vector<std::string> names;
    try {
      const LsblkImport import = ImportLsblk(capture.dump());
      for (std::size_t i = 0; i < import.host.disks.size(); ++i) {
        if (VerdictOn(import.host, import.host.disks[i], nullptr).state == 1) {
          names.push_back(import.kernelNames[i]);
        }
      }
    } catch (const HostDescriptionError&) {
      // Then nothing is offered.
    }
    return names;
  };
  const std::vector<std::string> before = freeIn(lab);
  ASSERT_EQ(before.size(), 9U);
  for (std::size_t index = 0; index < lab["blockdevices"].size(); ++index) {
    for (const auto& [key, value] : lab["blockdevices"][index].items()) {
      json dropped = lab;
      dropped["blockdevices"][index].erase(key);
      json emptied = lab;
      emptied["blockdevices"][index][key] = nullptr;
      for (const json& changed : {dropped, emptied}) {
        for (const std::string& name : freeIn(changed)) {
          const bool isNameItself = key == "name" || key == "kname";
          EXPECT_TRUE(isNameItself || std::count(before.begin(), before.end(), name) == 1)
              << "without " << key << " of " << index << ", " << name << " is offered";
        }
      }
    }
  }
}

TEST(LsblkImport, ManyDisksTakeLinearTime) {
  std::string text = R"({"blockdevices": [)";
  for (int number = 0; number < 20'000; ++number) {
    text += (number == 0 ? "" : ",") + OtherDevice("sd" + std::to_string(number), R"({"wwn": "0x1"})").dump();
  }
  EXPECT_EQ(ImportLsblk(text + "]}").host.disks.size(), 20'000U);
}

}  // namespace
}  // namespace OtxCtl::Sim
