#include "tessa/Lockable.h"

#include <atomic>
#include <mutex>
#include <thread>

namespace Tessa::System {
namespace {

class MutexLock final : public Lock {
 public:
  void Acquire() override {
    _mutex.lock();
    _holder.store(std::this_thread::get_id(), std::memory_order_relaxed);
  }
  void Release() override {
    _holder.store(std::thread::id(), std::memory_order_relaxed);
    _mutex.unlock();
  }
  // A thread can only read its own id here if it wrote it itself, so no ordering is needed.
  bool IsHeld() const noexcept override {
    return _holder.load(std::memory_order_relaxed) == std::this_thread::get_id();
  }

 private:
  std::mutex _mutex;
  std::atomic<std::thread::id> _holder{};
};

class MutexFactory final : public SystemFactory {
 public:
  Ref<Lock> CreateLock(std::string_view) override { return MakeRef<MutexLock>(); }
};

std::atomic<SystemFactory*> installedFactory{nullptr};

}  // namespace

Lock::~Lock() = default;
SystemFactory::~SystemFactory() = default;
LockableObject::~LockableObject() = default;

SystemFactory& GetSystemFactory() noexcept {
  // Never destroyed: objects that outlive the program's statics may still make locks.
  // NOLINTNEXTLINE(bugprone-unhandled-exception-at-new): without memory for this, nothing works
  static SystemFactory* const runtimeFactory = new MutexFactory;
  SystemFactory* const installed = installedFactory.load();
  return installed != nullptr ? *installed : *runtimeFactory;
}

SystemFactory* SetSystemFactory(SystemFactory* factory) noexcept {
  return installedFactory.exchange(factory);
}

LockableObjectImpl::LockableObjectImpl(std::string_view lockName)
    : _lock(GetSystemFactory().CreateLock(lockName)) {}
LockableObjectImpl::~LockableObjectImpl() = default;

void LockableObjectImpl::Lock() {
  _lock->Acquire();
}
void LockableObjectImpl::Unlock() {
  _lock->Release();
}
bool LockableObjectImpl::IsLocked() const noexcept {
  return _lock->IsHeld();
}

}  // namespace Tessa::System
