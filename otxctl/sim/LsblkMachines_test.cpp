// What is offered of machines of many kinds, as versions of lsblk from 2.33 on describe them.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "otxctl/sim/HostDescriptionError.h"
#include "otxctl/sim/LsblkImport.h"
#include "otxctl/sim/SimRules.h"

namespace OtxCtl::Sim {
namespace {

using nlohmann::json;
using Names = std::vector<std::string>;
using Devices = std::vector<json>;

// All that version 2.38 tells of any device, as a device without hardware has it.
json Device(const std::string& name, const std::string& type, const std::string& changes) {
  json device = json::parse(R"({"alignment": 0, "id-link": null, "disc-aln": 0, "dax": false, "disc-gran": 0,
    "disc-max": 0, "disc-zero": false, "fsavail": null, "fsroots": [null], "fssize": null, "fstype": null,
    "fsused": null, "fsuse%": null, "fsver": null, "group": "disk", "hctl": null, "hotplug": false,
    "label": null, "log-sec": 512, "maj:min": "8:0", "min-io": 512, "mode": "brw-rw----", "model": null,
    "opt-io": 0, "owner": "root", "partflags": null, "partlabel": null, "parttype": null,
    "parttypename": null, "partuuid": null, "phy-sec": 512, "pkname": null, "pttype": null, "ptuuid": null,
    "ra": 128, "rand": false, "rev": null, "rm": false, "ro": false, "rota": true, "rq-size": 64,
    "sched": "none", "serial": null, "size": 500107862016, "start": null, "state": null,
    "subsystems": "block", "mountpoint": null, "mountpoints": [null], "tran": null, "uuid": null,
    "vendor": null, "wsame": 0, "wwn": null, "zoned": "none", "zone-sz": 0})");
  device["name"] = name;
  device["kname"] = name;
  device["path"] = "/dev/" + name;
  device["type"] = type;
  device.update(json::parse(changes));
  return device;
}

// With a name of the world of its own and a serial number.
json Disk(const std::string& name, const std::string& changes = "{}") {
  json device = Device(name, "disk", R"({"state": "running", "vendor": "ATA     ", "model": "SOLID 500",
                       "tran": "sata", "subsystems": "block:scsi:pci"})");
  device["serial"] = "SN-" + name;
  device["wwn"] = "0x50000000" + name;
  device.update(json::parse(changes));
  return device;
}

json Nvme(const std::string& name, const std::string& changes = "{}") {
  json device = Disk(name, R"({"state": "live", "vendor": null, "tran": "nvme", "rota": false,
                     "subsystems": "block:nvme:pci"})");
  device["wwn"] = "eui.0025" + name;
  device.update(json::parse(changes));
  return device;
}

// As clouds have it: a serial number at most.
json Virtio(const std::string& name, const std::string& changes = "{}") {
  json device = Disk(name, R"({"state": null, "vendor": "0x1af4", "model": null, "tran": "virtio",
                     "wwn": null, "subsystems": "block:virtio:pci"})");
  device.update(json::parse(changes));
  return device;
}

json With(json device, const Devices& children) {
  device["children"] = children;
  return device;
}

json Part(const std::string& name, const std::string& changes = "{}") {
  json part = Device(name, "part", R"({"pttype": "gpt", "ptuuid": "1", "partuuid": "2", "fstype": "ext4"})");
  part.update(json::parse(changes));
  return part;
}

// The disk of the system.
json Root(json disk) {
  disk.update(json::parse(R"({"pttype": "gpt", "ptuuid": "1"})"));
  const std::string name = disk["name"];
  return With(disk, {Part(name + "p1", R"({"fstype": "vfat", "mountpoints": ["/boot/efi"]})"),
                     Part(name + "p2", R"({"mountpoints": ["/"]})")});
}

// As versions before 2.37 tell it, or, with `isVeryOld`, some before 2.33: everything in texts.
json AsOld(json device, bool isVeryOld) {
  device["mountpoint"] = device["mountpoints"][0];
  for (const char* const column :
       {"fsroots", "mountpoints", "fsver", "dax", "zone-sz", "start", "parttypename"}) {
    device.erase(column);
  }
  for (auto& [column, value] : device.items()) {
    if (isVeryOld && value.is_boolean()) {
      value = value.get<bool>() ? "1" : "0";
    } else if (isVeryOld && value.is_number()) {
      value = value.dump();
    }
  }
  if (device.contains("children")) {
    for (json& child : device["children"]) {
      child = AsOld(child, isVeryOld);
    }
  }
  return device;
}

