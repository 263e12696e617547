#include "otxctl/linux/MarkedGroup.h"

#include <algorithm>
#include <map>
#include <utility>

#include "otxctl/linux/GroupNames.h"
#include "otxctl/linux/GroupTags.h"

namespace OtxCtl::Linux {
namespace {

constexpr const char* wrongMarks = "whose members are not marked as they should be";

bool HasRole(const Member& member, std::string_view role) {
  return ValueOf(member.volume->tags, Tags::role) == role;
}

// That lies on the disk of this UUID; null: none does.
const LogicalVolume* DataVolumeOf(const VolumeGroup& group, const std::string& uuid) {
  const std::string tag = std::string(Tags::disk) + uuid;
  for (const LogicalVolume* volume : group.volumes) {
    if (!uuid.empty() && HasTag(volume->tags, tag)) {
      return volume;
    }
  }
  return nullptr;
}

std::string CacheStateOf(const LogicalVolume& volume) {
  if (volume.kind != "cache") {
    return "not cached";
  }
  if (volume.cacheMode != "writethrough") {
    return "cached in mode " + (volume.cacheMode.empty() ? "unknown" : volume.cacheMode);
  }
  if (!volume.isActive || volume.cacheBlocks <= 0) {
    return "cached, not active";
  }
  return std::to_string(volume.usedBlocks * 100 / volume.cacheBlocks) + "% of its cache used";
}

GroupMember ToMember(const Member& member) {
  GroupMember read;
  read.kovaUuid = UuidOf(member);
  read.isFlash = HasRole(member, Tags::cache);
  read.extents = member.volume->extents;
  read.place = NumberOf(member.volume->tags, Tags::place);
  read.isLeftBehind = member.volume->isLeftBehind;
  if (member.disk != nullptr) {
    read.canonicalName = member.disk->facts.canonicalName;
    read.deviceNode = member.disk->deviceNode;
    read.isFlash = member.disk->facts.isFlash.Is(true);
  }
  return read;
}

// A map that is on no disk any more was made for one that went away.
bool IsHeld(const Member& member) {
  const auto& holders = member.disk->facts.holders;
  return !holders.IsKnown() || !holders.Get().empty();
}

}  // namespace

MarkedGroup::MarkedGroup(const VolumeGroup& group, const std::string& machineId, bool isTwice)
    : _source(group), _uuid(ValueOf(group.tags, Tags::group).value_or("")) {
  const std::string state = ValueOf(group.tags, Tags::state).value_or("");
  if (_uuid.empty()) {
    _whyNot = "which has no identity";
  } else if (isTwice) {
    _whyNot = "which more than one volume group claims to be";
  } else if (ValueOf(group.tags, Tags::machine) != machineId || machineId.empty()) {
    _whyNot = "of another machine";
  } else if (state == Tags::released) {
    _whyNot = "whose cache disk was removed while its volumes held data";
  } else if (state != Tags::ready) {
    _whyNot = state == Tags::removing ? "of which the removal was not finished" : "which was never finished";
    _isUnfinished = state == Tags::removing || state == Tags::creating;
  } else {
    Read();
  }
}

std::string MarkedGroup::Words() const {
  return "member of disk group " + (_uuid.empty() ? "" : _uuid + ", ") + _whyNot;
}

void MarkedGroup::Read() {
  _group.uuid = _uuid;
  _group.volumeGroup = _source.name;
  _group.volumeGroupUuid = _source.uuid;
  ReadCacheDisk();
  ReadCapacityDisks();
  ReadForeignVolumes();
  _group.isMounted = IsMounted();
  _group.isAllFlash = IsAllFlash();
}

void MarkedGroup::ReadCacheDisk() {
  std::size_t caches = 0;
  for (const Member& member : _source.members) {
    if (std::string why = WhyNotOurs(member); !why.empty()) {
      _whyNot = std::move(why);
    } else if (HasRole(member, Tags::cache)) {
      ++caches;
      _cache = &member;
      _group.cache = ToMember(member);
      Identify(_group.cache.kovaUuid);
    }
  }
  if (_whyNot.empty() && caches != 1) {
    _whyNot = "which is not whole";
  }
}

void MarkedGroup::ReadCapacityDisks() {
  std::multimap<std::int64_t, const Member*> inOrder;
  for (const Member& member : _source.members) {
    if (&member != _cache) {
      inOrder.emplace(NumberOf(member.volume->tags, Tags::place), &member);
    }
  }
  for (const auto& [place, member] : inOrder) {
    const LogicalVolume* const volume = DataVolumeOf(_source, UuidOf(*member));
    if (volume == nullptr || !IsWhole(*volume)) {
      _halfWay.push_back(member);
    } else if (HasRole(*member, Tags::capacity)) {
      AddCapacityDisk(*member, *volume);
    }
  }
  if (_whyNot.empty() && CountDataVolumes() != _group.capacity.size()) {
    _whyNot = wrongMarks;
  }
  if (_whyNot.empty() && _group.capacity.empty()) {
    _whyNot = "which is not whole";
  }
}

std::size_t MarkedGroup::CountDataVolumes() const {
  return static_cast<std::size_t>(std::count_if(
      _source.volumes.begin(), _source.volumes.end(),
      [this](const LogicalVolume* volume) { return ValueOf(volume->tags, Tags::disk) && IsWhole(*volume); }));
}

// Those of a group whose cache disk has left may have been taken off it.
bool MarkedGroup::IsWhole(const LogicalVolume& volume) const {
  return volume.kind == "cache" || _group.HasLeft();
}

void MarkedGroup::AddCapacityDisk(const Member& member, const LogicalVolume& volume) {
  GroupMember& read = _group.capacity.emplace_back(ToMember(member));
  Identify(read.kovaUuid);
  read.volume.path = volume.path;
  read.volume.bytes = volume.bytes;
  read.volume.cacheState = CacheStateOf(volume);
  read.volume.isActive = volume.isActive;
  read.volume.isOpen = volume.isOpen;
  read.volume.isCached = volume.kind == "cache";
  read.volume.name = volume.name;
  _isStale = _isStale || (member.disk != nullptr && volume.isActive && !IsHeld(member));
}

void MarkedGroup::Identify(const std::string& uuid) {
  if (_whyNot.empty() && (uuid.empty() || !_uuids.insert(uuid).second)) {
    _whyNot = wrongMarks;
  }
}

void MarkedGroup::ReadForeignVolumes() {
  std::set<std::string> own;
  for (const Member& member : _source.members) {
    own.insert(CacheVolumeName(UuidOf(member)));
  }
  for (const LogicalVolume* volume : _source.volumes) {
    if (!ValueOf(volume->tags, Tags::disk) && own.count(volume->name) == 0) {
      _group.foreignVolumes.push_back(volume->name);
    }
  }
}

bool MarkedGroup::IsMounted() const {
  bool hasActive = false;
  for (const GroupMember& member : _group.capacity) {
    hasActive = hasActive || member.volume.isActive;
    if (member.isLeftBehind || (!member.canonicalName.empty() && !member.volume.isActive)) {
      return false;
    }
  }
  const bool isCacheStale = _cache != nullptr && _cache->disk != nullptr && !IsHeld(*_cache);
  return hasActive && !_isStale && !isCacheStale && !_group.cache.isLeftBehind;
}

// A group that does not say so is what its members are.
bool MarkedGroup::IsAllFlash() const {
  const std::string kind = ValueOf(_source.tags, Tags::kind).value_or("");
  if (!kind.empty()) {
    return kind == Tags::allFlash;
  }
  return std::all_of(_group.capacity.begin(), _group.capacity.end(),
                     [](const GroupMember& member) { return member.isFlash; });
}

}  // namespace OtxCtl::Linux
