#include "kova/agentd/KovaManagerImpl.h"

#include <utility>

#include "kova/agentd/include/KovaInfo.h"
#include "kova/agentd/include/KovaPlugin.h"
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

KovaManagerImpl::KovaManagerImpl(Ref<Logger>& logger) : LockableObjectImpl("KovaManager"), _logger(logger) {
  // Locals first: what a throw leaves behind goes down in reverse order of building.
  std::unique_ptr<HostCtl::Kova::KovaInfo> provider(OtxCtl::Kova::KovaPluginImpl().GetKovaInfo());
  Tessa::System::SystemFactory& factory = Tessa::System::GetSystemFactory();
  Ref<Tessa::System::Lock> operationLock = factory.CreateLock("KovaManager.operation");
  auto diskCache = std::make_unique<DiskCache>(factory.CreateLock("KovaManager.diskCache"));
  _util = MakeRef<Util::KovaUtil>(logger);
  _diskCache = std::move(diskCache);
  _operationLock = std::move(operationLock);
  _provider = std::move(provider);
}

KovaManagerImpl::~KovaManagerImpl() = default;

void KovaManagerImpl::GetKovaDiskMapping(std::vector<HostCtl::Kova::DiskMapping>& mappings) {
  _provider->GetDiskMappings(mappings, false);
}

void KovaManagerImpl::RefreshKovaDiskCache() {
  DiskCache::Locked cache(*_diskCache);
  RefreshKovaDiskCacheLocked(cache);
}

void KovaManagerImpl::RefreshKovaDiskCacheLocked(DiskCache::Locked& cache) {
  cache.Refresh(*_logger, *_provider);
}

void KovaManagerImpl::InvalidateKovaDiskCache() {
  DiskCache::Locked(*_diskCache).Invalidate();
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
