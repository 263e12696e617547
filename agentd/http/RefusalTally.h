// Counts whom a server turns away, and says so in the log: the first at once, those that follow in a line now
// and then, however many there are. Part of the server; nobody else includes this.
//
// Threads: the network's; Counts from any.
#pragma once

#include <array>
#include <atomic>
#include <chrono>
#include <functional>
#include <string>

#include "agentd/http/HttpLoad.h"

namespace Agentd {

class RefusalTally {
 public:
  using Time = std::chrono::steady_clock::time_point;
  using Say = std::function<void(const std::string& line)>;

  static constexpr std::chrono::seconds silence{10};  // between two lines about refusals of a kind

  explicit RefusalTally(Say say) : _say(std::move(say)) {}

  // `who` is printable.
  void Count(HttpRefusal refusal, const std::string& who, Time now);
  // Says how many were left out, where the silence is over.
  void CatchUp(Time now);
  // Whether there is something left to say.
  bool IsBehind() const;

  std::array<unsigned long, httpRefusals.size()> Counts() const;

 private:
  struct Row {
    std::atomic<unsigned long> counted{0};
    unsigned long said = 0;
    Time silentUntil = Time::min();
  };

  const Say _say;
  std::array<Row, httpRefusals.size()> _rows;  // by kind
};

}  // namespace Agentd
