#include "host/UnmountedGroups.h"

#include <algorithm>
#include <iterator>
#include <set>
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

}  // namespace

std::vector<GroupRecord> UnmountedGroups(HostCtl::Kova::KovaInfo& kernel) {
  std::vector<GroupRecord> groups;
  kernel.GetDiskMappings(groups, true);
  std::vector<GroupRecord> mounted;
  kernel.GetDiskMappings(mounted, false);
  const auto nameOf = [](const GroupRecord& group) {
    return std::pair(group.ssd.deviceName, group.ssd.kovaUuid);
  };
  std::set<std::pair<std::string, std::string>> names;
  std::transform(mounted.begin(), mounted.end(), std::inserter(names, names.end()), nameOf);
  std::erase_if(groups, [&](const GroupRecord& group) { return names.count(nameOf(group)) != 0; });
  return groups;
}

void AppendUnmounted(const std::vector<GroupRecord>& groups, const KnownDisks& known,
                     Nox::Kova::Host::ConfigInfo::StorageInfo& info) {
  const auto all = MakeRef<DataArray<DiskMapInfo>>();
  std::set<std::string> listed;
  if (info.GetDiskMapInfo()) {
    for (DiskMapInfo* mounted : *info.GetDiskMapInfo()) {
      all->Append(mounted);
      listed.insert(mounted->GetMapping()->GetSsd()->GetCanonicalName());
    }
  }
  for (const GroupRecord& group : groups) {
    const auto shown = MakeRef<DiskMapInfo>();
    shown->SetMapping(Show(group, known));
    shown->SetMounted(false);
    // One that was unmounted between the two questions is listed as it was then.
    if (listed.count(shown->GetMapping()->GetSsd()->GetCanonicalName()) == 0) {
      all->Append(shown);
    }
  }
  info.SetDiskMapInfo(all);
}

}  // namespace Host
