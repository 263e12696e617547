// How many disks and disk groups the host has, as it told when it was last asked: for monitoring, which must
// not wait for a slow kernel.
//
// Threads: any.
#pragma once

#include <atomic>
#include <chrono>
#include <cstddef>
#include <functional>
#include <mutex>
#include <optional>

#include "host/Answer.h"

namespace Host {
class ManagementApi;
}

namespace Agentd {

class QueryQueue;

struct HostCounts {
  std::size_t disksInUse = 0;
  std::size_t disksEligible = 0;
  std::size_t disksIneligible = 0;
  std::size_t groupsMounted = 0;
  std::size_t groupsUnmounted = 0;
  std::chrono::nanoseconds age{0};  // since the host told
};

class HostWatch {
 public:
  using Clock = std::function<std::chrono::steady_clock::time_point()>;

  static constexpr std::chrono::seconds freshTime{30};

  // Both outlive it, and what it leaves with the queue.
  HostWatch(const Host::ManagementApi& api, QueryQueue& queries,
            Clock clock = &std::chrono::steady_clock::now);

  // Nothing until the host has told for the first time.
  std::optional<HostCounts> Last() const;

  // Asks the host as any query does, here and now or when there is a place for it. Does nothing while what is
  // known is fresh, while it is being asked, or when too many queries wait. A host that fails to tell leaves
  // what was known. `changes` is how many have ended: one more, and nothing is fresh.
  void Refresh(std::size_t changes);

 private:
  bool IsFresh(std::size_t changes) const;
  Host::Outcome Ask(std::size_t changes);

  const Host::ManagementApi& _api;
  QueryQueue& _queries;
  const Clock _clock;
  std::atomic<bool> _isAsking{false};

  mutable std::mutex _mutex;  // guards what follows
  std::optional<HostCounts> _counts;
  std::chrono::steady_clock::time_point _toldAt;
  std::size_t _toldAfter = 0;  // so many changes
};

}  // namespace Agentd
