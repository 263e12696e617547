#include "kova/agentd/disks/DiskCache.h"

#include <cassert>
#include <utility>

#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/include/KovaInfo.h"

namespace Kovasvc {

using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;

DiskCache::DiskCache(Tessa::Ref<Tessa::System::Lock> lock) : _lock(std::move(lock)) {
  assert(_lock);
}
DiskCache::~DiskCache() = default;

void DiskCache::Locked::Refresh(Tessa::Service::Logger& logger, HostCtl::Kova::KovaInfo& provider) {
  if (_cache._isValid) {
    LogInternal(logger, LogLevel::Verbose, "Disk cache is valid, no need to refresh.");
    return;
  }
  _cache._records.clear();
  try {
    provider.RefreshKovaInfo();
    provider.QueryDisks({}, _cache._records, true);
    _cache._isValid = true;
  } catch (const HostCtl::Lib::HostCtlException& exception) {
    _cache._records.clear();
    LogInternal(logger, LogLevel::Warning, "Failed to refresh KOVA disk cache %1", exception.Describe());
  } catch (...) {
    _cache._records.clear();
    throw;
  }
}

}  // namespace Kovasvc
