// What a change is about: the disks and the group that it names, judged by what was seen of the machine.
//
// Pure: a snapshot in, a part of it out. Who is refused is refused as KovaInfo.h says, by the name that was
// given. What is handed back lives as long as the snapshot.
#pragma once

#include <chrono>
#include <string>
#include <vector>

#include "kova/agentd/include/KovaRecords.h"
#include "otxctl/linux/LinuxHost.h"

namespace OtxCtl::Linux {

// The mounted group that the cache disk heads; null: it heads none.
const DiskGroup* FindMountedGroup(const LinuxSnapshot& seen, const std::string& ssd);

struct FormatChoice {
  const ScannedDisk* cacheDisk = nullptr;  // null: the group is there already
  std::vector<const ScannedDisk*> capacityDisks;
};

// The disks of a new group, or of the extension of `extended`: all are free, and there are not too many.
FormatChoice ChooseDisks(const LinuxSnapshot& seen, const std::string& ssd,
                         const std::vector<std::string>& capacityDisks, const DiskGroup* extended);

// Mounted or not.
const DiskGroup& GroupOfCacheDisk(const LinuxSnapshot& seen, const std::string& ssd);
const DiskGroup& GroupOfCacheUuid(const LinuxSnapshot& seen, const std::string& kovaUuid);
const DiskGroup& GroupOfMember(const LinuxSnapshot& seen, const std::string& disk);
// Not the last one.
const GroupMember& CapacityDiskToRemove(const DiskGroup& group, const std::string& disk);

struct AbsentMember {
  const DiskGroup* group = nullptr;
  const GroupMember* member = nullptr;
  bool isCache = false;
};

// That may be removed.
AbsentMember FindAbsentMember(const LinuxSnapshot& seen, const std::string& kovaUuid);

// What a change has left on the disk; null: nothing.
const Unfinished* FindUnfinished(const LinuxSnapshot& seen, const std::string& disk);
// Device files of all that is there of its volume group.
std::vector<std::string> NodesOfVolumeGroup(const LinuxSnapshot& seen, const Unfinished& unfinished);

// What stands against every removal: the automatic mode, a wish that cannot be granted, the time.
void CheckDiskMayBeRemoved(const LinuxSnapshot& seen, const std::string& disk,
                           const HostCtl::Kova::RemovalOptions& options,
                           std::chrono::steady_clock::time_point asked);
void CheckGroupMayBeRemoved(const LinuxSnapshot& seen, const std::string& ssd,
                            const HostCtl::Kova::RemovalOptions& options,
                            std::chrono::steady_clock::time_point asked);

// Throw a HostCtlException that begins with `what` if somebody uses a volume.
void CheckNotOpen(const GroupMember& member, const std::string& what);
void CheckNotOpen(const DiskGroup& group, const std::string& what);

// Of the members that are there.
std::vector<std::string> NodesOf(const DiskGroup& group);
std::vector<std::string> NodesLeftBehind(const DiskGroup& group);
std::vector<std::string> PresentDisksOf(const DiskGroup& group);

bool HasActiveVolume(const DiskGroup& group);

}  // namespace OtxCtl::Linux
