#include "otxctl/linux/VolumeGroups.h"

#include <algorithm>
#include <charconv>
#include <unordered_map>

#include "otxctl/linux/GroupTags.h"

namespace OtxCtl::Linux {

using Disks::Attachment;
using Texts = std::vector<std::string>;

bool HasTag(const Texts& tags, std::string_view tag) {
  return std::find(tags.begin(), tags.end(), tag) != tags.end();
}

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

std::string UuidOf(const Member& member) {
  return ValueOf(member.volume->tags, Tags::disk).value_or("");
}

std::string WhyNotOurs(const Member& member) {
  if (member.disk == nullptr) {
    return member.volume->deviceNumber.empty() ? "" : "of which a member is no whole disk";
  }
  const auto& connection = member.disk->facts.connection;
  const bool isOwn = connection.IsKnown() && connection.Get().attachment == Attachment::Machine;
  return isOwn ? ""
               : "of which " + member.disk->facts.kernelName + " is not attached to this machine as its own";
}

std::vector<VolumeGroup> JoinVolumeGroups(const std::vector<PhysicalVolume>& physicalVolumes,
                                          const std::vector<LogicalVolume>& logicalVolumes,
                                          std::vector<ScannedDisk>& disks) {
  std::unordered_map<std::string, ScannedDisk*> diskOf;
  for (ScannedDisk& disk : disks) {
    diskOf.emplace(disk.deviceNumber, &disk);
  }
  std::vector<VolumeGroup> groups;
  std::unordered_map<std::string, std::size_t> groupOf;
  for (const PhysicalVolume& volume : physicalVolumes) {
    if (volume.groupUuid.empty()) {
      continue;
    }
    const auto disk = diskOf.find(volume.deviceNumber);
    const Member member{&volume, disk == diskOf.end() ? nullptr : disk->second};
    const auto [position, isNew] = groupOf.try_emplace(volume.groupUuid, groups.size());
    if (isNew) {
      groups.push_back({volume.groupName, volume.groupUuid, volume.groupTags, {}, {}});
    }
    groups[position->second].members.push_back(member);
  }
  for (const LogicalVolume& volume : logicalVolumes) {
    if (const auto group = groupOf.find(volume.groupUuid); group != groupOf.end()) {
      groups[group->second].volumes.push_back(&volume);
    }
  }
  return groups;
}

}  // namespace OtxCtl::Linux