Names OfferedIn(const Devices& devices) {
  const LsblkImport import = ImportLsblk(json{{"blockdevices", devices}}.dump());
  Names names;
  for (std::size_t i = 0; i < import.host.disks.size(); ++i) {
    const HostDisk& disk = import.host.disks[i];
    const bool isOffered = VerdictOn(import.host, disk, nullptr).state == 1;
    EXPECT_EQ(isOffered, disk.detail.empty()) << disk.name << ": " << disk.detail;
    if (isOffered) {
      names.push_back(import.kernelNames[i]);
    }
  }
  return names;
}

struct Machine {
  const char* what;
  Devices devices;
  Names offered;
};

Devices Multipath(const std::string& transport, const std::string& subsystems, const std::string& ofMap) {
  const json map = Device("mpatha", "mpath", ofMap);
  Devices paths;
  for (const char* const name : {"sdb", "sdc"}) {
    json path = Disk(name, R"({"fstype": "mpath_member", "serial": "LUN1", "wwn": "0x600a1"})");
    path["tran"] = transport;
    path["subsystems"] = subsystems;
    paths.push_back(With(path, {map}));
  }
  paths.push_back(Root(Disk("sda")));
  return paths;
}

std::vector<Machine> FreeDisksOfMetal() {
  return {
      {"a PC with SATA and NVMe", {Root(Nvme("nvme0n1")), Nvme("nvme1n1"), Disk("sda")}, {"nvme1n1", "sda"}},
      {"transports by other words",
       {Root(Disk("sda")), Disk("sdb", R"({"tran": "ata"})"), Disk("sdc", R"({"tran": "sas"})"),
        Nvme("nvme0n1", R"({"tran": "pcie"})"), Disk("sdd", R"({"tran": null, "zoned": null})"),
        Disk("sde", R"({"tran": "spi"})")},
       {"sdb", "sdc", "nvme0n1", "sdd", "sde"}},
      {"a RAID controller that shows single disks and a volume",
       {Root(Disk("sda", R"({"vendor": "RAIDCO", "tran": null})")),
        Disk("sdb", R"({"vendor": "RAIDCO", "tran": null})"),
        Disk("sdc", R"({"tran": null, "serial": null})")},
       {"sdb", "sdc"}},
      {"an old RAID controller with names in a folder",
       {Root(Disk("sda")), Disk("cciss!c0d1", R"({"tran": null, "state": null, "subsystems": "block:pci",
        "wwn": "0x600508b1"})")},
       {"cciss/c0d1"}},
  };
}

std::vector<Machine> FreeDisksOfClouds() {
  return {
      {"a cloud with virtio, serial numbers on some",
       {Root(Virtio("vda", R"({"serial": null})")), Virtio("vdb"), Virtio("vdc", R"({"serial": null})"),
        Virtio("vdd", R"({"tran": null, "subsystems": "block:virtio:ccw:css"})")},
       {"vdb", "vdd"}},
      {"a cloud with vmbus",
       {Root(Disk("sda", R"({"tran": null, "subsystems": "block:scsi:vmbus:acpi"})")),
        Disk("sdb", R"({"tran": null, "subsystems": "block:scsi:vmbus:acpi"})"),
        Nvme("nvme0n1", R"({"subsystems": "block:nvme:pci:vmbus:acpi"})")},
       {"sdb", "nvme0n1"}},
      {"a cloud with SCSI over virtio and disks of Xen",
       {Root(Disk("sda", R"({"tran": null, "subsystems": "block:scsi:virtio:pci", "wwn": null})")),
        Disk("sdb", R"({"tran": null, "subsystems": "block:scsi:virtio:pci", "wwn": null})"),
        Device("xvdb", "disk", R"({"subsystems": "block:xen"})")},
       {"sdb"}},
      {"ARM and POWER",
       {Root(Disk("sda", R"({"tran": null, "subsystems": "block:scsi:platform"})")),
        Disk("sdb", R"({"subsystems": "block:scsi:platform"})"),
        Disk("sdc", R"({"tran": null, "subsystems": "block:scsi:vio"})"),
        Nvme("nvme0n1", R"({"subsystems": "block:nvme:platform"})")},
       {"sdb", "sdc", "nvme0n1"}},
  };
}

