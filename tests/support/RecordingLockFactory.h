// Locks that really lock, and that say who took which one when.
//
// The factory also finds mistakes, so that a test fails instead of standing still: a thread that takes a
// lock it holds gets an exception, and the operation lock taken under the disk-cache lock is noted. Locks
// may outlive the factory. Safe from any thread.
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "tessa/Lockable.h"
#include "tests/support/Timeline.h"

namespace TestSupport {

inline constexpr const char* operationLock = "KovaManager.operation";
inline constexpr const char* diskCacheLock = "KovaManager.diskCache";

class RecordingLockFactory final : public Tessa::System::SystemFactory {
 public:
  // Notes "make X", "take X", "release X" and "destroy X" in the timeline, which outlives every lock.
  explicit RecordingLockFactory(Timeline& timeline);
  ~RecordingLockFactory() override;

  Tessa::Ref<Tessa::System::Lock> CreateLock(std::string_view name) override;

  // Making the lock of that name calls this, which should throw.
  void SetFailure(std::string name, std::function<void()> failure);

  // Called with the lock's name when it is about to be taken, on the thread that takes it. For what another
  // thread could do just before. It may take locks, and replace itself.
  void SetTakeObserver(std::function<void(const std::string& name)> observer);

  // Called with the lock's name when it has just been released, on the thread that did. For what another
  // thread could do at that very moment. It may take locks, and replace itself.
  void SetReleaseObserver(std::function<void(const std::string& name)> observer);

  // What the calling thread holds now, in the order of taking.
  std::vector<std::string> HeldHere() const;

  // Every mistake so far, in words.
  std::vector<std::string> Mistakes() const;

  struct State;

 private:
  const std::shared_ptr<State> _state;
};

}  // namespace TestSupport
