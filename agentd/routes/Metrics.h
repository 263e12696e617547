// What the agent has served and how things stand, for monitoring.
//
// Threads: any.
#pragma once

#include <array>
#include <chrono>
#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "agentd/routes/HostWatch.h"
#include "agentd/tasks/QueryQueue.h"
#include "agentd/tasks/TaskQueue.h"

namespace Agentd {

// What is not counted here, but known elsewhere.
struct MetricsNow {
  TaskQueue::Load changes;
  QueryQueue::Load queries;
  std::optional<HostCounts> host;  // none: the host has not told yet
};

class Metrics {
 public:
  using Time = std::chrono::nanoseconds;

  // A request on that route, one of a fixed set, was answered; `time` is from its last byte to the answer's
  // first.
  void Count(std::string_view route, unsigned status, Time time);

  // In the text format of Prometheus, version 0.0.4.
  std::string Text(const MetricsNow& now) const;

 private:
  // Queries take milliseconds; changes, seconds or minutes.
  struct Bucket {
    double seconds;
    const char* text;
  };
  static constexpr std::array<Bucket, 11> buckets = {{{0.001, "0.001"},
                                                      {0.005, "0.005"},
                                                      {0.025, "0.025"},
                                                      {0.1, "0.1"},
                                                      {0.5, "0.5"},
                                                      {1, "1"},
                                                      {5, "5"},
                                                      {15, "15"},
                                                      {60, "60"},
                                                      {300, "300"},
                                                      {1800, "1800"}}};
  struct Times {
    std::array<unsigned long, buckets.size()> atMost = {};  // by bucket: how many took no longer
    unsigned long count = 0;
    Time sum{0};
  };

  void WriteCounted(std::string& text) const;
  static void WriteTimes(std::string& text, const std::string& route, const Times& times);

  mutable std::mutex _mutex;                                            // guards what follows
  std::map<std::pair<std::string, unsigned>, unsigned long> _requests;  // by route and status
  std::map<std::string, Times, std::less<>> _times;                     // by route
};

}  // namespace Agentd
