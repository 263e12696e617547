// Volume groups and disks, made up for tests of disk groups.
#pragma once

#include <string>
#include <vector>

#include "otxctl/linux/DiskScan.h"
#include "otxctl/linux/LvmReport.h"

namespace OtxCtl::Linux {

inline constexpr const char* testMachine = "machine-1";

// A disk of this machine that carries a physical volume, and nothing else.
inline ScannedDisk MemberDisk(const std::string& number, bool isFlash) {
  ScannedDisk disk;
  disk.deviceNumber = "8:" + number;
  disk.deviceNode = "/dev/sd" + number;
  disk.displayName = "LAB " + number;
  disk.facts.kernelName = "sd" + number;
  disk.facts.canonicalName = "naa." + number;
  disk.facts.identity = Disks::DiskIdentity{"naa." + number, "LAB", "HDD", "S" + number};
  disk.facts.bytes = std::int64_t{4} << 30;
  disk.facts.isFlash = isFlash;
  disk.facts.connection = Disks::Connection{Disks::Attachment::Machine, "sas"};
  disk.facts.isReadOnly = false;
  disk.facts.isRemovable = false;
  disk.facts.isHotPlug = false;
  disk.facts.state = std::string("running");
  disk.facts.zones = std::string("none");
  disk.facts.signatures = std::vector<std::string>{"LVM physical volume"};
  disk.facts.partitionTable = std::string();
  disk.facts.partitions = 0;
  disk.facts.mounts = std::vector<std::string>();
  disk.facts.holders = std::vector<std::string>{"vg-data (device-mapper)"};
  disk.facts.multipathMap = std::string();
  return disk;
}

// The data volume of a capacity disk, active.
inline LogicalVolume DataVolumeOf(const std::string& uuid, const std::string& group = "g1") {
  LogicalVolume volume;
  volume.groupUuid = "vg-uuid-" + group;
  volume.name = "data_" + uuid;
  volume.path = "/dev/vg-" + group + "/data_" + uuid;
  volume.bytes = std::int64_t{4} << 30;
  volume.tags = {"kova.disk=" + uuid};
  volume.kind = "cache";
  volume.isActive = true;
  volume.cacheMode = "writethrough";
  volume.usedBlocks = 37;
  volume.cacheBlocks = 100;
  return volume;
}

// A member of a volume group with the marks of a disk group of this machine; empty number: it has left.
inline PhysicalVolume MemberVolume(const std::string& number, const std::string& role,
                                   const std::string& uuid, const std::string& group = "g1", int place = 0) {
  PhysicalVolume volume;
  volume.deviceNumber = number.empty() ? "" : "8:" + number;
  volume.groupName = "vg-" + group;
  volume.groupUuid = "vg-uuid-" + group;
  volume.extents = 511;
  volume.tags = {"kova.disk=" + uuid, "kova.role=" + role, "kova.place=" + std::to_string(place)};
  volume.groupTags = {"kova", "kova.group=" + group, std::string("kova.machine=") + testMachine,
                      "kova.state=ready", "kova.created=5"};
  return volume;
}

}  // namespace OtxCtl::Linux