std::vector<Machine> FreeDisksInCompany() {
  return {
      {"SAS disks with two paths each",
       Multipath("sas", "block:scsi:pci", R"({"state": "running"})"),
       {"mpatha"}},
      {"two name spaces of one NVMe controller",
       {Root(Nvme("nvme0n1", R"({"serial": "S"})")), Nvme("nvme0n2", R"({"serial": "S"})")},
       {"nvme0n2"}},
      {"strange company: floppies, drives, snaps, swap in memory, a FireWire disk",
       {Root(Disk("sda")), Disk("sdb"), Device("loop0", "loop", R"({"fstype": "squashfs", "ro": true,
        "mountpoints": ["/snap/core/1"]})"),
        Device("loop1", "loop", R"({"mountpoints": ["/snap/x/2"]})"),
        Device("zram0", "disk", R"({"mountpoints": ["[SWAP]"]})"),
        Device("fd0", "disk", R"({"rm": true, "size": 1474560, "subsystems": "block:platform"})"),
        Device("sr0", "rom", R"({"rm": true, "subsystems": "block:scsi:pci"})"),
        Disk("sdc", R"({"tran": "sbp", "type": "rbc", "subsystems": "block:scsi:firewire:pci"})")},
       {"sdb"}},
  };
}

std::vector<Machine> DisksBelowOthers() {
  const json md = Device("md0", "raid1", R"({"fstype": "xfs", "mountpoints": ["/srv"]})");
  const auto used = [](const std::string& name, const char* type, const json& above) {
    json disk = Disk(name);
    disk["fstype"] = type;
    return With(disk, {above});
  };
  const json plain = Device("dm-0", "crypt", R"({"name": "vault", "fstype": "ext4"})");
  return {
      {"arrays on whole disks and on partitions",
       {used("sda", "linux_raid_member", md), used("sdb", "linux_raid_member", md),
        With(Disk("sdc", R"({"pttype": "gpt"})"), {With(Part("sdc1"), {Device("md1", "raid0", "{}")})})},
       {}},
      {"an array whose members say nothing", {With(Disk("sda"), {md}), With(Disk("sdb"), {md})}, {}},
      {"LVM: thin, cached",
       {used("sda", "LVM2_member", With(Device("dm-1", "lvm", "{}"), {Device("dm-2", "lvm", "{}")})),
        Disk("sdb", R"({"fstype": "LVM2_member", "fsver": "LVM2 001"})")},
       {}},
      {"encryption with and without a header",
       {used("sda", "crypto_LUKS", Device("dm-0", "crypt", "{}")), With(Disk("sdb"), {plain})},
       {}},
      {"ZFS with and without partitions",
       {With(Disk("sda", R"({"pttype": "gpt", "fstype": "zfs_member", "label": "tank"})"),
             {Part("sda1", R"({"fstype": "zfs_member"})"), Part("sda9", R"({"fstype": null})")}),
        Disk("sdb", R"({"fstype": "zfs_member", "label": "tank"})"), Device("zd0", "disk", "{}")},
       {}},
      {"bcache and DRBD",
       {used("sda", "bcache", Device("bcache0", "disk", R"({"fstype": "ext4", "mountpoints": ["/b"]})")),
        With(Disk("sdb"), {Device("drbd0", "disk", "{}")}), Disk("sdc", R"({"fstype": "drbd"})")},
       {}},
  };
}

std::vector<Machine> MarkedDisks() {
  return {
      {"btrfs over several disks, mounted once",
       {Disk("sda", R"({"fstype": "btrfs", "uuid": "7", "mountpoints": ["/pool"]})"),
        Disk("sdb", R"({"fstype": "btrfs", "uuid": "7"})")},
       {}},
      {"swap, asleep and awake; raw stores",
       {Disk("sda", R"({"fstype": "swsuspend"})"),
        Disk("sdb", R"({"fstype": "swap", "mountpoints": ["[SWAP]"]})"),
        Disk("sdc", R"({"fstype": "ceph_bluestore"})"), Disk("sdd", R"({"label": "KEEP"})"),
        Disk("sde", R"({"ptuuid": "5"})"), Disk("sdf", R"({"fsver": "1"})"),
        Disk("sdg", R"({"pttype": "dos"})")},
       {}},
      {"a partition below a disk that says nothing of a table", {With(Disk("sda"), {Part("sda1")})}, {}},
  };
}

