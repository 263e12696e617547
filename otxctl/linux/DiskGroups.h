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

// What a capacity disk's data lie on.
struct DataVolume {
  std::string path;  // "/dev/kova_0123456789ab/data_0123456789ab"
  std::int64_t bytes = 0;
  std::string cacheState;  // in words: "37% of its cache used"
  bool isActive = false;
  bool isOpen = false;  // somebody uses it
  bool isCached = false;
  std::string name;  // as the volume manager calls it
};

struct GroupMember {
  std::string kovaUuid;
  std::string canonicalName;  // empty: the disk has left the host
  bool isFlash = false;       // of one that has left: whether it was the cache disk
  std::string deviceNode;     // empty: the disk has left the host
  bool isLeftBehind = false;  // it is back, and its group has changed meanwhile: it must be taken back
  std::int64_t extents = 0;
  std::int64_t place = 0;  // of a capacity disk: smaller than those of who joined later
  DataVolume volume;       // of a capacity disk
};

struct DiskGroup {
  std::string uuid;
  std::string volumeGroup;  // its name
  std::string volumeGroupUuid;
  GroupMember cache;
  std::vector<GroupMember> capacity;  // in the order in which they joined
  // The volumes of all capacity disks that are there are active, each on the disk that is there now.
  bool isMounted = false;
  bool isAllFlash = false;                  // as it was made, whoever has joined or left since
  std::vector<std::string> foreignVolumes;  // that somebody else made in it

  bool HasLeft() const noexcept { return cache.canonicalName.empty(); }  // its cache disk
};

// What a change left behind that did not come to its end. Nobody's data; it can be cleaned up on request.
struct Unfinished {
  std::vector<std::string> disks;  // canonical names; of a whole group or of one disk
  std::vector<std::string> deviceNodes;
  std::string volumeGroup;           // empty: the disk is in none
  bool isWholeGroup = false;         // nothing of the volume group is anybody's
  std::vector<std::string> volumes;  // of one disk: names of its volumes
};

struct FoundGroups {
  std::vector<DiskGroup> groups;  // in order of creation
  std::vector<Unfinished> unfinished;
};

// Members become so in their facts. What else stands in a volume group, or carries KOVA's marks without being
// a disk group of this machine, is told in the words of its signatures: it is never claimed. A physical
// volume that a change was about to make or to remove, one of the canonical names in `underChange`, and that
// is in no volume group, is unfinished.
FoundGroups FindDiskGroups(const std::vector<PhysicalVolume>& physicalVolumes,
                           const std::vector<LogicalVolume>& logicalVolumes, const std::string& machineId,
                           const std::vector<std::string>& underChange, std::vector<ScannedDisk>& disks);

// Whether a volume group with KOVA's marks is among them.
bool HasMarkedGroup(const std::vector<PhysicalVolume>& physicalVolumes);

// Whether the probe found a physical volume on it.
bool IsPhysicalVolume(const ScannedDisk& disk);

}  // namespace OtxCtl::Linux
