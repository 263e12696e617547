#include "kova/agentd/marshal/DiskResultMarshal.h"

#include <array>

#include "kova/agentd/disks/AbsentDisk.h"
#include "kova/agentd/disks/DiskInventory.h"
#include "kova/agentd/disks/DiskQuery.h"
#include "kova/agentd/disks/NameList.h"
#include "kova/agentd/util/KovaUtil.h"
#include "nox/Faults.h"
#include "nox/Kova.h"
#include "orbis/Engine.h"

namespace Kovasvc {

using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskState;
using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskResult;
using Nox::Kova::Host::KovaDiskInfo;
using Orbis::DataArray;
using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::Logger;
using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;
using DiskRecord = HostCtl::Kova::DiskResult;

namespace {

template <class Fault>
Ref<Orbis::MethodFault> MakeDiskFault(const std::string& deviceName) {
  return MakeRef<Fault>(deviceName);
}

struct ReasonFault {
  DiskReason reason;
  Ref<Orbis::MethodFault> (*make)(const std::string& deviceName);
};

constexpr std::array<ReasonFault, 5> reasonFaults = {{
    {DiskReason::NonLocal, &MakeDiskFault<Nox::Fault::DiskIsNonLocal>},
    {DiskReason::HasPartitions, &MakeDiskFault<Nox::Fault::DiskHasPartitions>},
    {DiskReason::Usb, &MakeDiskFault<Nox::Fault::DiskIsUSB>},
    {DiskReason::HasForeignPartitions, &MakeDiskFault<Nox::Fault::DiskHasPartitions>},
    {DiskReason::TooSmall, &MakeDiskFault<Nox::Fault::DiskTooSmall>},
}};

// The inventory's disk, or a stand-in; null when there is neither.
Ref<ScsiDisk> DiskOf(const DiskRecord& record, const DiskInventory& inventory) {
  Ref<ScsiDisk> disk;
  if (!record.isPdl) {
    GetScsiDiskFromArray(record.name, inventory, disk);
  } else if (!record.kovaUuid.empty()) {
    GeneratePDLScsiDisk(record.kovaUuid, record.isSsd, disk);
  }
  return disk;
}

// A copy of the disk, as results show it.
Ref<ScsiDisk> CopyForResult(const Ref<ScsiDisk>& disk, const DiskRecord& record, bool queryMode) {
  const Ref<ScsiDisk> copy = Orbis::Clone(disk);
  CleanUnusedDiskFileds(*copy);
  if (record.capacityFlash && !queryMode) {
    copy->SetSsd(false);
  }
  if (record.reason == DiskReason::GroupNotMounted) {
    copy->SetOperationalState(MakeRef<Orbis::TextList>(std::vector<std::string>{ScsiDisk::STATE_OFF}));
  }
  return copy;
}

}  // namespace

const char* MarshalDiskState(DiskState state) {
  switch (state) {
    case DiskState::InUse:
      return DiskResult::STATE_INUSE;
    case DiskState::Eligible:
      return DiskResult::STATE_ELIGIBLE;
    case DiskState::Ineligible:
      break;
  }
  return DiskResult::STATE_INELIGIBLE;
}

void MarshalDiskReason(const std::string& deviceName, DiskReason reason, Ref<Orbis::MethodFault>& fault) {
  for (const ReasonFault& row : reasonFaults) {
    if (row.reason == reason) {
      fault = row.make(deviceName);
      return;
    }
  }
}

void CleanUnusedDiskFileds(ScsiDisk& disk) {
  disk.SetDurableName(nullptr);
  disk.SetAlternateName(nullptr);
  disk.SetStandardInquiry(nullptr);
}

void MarshalHostCtlDiskResult(Logger&, const DiskRecord& record, const DiskInventory& inventory,
                              Ref<DiskResult>& result, bool queryMode) {
  const Ref<ScsiDisk> disk = DiskOf(record, inventory);
  if (!disk) {
    return;
  }
  const Ref<DiskResult> marshalled = MakeRef<DiskResult>();
  const Ref<ScsiDisk> copy = CopyForResult(disk, record, queryMode);
  marshalled->SetDisk(copy);
  marshalled->SetKovaUuid(record.kovaUuid);
  marshalled->SetState(MarshalDiskState(record.state));
  if (marshalled->GetState() == DiskResult::STATE_INUSE) {
    const Ref<KovaDiskInfo> info = MakeRef<KovaDiskInfo>();
    info->SetKovaUuid(record.kovaUuid);
    info->SetFormatVersion(record.formatVersion);
    copy->SetKovaDiskInfo(info);
  }
  Ref<Orbis::MethodFault> fault;
  MarshalDiskReason(record.name, record.reason, fault);
  if (fault) {
    marshalled->SetError(fault);
  }
  result = marshalled;
}

void MarshalHostCtlDiskResults(Logger& logger, const std::vector<DiskRecord>& records,
                               Ref<DataArray<DiskResult>>& results, bool queryMode) {
  const Ref<DataArray<DiskResult>> marshalled = MakeRef<DataArray<DiskResult>>();
  Ref<DataArray<ScsiDisk>> disks;
  try {
    Util::KovaUtil::GetDisksFromAgentd(disks);
  } catch (const Orbis::Fault::SystemError::Exception& exception) {
    LogInternal(logger, LogLevel::Warning, "GetDisksFromAgentd %1", Util::ReasonOf(exception));
    throw;
  }
  NameList names(NamesOfRecords(records));
  const DiskInventory inventory(disks, names);
  for (const DiskRecord& record : records) {
    Ref<DiskResult> result;
    MarshalHostCtlDiskResult(logger, record, inventory, result, queryMode);
    if (result) {
      marshalled->Append(result);
    } else if (!record.isPdl) {
      // An absent disk without a UUID has nothing to be named by, and goes without a word.
      LogInternal(logger, LogLevel::Info, "%1: Failed to marshal disk: %2", "MarshalHostCtlDiskResults",
                  record.name);
    }
  }
  results = marshalled;
}

Ref<DataArray<DiskResult>> MarshalCachedDisks(Logger& logger, const DiskCache::Locked& cache,
                                              const std::vector<std::string>& names,
                                              const DiskQueryLimit& limit) {
  std::vector<DiskRecord> records;
  LimitQueryDisksForKova(logger, names, limit, cache.Records(), records);
  Ref<DataArray<DiskResult>> results;
  MarshalHostCtlDiskResults(logger, records, results, false);
  return results;
}

}  // namespace Kovasvc
