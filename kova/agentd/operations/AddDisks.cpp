// Plans disk groups from the disks of a request and makes them.

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/disks/DiskMappings.h"
#include "kova/agentd/disks/DiskQuery.h"
#include "kova/agentd/include/KovaInfo.h"
#include "kova/agentd/marshal/DiskResultMarshal.h"
#include "kova/agentd/operations/OperationSteps.h"
#include "kova/agentd/planning/pure/AddPlan.h"
#include "nox/Faults.h"
#include "nox/Kova.h"

namespace Kovasvc {

using Nox::Fault::DuplicateDisks;
using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;
using Orbis::DataArray;
using Orbis::MethodFault;
using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::Logger;
using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;
using Tessa::System::LockGuard;

namespace {

void DemandNoRepeat(Logger& logger, const std::vector<std::string>& names) {
  if (const auto repeated = Planning::FindRepeatedNeighbour({names.begin(), names.end()})) {
    const std::string& told = names[*repeated];
    LogInternal(logger, LogLevel::Warning,
                "Error checking disk uniqueness, duplicate disks found in mappings: %1", told);
    throw DuplicateDisks::Exception(MakeRef<DuplicateDisks>(told));
  }
}

// A fault that says by its one message which limit stopped the planning.
Ref<MethodFault> LimitReached(bool allFlash) {
  const auto message = MakeRef<Orbis::LocalizableMessage>();
  message->SetKey(allFlash ? "nox.agentd.kovaDiskOperation.allFlashExceed"
                           : "nox.agentd.kovaDiskOperation.hybridExceed");
  const auto messages = MakeRef<DataArray<Orbis::LocalizableMessage>>();
  messages->Append(message);
  const auto fault = MakeRef<Nox::Fault::KovaFault>();
  fault->SetFaultMessage(messages);
  return fault;
}

// Those of the disks that the kernel calls eligible, as planning sees them.
Ref<DataArray<ScsiDisk>> EligibleOf(Logger& logger, DiskCache& cache, const std::vector<std::string>& names) {
  const auto candidates = MakeRef<DataArray<ScsiDisk>>();
  if (names.empty()) {
    return candidates;  // a query without names would answer for every disk of the host
  }
  const auto results = MarshalCachedDisks(logger, DiskCache::Locked(cache), names, eligibleDisks);
  AppendDisks(*results, *candidates);
  return candidates;
}

// The groups that an addition of these disks makes: hybrid ones, those that are there but not mounted, and
// all-flash ones.
struct Addition {
  Ref<DataArray<DiskMapping>> groups;
  // Which planner could plan nothing because of a limit.
  bool allFlashExceeded = false;
  bool hybridExceeded = false;
};

Addition PlanAddition(KovaManagerImpl& manager, Logger& logger, DiskCache& cache,
                      DataArray<ScsiDisk>& disks) {
  Addition addition;
  Ref<DataArray<DiskMapping>> allFlash;
  Ref<DataArray<ScsiDisk>> remaining;
  manager.AllFlashDiskMappingSwitch(&disks, allFlash, remaining, addition.allFlashExceeded);
  const std::vector<std::string> names = NamesOf(remaining.Get());
  DemandNoRepeat(logger, names);
  const Ref<DataArray<ScsiDisk>> candidates = EligibleOf(logger, cache, names);
  manager.ComputeDiskMappings(candidates.Get(), false, addition.groups, addition.hybridExceeded);
  manager.ComputeNotMountedDiskMappings(&disks, addition.groups);
  AppendMappings(allFlash.Get(), *addition.groups);
  return addition;
}

}  // namespace

void KovaManagerImpl::AddDisks(const Texts& disks, const std::string& requestTag, std::string& faultText,
                               std::string& resultText) {
  const Ref<DataArray<ScsiDisk>> given = ReadObjects<ScsiDisk>(disks, WrongTypeLine::AddDisks);
  {
    const LockGuard guard(*_operationLock);
    RefreshKovaDiskCache();
  }
  Ref<Orbis::Any> result;
  Ref<MethodFault> fault;
  const bool cameThrough = RunIntoFault(*_logger, fault, [&] {
    const Addition planned = PlanAddition(*this, *_logger, *_diskCache, *given);
    // The number of disks is passed and, by this format, not shown.
    LogInternal(_logger, LogLevel::Verbose, "Computed %1 mappings from the given %3 disks for KOVA",
                planned.groups->Size(), given->Size());
    LogDiskMappings(*_logger, planned.groups.Get());
    if (planned.groups->IsEmpty() && (planned.allFlashExceeded || planned.hybridExceeded)) {
      fault = LimitReached(planned.allFlashExceeded);
    } else {
      InitializeDisksInt(planned.groups.Get(), requestTag, result, fault);
    }
  });
  // After a fault the disk cache stays valid.
  if (cameThrough) {
    InvalidateKovaDiskCache();
    LogInternal(_logger, LogLevel::Verbose, "DONE");
  }
  SerializeKovaResultAndFault(resultText, faultText, result, fault);
}

}  // namespace Kovasvc
