// What the agent has served, for monitoring.
//
// Threads: any.
#pragma once

#include <chrono>
#include <map>
#include <mutex>
#include <string>
#include <string_view>
#include <utility>

#include "agentd/tasks/QueryQueue.h"
#include "agentd/tasks/TaskQueue.h"

namespace Agentd {

class Metrics {
 public:
  using Time = std::chrono::nanoseconds;

  // A request on that route, one of a fixed set, was answered; `time` is from its last byte to the answer's
  // first.
  void Count(std::string_view route, unsigned status, Time time);

  // In the text format of Prometheus, version 0.0.4: what was counted, and how things stand with the queues.
  std::string Text(const TaskQueue::Load& changes, const QueryQueue::Load& queries) const;

 private:
  mutable std::mutex _mutex;                                                  // guards what follows
  std::map<std::pair<std::string, unsigned>, unsigned long> _requests;        // by route and status
  std::map<std::string, std::pair<Time, unsigned long>, std::less<>> _times;  // by route: sum and number
};

}  // namespace Agentd
