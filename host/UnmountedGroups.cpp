#include "host/UnmountedGroups.h"

#include <algorithm>
#include <iterator>
#include <string>
#include <utility>

#include "host/KnownDisks.h"
#include "kova/agentd/include/KovaInfo.h"
#include "nox/Host.h"
#include "orbis/Engine.h"

namespace Host {

using HostCtl::Kova::DiskName;
using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapInfo;
using Nox::Kova::Host::DiskMapping;
using Nox::Kova::Host::KovaDiskInfo;
using Orbis::DataArray;
using Tessa::MakeRef;
using Tessa::Ref;
using GroupRecord = HostCtl::Kova::DiskMapping;

namespace {

// As storage info shows the disk of a mounted group.
Ref<ScsiDisk> ShowKnown(const Ref<ScsiDisk>& found, const std::string& kovaUuid) {
  const Ref<ScsiDisk> disk = Orbis::Clone(found);
  const auto info = MakeRef<KovaDiskInfo>();
  info->SetKovaUuid(kovaUuid);
  disk->SetKovaDiskInfo(info);
  return disk;
}

Ref<ScsiDisk> Show(const DiskName& name, bool ssd, const KnownDisks& known) {
  if (name.deviceName.empty()) {
    return AbsentDisk(name.kovaUuid, ssd);
  }
  if (const Ref<ScsiDisk> found = known.Find(name.deviceName)) {
    return ShowKnown(found, name.kovaUuid);
  }
  const auto disk = MakeRef<ScsiDisk>();
  disk->SetCanonicalName(name.deviceName);
  return disk;
}

Ref<DiskMapping> Show(const GroupRecord& group, const KnownDisks& known) {
  const auto mapping = MakeRef<DiskMapping>();
  mapping->SetSsd(Show(group.ssd, true, known));
  const auto disks = MakeRef<DataArray<ScsiDisk>>();
  for (const DiskName& name : group.capacityDisks) {
    disks->Append(Show(name, false, known));
  }
  mapping->SetNonSsd(disks);
  return mapping;
}

// The cache disk first.
using Names = std::vector<std::string>;

Names NamesOf(const GroupRecord& group) {
  const auto nameOf = [](const DiskName& disk) {
    return disk.deviceName.empty() ? AbsentName(disk.kovaUuid) : disk.deviceName;
  };
  Names names = {nameOf(group.ssd)};
  std::transform(group.capacityDisks.begin(), group.capacityDisks.end(), std::back_inserter(names), nameOf);
  return names;
}

Names NamesOf(const DiskMapping& mapping) {
  Names names = {mapping.GetSsd()->GetCanonicalName()};
  if (const auto& disks = mapping.GetNonSsd()) {
    for (const ScsiDisk* disk : *disks) {
      names.push_back(disk->GetCanonicalName());
    }
  }
  return names;
}

// Which of the groups are among the others. Each of the others stands for one group: the one of the same
// disks or, where a disk has come or gone meanwhile, the first of the same cache disk.
std::vector<bool> Among(const std::vector<Names>& groups, std::vector<Names> others) {
  std::vector<bool> found(groups.size(), false);
  const auto take = [&](const auto& isSame) {
    for (std::size_t i = 0; i < groups.size(); ++i) {
      const auto at = found[i] ? others.end()
                               : std::find_if(others.begin(), others.end(),
                                              [&](const Names& other) { return isSame(groups[i], other); });
      if (at != others.end()) {
        found[i] = true;
        others.erase(at);
      }
    }
  };
  take([](const Names& one, const Names& other) { return one == other; });
  take([](const Names& one, const Names& other) { return one.front() == other.front(); });
  return found;
}

std::vector<Names> NamesOf(const std::vector<GroupRecord>& groups) {
  std::vector<Names> names;
  names.reserve(groups.size());
  for (const GroupRecord& group : groups) {
    names.push_back(NamesOf(group));
  }
  return names;
}

}  // namespace

std::vector<KernelGroup> GroupsOf(HostCtl::Kova::KovaInfo& kernel) {
  std::vector<GroupRecord> all;
  kernel.GetDiskMappings(all, true);
  std::vector<GroupRecord> mounted;
  kernel.GetDiskMappings(mounted, false);
  const std::vector<bool> isMounted = Among(NamesOf(all), NamesOf(mounted));
  std::vector<KernelGroup> groups;
  for (std::size_t i = 0; i < all.size(); ++i) {
    groups.push_back({.disks = std::move(all[i]), .mounted = isMounted[i]});
  }
  return groups;
}

void AppendUnlisted(const std::vector<KernelGroup>& groups, const KnownDisks& known,
                    Nox::Kova::Host::ConfigInfo::StorageInfo& info) {
  const auto all = MakeRef<DataArray<DiskMapInfo>>();
  std::vector<Names> listed;
  if (info.GetDiskMapInfo()) {
    for (DiskMapInfo* one : *info.GetDiskMapInfo()) {
      all->Append(one);
      listed.push_back(NamesOf(*one->GetMapping()));
    }
  }
  std::vector<Names> names;
  names.reserve(groups.size());
  for (const KernelGroup& group : groups) {
    names.push_back(NamesOf(group.disks));
  }
  const std::vector<bool> isListed = Among(names, listed);
  for (std::size_t i = 0; i < groups.size(); ++i) {
    if (!isListed[i]) {
      const auto shown = MakeRef<DiskMapInfo>();
      shown->SetMapping(Show(groups[i].disks, known));
      shown->SetMounted(groups[i].mounted);
      all->Append(shown);
    }
  }
  info.SetDiskMapInfo(all);
}

}  // namespace Host
