// Locks, the factory that makes them, and objects that have one.
//
// Locks are plain mutexes: not recursive; a thread that takes one twice waits for itself forever.
// Every lock comes from the system factory, so that a host program or a test can see who takes which
// lock when.
#pragma once

#include <memory>
#include <string_view>

#include "tessa/Object.h"
#include "tessa/Ref.h"

namespace Tessa::System {

class TESSA_API Lock : public ObjectImpl {
 public:
  virtual void Acquire() = 0;
  virtual void Release() = 0;
  // Whether the calling thread holds it.
  virtual bool IsHeld() const noexcept = 0;

 protected:
  ~Lock() override;
};

// Holds a lock for as long as it lives.
class LockGuard {
 public:
  explicit LockGuard(Lock& lock) : _lock(lock) { _lock.Acquire(); }
  ~LockGuard() { _lock.Release(); }
  LockGuard(const LockGuard&) = delete;
  LockGuard& operator=(const LockGuard&) = delete;

 private:
  Lock& _lock;
};

// Threads: safe from any thread.
class TESSA_API SystemFactory {
 public:
  virtual ~SystemFactory();

  // `name` says what the lock guards, for people who trace locks.
  virtual Ref<Lock> CreateLock(std::string_view name) = 0;
};

// The factory of this process. Never null.
TESSA_API SystemFactory& GetSystemFactory() noexcept;

// Installs a factory, which the caller keeps alive as long as anything made by it; null restores the
// runtime's own. Returns the one before, null for the runtime's own. Not while other threads create locks.
TESSA_API SystemFactory* SetSystemFactory(SystemFactory* factory) noexcept;

class TESSA_API LockableObject : public virtual Object {
 public:
  virtual void Lock() = 0;
  virtual void Unlock() = 0;
  // Whether the calling thread holds the object's lock.
  virtual bool IsLocked() const noexcept = 0;

 protected:
  LockableObject() = default;
  ~LockableObject() override;
};

class TESSA_API LockableObjectImpl : public virtual LockableObject, public ObjectImpl {
 public:
  void Lock() override;
  void Unlock() override;
  bool IsLocked() const noexcept override;

 protected:
  explicit LockableObjectImpl(std::string_view lockName);
  ~LockableObjectImpl() override;

 private:
  Ref<System::Lock> _lock;
};

}  // namespace Tessa::System