std::vector<Machine> ForeignDisks() {
  return {
      {"SAN and network disks",
       {Disk("sda", R"({"tran": "fc"})"), Disk("sdb", R"({"tran": "iscsi", "subsystems": "block:scsi"})"),
        Disk("sdc", R"({"tran": null, "subsystems": "block:scsi"})"),
        Disk("sdd", R"({"tran": null, "subsystems": "block:scsi:infiniband_srp:pci"})"),
        Nvme("nvme0n1", R"({"subsystems": "block:nvme:nvme-fabrics"})"),
        Nvme("nvme1n1", R"({"subsystems": "block:nvme-subsystem"})"), Nvme("nvme2n1", R"({"tran": "rdma"})"),
        Device("rbd0", "disk", R"({"subsystems": "block:rbd"})"), Device("nbd0", "disk", "{}")},
       {}},
      {"a fabric with multipath", Multipath("fc", "block:scsi:pci", "{}"), {}},
      {"a multipath device with partitions",
       Multipath("sas", "block:scsi:pci", R"({"pttype": "gpt", "children": [{"name": "mpatha1",
                 "kname": "dm-9", "type": "part", "pttype": "gpt"}]})"),
       {}},
      {"what is plugged in",
       {Disk("sda", R"({"tran": "usb", "subsystems": "block:scsi:usb:pci", "hotplug": true, "wwn": null,
             "serial": "000000000000"})"),
        Disk("mmcblk0", R"({"tran": "mmc", "state": null, "subsystems": "block:mmc:mmc_host:platform"})"),
        Disk("mmcblk0boot0", R"({"tran": null, "state": null, "subsystems": "block:mmc:mmc_host:pci"})"),
        Disk("mspblk0", R"({"tran": null, "subsystems": "block:memstick:memstick_host:pci"})"),
        Disk("dasda", R"({"tran": null, "hotplug": true, "subsystems": "block:ccw:css"})"),
        Disk("pmem0", R"({"tran": null, "state": null, "subsystems": "block:nd:acpi"})")},
       {}},
  };
}

std::vector<Machine> All(const std::vector<std::vector<Machine>>& kinds) {
  std::vector<Machine> all;
  for (const std::vector<Machine>& kind : kinds) {
    all.insert(all.end(), kind.begin(), kind.end());
  }
  return all;
}

std::vector<Machine> FreeDisks() {
  return All({FreeDisksOfMetal(), FreeDisksOfClouds(), FreeDisksInCompany()});
}

std::vector<Machine> UsedDisks() {
  return All({DisksBelowOthers(), MarkedDisks(), ForeignDisks()});
}

// Changes of one path, of both, and of the multipath device, one after the other.
Names OfferedOfMultipath(const char* ofOne, const char* ofBoth, const char* ofMap, const Devices& besides) {
  Devices devices = Multipath("sas", "block:scsi:pci", ofMap);
  for (std::size_t path = 0; path < 2; ++path) {
    json& children = devices[path]["children"];
    devices[path].update(json::parse(ofBoth));
    if (path == 0) {
      devices[path].update(json::parse(ofOne));
      for (const json& other : besides) {
        children.push_back(other);
      }
    }
  }
  return OfferedIn(devices);
}

TEST(LsblkMachines, WhatUsesAPathPastItsMultipathDeviceUsesTheDisk) {
  EXPECT_EQ(OfferedOfMultipath("{}", "{}", "{}", {}), Names{"mpatha"});
  EXPECT_EQ(OfferedOfMultipath("{}", "{}", "{}", {Part("sdb1")}), Names());
  EXPECT_EQ(OfferedOfMultipath("{}", "{}", "{}", {Device("vault", "crypt", "{}")}), Names());
  EXPECT_EQ(OfferedOfMultipath(R"({"mountpoints": ["/x"]})", "{}", "{}", {}), Names());
}

TEST(LsblkMachines, AMultipathDeviceNeedsOnePathThatRuns) {
  EXPECT_EQ(OfferedOfMultipath(R"({"state": "offline"})", "{}", "{}", {}), Names{"mpatha"});
  EXPECT_EQ(OfferedOfMultipath("{}", R"({"state": "offline"})", R"({"state": "running"})", {}), Names());
  EXPECT_EQ(OfferedOfMultipath("{}", "{}", R"({"state": "suspended"})", {}), Names());
}

TEST(LsblkMachines, AMultipathDeviceThatIsCalledLikeADiskIsNotTakenForIt) {
  Devices devices = Multipath("sas", "block:scsi:pci", R"({"name": "sdx", "kname": "dm-0"})");
  EXPECT_EQ(OfferedIn(devices), Names{"sdx"});
  devices.push_back(Disk("sdx", R"({"serial": "LUN1", "wwn": "0x600a1"})"));
  EXPECT_EQ(OfferedIn(devices), Names()) << "a third path, outside of the multipath device";
}

