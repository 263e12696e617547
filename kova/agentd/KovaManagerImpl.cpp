#include "kova/agentd/KovaManagerImpl.h"

#include <utility>

#include "kova/agentd/disks/DiskQuery.h"
#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/include/KovaInfo.h"
#include "kova/agentd/include/KovaPlugin.h"
#include "kova/agentd/marshal/DiskResultMarshal.h"
#include "nox/Kova.h"
#include "orbis/Soap.h"
#include "orbis/Types.h"
#include "orbis/Version.h"

namespace Kovasvc {

using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::Logger;
using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;
using Tessa::System::LockGuard;

KovaManagerImpl::KovaManagerImpl(Ref<Logger>& logger) : LockableObjectImpl("KovaManager"), _logger(logger) {
  // Locals first: what a throw leaves behind goes down in reverse order of building.
  std::unique_ptr<HostCtl::Kova::KovaInfo> provider(OtxCtl::Kova::KovaPluginImpl().GetKovaInfo());
  Tessa::System::SystemFactory& factory = Tessa::System::GetSystemFactory();
  Ref<Tessa::System::Lock> operationLock = factory.CreateLock("KovaManager.operation");
  Ref<Tessa::System::Lock> diskCacheLock = factory.CreateLock("KovaManager.diskCache");
  _util = MakeRef<Util::KovaUtil>(logger);
  _diskCacheLock = std::move(diskCacheLock);
  _operationLock = std::move(operationLock);
  _provider = std::move(provider);
}

KovaManagerImpl::~KovaManagerImpl() = default;

void KovaManagerImpl::GetKovaDiskMapping(std::vector<HostCtl::Kova::DiskMapping>& mappings) {
  _provider->GetDiskMappings(mappings, false);
}

void KovaManagerImpl::RefreshKovaDiskCache() {
  const LockGuard guard(*_diskCacheLock);
  RefreshKovaDiskCacheLocked();
}

void KovaManagerImpl::RefreshKovaDiskCacheLocked() {
  if (_diskCacheValid) {
    LogInternal(_logger, LogLevel::Verbose, "Disk cache is valid, no need to refresh.");
    return;
  }
  _diskCache.clear();
  try {
    _provider->RefreshKovaInfo();
    _provider->QueryDisks({}, _diskCache, true);
    _diskCacheValid = true;
  } catch (const HostCtl::Lib::HostCtlException& exception) {
    _diskCache.clear();
    LogInternal(_logger, LogLevel::Warning, "Failed to refresh KOVA disk cache %1", exception.Describe());
  } catch (...) {
    _diskCache.clear();
    throw;
  }
}

void KovaManagerImpl::InvalidateKovaDiskCache() {
  const LockGuard guard(*_diskCacheLock);
  _diskCacheValid = false;
}

void KovaManagerImpl::QueryDiskCacheLocked(const Texts& names, const DiskQueryLimit& limit,
                                           Ref<DiskResults>& results) {
  std::vector<HostCtl::Kova::DiskResult> records;
  LimitQueryDisksForKova(*_logger, names, limit, _diskCache, records);
  MarshalHostCtlDiskResults(*_logger, records, results, false);
}

void KovaManagerImpl::SerializeKovaResultAndFault(std::string& resultText, std::string& faultText,
                                                  Ref<Orbis::Any>& result, Ref<Orbis::MethodFault>& fault) {
  // No version of that name: everything is written.
  const Ref<Orbis::Version> version = Orbis::FindVersionByTyrlName("nox.version.unstable");
  if (result) {
    Orbis::SerializeObjectToSoap(*result, version.Get(), resultText);
  } else {
    LogInternal(_logger, LogLevel::Verbose, "No result. Operation failed.");
  }
  if (fault) {
    Orbis::SerializeObjectToSoap(*fault, version.Get(), faultText);
  } else {
    LogInternal(_logger, LogLevel::Verbose, "No fault. Operation completed successfully");
  }
}

}  // namespace Kovasvc
