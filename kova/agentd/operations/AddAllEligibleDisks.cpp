// Plans disk groups from every disk that the kernel offers and makes them.
//
// Unlike an addition of named disks it looks for no groups that are not mounted, says nothing when a limit
// leaves nothing to plan, and invalidates the disk cache also after a fault.

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/disks/DiskMappings.h"
#include "kova/agentd/disks/DiskQuery.h"
#include "kova/agentd/include/KovaInfo.h"
#include "kova/agentd/marshal/DiskResultMarshal.h"
#include "kova/agentd/operations/OperationSteps.h"
#include "nox/Kova.h"

namespace Kovasvc {

using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskState;
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

constexpr DiskQueryLimit offered = {.byState = true,
                                    .state = DiskState::Eligible,
                                    .byReason = true,
                                    .reason = DiskReason::None,
                                    .fifthFlag = false};

// The groups that these make: hybrid ones, then all-flash ones.
Ref<DataArray<DiskMapping>> PlanOfferedDisks(KovaManagerImpl& manager, Tessa::Service::Logger& logger,
                                             DataArray<ScsiDisk>& candidates) {
  bool limitReached = false;  // one flag for both planners, and nobody asks for it
  Ref<DataArray<DiskMapping>> allFlash;
  Ref<DataArray<ScsiDisk>> remaining;
  manager.AllFlashDiskMappingSwitch(&candidates, allFlash, remaining, limitReached);
  Ref<DataArray<DiskMapping>> planned;
  manager.ComputeDiskMappings(remaining.Get(), false, planned, limitReached);
  AppendMappings(allFlash.Get(), *planned);
  LogInternal(logger, LogLevel::Verbose, "Computed %1 mappings from the queried %2 disks for KOVA",
              planned->Size(), candidates.Size());
  LogDiskMappings(logger, planned.Get());
  return planned;
}

}  // namespace

void KovaManagerImpl::AddAllEligibleDisks(const std::string& requestTag, std::string& faultText,
                                          std::string& resultText) {
  Ref<Orbis::Any> result;
  Ref<MethodFault> fault;
  const bool cameThrough = RunIntoFault(*_logger, fault, [&] {
    Ref<DiskResults> results;
    {
      const LockGuard guard(*_operationLock);
      DiskCache::Locked cache(*_diskCache);
      RefreshKovaDiskCacheLocked(cache);
      results = MarshalCachedDisks(*_logger, cache, {}, offered);
    }
    LogInternal(_logger, LogLevel::Verbose, "Queried %1 eligible disks to be added to KOVA", results->Size());
    if (results->IsEmpty()) {
      return;
    }
    const auto candidates = MakeRef<DataArray<ScsiDisk>>();
    AppendDisks(*results, *candidates);
    const Ref<DataArray<DiskMapping>> planned = PlanOfferedDisks(*this, *_logger, *candidates);
    if (!planned->IsEmpty()) {
      InitializeDisksInt(planned.Get(), requestTag, result, fault);
    }
  });
  if (cameThrough) {
    LogInternal(_logger, LogLevel::Verbose, "DONE");
  }
  InvalidateKovaDiskCache();
  SerializeKovaResultAndFault(resultText, faultText, result, fault);
}

}  // namespace Kovasvc
