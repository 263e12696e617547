// Plans disk groups from the disks of a request and makes them.

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/disks/DiskMappings.h"
#include "kova/agentd/disks/DiskQuery.h"
#include "kova/agentd/include/KovaInfo.h"
#include "kova/agentd/operations/OperationSteps.h"
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
using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;
using Tessa::System::LockGuard;

namespace {

// Only neighbours count: a disk that is named twice with another between them passes. The name told is
// names[k], k being the count of names without repeats; it need not be a repeated one.
void DemandNoRepeat(Tessa::Service::Logger& logger, const std::vector<std::string>& names) {
  std::size_t withoutRepeats = 0;
  for (std::size_t i = 0; i < names.size(); ++i) {
    withoutRepeats += i == 0 || names[i] != names[i - 1] ? 1 : 0;
  }
  if (withoutRepeats == names.size()) {
    return;
  }
  const std::string& told = names[withoutRepeats];
  LogInternal(logger, LogLevel::Warning,
              "Error checking disk uniqueness, duplicate disks found in mappings: %1", told);
  throw DuplicateDisks::Exception(MakeRef<DuplicateDisks>(told));
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

}  // namespace

Ref<DataArray<ScsiDisk>> KovaManagerImpl::EligibleOf(const Texts& names) {
  const auto candidates = MakeRef<DataArray<ScsiDisk>>();
  if (names.empty()) {
    return candidates;  // a query without names would answer for every disk of the host
  }
  Ref<DiskResults> results;
  {
    const LockGuard guard(*_diskCacheLock);
    QueryDiskCacheLocked(names, eligibleDisks, results);
  }
  AppendDisks(*results, *candidates);
  return candidates;
}

Ref<DataArray<DiskMapping>> KovaManagerImpl::PlanGroups(DataArray<ScsiDisk>& disks, bool& allFlashExceeded,
                                                        bool& hybridExceeded) {
  Ref<DataArray<DiskMapping>> allFlash;
  Ref<DataArray<ScsiDisk>> remaining;
  AllFlashDiskMappingSwitch(&disks, allFlash, remaining, allFlashExceeded);
  const Texts names = NamesOf(remaining.Get());
  DemandNoRepeat(*_logger, names);
  const Ref<DataArray<ScsiDisk>> candidates = EligibleOf(names);
  Ref<DataArray<DiskMapping>> planned;
  ComputeDiskMappings(candidates.Get(), false, planned, hybridExceeded);
  ComputeNotMountedDiskMappings(&disks, planned);
  AppendMappings(allFlash.Get(), *planned);
  return planned;
}

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
    bool allFlashExceeded = false;
    bool hybridExceeded = false;
    const Ref<DataArray<DiskMapping>> planned = PlanGroups(*given, allFlashExceeded, hybridExceeded);
    // The number of disks is passed and, by this format, not shown.
    LogInternal(_logger, LogLevel::Verbose, "Computed %1 mappings from the given %3 disks for KOVA",
                planned->Size(), given->Size());
    LogDiskMappings(*_logger, planned.Get());
    if (planned->IsEmpty() && (allFlashExceeded || hybridExceeded)) {
      fault = LimitReached(allFlashExceeded);
    } else {
      InitializeDisksInt(planned.Get(), requestTag, result, fault);
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
