// What happened, in order, across all the doubles of one test.
//
// The doubles note their events here as short texts ("QueryDisks([], true)", "take KovaManager.operation"),
// so that a test can compare one list with what it expects. Safe from any thread.
#pragma once

#include <cstdio>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

namespace TestSupport {

class Timeline {
 public:
  void Note(std::string event) {
    const std::lock_guard guard(_mutex);
    if (_echo) {
      std::fprintf(stderr, "%s\n", event.c_str());
    }
    _events.push_back(std::move(event));
  }

  // From now on each event is also written to standard error: for tests in which a process ends.
  void EchoToStandardError() {
    const std::lock_guard guard(_mutex);
    _echo = true;
  }

  std::vector<std::string> Events() const {
    const std::lock_guard guard(_mutex);
    return _events;
  }

  // Hands over the events so far and forgets them.
  std::vector<std::string> Take() {
    const std::lock_guard guard(_mutex);
    return std::exchange(_events, {});
  }

 private:
  mutable std::mutex _mutex;
  std::vector<std::string> _events;
  bool _echo = false;
};

}  // namespace TestSupport
