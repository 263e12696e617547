// What happened, in order, across all the doubles of one test.
//
// The doubles note their events here as short texts ("QueryDisks([], true)", "take KovaManager.operation"),
// so that a test can compare one list with what it expects. Safe from any thread.
#pragma once

#include <cstdio>
#include <functional>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

namespace TestSupport {

class Timeline {
 public:
  void Note(std::string event) {
    if (const auto observer = Observer()) {
      observer(event);
    }
    const std::lock_guard guard(_mutex);
    if (_echo) {
      std::fprintf(stderr, "%s\n", event.c_str());
    }
    _events.push_back(std::move(event));
  }

  // Called with each event before it is kept, on the thread that notes it.
  void SetObserver(std::function<void(const std::string& event)> observer) {
    const std::lock_guard guard(_mutex);
    _observer = std::move(observer);
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
  std::function<void(const std::string&)> Observer() const {
    const std::lock_guard guard(_mutex);
    return _observer;
  }

  mutable std::mutex _mutex;  // guards all below
  std::function<void(const std::string&)> _observer;
  std::vector<std::string> _events;
  bool _echo = false;
};

}  // namespace TestSupport
