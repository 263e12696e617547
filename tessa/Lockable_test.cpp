#include "tessa/Lockable.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <future>
#include <string>
#include <thread>
#include <vector>

namespace Tessa::System {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

class Cupboard final : public LockableObjectImpl {
 public:
  explicit Cupboard(std::string_view lockName = "cupboard") : LockableObjectImpl(lockName) {}
  int content = 0;
};

// What another thread sees.
bool IsLockedForAnother(const LockableObject& object) {
  return std::async(std::launch::async, [&] { return object.IsLocked(); }).get();
}

TEST(LockableObject, SaysWhetherTheCallingThreadHoldsItsLock) {
  const Ref<Cupboard> object = MakeRef<Cupboard>();
  EXPECT_FALSE(object->IsLocked());
  object->Lock();
  EXPECT_TRUE(object->IsLocked());
  EXPECT_FALSE(IsLockedForAnother(*object));
  object->Unlock();
  EXPECT_FALSE(object->IsLocked());
}

TEST(LockableObject, LetsOneThreadInAtATime) {
  constexpr int threadCount = 4;
  constexpr int rounds = 5'000;
  const Ref<Cupboard> object = MakeRef<Cupboard>();
  std::vector<std::thread> threads;
  for (int i = 0; i < threadCount; ++i) {
    threads.emplace_back([&] {
      for (int round = 0; round < rounds; ++round) {
        object->Lock();
        ++object->content;  // not atomic: lost updates would show
        object->Unlock();
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_EQ(object->content, threadCount * rounds);
}

TEST(LockGuard, HoldsTheLockForItsScope) {
  const Ref<Lock> lock = GetSystemFactory().CreateLock("guarded");
  {
    const LockGuard guard(*lock);
    EXPECT_TRUE(lock->IsHeld());
  }
  EXPECT_FALSE(lock->IsHeld());
}

TEST(LockGuard, LetsGoWhenAnExceptionPasses) {
  const Ref<Lock> lock = GetSystemFactory().CreateLock("guarded");
  try {
    const LockGuard guard(*lock);
    throw std::string("out of here");
  } catch (const std::string&) {
  }
  EXPECT_FALSE(lock->IsHeld());
}

// Writes down the life of its locks.
class RecordingFactory final : public SystemFactory {
 public:
  Ref<Lock> CreateLock(std::string_view name) override {
    events.push_back("create " + std::string(name));
    return MakeRef<RecordingLock>(events, std::string(name));
  }

  std::vector<std::string> events;

 private:
  class RecordingLock final : public Lock {
   public:
    RecordingLock(std::vector<std::string>& events, std::string name)
        : _events(events), _name(std::move(name)) {}
    void Acquire() override {
      _events.push_back("acquire " + _name);
      _held = true;
    }
    void Release() override {
      _events.push_back("release " + _name);
      _held = false;
    }
    bool IsHeld() const noexcept override { return _held; }

   private:
    std::vector<std::string>& _events;
    const std::string _name;
    bool _held = false;
  };
};

TEST(SystemFactory, OfATestSeesEveryLockAndWhatIsDoneWithIt) {
  RecordingFactory factory;
  SystemFactory* const before = SetSystemFactory(&factory);
  EXPECT_EQ(&GetSystemFactory(), &factory);
  const Ref<Cupboard> object = MakeRef<Cupboard>("linen");
  object->Lock();
  EXPECT_TRUE(object->IsLocked());
  object->Unlock();
  EXPECT_EQ(SetSystemFactory(before), &factory);
  EXPECT_THAT(factory.events, ElementsAre("create linen", "acquire linen", "release linen"));
}

TEST(SystemFactory, OfTheRuntimeComesBackWithNull) {
  SystemFactory& ofTheRuntime = GetSystemFactory();
  RecordingFactory factory;
  EXPECT_EQ(SetSystemFactory(&factory), nullptr);
  SetSystemFactory(nullptr);
  EXPECT_EQ(&GetSystemFactory(), &ofTheRuntime);
  MakeRef<Cupboard>()->Lock();
  EXPECT_THAT(factory.events, IsEmpty());
}

}  // namespace
}  // namespace Tessa::System
