#include "otxctl/linux/GroupChoice.h"

#include <algorithm>
#include <set>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/linux/VolumeManager.h"

namespace OtxCtl::Linux {

using HostCtl::Kova::DiskState;
using HostCtl::Kova::RemovalOptions;
using HostCtl::Lib::HostCtlException;
using HostCtl::Lib::KovaExceptionHasPartition;
using HostCtl::Lib::KovaExceptionLastRemainingHDD;
using HostCtl::Lib::KovaExceptionRemoveDiskAutoModeEnabled;
using HostCtl::Lib::KovaExceptionRemoveMappingAutoModeEnabled;
using HostCtl::Lib::KovaStorageException;

namespace {

using Texts = std::vector<std::string>;
using Clock = std::chrono::steady_clock;

constexpr std::size_t mostCapacityDisks = static_cast<std::size_t>(slicesOfCache);

template <typename Refusal = KovaStorageException>
[[noreturn]] void Refuse(const std::string& disk, const std::string& why) {
  throw Refusal("disk " + disk + " " + why, disk);
}

const ScannedDisk& FreeDisk(const LinuxSnapshot& seen, const std::string& name) {
  for (std::size_t i = 0; i < seen.disks.size(); ++i) {
    const Disks::DiskFacts& facts = seen.disks[i].facts;
    if (facts.canonicalName != name) {
      continue;
    }
    if (facts.membership != Disks::Membership::None) {
      Refuse(name, "is a member of disk group " + facts.group);
    }
    if (facts.partitions.IsKnown() && facts.partitions.Get() > 0) {
      Refuse<KovaExceptionHasPartition>(name, "has partitions");
    }
    if (seen.verdicts[i].state != DiskState::Eligible) {
      Refuse(name, "is not free: " + seen.verdicts[i].detail);
    }
    return seen.disks[i];
  }
  Refuse(name, "is not there");
}

const GroupMember* FindMember(const DiskGroup& group, const std::string& disk) {
  const auto found =
      std::find_if(group.capacity.begin(), group.capacity.end(),
                   [&disk](const GroupMember& member) { return member.canonicalName == disk; });
  return found == group.capacity.end() ? nullptr : &*found;
}

// Only these two are understood; whatever else is said changes nothing of a removal.
void CheckOptions(const std::string& disk, const RemovalOptions& options, Clock::time_point asked) {
  if (options.text == "evacuate") {
    Refuse(disk, "cannot be evacuated: every disk is filled by its own volume");
  }
  if (options.text == "discard" && options.first > 0 &&
      Clock::now() - asked > std::chrono::seconds(options.first)) {
    Refuse(disk, "was not removed: " + std::to_string(options.first) +
                     " s were over before anything could be changed");
  }
}

// The empty name is that of every disk that has left.
template <typename Value>
bool IsNamed(const Value& one, const std::string& name) {
  return !name.empty() && one == name;
}

}  // namespace

const DiskGroup* FindMountedGroup(const LinuxSnapshot& seen, const std::string& ssd) {
  const auto found = std::find_if(seen.groups.begin(), seen.groups.end(), [&ssd](const DiskGroup& group) {
    return group.isMounted && IsNamed(group.cache.canonicalName, ssd);
  });
  return found == seen.groups.end() ? nullptr : &*found;
}

FormatChoice ChooseDisks(const LinuxSnapshot& seen, const std::string& ssd, const Texts& capacityDisks,
                         const DiskGroup* extended) {
  FormatChoice choice;
  choice.cacheDisk = extended == nullptr ? &FreeDisk(seen, ssd) : nullptr;
  std::set<std::string> named = {ssd};
  for (const std::string& disk : capacityDisks) {
    if (!named.insert(disk).second) {
      Refuse(disk, "is named more than once");
    }
    choice.capacityDisks.push_back(&FreeDisk(seen, disk));
  }
  if (capacityDisks.empty()) {
    throw HostCtlException("a disk group needs a capacity disk");
  }
  const std::size_t before = extended == nullptr ? 0 : extended->capacity.size();
  if (before + capacityDisks.size() > mostCapacityDisks) {
    throw HostCtlException("a disk group has at most " + std::to_string(mostCapacityDisks) +
                           " capacity disks, and would have " +
                           std::to_string(before + capacityDisks.size()));
  }
  return choice;
}

const DiskGroup& GroupOfCacheDisk(const LinuxSnapshot& seen, const std::string& ssd) {
  for (const DiskGroup& group : seen.groups) {
    if (IsNamed(group.cache.canonicalName, ssd)) {
      return group;
    }
  }
  Refuse(ssd, "is the cache disk of no disk group");
}

const DiskGroup& GroupOfCacheUuid(const LinuxSnapshot& seen, const std::string& kovaUuid) {
  for (const DiskGroup& group : seen.groups) {
    if (IsNamed(group.cache.kovaUuid, kovaUuid)) {
      return group;
    }
  }
  Refuse(kovaUuid, "is the cache disk of no disk group");
}

const DiskGroup& GroupOfMember(const LinuxSnapshot& seen, const std::string& disk) {
  for (const DiskGroup& group : seen.groups) {
    if (!disk.empty() && (group.cache.canonicalName == disk || FindMember(group, disk) != nullptr)) {
      return group;
    }
  }
  Refuse(disk, "is in no disk group");
}

const GroupMember& CapacityDiskToRemove(const DiskGroup& group, const std::string& disk) {
  if (group.capacity.size() < 2) {
    Refuse<KovaExceptionLastRemainingHDD>(disk, "is the last capacity disk of its disk group");
  }
  return *FindMember(group, disk);
}

AbsentMember FindAbsentMember(const LinuxSnapshot& seen, const std::string& kovaUuid) {
  for (const DiskGroup& group : seen.groups) {
    if (group.HasLeft() && IsNamed(group.cache.kovaUuid, kovaUuid)) {
      return {&group, &group.cache, true};
    }
    for (const GroupMember& member : group.capacity) {
      if (!member.canonicalName.empty() || !IsNamed(member.kovaUuid, kovaUuid)) {
        continue;
      }
      if (group.capacity.size() < 2) {
        Refuse<KovaExceptionLastRemainingHDD>(kovaUuid, "is the last capacity disk of its disk group");
      }
      return {&group, &member, false};
    }
  }
  Refuse(kovaUuid, "is none that has left the host");
}

const Unfinished* FindUnfinished(const LinuxSnapshot& seen, const std::string& disk) {
  for (const Unfinished& unfinished : seen.unfinished) {
    if (std::find(unfinished.disks.begin(), unfinished.disks.end(), disk) != unfinished.disks.end()) {
      return &unfinished;
    }
  }
  return nullptr;
}

Texts NodesOfVolumeGroup(const LinuxSnapshot& seen, const Unfinished& unfinished) {
  Texts nodes = unfinished.deviceNodes;
  for (const DiskGroup& group : seen.groups) {
    if (group.volumeGroup == unfinished.volumeGroup) {
      const Texts members = NodesOf(group);
      nodes.insert(nodes.end(), members.begin(), members.end());
    }
  }
  return nodes;
}

void CheckDiskMayBeRemoved(const LinuxSnapshot& seen, const std::string& disk, const RemovalOptions& options,
                           Clock::time_point asked) {
  if (seen.settings.isAutoMode) {
    Refuse<KovaExceptionRemoveDiskAutoModeEnabled>(disk,
                                                   "cannot be removed while disks are claimed automatically");
  }
  CheckOptions(disk, options, asked);
}

void CheckGroupMayBeRemoved(const LinuxSnapshot& seen, const std::string& ssd, const RemovalOptions& options,
                            Clock::time_point asked) {
  if (seen.settings.isAutoMode) {
    Refuse<KovaExceptionRemoveMappingAutoModeEnabled>(
        ssd, "and its group cannot be removed while disks are claimed automatically");
  }
  CheckOptions(ssd, options, asked);
}

void CheckNotOpen(const GroupMember& member, const std::string& what) {
  if (member.volume.isOpen) {
    throw HostCtlException(what + ": its volume " + member.volume.path +
                           " is in use; unmount its file system, or end who else has it open");
  }
}

void CheckNotOpen(const DiskGroup& group, const std::string& what) {
  for (const GroupMember& member : group.capacity) {
    CheckNotOpen(member, what);
  }
}

Texts NodesOf(const DiskGroup& group) {
  Texts nodes;
  if (!group.cache.deviceNode.empty()) {
    nodes.push_back(group.cache.deviceNode);
  }
  for (const GroupMember& member : group.capacity) {
    if (!member.deviceNode.empty()) {
      nodes.push_back(member.deviceNode);
    }
  }
  return nodes;
}

Texts NodesLeftBehind(const DiskGroup& group) {
  Texts nodes;
  if (group.cache.isLeftBehind) {
    nodes.push_back(group.cache.deviceNode);
  }
  for (const GroupMember& member : group.capacity) {
    if (member.isLeftBehind) {
      nodes.push_back(member.deviceNode);
    }
  }
  return nodes;
}

Texts PresentDisksOf(const DiskGroup& group) {
  Texts names;
  if (!group.cache.canonicalName.empty()) {
    names.push_back(group.cache.canonicalName);
  }
  for (const GroupMember& member : group.capacity) {
    if (!member.canonicalName.empty()) {
      names.push_back(member.canonicalName);
    }
  }
  return names;
}

bool HasActiveVolume(const DiskGroup& group) {
  return std::any_of(group.capacity.begin(), group.capacity.end(),
                     [](const GroupMember& member) { return member.volume.isActive; });
}

}  // namespace OtxCtl::Linux