TEST(LsblkMachines, WhatIsMountedWithoutAFileSystemWasNotSeenButInMemory) {
  const json memory = Device("zram0", "disk", R"({"mountpoints": ["[SWAP]"]})");
  const json cached = Device("bcache0", "disk", R"({"mountpoints": ["/srv"]})");
  EXPECT_EQ(OfferedIn({Disk("sda"), memory}), Names{"sda"});
  EXPECT_THROW(OfferedIn({Disk("sda"), With(Disk("sdb"), {cached})}), HostDescriptionError);
}

TEST(LsblkMachines, FreeDisksOfOrdinaryMachinesAreOfferedAndNoOthers) {
  for (const Machine& machine : FreeDisks()) {
    EXPECT_EQ(OfferedIn(machine.devices), machine.offered) << machine.what;
  }
}

TEST(LsblkMachines, DisksThatAreUsedOrNotTheMachinesOwnAreNotOffered) {
  for (const Machine& machine : UsedDisks()) {
    EXPECT_EQ(OfferedIn(machine.devices), machine.offered) << machine.what;
    // Nor beside one that is free.
    Devices more = machine.devices;
    more.push_back(Root(Disk("sdy")));
    more.push_back(Disk("sdz"));
    EXPECT_EQ(OfferedIn(more), Names{"sdz"}) << machine.what;
  }
}

TEST(LsblkMachines, OldVersionsOfLsblkTellTheSame) {
  for (const bool isVeryOld : {false, true}) {
    for (const Machine& machine : FreeDisks()) {
      Devices devices;
      for (const json& device : machine.devices) {
        devices.push_back(AsOld(device, isVeryOld));
      }
      EXPECT_EQ(OfferedIn(devices), machine.offered) << machine.what;
    }
  }
}

// What is changed of one device of a capture, and whether that device may still be offered.
struct Change {
  json columns;
  bool isUse;
};

std::vector<Change> Changes() {
  std::vector<Change> changes;
  for (const char* const unknown :
       {"size", "rota", "ro", "rm", "hotplug", "subsystems", "wwn", "serial", "model"}) {
    changes.push_back({json{{unknown, nullptr}}, false});
  }
  for (const json& trace :
       json::parse(R"([{"fstype": "ext4"}, {"label": "L"}, {"uuid": "1"}, {"pttype": "gpt"},
         {"ptuuid": "1"}, {"fsver": "1"}, {"mountpoints": ["/x"]}, {"mountpoint": "/x"}, {"partuuid": "1"},
         {"ro": true}, {"rm": true}, {"hotplug": true}, {"state": "offline"}, {"zoned": "host-managed"},
         {"fsused": 1}, {"partlabel": "x"}])")) {
    changes.push_back({trace, true});
  }
  changes.push_back(
      {json{{"children", json::array({Device("dm-77", "crypt", R"({"fstype": "ext4"})")})}}, true});
  return changes;
}

void ExpectNoMore(const Machine& machine, std::size_t index, const Change& change) {
  Devices devices = machine.devices;
  devices[index].update(change.columns);
  Names offered;
  try {
    offered = OfferedIn(devices);
  } catch (const HostDescriptionError&) {
    return;  // then nothing is
  }
  const std::string changed = devices[index]["name"];
  for (const std::string& name : offered) {
    const bool wasOffered = std::count(machine.offered.begin(), machine.offered.end(), name) == 1;
    EXPECT_TRUE(wasOffered && !(change.isUse && name == changed))
        << machine.what << ", " << changed << " with " << change.columns << ": " << name;
  }
}

TEST(LsblkMachines, NeitherWhatIsForgottenNorATraceOfUseOffersMore) {
  const std::vector<Machine> machines = All({FreeDisks(), UsedDisks()});
  const std::vector<Change> changes = Changes();
  // Each change often, but not each with each device: that takes long.
  std::size_t turn = 0;
  for (const Machine& machine : machines) {
    for (std::size_t index = 0; index < machine.devices.size(); ++index) {
      for (int times = 0; times < 5; ++times) {
        ExpectNoMore(machine, index, changes[turn++ % changes.size()]);
      }
    }
  }
}

}  // namespace
}  // namespace OtxCtl::Sim
