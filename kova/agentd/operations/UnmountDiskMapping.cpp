// Takes disk groups out of use without erasing them, and brings them back.

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/disks/DiskMappings.h"
#include "kova/agentd/include/KovaInfo.h"
#include "kova/agentd/operations/OperationSteps.h"
#include "nox/Kova.h"
#include "tessa/Formatter.h"

namespace Kovasvc {

using Nox::Kova::Host::DiskMapping;
using Nox::Kova::Host::DiskMapResult;
using Orbis::DataArray;
using Orbis::MethodFault;
using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;
using Tessa::System::LockGuard;

void KovaManagerImpl::UnmountDiskMapping(const Texts& mappings, const std::string& requestTag,
                                         std::string& faultText, std::string& resultText) {
  const Ref<DataArray<DiskMapping>> requested =
      ReadObjects<DiskMapping>(mappings, WrongTypeLine::UnmountDiskMapping);
  {
    const LockGuard guard(*_operationLock);
    RefreshKovaDiskCache();
  }
  const auto results = MakeRef<DataArray<DiskMapResult>>();
  Ref<MethodFault> combined;
  try {
    for (DiskMapping* const element : *requested) {
      Ref<DiskMapping> mapping(element);
      Ref<MethodFault> fault;
      const auto result = MakeRef<DiskMapResult>();
      UnmountDiskMappingInt(mapping, requestTag, fault);
      result->SetMapping(mapping);
      if (fault) {
        result->SetError(fault);
        PrepareKovaDiskFault(fault, combined);
      }
      results->Append(result);
    }
  } catch (const MethodFault::Exception& exception) {
    combined = exception.GetFault();
    LogInternal(_logger, LogLevel::Warning, "UnmountDiskMapping failed with exception: %1",
                Tessa::PrintFormatter::FormatObject(combined->GetFaultMessage()));
  }
  InvalidateKovaDiskCache();
  Ref<Orbis::Any> result = results;
  SerializeKovaResultAndFault(resultText, faultText, result, combined);
}

void KovaManagerImpl::UnmountDiskMappingInt(Ref<DiskMapping>& mapping, const std::string&,
                                            Ref<MethodFault>& fault) {
  const LockGuard guard(*_operationLock);
  const std::string ssdName = SsdNameOf(mapping.Get());
  if (!DiskMappingExists(mapping)) {
    LogInternal(_logger, LogLevel::Verbose, "Failed to validate existing disk mapping:");
    fault = MakeRef<Orbis::Fault::InvalidArgument>();
    return;
  }
  LogOneDiskMapping(*_logger, mapping);
  AskKernel(*_logger, "Error unmounting KOVA disk mapping: %1", fault,
            [&] { _provider->UnmountDiskMapping(ssdName); });
}

void KovaManagerImpl::ClaimUnmountedDiskgroup() {
  try {
    const LockGuard guard(*_operationLock);
    _provider->ClaimUnmountedDiskgroups();
  } catch (const HostCtl::Lib::HostCtlException& exception) {
    LogInternal(_logger, LogLevel::Warning, "Mount diskgroup failed with exception %1 ",
                exception.Describe());
  }
  InvalidateKovaDiskCache();
}

}  // namespace Kovasvc
