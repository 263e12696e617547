#include "otxctl/sim/SimRules.h"

#include <algorithm>
#include <array>
#include <unordered_set>
#include <utility>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/sim/KovaUuid.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Sim {
namespace {

using namespace HostCtl::Lib;
using HostCtl::Kova::DiskMapping;
using HostCtl::Kova::DiskName;
using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskResult;
using HostCtl::Kova::DiskState;

constexpr std::string_view speaker = "simulated kernel: ";

HostVerdict Verdict(DiskState state, DiskReason reason) {
  return {static_cast<std::int32_t>(state), static_cast<std::int32_t>(reason)};
}

// Why a disk may be ineligible, in the order of the numbers: of several reasons the lowest is reported.
struct ReasonRule {
  DiskReason reason;
  bool (*holds)(const HostDescription& host, const HostDisk& disk, const HostGroup* group);
};
constexpr std::array<ReasonRule, 6> reasonRules = {{
    {DiskReason::None, [](const HostDescription&, const HostDisk& disk,
                          const HostGroup* group) { return disk.absent && group == nullptr; }},
    {DiskReason::NonLocal,
     [](const HostDescription&, const HostDisk& disk, const HostGroup*) { return !disk.local; }},
    {DiskReason::HasPartitions,
     [](const HostDescription&, const HostDisk& disk, const HostGroup*) { return disk.partitions > 0; }},
    {DiskReason::Usb,
     [](const HostDescription&, const HostDisk& disk, const HostGroup*) { return disk.transport == "usb"; }},
    {DiskReason::TooSmall, [](const HostDescription& host, const HostDisk& disk,
                              const HostGroup*) { return disk.bytes < host.minimumDiskBytes; }},
    {DiskReason::GroupNotMounted,
     [](const HostDescription&, const HostDisk&, const HostGroup* group) { return group != nullptr; }},
}};

template <typename Exception>
[[noreturn]] void Refuse(const std::string& disk, const std::string& why) {
  // The name comes from a request and may hold anything; the message must not.
  throw Exception(std::string(speaker) + "disk " + Tessa::Quote(Tessa::Sanitize(disk)) + " " + why, disk);
}

DiskName NameOf(const HostDisk& disk) {
  return {disk.absent ? std::string() : disk.name, disk.kovaUuid};
}

DiskResult RecordOf(const HostDisk& disk, const HostVerdict& verdict) {
  DiskResult record;
  record.name = NameOf(disk).deviceName;
  record.kovaUuid = disk.kovaUuid;
  record.state = static_cast<DiskState>(verdict.state);
  record.reason = static_cast<DiskReason>(verdict.reason);
  record.isSsd = disk.ssd;
  record.isPdl = disk.absent;
  record.capacityFlash = disk.capacityFlash;
  record.formatVersion = disk.formatVersion;
  return record;
}

void Format(HostDisk& disk, std::string kovaUuid, std::uint8_t formatVersion) {
  disk.kovaUuid = std::move(kovaUuid);
  disk.formatVersion = formatVersion;
}

void Clear(HostDisk& disk) {
  Format(disk, {}, 0);
}

}  // namespace

HostVerdict VerdictOn(const HostDescription& host, const HostDisk& disk, const HostGroup* group) {
  if (disk.verdict) {
    return *disk.verdict;
  }
  if (group != nullptr && group->mounted) {
    return Verdict(DiskState::InUse, DiskReason::None);
  }
  for (const ReasonRule& rule : reasonRules) {
    if (rule.holds(host, disk, group)) {
      return Verdict(DiskState::Ineligible, rule.reason);
    }
  }
  return Verdict(DiskState::Eligible, DiskReason::None);
}

SimRules::SimRules(HostDescription host) : _host(std::move(host)) {
  for (Index index = 0; index < _host.disks.size(); ++index) {
    _diskOfName.emplace(_host.disks[index].name, index);
  }
  IndexGroups();
}

void SimRules::QueryDisks(const std::vector<std::string>& names, std::vector<DiskResult>& results) const {
  const std::unordered_set<std::string_view> wanted(names.begin(), names.end());
  for (Index index = 0; index < _host.disks.size(); ++index) {
    const HostDisk& disk = _host.disks[index];
    if (!disk.inKernel) {
      continue;
    }
    const std::string_view deviceName = disk.absent ? std::string_view() : disk.name;
    if (wanted.empty() || wanted.count(deviceName) > 0) {
      results.push_back(RecordOf(disk, VerdictOn(_host, disk, GroupOfDisk(index))));
    }
  }
}

