#include "tests/support/RecordingLockFactory.h"

#include <algorithm>
#include <map>
#include <mutex>
#include <stdexcept>
#include <thread>
#include <utility>

namespace TestSupport {

struct RecordingLockFactory::State {
  explicit State(Timeline& events) : timeline(events) {}

  Timeline& timeline;
  mutable std::mutex mutex;  // guards all below
  std::map<std::thread::id, std::vector<std::string>> held;
  std::vector<std::string> mistakes;
  std::string failingName;
  std::function<void()> failure;
  std::function<void(const std::string&)> onTake;
  std::function<void(const std::string&)> onRelease;

  std::vector<std::string> Held() const {
    const std::lock_guard guard(mutex);
    const auto found = held.find(std::this_thread::get_id());
    return found == held.end() ? std::vector<std::string>() : found->second;
  }

  void AddMistake(std::string mistake) {
    const std::lock_guard guard(mutex);
    mistakes.push_back(std::move(mistake));
  }
};

namespace {

using State = RecordingLockFactory::State;

bool Contains(const std::vector<std::string>& names, std::string_view name) {
  return std::find(names.begin(), names.end(), name) != names.end();
}

class RecordingLock final : public Tessa::System::Lock {
 public:
  RecordingLock(std::shared_ptr<State> state, std::string name)
      : _state(std::move(state)), _name(std::move(name)) {
    _state->timeline.Note("make " + _name);
  }
  ~RecordingLock() override { _state->timeline.Note("destroy " + _name); }

  void Acquire() override {
    if (const auto observer = TakeObserver()) {
      observer(_name);
    }
    const std::vector<std::string> held = _state->Held();
    if (Contains(held, _name)) {
      _state->AddMistake(_name + " taken twice by one thread");
      throw std::logic_error(_name + " is not recursive");
    }
    if (_name == operationLock && Contains(held, diskCacheLock)) {
      _state->AddMistake(std::string(operationLock) + " taken under " + diskCacheLock);
    }
    _mutex.lock();
    _state->timeline.Note("take " + _name);
    const std::lock_guard guard(_state->mutex);
    _state->held[std::this_thread::get_id()].push_back(_name);
  }

  void Release() override {
    if (!IsHeld()) {
      _state->AddMistake(_name + " released by a thread that does not hold it");
      return;
    }
    std::function<void(const std::string&)> observer;
    {
      const std::lock_guard guard(_state->mutex);
      std::erase(_state->held[std::this_thread::get_id()], _name);
      observer = _state->onRelease;
    }
    _state->timeline.Note("release " + _name);
    _mutex.unlock();
    if (observer) {
      observer(_name);
    }
  }

  bool IsHeld() const noexcept override { return Contains(_state->Held(), _name); }

 private:
  std::function<void(const std::string&)> TakeObserver() const {
    const std::lock_guard guard(_state->mutex);
    return _state->onTake;
  }

  const std::shared_ptr<State> _state;
  const std::string _name;
  std::mutex _mutex;
};

}  // namespace

RecordingLockFactory::RecordingLockFactory(Timeline& timeline) : _state(std::make_shared<State>(timeline)) {}
RecordingLockFactory::~RecordingLockFactory() = default;

Tessa::Ref<Tessa::System::Lock> RecordingLockFactory::CreateLock(std::string_view name) {
  std::function<void()> failure;
  {
    const std::lock_guard guard(_state->mutex);
    failure = _state->failingName == name ? _state->failure : nullptr;
  }
  if (failure) {
    failure();
  }
  return Tessa::MakeRef<RecordingLock>(_state, std::string(name));
}

void RecordingLockFactory::SetFailure(std::string name, std::function<void()> failure) {
  const std::lock_guard guard(_state->mutex);
  _state->failingName = std::move(name);
  _state->failure = std::move(failure);
}

void RecordingLockFactory::SetTakeObserver(std::function<void(const std::string& name)> observer) {
  const std::lock_guard guard(_state->mutex);
  _state->onTake = std::move(observer);
}

void RecordingLockFactory::SetReleaseObserver(std::function<void(const std::string& name)> observer) {
  const std::lock_guard guard(_state->mutex);
  _state->onRelease = std::move(observer);
}

std::vector<std::string> RecordingLockFactory::HeldHere() const {
  return _state->Held();
}

std::vector<std::string> RecordingLockFactory::Mistakes() const {
  const std::lock_guard guard(_state->mutex);
  return _state->mistakes;
}

}  // namespace TestSupport
