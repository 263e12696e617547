// Requested disk groups beside those that the kernel already has.

#include <algorithm>
#include <string_view>
#include <unordered_set>

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/disks/DiskInventory.h"
#include "kova/agentd/disks/DiskMappings.h"
#include "kova/agentd/disks/DiskQuery.h"
#include "kova/agentd/disks/NameList.h"
#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/include/KovaInfo.h"
#include "kova/agentd/planning/KernelGroups.h"
#include "kova/agentd/util/KovaUtil.h"
#include "nox/Kova.h"

namespace Kovasvc {

using HostCtl::Kova::DiskName;
using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskResult;
using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;
using Orbis::DataArray;
using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;
using GroupRecord = HostCtl::Kova::DiskMapping;

namespace {

// How a request names one of the kernel's disks, also one that has left.
std::string RequestNameOf(const DiskName& disk) {
  return disk.deviceName.empty() ? "kova:" + disk.kovaUuid : disk.deviceName;
}

// Whether the kernel's group is the requested one: as many disks, and each of the kernel's among the
// requested.
bool IsRequested(const GroupRecord& group, const std::string& ssd,
                 const std::unordered_set<std::string_view>& requested, std::size_t requestedCount) {
  return group.ssd.deviceName == ssd && group.capacityDisks.size() == requestedCount &&
         std::all_of(group.capacityDisks.begin(), group.capacityDisks.end(),
                     [&](const DiskName& disk) { return requested.contains(RequestNameOf(disk)); });
}

bool IsUnmountedSsd(const DiskResult& record) {
  return record.isSsd && record.reason == DiskReason::GroupNotMounted;
}

// The group with the inventory's disks; null where the inventory has none.
Ref<DiskMapping> FromInventory(const GroupRecord& group, const DiskInventory& inventory) {
  const auto mapping = MakeRef<DiskMapping>();
  Ref<ScsiDisk> ssd;
  GetScsiDiskFromArray(group.ssd.deviceName, inventory, ssd);
  mapping->SetSsd(ssd);
  const auto disks = MakeRef<DataArray<ScsiDisk>>();
  for (const DiskName& name : group.capacityDisks) {
    Ref<ScsiDisk> disk;
    GetScsiDiskFromArray(name.deviceName, inventory, disk);
    disks->Append(disk);
  }
  mapping->SetNonSsd(disks);
  return mapping;
}

}  // namespace

bool KovaManagerImpl::DiskMappingExists(Ref<DiskMapping> mapping) {
  const std::string ssd = SsdNameOf(mapping.Get());
  const Texts names = CapacityNamesOf(mapping.Get());
  if (names.empty()) {
    return false;
  }
  try {
    std::vector<GroupRecord> groups;
    _provider->GetDiskMappings(groups, false);
    const std::unordered_set<std::string_view> requested(names.begin(), names.end());
    return std::any_of(groups.begin(), groups.end(), [&](const GroupRecord& group) {
      return IsRequested(group, ssd, requested, names.size());
    });
  } catch (const HostCtl::Lib::HostCtlException& exception) {
    LogInternal(_logger, LogLevel::Warning, "Failed to validate disk mapping: %1", exception.Describe());
    return false;
  }
}

void KovaManagerImpl::ComputeNotMountedDiskMappings(DataArray<ScsiDisk>* candidates,
                                                    Ref<DataArray<DiskMapping>>& mappings) {
  Texts ssdNames;
  if (candidates != nullptr) {
    for (const ScsiDisk* disk : *candidates) {
      if (IsSsd(disk)) {
        ssdNames.push_back(NameOf(disk));
      }
    }
  }
  if (ssdNames.empty()) {
    return;  // a query without names would answer for every disk of the host
  }
  std::vector<DiskResult> records;
  {
    const DiskCache::Locked cache(*_diskCache);
    LimitQueryDisksForKova(*_logger, ssdNames, DiskQueryLimit(), cache.Records(), records);
  }
  std::erase_if(records, [](const DiskResult& record) { return !IsUnmountedSsd(record); });
  NameList notMounted(NamesOfRecords(records));
  if (notMounted.IsEmpty()) {
    return;
  }
  const std::vector<GroupRecord> groups = KernelGroupsOrNone(*_logger, *_provider);
  const Ref<DataArray<ScsiDisk>> disks = Util::InventoryOrNone(*_logger);
  if (!disks) {
    return;
  }
  const DiskInventory inventory(disks);
  for (const GroupRecord& group : groups) {
    if (notMounted.Contains(group.ssd.deviceName)) {
      mappings->Append(FromInventory(group, inventory));
    }
  }
}

}  // namespace Kovasvc
