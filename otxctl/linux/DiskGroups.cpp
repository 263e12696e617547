#include "otxctl/linux/DiskGroups.h"

#include <algorithm>
#include <charconv>
#include <map>
#include <optional>
#include <set>
#include <string_view>
#include <unordered_map>

#include "otxctl/disks/SignatureWords.h"
#include "otxctl/linux/GroupTags.h"

namespace OtxCtl::Linux {
namespace {

using Disks::Attachment;
using Disks::Membership;
using Texts = std::vector<std::string>;

const std::string& PhysicalVolumeWords() {
  static const std::string words = Disks::SignatureInWords("LVM2_member", "");
  return words;
}

bool HasTag(const Texts& tags, std::string_view tag) {
  return std::find(tags.begin(), tags.end(), tag) != tags.end();
}

// What stands behind `key`; nothing if it is missing, or stands there twice.
std::optional<std::string> ValueOf(const Texts& tags, std::string_view key) {
  std::optional<std::string> value;
  for (const std::string& tag : tags) {
    if (tag.compare(0, key.size(), key) != 0) {
      continue;
    }
    if (value) {
      return std::nullopt;
    }
    value = tag.substr(key.size());
  }
  return value && value->empty() ? std::nullopt : value;
}

std::int64_t NumberOf(const Texts& tags, std::string_view key) {
  const std::string text = ValueOf(tags, key).value_or("");
  std::int64_t number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  return error == std::errc() && end == text.data() + text.size() ? number : 0;
}

struct Member {
  const PhysicalVolume* volume = nullptr;
  ScannedDisk* disk = nullptr;  // null: has left the host, or is no whole disk
};

struct VolumeGroup {
  std::string name;
  std::string uuid;
  Texts tags;
  std::vector<Member> members;
};

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

// Why a member's disk cannot be one of a disk group of this machine; empty if it can.
std::string WhyNotOurs(const Member& member) {
  if (member.disk == nullptr) {
    return member.volume->deviceNumber.empty() ? "" : "of which a member is no whole disk";
  }
  const auto& connection = member.disk->facts.connection;
  const bool isOwn = connection.IsKnown() && connection.Get().attachment == Attachment::Machine;
  return isOwn ? ""
               : "of which " + member.disk->facts.kernelName + " is not attached to this machine as its own";
}

// A disk group as its marks describe it, or why it is none.
class MarkedGroup {
 public:
  MarkedGroup(const VolumeGroup& group, const std::string& machineId, bool isTwice)
      : _uuid(ValueOf(group.tags, Tags::group).value_or("")) {
    if (_uuid.empty()) {
      _whyNot = "which has no identity";
    } else if (isTwice) {
      _whyNot = "which more than one volume group claims to be";
    } else if (ValueOf(group.tags, Tags::machine) != machineId || machineId.empty()) {
      _whyNot = "of another machine";
    } else if (ValueOf(group.tags, Tags::state) != Tags::ready) {
      _whyNot = "which was never finished";
    } else {
      Read(group);
    }
  }

  bool IsOurs() const noexcept { return _whyNot.empty(); }
  std::string Words() const {
    return "member of disk group " + (_uuid.empty() ? "" : _uuid + ", ") + _whyNot;
  }
  DiskGroup Take() && { return std::move(_group); }

 private:
  void Read(const VolumeGroup& group) {
    _group.uuid = _uuid;
    std::multimap<std::int64_t, GroupMember> capacity;
    std::set<std::string> uuids;
    std::size_t caches = 0;
    for (const Member& member : group.members) {
      const Texts& tags = member.volume->tags;
      const std::optional<std::string> role = ValueOf(tags, Tags::role);
      const bool isCache = role == Tags::cache;
      GroupMember read = ToMember(member, isCache);
      const bool isMarked = !read.kovaUuid.empty() && (isCache || role == Tags::capacity);
      if (!isMarked || !uuids.insert(read.kovaUuid).second) {
        _whyNot = "whose members are not marked as they should be";
        return;
      }
      if (std::string why = WhyNotOurs(member); !why.empty()) {
        _whyNot = std::move(why);
        return;
      }
      if (isCache) {
        ++caches;
        _group.cache = std::move(read);
      } else {
        capacity.emplace(NumberOf(tags, Tags::place), std::move(read));
      }
    }
    for (auto& [place, member] : capacity) {
      _group.capacity.push_back(std::move(member));
    }
    if (caches != 1 || _group.capacity.empty()) {
      _whyNot = "which is not whole";
    }
  }