void SimRules::GetDiskMappings(std::vector<DiskMapping>& mappings, bool withUnmounted) const {
  for (Index index = 0; index < _host.groups.size(); ++index) {
    const HostGroup& group = _host.groups[index];
    if (!group.mounted && !withUnmounted) {
      continue;
    }
    const Members& members = _membersOfGroup[index];
    DiskMapping& mapping = mappings.emplace_back();
    mapping.ssd = NameOf(_host.disks[members.ssd]);
    mapping.capacityDisks.reserve(members.capacity.size());
    for (const Index disk : members.capacity) {
      mapping.capacityDisks.push_back(NameOf(_host.disks[disk]));
    }
    mapping.formatVersion = group.formatVersion;
    mapping.allFlash = group.allFlash;
    mapping.thirdFlag = group.busy || !group.mounted;
  }
}

bool SimRules::FormatDiskMapping(const std::string& ssd, const std::vector<std::string>& capacityDisks) {
  CheckFormat(ssd, capacityDisks);
  const std::optional<Index> extended = FindGroupOfSsd(ssd);
  CheckRoom(extended ? _host.groups[*extended].capacity.size() : 0, capacityDisks.size());
  HostGroup group;
  if (extended) {
    group = _host.groups[*extended];
  } else {
    group.ssd = ssd;
    group.allFlash = IsAllFlash(capacityDisks);
    group.formatVersion = newGroupFormatVersion;
  }
  group.capacity.insert(group.capacity.end(), capacityDisks.begin(), capacityDisks.end());

  std::vector<std::string> joining = capacityDisks;
  if (!extended) {
    joining.push_back(ssd);
  }
  for (const std::string& name : joining) {
    Format(DiskOf(name), KovaUuidOf(_host.name, name), group.formatVersion);
  }
  if (extended) {
    _host.groups[*extended] = std::move(group);
  } else {
    _host.groups.push_back(std::move(group));
  }
  IndexGroup(extended ? *extended : _host.groups.size() - 1);
  return true;
}

// Disk by disk, the cache disk first. Whatever a disk's verdict says, one that belongs to a group is never
// formatted: it may hold data, above all in a group that is not mounted.
void SimRules::CheckFormat(const std::string& ssd, const std::vector<std::string>& capacityDisks) const {
  std::unordered_set<std::string_view> named;
  const auto check = [this, &named](const std::string& name, bool mayHeadItsGroup) {
    const std::optional<Index> disk = FindDisk(name);
    if (!disk) {
      Refuse<KovaStorageException>(name, "is unknown or absent");
    }
    const HostGroup* const group = GroupOfDisk(*disk);
    const bool isExtended = mayHeadItsGroup && group != nullptr && group->mounted && group->ssd == name;
    const bool isNew = named.insert(name).second;
    if (!isNew || (group != nullptr && !isExtended)) {
      Refuse<KovaStorageException>(name, "is in use");
    }
    if (_host.disks[*disk].partitions > 0) {
      Refuse<KovaExceptionHasPartition>(name, "has partitions");
    }
  };
  check(ssd, true);
  for (const std::string& name : capacityDisks) {
    check(name, false);
  }
}

void SimRules::CheckRoom(std::size_t present, std::size_t added) const {
  if (added == 0) {
    throw HostCtlException(std::string(speaker) + "a disk group needs a capacity disk");
  }
  if (present + added > mostCapacityDisks) {
    throw HostCtlException(std::string(speaker) + "a disk group holds at most " +
                           std::to_string(mostCapacityDisks) + " capacity disks");
  }
}

bool SimRules::IsAllFlash(const std::vector<std::string>& capacityDisks) const {
  return std::all_of(capacityDisks.begin(), capacityDisks.end(), [this](const std::string& name) {
    const HostDisk& disk = DiskOf(name);
    return disk.ssd || disk.capacityFlash;
  });
}

// New stamps show nowhere in a description: a restamp only asks whether the group exists.
bool SimRules::RestampDiskMapping(const std::string& ssd) const {
  GroupOfSsd(ssd);
  return false;
}

bool SimRules::RestampDiskMappingByUuid(const std::string& kovaUuid) const {
  const bool isKnown =
      !kovaUuid.empty() && std::any_of(_host.groups.begin(), _host.groups.end(), [&](const HostGroup& group) {
        return DiskOf(group.ssd).kovaUuid == kovaUuid;
      });
  if (!isKnown) {
    Refuse<KovaStorageException>(kovaUuid, "heads no disk group");
  }
  return false;
}

bool SimRules::MountDiskMapping(const std::string& ssd) {
  return SetMounted(GroupOfSsd(ssd), true);
}

bool SimRules::UnmountDiskMapping(const std::string& ssd) {
  return SetMounted(GroupOfSsd(ssd), false);
}

bool SimRules::ClaimUnmountedDiskgroups() {
  bool isChanged = false;
  for (Index group = 0; group < _host.groups.size(); ++group) {
    isChanged |= SetMounted(group, true);
  }
  return isChanged;
}

bool SimRules::SetMounted(Index group, bool mounted) {
  return std::exchange(_host.groups[group].mounted, mounted) != mounted;
}

