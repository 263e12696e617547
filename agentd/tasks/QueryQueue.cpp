#include "agentd/tasks/QueryQueue.h"

#include <string>
#include <utility>

#include "agentd/tasks/Busy.h"
#include "nox/Faults.h"

namespace Agentd {

void QueryQueue::Run(Query query) {
  if (!TakePlace(query)) {
    return;
  }
  do {
    query = Next(query());
  } while (query);
}

// Whether there was a place; without one, the query now waits.
bool QueryQueue::TakePlace(Query& query) {
  const std::lock_guard guard(_mutex);
  if (_running < _limits.atOnce) {
    ++_running;
    return true;
  }
  if (_waiting.size() >= _limits.waiting) {
    throw Nox::Fault::Busy::Exception(
        TooBusy("nox.agentd.queries.tooMany",
                "The agent has " + std::to_string(_waiting.size()) + " queries waiting; try again later."));
  }
  _waiting.push_back(std::move(query));
  return false;
}

QueryQueue::Query QueryQueue::Next(Host::Outcome ofTheLast) {
  const std::lock_guard guard(_mutex);
  _ended.Add(ofTheLast);
  if (_waiting.empty()) {
    if (--_running == 0) {
      _idle.notify_all();
    }
    return {};
  }
  Query next = std::move(_waiting.front());
  _waiting.pop_front();
  return next;
}

QueryQueue::Load QueryQueue::Now() const {
  const std::lock_guard guard(_mutex);
  return {_running, _waiting.size(), _ended};
}

bool QueryQueue::WaitUntilIdle(std::chrono::milliseconds patience) {
  std::unique_lock lock(_mutex);
  return _idle.wait_for(lock, patience, [this] { return _running == 0; });
}

}  // namespace Agentd
