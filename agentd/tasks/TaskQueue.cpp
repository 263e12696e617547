#include "agentd/tasks/TaskQueue.h"

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <random>
#include <utility>

#include "agentd/tasks/Busy.h"
#include "nox/Faults.h"
#include "otxctl/TaskScope.h"
#include "tessa/Logger.h"

namespace Agentd {

using Nox::Fault::Busy;
using Orbis::DateTime;
using Tessa::Ref;

namespace {

// Ids of one process must not be taken for those of the next, whose first task is number one again.
std::string RandomPrefix() {
  char text[24];
  std::snprintf(text, sizeof text, "task-%08x-", static_cast<unsigned>(std::random_device()()));
  return text;
}

Ref<Busy> Stopping() {
  return TooBusy("nox.agentd.tasks.stopping", "The agent is stopping; nothing of the request was done.");
}

}  // namespace

struct TaskQueue::Entry {
  Task task;
  Work work;
  Listener onEnded;
  std::size_t requestBytes = 0;
  std::size_t resultBytes = 0;
};

DateTime TaskQueue::WallClock() {
  using std::chrono::duration_cast;
  using std::chrono::microseconds;
  const auto now = std::chrono::system_clock::now().time_since_epoch();
  return {.microseconds = duration_cast<microseconds>(now).count()};
}

TaskQueue::TaskQueue(const TaskLimits& limits, Clock clock)
    : _limits(limits), _clock(std::move(clock)), _idPrefix(RandomPrefix()), _worker([this] { RunAll(); }) {}

TaskQueue::~TaskQueue() {
  Finish();
}

Task TaskQueue::Submit(const std::string& operation, const std::string& label, Work work, Listener onEnded,
                       std::size_t bytes) {
  const std::lock_guard guard(_mutex);
  if (_closed) {
    throw Busy::Exception(Stopping());
  }
  if (_waiting.size() >= _limits.waiting) {
    throw Busy::Exception(
        TooBusy("nox.agentd.tasks.tooMany",
                "The agent has " + std::to_string(_waiting.size()) + " changes waiting; try again later."));
  }
  if (!_waiting.empty() && _waitingBytes + bytes > _limits.waitingBytes) {
    throw Busy::Exception(
        TooBusy("nox.agentd.tasks.tooLarge",
                "The changes that wait leave no room for one of this size; try again later."));
  }
  auto entry = std::make_shared<Entry>();
  entry->task.id = _idPrefix + std::to_string(++_created);
  entry->task.label = label;
  entry->task.operation = operation;
  entry->task.created = _clock();
  entry->work = std::move(work);
  entry->onEnded = std::move(onEnded);
  entry->requestBytes = bytes;
  _waitingBytes += bytes;
  _entries.push_back(entry);
  _waiting.push_back(entry);
  _changed.notify_all();
  return entry->task;
}

std::optional<Task> TaskQueue::Find(const std::string& id) const {
  const std::lock_guard guard(_mutex);
  const auto found = std::find_if(_entries.begin(), _entries.end(),
                                  [&id](const auto& entry) { return entry->task.id == id; });
  return found == _entries.end() ? std::nullopt : std::optional((*found)->task);
}

std::vector<Task> TaskQueue::List() const {
  const std::lock_guard guard(_mutex);
  std::vector<Task> tasks;
  tasks.reserve(_entries.size());
  for (const auto& entry : _entries) {
    tasks.push_back(entry->task);
  }
  return tasks;
}

TaskQueue::Load TaskQueue::Now() const {
  const std::lock_guard guard(_mutex);
  const auto isRunning = [](const auto& entry) { return entry->task.state == TaskState::Running; };
  const auto running = std::count_if(_entries.begin(), _entries.end(), isRunning);
  return {.waiting = _waiting.size(), .running = static_cast<std::size_t>(running), .ended = _ended};
}

void TaskQueue::Close() {
  std::deque<std::shared_ptr<Entry>> refused;
  {
    const std::lock_guard guard(_mutex);
    _closed = true;
    refused.swap(_waiting);
    _waitingBytes = 0;
    _changed.notify_all();
  }
  for (const auto& entry : refused) {
    End(*entry, {.result = nullptr, .fault = Stopping()}, Host::Outcome::Failed);
  }
}

void TaskQueue::Finish() {
  Close();
  std::call_once(_joined, [this] { _worker.join(); });
}

void TaskQueue::RunAll() {
  Lock lock(_mutex);
  while (const std::shared_ptr<Entry> entry = NextWaiting(lock)) {
    entry->task.state = TaskState::Running;
    entry->task.started = _clock();
    lock.unlock();
    Run(*entry);
    lock.lock();
  }
}

// Waits for a task; null once the queue is closed.
std::shared_ptr<TaskQueue::Entry> TaskQueue::NextWaiting(Lock& lock) {
  _changed.wait(lock, [this] { return _closed || !_waiting.empty(); });
  if (_waiting.empty()) {
    return nullptr;
  }
  std::shared_ptr<Entry> entry = _waiting.front();
  _waiting.pop_front();
  _waitingBytes -= entry->requestBytes;
  return entry;
}

void TaskQueue::Run(Entry& entry) {
  const OtxCtl::TaskScope scope(entry.task.id, [this, &entry](int percent, std::string_view step) {
    const std::lock_guard guard(_mutex);
    entry.task.percent = percent;
    entry.task.step = step;
  });
  auto [answer, outcome] = CallWork(entry);
  End(entry, std::move(answer), outcome);
}

std::pair<Host::Answer, Host::Outcome> TaskQueue::CallWork(const Entry& entry) {
  try {
    Host::Answer answer = entry.work();
    const Host::Outcome outcome =
        OutcomeOf(Host::Answer(answer));  // of a copy: the task keeps the text alone
    return {std::move(answer), outcome};
  } catch (const std::exception& exception) {
    return {Host::FailedWith(exception.what()), Host::Outcome::Failed};
  } catch (...) {
    return {Host::FailedWith("an error of an unknown kind"), Host::Outcome::Failed};
  }
}

void TaskQueue::End(Entry& entry, Host::Answer answer, Host::Outcome outcome) {
  Listener onEnded;
  Task ended;
  const std::size_t resultBytes = answer.result.TextSize();
  {
    const std::lock_guard guard(_mutex);
    entry.task.state = StateAfter(outcome);
    _ended.Add(outcome);
    entry.task.ended = _clock();
    entry.task.answer = std::move(answer);
    entry.work = {};  // and what it holds of the request
    onEnded = std::move(entry.onEnded);
    ended = entry.task;
    entry.resultBytes = resultBytes;
    _resultBytes += resultBytes;
    ForgetOldest();
    ForgetLargeResults(entry);
  }
  if (!onEnded) {
    return;
  }
  try {
    onEnded(ended);
  } catch (const std::exception& exception) {
    // The change is what counts: whoever waits for word of it must not end the worker.
    if (const Ref<Tessa::Service::Logger> logger = Tessa::Service::GetDefaultLogger()) {
      LogInternal(logger, Tessa::Service::LogLevel::Warning, "Nobody could be told what became of %1: %2",
                  ended.id, exception.what());
    }
  }
}

void TaskQueue::ForgetOldest() {
  const auto hasEnded = [](const std::shared_ptr<Entry>& entry) { return entry->task.ended.has_value(); };
  const auto count = static_cast<std::size_t>(std::count_if(_entries.begin(), _entries.end(), hasEnded));
  if (count > _limits.remembered) {
    const auto oldest = std::find_if(_entries.begin(), _entries.end(), hasEnded);
    _resultBytes -= (*oldest)->resultBytes;
    _entries.erase(oldest);
  }
}

void TaskQueue::ForgetLargeResults(const Entry& last) {
  for (auto at = _entries.begin(); _resultBytes > _limits.rememberedBytes && at != _entries.end(); ++at) {
    Entry& entry = **at;
    if (entry.resultBytes != 0 && &entry != &last) {
      _resultBytes -= std::exchange(entry.resultBytes, 0);
      entry.task.answer.result = nullptr;
      entry.task.resultForgotten = true;
    }
  }
}

}  // namespace Agentd
