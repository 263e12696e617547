// Requested disk groups are checked before anything is formatted: the request as a whole, then each group.

#include <algorithm>

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/disks/DiskMappings.h"
#include "kova/agentd/disks/DiskQuery.h"
#include "kova/agentd/disks/NameList.h"
#include "kova/agentd/include/KovaInfo.h"
#include "kova/agentd/marshal/DiskResultMarshal.h"
#include "nox/Faults.h"
#include "nox/Kova.h"

namespace Kovasvc {

using Nox::Fault::DuplicateDisks;
using Nox::Fault::InsufficientDisks;
using Nox::Kova::Host::DiskMapping;
using Nox::Kova::Host::DiskMapResult;
using Orbis::DataArray;
using Orbis::MethodFault;
using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::Logger;
using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;

namespace {

constexpr std::size_t fewestDisks = 2;  // a cache disk and a capacity disk

void LogDone(Logger& logger, std::string_view format, const Ref<MethodFault>& fault) {
  LogInternal(logger, LogLevel::Verbose, format, fault ? "FAIL" : "OK");
}

// The checks that need no kernel: null when the group passes. The names are sorted.
Ref<MethodFault> CheckShape(Logger& logger, const DiskMapping& mapping,
                            const std::vector<std::string>& names) {
  if (names.empty()) {
    LogInternal(logger, LogLevel::Warning, "Given invalid empty mapping");
    return MakeRef<InsufficientDisks>();
  }
  LogInternal(logger, LogLevel::Verbose, "Checking %1 disks for uniqueness", names.size());
  Ref<MethodFault> fault;
  const auto duplicate = std::adjacent_find(names.begin(), names.end());
  if (duplicate != names.end()) {
    LogInternal(logger, LogLevel::Warning, "Duplicate disks found in mapping: %1", *duplicate);
    fault = MakeRef<DuplicateDisks>(*duplicate);
  }
  LogDone(logger, "Done checking disk uniqueness: %1", fault);
  if (fault) {
    return fault;
  }
  if (!mapping.GetNonSsd() || mapping.GetNonSsd()->IsEmpty()) {
    LogInternal(logger, LogLevel::Warning,
                "Error checking disk count: insufficient non-SSD disks in mapping");
    return MakeRef<InsufficientDisks>();
  }
  if (!IsSsd(mapping.GetSsd().Get())) {
    LogInternal(logger, LogLevel::Warning, "Error with SSD: invalid SSD in mapping (disk is not an SSD): %1",
                NameForLog(mapping.GetSsd().Get()));
    fault = MakeRef<Orbis::Fault::InvalidArgument>();
  }
  LogDone(logger, "Done checking disk types: %1", fault);
  return fault;
}

// The fault of the first disk that the kernel calls ineligible and says why, shared; or null.
Ref<MethodFault> CheckEligibility(Logger& logger, const KovaManagerImpl::DiskResults& results) {
  Ref<MethodFault> fault;
  for (const Nox::Kova::Host::DiskResult* result : results) {
    if (result->GetState() == Nox::Kova::Host::DiskResult::STATE_INELIGIBLE && result->GetError()) {
      LogInternal(logger, LogLevel::Warning, "Found ineligible disk in mapping: %1",
                  NameForLog(result->GetDisk().Get()));
      fault = result->GetError();
      break;
    }
  }
  LogDone(logger, "Done checking for ineligible disks: %1", fault);
  return fault;
}

}  // namespace

void KovaManagerImpl::ValidateDiskMappings(DataArray<DiskMapping>* mappings) {
  std::vector<std::string_view> names;
  if (mappings != nullptr) {
    for (const DiskMapping* mapping : *mappings) {
      AppendDeviceNames(mapping, names);
    }
  }
  if (names.size() < fewestDisks) {
    LogInternal(_logger, LogLevel::Warning,
                "Error checking disks (only found %1): insufficient disks in given mappings", names.size());
    throw InsufficientDisks::Exception(MakeRef<InsufficientDisks>(std::nullopt));
  }
  if (const std::string_view* const duplicate = FindRepeated(names)) {
    LogInternal(_logger, LogLevel::Warning,
                "Error checking disk uniqueness, duplicate disks found in mappings: %1", *duplicate);
    throw DuplicateDisks::Exception(MakeRef<DuplicateDisks>(std::string(*duplicate)));
  }
}

void KovaManagerImpl::ValidateDiskMapping(Ref<DiskMapping> mapping, Ref<DiskMapResult>& result) {
  Ref<DiskResults> results = MakeRef<DiskResults>();
  Texts names;
  DiskMappingToDeviceNames(mapping, names);
  Ref<MethodFault> fault = CheckShape(*_logger, *mapping, names);
  if (!fault) {
    results = MarshalCachedDisks(*_logger, DiskCache::Locked(*_diskCache), names, DiskQueryLimit());
    fault = CheckEligibility(*_logger, *results);
  }
  result->SetMapping(mapping);
  result->SetDiskResult(results);
  result->SetError(fault);
  LogInternal(_logger, LogLevel::Trivia, "%1 Complete", "ValidateDiskMapping");
}

}  // namespace Kovasvc
