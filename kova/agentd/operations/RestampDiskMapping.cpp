// Gives a disk group that is there but off-line new identity stamps, and mounts it.

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/disks/AbsentDisk.h"
#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/include/KovaInfo.h"
#include "kova/agentd/operations/OperationSteps.h"

namespace Kovasvc {

using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;
using Tessa::System::LockGuard;

void KovaManagerImpl::RestampDiskMapping(const std::string& ssdName, Texts& capacityNames) {
  LogInternal(_logger, LogLevel::Verbose, "Restamping disks %1", ssdName);
  {
    const LockGuard guard(*_operationLock);
    if (IsPDLDiskInput(ssdName)) {
      LogInternal(_logger, LogLevel::Verbose, "UUID input %1", ssdName);
      try {
        const std::string uuid = ReadAbsentDisk(*_logger, ssdName);
        _provider->RestampDiskMappingByUuid(uuid);
      } catch (const HostCtl::Lib::HostCtlException& exception) {
        LogInternal(_logger, LogLevel::Warning, "Error restamping PDL'd KOVA disk mapping: %1",
                    exception.Describe());
        throw;  // the caller makes the fault
      }
    } else {
      _provider->RestampDiskMapping(ssdName, capacityNames);
      _provider->MountDiskMapping(ssdName, false);
    }
  }
  LogInternal(_logger, LogLevel::Verbose, "Done restamping disks");
}

}  // namespace Kovasvc
