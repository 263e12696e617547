// Disk groups, from what the volume manager reports: a disk group is a volume group that carries KOVA's marks
// (GroupTags.h), made on this machine, whole, and on disks that are this machine's own.
//
// Pure: values in, values out.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "otxctl/linux/DiskScan.h"
#include "otxctl/linux/LvmReport.h"

namespace OtxCtl::Linux {

struct GroupMember {
  std::string kovaUuid;
  std::string canonicalName;  // empty: the disk has left the host
  bool isFlash = false;       // of one that has left: whether it was the cache disk
};

struct DiskGroup {
  std::string uuid;
  GroupMember cache;
  std::vector<GroupMember> capacity;  // in the order in which they joined
  bool isMounted = false;             // all its volumes are active

  bool HasLeft() const noexcept { return cache.canonicalName.empty(); }  // its cache disk
};

// The groups in order of creation. Members become so in their facts. What else stands in a volume group, or
// carries KOVA's marks without being a disk group of this machine, is told in the words of its signatures: it
// is never claimed.
std::vector<DiskGroup> FindDiskGroups(const std::vector<PhysicalVolume>& physicalVolumes,
                                      const std::vector<LogicalVolume>& logicalVolumes,
                                      const std::string& machineId, std::vector<ScannedDisk>& disks);

// Whether a volume group with KOVA's marks is among them.
bool HasMarkedGroup(const std::vector<PhysicalVolume>& physicalVolumes);

// Whether the probe found a physical volume on it.
bool IsPhysicalVolume(const ScannedDisk& disk);

}  // namespace OtxCtl::Linux
