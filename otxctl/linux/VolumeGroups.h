// Volume groups with their members and volumes, as the volume manager reports them, joined with the disks.
//
// Pure: values in, values out.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "otxctl/linux/DiskScan.h"
#include "otxctl/linux/LvmReport.h"

namespace OtxCtl::Linux {

struct Member {
  const PhysicalVolume* volume = nullptr;
  ScannedDisk* disk = nullptr;  // null: has left the host, or is no whole disk
};

struct VolumeGroup {
  std::string name;
  std::string uuid;
  std::vector<std::string> tags;
  std::vector<Member> members;
  std::vector<const LogicalVolume*> volumes;
};

// Points into what it is given. Physical volumes in no group are left out.
std::vector<VolumeGroup> JoinVolumeGroups(const std::vector<PhysicalVolume>& physicalVolumes,
                                          const std::vector<LogicalVolume>& logicalVolumes,
                                          std::vector<ScannedDisk>& disks);

bool HasTag(const std::vector<std::string>& tags, std::string_view tag);
// What stands behind `key`; nothing if it is missing, or stands there twice.
std::optional<std::string> ValueOf(const std::vector<std::string>& tags, std::string_view key);
// The same as a number; 0 if it is none.
std::int64_t NumberOf(const std::vector<std::string>& tags, std::string_view key);

// The KOVA UUID that a member is marked with; empty: none.
std::string UuidOf(const Member& member);

// Why a member's disk cannot be one of a disk group of this machine; empty if it can.
std::string WhyNotOurs(const Member& member);

}  // namespace OtxCtl::Linux
