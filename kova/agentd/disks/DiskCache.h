// The kernel's record of every disk of the host, as the kernel last told them, with the lock that guards
// them.
//
// Threads: any. What may be done with the records only under the lock takes a DiskCache::Locked, and nobody
// has one without holding the lock.
#pragma once

#include <vector>

#include "kova/agentd/include/KovaRecords.h"
#include "tessa/Lockable.h"
#include "tessa/Logger.h"
#include "tessa/Ref.h"

namespace HostCtl::Kova {
class KovaInfo;
}

namespace Kovasvc {

class DiskCache {
 public:
  // Empty and invalid.
  explicit DiskCache(Tessa::Ref<Tessa::System::Lock> lock);
  ~DiskCache();
  DiskCache(const DiskCache&) = delete;
  DiskCache& operator=(const DiskCache&) = delete;

  // The cache in the hands of whoever holds its lock, which it does for as long as it lives. The lock is not
  // recursive: a thread has one of them at a time.
  class Locked {
   public:
    explicit Locked(DiskCache& cache) : _guard(*cache._lock), _cache(cache) {}

    // Makes the cache valid, if it is not, by asking the kernel for every disk's record. A failing kernel is
    // a warning and an empty, invalid cache; what else is thrown leaves one too, and passes.
    void Refresh(Tessa::Service::Logger& logger, HostCtl::Kova::KovaInfo& provider);
    // The next refresh will ask the kernel again. The records stay in memory until then.
    void Invalidate() noexcept { _cache._isValid = false; }
    // As they are in memory, valid or not; in the kernel's order.
    const std::vector<HostCtl::Kova::DiskResult>& Records() const noexcept { return _cache._records; }

   private:
    Tessa::System::LockGuard _guard;
    DiskCache& _cache;
  };

 private:
  std::vector<HostCtl::Kova::DiskResult> _records;
  bool _isValid = false;
  Tessa::Ref<Tessa::System::Lock> _lock;
};

}  // namespace Kovasvc