bool SimRules::RemoveDisk(const std::string& disk) {
  if (_host.autoMode) {
    Refuse<KovaExceptionRemoveDiskAutoModeEnabled>(disk,
                                                   "cannot be removed while disks are claimed automatically");
  }
  const std::optional<Index> found = FindDisk(disk);
  if (!found || GroupOfDisk(*found) == nullptr) {
    Refuse<KovaStorageException>(disk, "is unknown or in no disk group");
  }
  return TakeOut(*found, disk);
}

bool SimRules::RemoveDiskMapping(const std::string& ssd) {
  if (_host.autoMode) {
    Refuse<KovaExceptionRemoveMappingAutoModeEnabled>(
        ssd, "cannot give up its group while disks are claimed automatically");
  }
  RemoveGroup(GroupOfSsd(ssd));
  return true;
}

// Automatic claiming does not matter here: a disk that has left is not claimed again.
bool SimRules::RemoveDiskByUuid(const std::string& kovaUuid) {
  // A disk that the kernel neither lists nor has in a group is unknown to it.
  const auto isMeant = [&](const HostDisk& disk) {
    const bool isKnown = disk.inKernel || _groupOfDisk[static_cast<Index>(&disk - _host.disks.data())];
    return disk.absent && isKnown && disk.kovaUuid == kovaUuid;
  };
  const auto found = std::find_if(_host.disks.begin(), _host.disks.end(), isMeant);
  if (kovaUuid.empty() || found == _host.disks.end()) {
    Refuse<KovaStorageException>(kovaUuid, "is no absent disk");
  }
  return TakeOut(static_cast<Index>(found - _host.disks.begin()), kovaUuid);
}

bool SimRules::TakeOut(Index disk, const std::string& named) {
  const std::optional<Index> groupIndex = _groupOfDisk[disk];
  if (!groupIndex) {
    Clear(_host.disks[disk]);
    return true;
  }
  HostGroup& group = _host.groups[*groupIndex];
  if (group.ssd == _host.disks[disk].name) {
    RemoveGroup(*groupIndex);
    return true;
  }
  if (group.capacity.size() == 1) {
    Refuse<KovaExceptionLastRemainingHDD>(named, "is the last capacity disk of its group");
  }
  std::vector<std::string>& capacity = group.capacity;
  capacity.erase(std::find(capacity.begin(), capacity.end(), _host.disks[disk].name));
  _groupOfDisk[disk].reset();
  IndexGroup(*groupIndex);
  Clear(_host.disks[disk]);
  return true;
}

void SimRules::RemoveGroup(Index group) {
  Clear(DiskOf(_host.groups[group].ssd));
  for (const std::string& name : _host.groups[group].capacity) {
    Clear(DiskOf(name));
  }
  _host.groups.erase(_host.groups.begin() + static_cast<std::ptrdiff_t>(group));
  IndexGroups();
}

void SimRules::IndexGroups() {
  _groupOfDisk.assign(_host.disks.size(), std::nullopt);
  _membersOfGroup.clear();
  for (Index index = 0; index < _host.groups.size(); ++index) {
    IndexGroup(index);
  }
}

void SimRules::IndexGroup(Index group) {
  _membersOfGroup.resize(_host.groups.size());
  Members& members = _membersOfGroup[group];
  members.ssd = _diskOfName.at(_host.groups[group].ssd);
  members.capacity.clear();
  for (const std::string& name : _host.groups[group].capacity) {
    members.capacity.push_back(_diskOfName.at(name));
    _groupOfDisk[members.capacity.back()] = group;
  }
  _groupOfDisk[members.ssd] = group;
}

std::optional<SimRules::Index> SimRules::FindDisk(const std::string& name) const {
  const auto found = _diskOfName.find(name);
  if (found == _diskOfName.end()) {
    return std::nullopt;
  }
  const HostDisk& disk = _host.disks[found->second];
  return disk.inKernel && !disk.absent ? std::optional<Index>(found->second) : std::nullopt;
}

std::optional<SimRules::Index> SimRules::FindGroupOfSsd(const std::string& ssd) const {
  const std::optional<Index> disk = FindDisk(ssd);
  const HostGroup* const group = disk ? GroupOfDisk(*disk) : nullptr;
  return group != nullptr && group->ssd == ssd ? _groupOfDisk[*disk] : std::nullopt;
}

SimRules::Index SimRules::GroupOfSsd(const std::string& ssd) const {
  const std::optional<Index> group = FindGroupOfSsd(ssd);
  if (!group) {
    Refuse<KovaStorageException>(ssd, "heads no disk group");
  }
  return *group;
}

const HostGroup* SimRules::GroupOfDisk(Index disk) const {
  const std::optional<Index> group = _groupOfDisk[disk];
  return group ? &_host.groups[*group] : nullptr;
}

HostDisk& SimRules::DiskOf(const std::string& name) {
  return _host.disks[_diskOfName.at(name)];
}

const HostDisk& SimRules::DiskOf(const std::string& name) const {
  return _host.disks[_diskOfName.at(name)];
}

}  // namespace OtxCtl::Sim
