// Plans all-flash groups first, and says which disks are left for hybrid ones.
//
// The kernel tags flash disks that are meant for capacity; marshalled for planning they are no cache disks,
// so the planner of hybrid groups deals them out like hard disks.

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/disks/DiskMappings.h"
#include "kova/agentd/disks/DiskQuery.h"
#include "kova/agentd/disks/NameList.h"
#include "kova/agentd/include/KovaInfo.h"
#include "kova/agentd/marshal/DiskResultMarshal.h"
#include "kova/agentd/planning/pure/GroupPlan.h"
#include "nox/Kova.h"
#include "orbis/Types.h"

namespace Kovasvc {

using HostCtl::Kova::DiskResult;
using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;
using Orbis::DataArray;
using Orbis::MethodFault;
using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::Logger;
using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;

namespace {

bool IsFlash(const DiskResult& record) {
  return Planning::IsFlash(record.isSsd, record.capacityFlash);
}

// The candidates that the kernel calls eligible flash disks, as planning sees them.
Ref<DataArray<ScsiDisk>> QueryEligibleFlash(Logger& logger, DiskCache& diskCache,
                                            const DataArray<ScsiDisk>* candidates) {
  const auto flash = MakeRef<DataArray<ScsiDisk>>();
  Ref<KovaManagerImpl::DiskResults> results;
  {
    const DiskCache::Locked cache(diskCache);
    const std::vector<std::string> names = NamesOf(candidates);
    if (names.empty()) {
      return flash;  // a query without names would answer for every disk of the host
    }
    std::vector<DiskResult> records;
    LimitQueryDisksForKova(logger, names, eligibleDisks, cache.Records(), records);
    std::erase_if(records, [](const DiskResult& record) { return !IsFlash(record); });
    MarshalHostCtlDiskResults(logger, records, results, false);
  }
  AppendDisks(*results, *flash);
  return flash;
}

}  // namespace

void KovaManagerImpl::ComputeAllFlashDiskMappings(DataArray<ScsiDisk>* candidates,
                                                  Ref<DataArray<DiskMapping>>& mappings, Texts& takenNames,
                                                  bool& limitReached) {
  Ref<DataArray<DiskMapping>> planned;
  try {
    const Ref<DataArray<ScsiDisk>> flash = QueryEligibleFlash(*_logger, *_diskCache, candidates);
    if (flash->IsEmpty()) {
      mappings = nullptr;
      return;
    }
    LogInternal(_logger, LogLevel::Verbose, "Queried %1 All-Flash eligible disks to be added to KOVA",
                flash->Size());
    for (const ScsiDisk* disk : *flash) {
      if (!IsSsd(disk)) {
        takenNames.push_back(NameOf(disk));
      }
    }
    ComputeDiskMappings(flash.Get(), true, planned, limitReached);
    LogInternal(_logger, LogLevel::Verbose,
                "Computed %1 All-Flash mappings from the queried %2 disks for KOVA", planned->Size(),
                flash->Size());
    LogDiskMappings(*_logger, planned.Get());
    for (const DiskMapping* mapping : *planned) {
      takenNames.push_back(SsdNameOf(mapping));
    }
  } catch (const MethodFault::Exception& exception) {
    LogInternal(_logger, LogLevel::Verbose, "Got fault %1", exception.what());
  }
  mappings = planned;
}

void KovaManagerImpl::AllFlashDiskMappingSwitch(DataArray<ScsiDisk>* candidates,
                                                Ref<DataArray<DiskMapping>>& mappings,
                                                Ref<DataArray<ScsiDisk>>& remaining, bool& limitReached) {
  const auto left = MakeRef<DataArray<ScsiDisk>>();
  Ref<DataArray<DiskMapping>> planned;
  Texts takenNames;
  try {
    ComputeAllFlashDiskMappings(candidates, planned, takenNames, limitReached);
  } catch (const MethodFault::Exception& exception) {
    LogInternal(_logger, LogLevel::Verbose, "Got fault %1", exception.what());
    remaining = Ref<DataArray<ScsiDisk>>(candidates);
    mappings = nullptr;
    return;
  }
  NameList taken(takenNames);
  if (candidates != nullptr) {
    for (ScsiDisk* disk : *candidates) {
      if (!taken.Contains(NameOf(disk))) {
        left->Append(disk);
      }
    }
  }
  mappings = planned;
  remaining = left;
}

}  // namespace Kovasvc