  static GroupMember ToMember(const Member& member, bool isCache) {
    GroupMember read;
    read.kovaUuid = ValueOf(member.volume->tags, Tags::disk).value_or("");
    read.isFlash = isCache;
    if (member.disk != nullptr) {
      read.canonicalName = member.disk->facts.canonicalName;
      read.isFlash = member.disk->facts.isFlash.Is(true);
    }
    return read;
  }

  std::string _uuid;
  std::string _whyNot;
  DiskGroup _group;
};

std::vector<VolumeGroup> GroupsOf(const std::vector<PhysicalVolume>& volumes,
                                  std::vector<ScannedDisk>& disks) {
  std::unordered_map<std::string, ScannedDisk*> diskOf;
  for (ScannedDisk& disk : disks) {
    diskOf.emplace(disk.deviceNumber, &disk);
  }
  std::vector<VolumeGroup> groups;
  std::unordered_map<std::string, std::size_t> groupOf;
  for (const PhysicalVolume& volume : volumes) {
    const auto disk = diskOf.find(volume.deviceNumber);
    const Member member{&volume, disk == diskOf.end() ? nullptr : disk->second};
    if (volume.groupUuid.empty()) {
      if (member.disk != nullptr) {
        Describe(*member.disk, "LVM physical volume in no volume group");
      }
      continue;
    }
    const auto [position, isNew] = groupOf.try_emplace(volume.groupUuid, groups.size());
    if (isNew) {
      groups.push_back({volume.groupName, volume.groupUuid, volume.groupTags, {}});
    }
    groups[position->second].members.push_back(member);
  }
  return groups;
}

bool AreAllActive(const VolumeGroup& group, const std::vector<LogicalVolume>& volumes) {
  bool hasAny = false;
  for (const LogicalVolume& volume : volumes) {
    if (volume.groupUuid == group.uuid) {
      hasAny = true;
      if (!volume.isActive) {
        return false;
      }
    }
  }
  return hasAny;
}

void DescribeMembers(const VolumeGroup& group, const std::string& words) {
  for (const Member& member : group.members) {
    if (member.disk != nullptr) {
      Describe(*member.disk, words);
    }
  }
}

void ClaimMembers(const VolumeGroup& group, const DiskGroup& found) {
  for (const Member& member : group.members) {
    if (member.disk != nullptr) {
      member.disk->facts.membership = found.isMounted ? Membership::Mounted : Membership::Unmounted;
      member.disk->facts.group = found.uuid;
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

}  // namespace

std::vector<DiskGroup> FindDiskGroups(const std::vector<PhysicalVolume>& physicalVolumes,
                                      const std::vector<LogicalVolume>& logicalVolumes,
                                      const std::string& machineId, std::vector<ScannedDisk>& disks) {
  DescribeHidden(physicalVolumes, disks);
  const std::vector<VolumeGroup> volumeGroups = GroupsOf(physicalVolumes, disks);
  std::map<std::string, int> claims;
  for (const VolumeGroup& group : volumeGroups) {
    ++claims[ValueOf(group.tags, Tags::group).value_or("")];
  }
  std::map<std::pair<std::int64_t, std::string>, DiskGroup> groups;
  for (const VolumeGroup& group : volumeGroups) {
    if (!HasTag(group.tags, Tags::marker)) {
      DescribeMembers(group, "member of volume group " + group.name);
      continue;
    }
    MarkedGroup marked(group, machineId, claims[ValueOf(group.tags, Tags::group).value_or("")] > 1);
    if (!marked.IsOurs()) {
      DescribeMembers(group, marked.Words());
      continue;
    }
    DiskGroup found = std::move(marked).Take();
    found.isMounted = AreAllActive(group, logicalVolumes);
    ClaimMembers(group, found);
    const std::int64_t created = NumberOf(group.tags, Tags::created);
    groups.emplace(std::make_pair(created, found.uuid), std::move(found));
  }
  std::vector<DiskGroup> inOrder;
  for (auto& [key, group] : groups) {
    inOrder.push_back(std::move(group));
  }
  return inOrder;
}

bool HasMarkedGroup(const std::vector<PhysicalVolume>& physicalVolumes) {
  return std::any_of(physicalVolumes.begin(), physicalVolumes.end(),
                     [](const PhysicalVolume& volume) { return HasTag(volume.groupTags, Tags::marker); });
}

bool IsPhysicalVolume(const ScannedDisk& disk) {
  return disk.facts.signatures.IsKnown() && HasTag(disk.facts.signatures.Get(), PhysicalVolumeWords());
}

}  // namespace OtxCtl::Linux
