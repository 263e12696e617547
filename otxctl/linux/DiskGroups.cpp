#include "otxctl/linux/DiskGroups.h"

#include <algorithm>
#include <map>
#include <set>
#include <utility>

#include "otxctl/disks/SignatureWords.h"
#include "otxctl/linux/GroupNames.h"
#include "otxctl/linux/GroupTags.h"
#include "otxctl/linux/MarkedGroup.h"
#include "otxctl/linux/VolumeGroups.h"

namespace OtxCtl::Linux {
namespace {

using Disks::Membership;
using Texts = std::vector<std::string>;

const std::string& PhysicalVolumeWords() {
  static const std::string words = Disks::SignatureInWords("LVM2_member", "");
  return words;
}

// The words for a disk that stands in a volume group, in place of those for any physical volume.
void Describe(ScannedDisk& disk, const std::string& words) {
  Texts signatures = disk.facts.signatures.IsKnown() ? disk.facts.signatures.Get() : Texts();
  const auto found = std::find(signatures.begin(), signatures.end(), PhysicalVolumeWords());
  if (found == signatures.end()) {
    signatures.push_back(words);
  } else {
    *found = words;
  }
  // What nobody could read stays unknown.
  if (disk.facts.signatures.IsKnown()) {
    disk.facts.signatures = std::move(signatures);
  }
}

void DescribeMembers(const VolumeGroup& group, const std::string& words) {
  for (const Member& member : group.members) {
    if (member.disk != nullptr) {
      Describe(*member.disk, words);
    }
  }
}

void ClaimMembers(const VolumeGroup& group, const MarkedGroup& marked) {
  const auto& halfWay = marked.HalfWay();
  for (const Member& member : group.members) {
    if (member.disk != nullptr && std::find(halfWay.begin(), halfWay.end(), &member) == halfWay.end()) {
      member.disk->facts.membership = marked.Get().isMounted ? Membership::Mounted : Membership::Unmounted;
      member.disk->facts.group = marked.Get().uuid;
    }
  }
}

void AddDisk(Unfinished& unfinished, const Member& member) {
  if (member.disk != nullptr) {
    unfinished.disks.push_back(member.disk->facts.canonicalName);
    unfinished.deviceNodes.push_back(member.disk->deviceNode);
  }
}

void AddWhole(const VolumeGroup& group, std::vector<Unfinished>& all) {
  Unfinished unfinished;
  unfinished.volumeGroup = group.name;
  unfinished.isWholeGroup = true;
  for (const Member& member : group.members) {
    if (!WhyNotOurs(member).empty()) {
      return;
    }
    AddDisk(unfinished, member);
  }
  all.push_back(std::move(unfinished));
}

void AddHalfWay(const VolumeGroup& group, const Member& member, const std::string& uuid,
                std::vector<Unfinished>& all) {
  if (member.disk == nullptr) {
    return;
  }
  Describe(*member.disk, "half way into disk group " + uuid + ", or out of it");
  Unfinished unfinished;
  unfinished.volumeGroup = group.name;
  const std::string own = UuidOf(member);
  for (const LogicalVolume* volume : group.volumes) {
    if (!own.empty() && (volume->name == DataVolumeName(own) || volume->name == CacheVolumeName(own))) {
      unfinished.volumes.push_back(volume->name);
    }
  }
  AddDisk(unfinished, member);
  all.push_back(std::move(unfinished));
}

// Those in no volume group. If a change was about to make or to remove one, it is nobody's.
void DescribeOrphans(const std::vector<PhysicalVolume>& volumes, const Texts& underChange,
                     std::vector<ScannedDisk>& disks, std::vector<Unfinished>& all) {
  for (const PhysicalVolume& volume : volumes) {
    for (ScannedDisk& disk : disks) {
      if (!volume.groupUuid.empty() || volume.deviceNumber != disk.deviceNumber) {
        continue;
      }
      const bool isUnderChange = HasTag(underChange, disk.facts.canonicalName);
      Describe(disk, isUnderChange
                         ? "LVM physical volume that an unfinished change of a disk group left behind"
                         : "LVM physical volume in no volume group");
      if (isUnderChange) {
        AddDisk(all.emplace_back(), {&volume, &disk});
      }
    }
  }
}

// A volume manager that hides a disk's second path, or a member that its group has lost, does not show it.
void DescribeHidden(const std::vector<PhysicalVolume>& volumes, std::vector<ScannedDisk>& disks) {
  std::set<std::string> shown;
  for (const PhysicalVolume& volume : volumes) {
    shown.insert(volume.deviceNumber);
  }
  for (ScannedDisk& disk : disks) {
    if (IsPhysicalVolume(disk) && shown.count(disk.deviceNumber) == 0) {
      Describe(disk, "LVM physical volume that its volume group no longer knows, or hides");
    }
  }
}

using Claims = std::map<std::string, int>;  // how many volume groups say that they are this disk group

Claims CountClaims(const std::vector<VolumeGroup>& groups) {
  Claims claims;
  for (const VolumeGroup& group : groups) {
    ++claims[ValueOf(group.tags, Tags::group).value_or("")];
  }
  return claims;
}

}  // namespace

FoundGroups FindDiskGroups(const std::vector<PhysicalVolume>& physicalVolumes,
                           const std::vector<LogicalVolume>& logicalVolumes, const std::string& machineId,
                           const std::vector<std::string>& underChange, std::vector<ScannedDisk>& disks) {
  DescribeHidden(physicalVolumes, disks);
  const std::vector<VolumeGroup> volumeGroups = JoinVolumeGroups(physicalVolumes, logicalVolumes, disks);
  Claims claims = CountClaims(volumeGroups);
  FoundGroups found;
  DescribeOrphans(physicalVolumes, underChange, disks, found.unfinished);
  std::map<std::pair<std::int64_t, std::string>, DiskGroup> groups;
  for (const VolumeGroup& group : volumeGroups) {
    if (!HasTag(group.tags, Tags::marker)) {
      DescribeMembers(group, "member of volume group " + group.name);
      continue;
    }
    MarkedGroup marked(group, machineId, claims[ValueOf(group.tags, Tags::group).value_or("")] > 1);
    if (!marked.IsOurs()) {
      DescribeMembers(group, marked.Words());
      if (marked.IsUnfinished()) {
        AddWhole(group, found.unfinished);
      }
      continue;
    }
    for (const Member* member : marked.HalfWay()) {
      AddHalfWay(group, *member, marked.Get().uuid, found.unfinished);
    }
    ClaimMembers(group, marked);
    const std::int64_t created = NumberOf(group.tags, Tags::created);
    groups.emplace(std::make_pair(created, marked.Get().uuid), marked.Get());
  }
  for (auto& [key, group] : groups) {
    found.groups.push_back(std::move(group));
  }
  return found;
}

bool HasMarkedGroup(const std::vector<PhysicalVolume>& physicalVolumes) {
  return std::any_of(physicalVolumes.begin(), physicalVolumes.end(),
                     [](const PhysicalVolume& volume) { return HasTag(volume.groupTags, Tags::marker); });
}

bool IsPhysicalVolume(const ScannedDisk& disk) {
  return disk.facts.signatures.IsKnown() && HasTag(disk.facts.signatures.Get(), PhysicalVolumeWords());
}

}  // namespace OtxCtl::Linux
