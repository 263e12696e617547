// Makes disk groups: each is checked, formatted by the kernel and reported, disk by disk.
//
// No lock is held across a request, so another may run between two of its groups.

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/disks/AbsentDisk.h"
#include "kova/agentd/disks/DiskMappings.h"
#include "kova/agentd/disks/DiskQuery.h"
#include "kova/agentd/include/KovaInfo.h"
#include "kova/agentd/marshal/DiskResultMarshal.h"
#include "kova/agentd/operations/OperationSteps.h"
#include "nox/Kova.h"
#include "tessa/Formatter.h"

namespace Kovasvc {

using HostCtl::Kova::DiskReason;
using Nox::Kova::Host::DiskMapping;
using Nox::Kova::Host::DiskMapResult;
using Orbis::DataArray;
using Orbis::MethodFault;
using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::Logger;
using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;
using Tessa::System::LockGuard;

namespace {

// Whether the kernel knows exactly one disk of that name, and as part of a group that is not mounted.
bool IsUnmounted(Logger& logger, DiskCache& diskCache, const std::string& ssdName) {
  std::vector<HostCtl::Kova::DiskResult> records;
  const DiskCache::Locked cache(diskCache);
  LimitQueryDisksForKova(logger, {ssdName}, DiskQueryLimit(), cache.Records(), records);
  return records.size() == 1 && records.front().reason == DiskReason::GroupNotMounted;
}

}  // namespace

void KovaManagerImpl::InitializeDisks(const Texts& mappings, const std::string& requestTag,
                                      std::string& faultText, std::string& resultText) {
  const Ref<DataArray<DiskMapping>> requested =
      ReadObjects<DiskMapping>(mappings, WrongTypeLine::InitializeDisks);
  Ref<Orbis::Any> result;
  Ref<MethodFault> fault;
  RunIntoFault(*_logger, fault, [&] {
    {
      const LockGuard guard(*_operationLock);
      RefreshKovaDiskCache();
    }
    InitializeDisksInt(requested.Get(), requestTag, result, fault);
  });
  InvalidateKovaDiskCache();
  SerializeKovaResultAndFault(resultText, faultText, result, fault);
}

void KovaManagerImpl::InitializeDisksInt(DataArray<DiskMapping>* mappings, const std::string& requestTag,
                                         Ref<Orbis::Any>& result, Ref<MethodFault>& fault) {
  const auto results = MakeRef<DataArray<DiskMapResult>>();
  Ref<MethodFault> combined;
  try {
    ValidateDiskMappings(mappings);
    const int count = mappings != nullptr ? static_cast<int>(mappings->Size()) : 0;
    for (int index = 0; index < count; ++index) {
      auto mapResult = MakeRef<DiskMapResult>();
      InitializeMapping(Ref<DiskMapping>((*mappings)[index]), requestTag, count, index, mapResult);
      results->Append(mapResult);
      if (mapResult->GetError()) {
        PrepareKovaDiskFault(mapResult->GetError(), combined);
      }
    }
  } catch (const MethodFault::Exception& exception) {
    combined = exception.GetFault();
  }
  result = results;
  fault = combined;
}

void KovaManagerImpl::InitializeMapping(Ref<DiskMapping> mapping, const std::string& requestTag,
                                        int mappingCount, int mappingIndex, Ref<DiskMapResult>& result) {
  ValidateDiskMapping(mapping, result);
  if (result->GetError()) {
    LogInternal(_logger, LogLevel::Warning, "Given mapping is invalid: %1",
                Tessa::PrintFormatter::FormatObject(result->GetError()));
    return;
  }
  Ref<MethodFault> refused;
  // A group that is off-line, or whose cache disk has left, is restamped.
  AskKernel(*_logger, "Error formatting KOVA disks: %1", refused, [&] {
    const std::string ssdName = SsdNameOf(mapping.Get());
    Texts capacityNames = CapacityNamesOf(mapping.Get());
    if (IsUnmounted(*_logger, *_diskCache, ssdName) || IsPDLDiskInput(ssdName)) {
      RestampDiskMapping(ssdName, capacityNames);
    } else {
      FormatDiskMapping(ssdName, capacityNames, requestTag, mappingCount, mappingIndex);
    }
  });
  if (refused) {
    result->SetError(refused);
  }
  InvalidateKovaDiskCache();  // also after a refusal: what is reported is what the kernel says now
  Texts names;
  DiskMappingToDeviceNames(mapping, names);
  const LockGuard guard(*_operationLock);
  DiskCache::Locked cache(*_diskCache);
  RefreshKovaDiskCacheLocked(cache);
  result->SetDiskResult(MarshalCachedDisks(*_logger, cache, names, DiskQueryLimit()));
}

void KovaManagerImpl::FormatDiskMapping(const std::string& ssdName, Texts& nonSsdNames,
                                        const std::string& requestTag, int mappingCount, int mappingIndex) {
  LogInternal(_logger, LogLevel::Verbose, "Formatting KOVA disks");
  {
    const LockGuard guard(*_operationLock);
    _provider->FormatDiskMapping(
        ssdName, nonSsdNames,
        {.requestTag = requestTag, .mappingCount = mappingCount, .mappingIndex = mappingIndex});
  }
  LogInternal(_logger, LogLevel::Verbose, "Done formatting KOVA disks");
}

}  // namespace Kovasvc
