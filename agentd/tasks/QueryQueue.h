// The requests that only ask: a few at the same time, the others in the order in which they came.
//
// No thread waits in here. A query that finds no place is left behind, and the thread whose query ends next
// takes it up: so, however slow the kernel is, of a server's threads only as many are held up as queries may
// run at once.
//
// Threads: every function from any thread.
#pragma once

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <deque>
#include <functional>
#include <mutex>

#include "agentd/tasks/OutcomeCounts.h"

namespace Agentd {

struct QueryLimits {
  std::size_t atOnce = 4;  // fewer than the server has workers
  std::size_t waiting = 64;
};

class QueryQueue {
 public:
  // Tells what it came to. Must not throw.
  using Query = std::function<Host::Outcome()>;

  explicit QueryQueue(const QueryLimits& limits = {}) : _limits(limits) {}

  // Runs the query here and now, and behind it those that were left meanwhile; or leaves it, to be run by
  // another thread. Throws Nox::Fault::Busy::Exception when too many wait.
  void Run(Query query);

  struct Load {
    std::size_t running = 0;
    std::size_t waiting = 0;
    OutcomeCounts ended = {};  // since the queue was made
  };
  Load Now() const;

  // Waits until none runs; whether that came about in time.
  bool WaitUntilIdle(std::chrono::milliseconds patience);

 private:
  bool TakePlace(Query& query);
  // The one that has waited longest, in the place of one that has ended; none: the place is free again.
  Query Next(Host::Outcome ofTheLast);

  const QueryLimits _limits;
  mutable std::mutex _mutex;  // guards what follows
  std::condition_variable _idle;
  std::size_t _running = 0;
  OutcomeCounts _ended;
  std::deque<Query> _waiting;
};

}  // namespace Agentd
