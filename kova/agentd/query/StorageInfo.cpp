// The host's disk groups: which there are, of which disks, and whether they are mounted.

#include <optional>

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/disks/AbsentDisk.h"
#include "kova/agentd/disks/DiskInventory.h"
#include "kova/agentd/disks/DiskMappings.h"
#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/include/KovaInfo.h"
#include "kova/agentd/marshal/DiskResultMarshal.h"
#include "kova/agentd/util/KovaUtil.h"
#include "nox/Kova.h"
#include "orbis/Engine.h"
#include "orbis/Types.h"

namespace Kovasvc {

using HostCtl::Kova::DiskName;
using HostCtl::Kova::DiskState;
using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapInfo;
using Nox::Kova::Host::DiskMapping;
using Nox::Kova::Host::KovaDiskInfo;
using Orbis::DataArray;
using StorageInfo = Nox::Kova::Host::ConfigInfo::StorageInfo;
using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::Logger;
using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;
using GroupRecord = HostCtl::Kova::DiskMapping;

namespace {

// A copy of the inventory's disk, or a stand-in for one that has left the host, with its KOVA UUID; null
// when the inventory does not have it.
Ref<ScsiDisk> DescribeDisk(const DiskName& name, bool ssd, const DiskInventory& inventory) {
  Ref<ScsiDisk> disk;
  if (name.deviceName.empty()) {
    GeneratePDLScsiDisk(name.kovaUuid, ssd, disk);
  } else {
    GetScsiDiskFromArray(name.deviceName, inventory, disk);
  }
  if (!disk) {
    return nullptr;
  }
  const Ref<ScsiDisk> copy = Orbis::Clone(disk);
  const Ref<KovaDiskInfo> info = MakeRef<KovaDiskInfo>();
  info->SetKovaUuid(name.kovaUuid);
  copy->SetKovaDiskInfo(info);
  CleanUnusedDiskFileds(*copy);
  return copy;
}

// The group; null when its cache disk or all its capacity disks are unknown to the inventory.
Ref<DiskMapping> DescribeGroup(Logger& logger, const GroupRecord& group, const DiskInventory& inventory) {
  const Ref<ScsiDisk> ssd = DescribeDisk(group.ssd, true, inventory);
  if (!ssd) {
    return nullptr;
  }
  const auto disks = MakeRef<DataArray<ScsiDisk>>();
  for (const DiskName& name : group.capacityDisks) {
    if (const Ref<ScsiDisk> disk = DescribeDisk(name, false, inventory)) {
      disks->Append(disk);
    }
  }
  if (disks->IsEmpty()) {
    // The misspelling stays: whoever searches a log finds this line by it.
    LogInternal(logger, LogLevel::Info, "Error marshaling disk maping for SSD: %1", NameForLog(ssd.Get()));
    return nullptr;
  }
  const auto mapping = MakeRef<DiskMapping>();
  mapping->SetSsd(ssd);
  mapping->SetNonSsd(disks);
  return mapping;
}

// A group counts as mounted unless the kernel calls its cache disk ineligible.
bool IsMounted(Logger& logger, HostCtl::Kova::KovaInfo& provider, const std::string& ssdDeviceName) {
  try {
    std::vector<HostCtl::Kova::DiskResult> records;
    provider.QueryDisks({ssdDeviceName}, records, false);
    return records.empty() || records.front().state != DiskState::Ineligible;
  } catch (const std::exception& exception) {
    // The format asks for a second argument and is given one, so the line ends in "%2".
    LogInternal(logger, LogLevel::Info, "Error when querying disks for KOVA: %2", exception.what());
    return true;
  }
}

// The kernel's mounted groups, and whether it claims disks on its own; a failing kernel is a warning and no
// groups.
std::vector<GroupRecord> ReadStorage(KovaManagerImpl& manager, Logger& logger,
                                     HostCtl::Kova::KovaInfo& provider, std::optional<bool>& autoClaim) {
  std::vector<GroupRecord> groups;
  try {
    provider.RefreshKovaInfo();
    autoClaim = provider.IsAutoModeEnabled();
    manager.GetKovaDiskMapping(groups);
  } catch (const HostCtl::Lib::HostCtlException& exception) {
    LogInternal(logger, LogLevel::Warning, "Error retrieving storage info: %1", exception.Describe());
    groups.clear();
  }
  return groups;
}

}  // namespace

void KovaManagerImpl::GetStorageInfo(std::string& resultText) {
  const auto info = MakeRef<StorageInfo>();
  const auto mappings = MakeRef<DataArray<DiskMapping>>();
  const auto mapInfos = MakeRef<DataArray<DiskMapInfo>>();
  std::optional<bool> autoClaim;
  const std::vector<GroupRecord> groups = ReadStorage(*this, *_logger, *_provider, autoClaim);
  info->SetAutoClaim(autoClaim);
  const Ref<DataArray<ScsiDisk>> disks = groups.empty() ? nullptr : Util::InventoryOrNone(*_logger);
  if (disks) {
    const DiskInventory inventory(disks);
    for (const GroupRecord& group : groups) {
      const Ref<DiskMapping> mapping = DescribeGroup(*_logger, group, inventory);
      if (!mapping) {
        continue;
      }
      const auto mapInfo = MakeRef<DiskMapInfo>();
      mapInfo->SetMapping(mapping);
      mapInfo->SetMounted(IsMounted(*_logger, *_provider, group.ssd.deviceName));
      mappings->Append(mapping);
      mapInfos->Append(mapInfo);
    }
  }
  info->SetDiskMapping(mappings);
  info->SetDiskMapInfo(mapInfos);
  std::string droppedFaultText;
  Ref<Orbis::Any> result = info;
  Ref<Orbis::MethodFault> noFault;
  SerializeKovaResultAndFault(resultText, droppedFaultText, result, noFault);
  InvalidateKovaDiskCache();
}

}  // namespace Kovasvc
