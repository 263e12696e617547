// The requests that change disks, one after the other.
//
// One worker carries them out in the order in which they came; as many may wait as the limits say. Round each
// stands an OtxCtl::TaskScope with the task's id, through which the kernel reports progress. Tasks that have
// ended are remembered, up to a number; the oldest lose their results before that when those are large.
//
// Threads: every function from any thread; listeners are called without a lock.
#pragma once

#include <condition_variable>
#include <deque>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "agentd/tasks/OutcomeCounts.h"
#include "agentd/tasks/Task.h"

namespace Agentd {

struct TaskLimits {
  std::size_t waiting = 64;                 // beside the one that runs
  std::size_t remembered = 256;             // that have ended
  std::size_t waitingBytes = 64u << 20;     // of the requests that wait, unless it is a single one
  std::size_t rememberedBytes = 64u << 20;  // of the results as texts; the last one is kept however large
};

class TaskQueue {
 public:
  // Called on the worker. An exception is answered as a SystemError with its text.
  using Work = std::function<Host::Answer()>;
  // Told once that the task has ended (what it throws is logged), on the worker or, for one that was never
  // begun, in Close.
  using Listener = std::function<void(const Task&)>;
  using Clock = std::function<Orbis::DateTime()>;

  static Orbis::DateTime WallClock();

  explicit TaskQueue(const TaskLimits& limits = {}, Clock clock = &TaskQueue::WallClock);
  // As Close and Finish.
  ~TaskQueue();
  TaskQueue(const TaskQueue&) = delete;
  TaskQueue& operator=(const TaskQueue&) = delete;

  // The task as it was taken on. Throws Nox::Fault::Busy::Exception when too many wait, or after Close; the
  // listener is not called then. `bytes` is roughly what the work holds of the request.
  Task Submit(const std::string& operation, const std::string& label, Work work, Listener onEnded = {},
              std::size_t bytes = 0);

  // Nothing when there never was one of that id, or it is forgotten.
  std::optional<Task> Find(const std::string& id) const;
  // In order of creation.
  std::vector<Task> List() const;

  struct Load {
    std::size_t waiting = 0;
    std::size_t running = 0;   // 0 or 1
    OutcomeCounts ended = {};  // since the queue was made
  };
  Load Now() const;

  // Takes on nothing more; tasks that wait end with a Busy fault, nothing of them done. The one that runs
  // goes on.
  void Close();
  // Closes, and waits for the one that runs.
  void Finish();

 private:
  struct Entry;
  using Lock = std::unique_lock<std::mutex>;

  void RunAll();
  void Run(Entry& entry);
  std::pair<Host::Answer, Host::Outcome> CallWork(const Entry& entry);
  std::shared_ptr<Entry> NextWaiting(Lock& lock);
  // Ends the task, and tells its listener with the lock let go.
  void End(Entry& entry, Host::Answer answer, Host::Outcome outcome);
  void ForgetOldest();
  // Of all but the one that ended last.
  void ForgetLargeResults(const Entry& last);

  const TaskLimits _limits;
  const Clock _clock;
  const std::string _idPrefix;  // another in every process

  mutable std::mutex _mutex;  // guards what follows, and the tasks in the entries
  std::condition_variable _changed;
  std::deque<std::shared_ptr<Entry>> _entries;  // in order of creation
  std::deque<std::shared_ptr<Entry>> _waiting;
  std::size_t _created = 0;
  OutcomeCounts _ended;
  std::size_t _waitingBytes = 0;
  std::size_t _resultBytes = 0;  // of all entries
  bool _closed = false;

  std::once_flag _joined;
  std::thread _worker;  // the last to be made
};

}  // namespace Agentd
