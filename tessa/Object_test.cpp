#include "tessa/Object.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <thread>
#include <type_traits>
#include <utility>
#include <vector>

#include "tessa/Lockable.h"
#include "tessa/Narrow.h"
#include "tessa/Ref.h"
#include "tessa/Session.h"

namespace Tessa {
namespace {

using ::testing::HasSubstr;
using ::testing::ThrowsMessage;

struct Life {
  int firstRefs = 0;
  int finalRefs = 0;
  int deaths = 0;
};

// Tells its Life what happens to it.
class Counted : public ObjectImpl {
 public:
  explicit Counted(Life& life) : _life(life) {}
  Counted(const Counted&) = default;
  Counted& operator=(const Counted& other) {
    ObjectImpl::operator=(other);
    return *this;
  }
  ~Counted() override { ++_life.deaths; }

 protected:
  void FirstIncRef() const override { ++_life.firstRefs; }
  void FinalDecRef() const override {
    ++_life.finalRefs;
    ObjectImpl::FinalDecRef();
  }

 private:
  Life& _life;
};

class MoreCounted final : public Counted {
 public:
  using Counted::Counted;
};

class Unrelated final : public ObjectImpl {};

TEST(Object, StartsUncountedAndDiesWithItsLastRef) {
  Life life;
  auto* const object = new Counted(life);
  EXPECT_EQ(object->GetRefCount(), 0);
  {
    const Ref<Counted> first(object);
    EXPECT_EQ(object->GetRefCount(), 1);
    {
      const Ref<Counted> second = first;
      EXPECT_EQ(object->GetRefCount(), 2);
    }
    EXPECT_EQ(object->GetRefCount(), 1);
    EXPECT_EQ(life.deaths, 0);
  }
  EXPECT_EQ(life.deaths, 1);
}

TEST(Object, IsToldOnceOfItsFirstRefAndOnceOfItsLast) {
  Life life;
  {
    Ref<Counted> first = MakeRef<Counted>(life);
    Ref<Counted> second = first;
    const Ref<Counted> third = std::move(second);
    first.Reset();
    EXPECT_EQ(life.firstRefs, 1);
    EXPECT_EQ(life.finalRefs, 0);
  }
  EXPECT_EQ(life.firstRefs, 1);
  EXPECT_EQ(life.finalRefs, 1);
}

TEST(Object, ACopyStartsUncountedWhateverTheOriginal) {
  Life life;
  const Ref<Counted> original = MakeRef<Counted>(life);
  const Ref<Counted> another = original;
  auto* const copy = new Counted(*original);
  EXPECT_EQ(copy->GetRefCount(), 0);
  { const Ref<Counted> only(copy); }
  EXPECT_EQ(life.deaths, 1);
  EXPECT_EQ(original->GetRefCount(), 2);
}

TEST(Object, AssignmentLeavesBothCountsAlone) {
  Life life;
  const Ref<Counted> target = MakeRef<Counted>(life);
  const Ref<Counted> source = MakeRef<Counted>(life);
  const Ref<Counted> another = source;
  *target = *source;
  EXPECT_EQ(target->GetRefCount(), 1);
  EXPECT_EQ(source->GetRefCount(), 2);
}

TEST(Object, PrintsTheNameOfItsOwnClass) {
  EXPECT_THAT(MakeRef<Unrelated>()->ToString(), HasSubstr("Unrelated"));
}

TEST(Object, KeepsCountWhileManyThreadsShareIt) {
  constexpr int threadCount = 8;
  constexpr int rounds = 20'000;
  Life life;
  Ref<Counted> object = MakeRef<Counted>(life);
  std::vector<std::thread> threads;
  for (int i = 0; i < threadCount; ++i) {
    threads.emplace_back([mine = object] {
      for (int round = 0; round < rounds; ++round) {
        const Ref<Counted> copy = mine;
        copy->IncRef();
        copy->DecRef();
      }
    });
  }
  object.Reset();  // whichever thread is last deletes the object
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_EQ(life.deaths, 1);
  EXPECT_EQ(life.firstRefs, 1);
  EXPECT_EQ(life.finalRefs, 1);
}

// A host's own session is both: a session and an object with a lock.
class SessionWithALock final : public SessionMixin, public System::LockableObjectImpl {
 public:
  SessionWithALock() : LockableObjectImpl("session") {}
};

TEST(Object, ThatIsSeveralThingsHasOneCount) {
  const Ref<SessionWithALock> object = MakeRef<SessionWithALock>();
  const Ref<Session> session = object;
  const Ref<System::LockableObject> lockable = object;
  const Ref<Object> plain = object;
  EXPECT_EQ(object->GetRefCount(), 4);
  EXPECT_EQ(session->GetRefCount(), 4);
  EXPECT_EQ(lockable->GetRefCount(), 4);
  EXPECT_EQ(plain->GetRefCount(), 4);
}

TEST(Ref, OfNothingIsNull) {
  const Ref<Counted> none;
  EXPECT_FALSE(none);
  EXPECT_TRUE(none == nullptr);
  EXPECT_EQ(none.Get(), nullptr);
  EXPECT_TRUE(Ref<Counted>(nullptr) == none);
  EXPECT_TRUE(Ref<Counted>(static_cast<Counted*>(nullptr)) == none);
}

TEST(Ref, SurvivesAssignmentToItself) {
  Life life;
  Ref<Counted> object = MakeRef<Counted>(life);
  Ref<Counted>& same = object;
  object = same;
  EXPECT_EQ(object->GetRefCount(), 1);
  object = std::move(same);
  ASSERT_TRUE(object);
  EXPECT_EQ(object->GetRefCount(), 1);
  object = object.Get();
  EXPECT_EQ(object->GetRefCount(), 1);
  EXPECT_EQ(life.deaths, 0);
}

TEST(Ref, MovedFromIsNullAndTheCountStays) {
  Life life;
  Ref<Counted> source = MakeRef<Counted>(life);
  Counted* const object = source.Get();
  const Ref<Counted> target = std::move(source);
  EXPECT_TRUE(source == nullptr);
  EXPECT_EQ(target, object);
  EXPECT_EQ(object->GetRefCount(), 1);
  static_assert(std::is_nothrow_move_constructible_v<Ref<Counted>>);
}

TEST(Ref, ConvertsToABaseByCopyAndByMove) {
  Life life;
  Ref<MoreCounted> derived = MakeRef<MoreCounted>(life);
  const Ref<Counted> copied = derived;
  EXPECT_EQ(copied->GetRefCount(), 2);
  const Ref<Object> moved = std::move(derived);
  EXPECT_TRUE(derived == nullptr);
  EXPECT_EQ(moved->GetRefCount(), 2);
  static_assert(!std::is_constructible_v<Ref<MoreCounted>, const Ref<Counted>&>, "down only by NarrowToType");
  static_assert(!std::is_constructible_v<Ref<Unrelated>, const Ref<Counted>&>);
}

TEST(Ref, ReleasesWhatItHeldWhenAssigned) {
  Life first;
  Life second;
  Ref<Counted> held = MakeRef<Counted>(first);
  held = MakeRef<Counted>(second);
  EXPECT_EQ(first.deaths, 1);
  EXPECT_EQ(second.deaths, 0);
  held = nullptr;
  EXPECT_EQ(second.deaths, 1);
}

// An object that reads, while it dies, the Ref that it dies of.
class Onlooker final : public ObjectImpl {
 public:
  Onlooker(const Ref<Onlooker>& place, const Onlooker*& seen) : _place(place), _seen(seen) {}
  ~Onlooker() override { _seen = _place.Get(); }

 private:
  const Ref<Onlooker>& _place;
  const Onlooker*& _seen;
};

TEST(Ref, ShowsTheNewObjectWhileTheOldOneIsReleased) {
  const Onlooker* seen = nullptr;
  Ref<Onlooker> place;
  place = MakeRef<Onlooker>(place, seen);
  const Ref<Onlooker> next = MakeRef<Onlooker>(place, seen);
  place = next;
  EXPECT_EQ(seen, next.Get());
}

TEST(NarrowToType, GivesTheSameObject) {
  Life life;
  const Ref<Object> object = MakeRef<MoreCounted>(life);
  const Ref<Counted> narrowed = NarrowToType<Counted>(object);
  EXPECT_EQ(static_cast<Object*>(narrowed.Get()), object.Get());
  EXPECT_EQ(object->GetRefCount(), 2);
}

TEST(NarrowToType, LeavesNullNull) {
  EXPECT_FALSE(NarrowToType<Counted>(Ref<Object>()));
}

TEST(NarrowToType, RefusesAnotherTypeAndSaysWhatItFound) {
  const Ref<Object> object = MakeRef<Unrelated>();
  EXPECT_THAT([&] { NarrowToType<Counted>(object); },
              ThrowsMessage<TypeMismatchException>(HasSubstr("Unrelated")));
  EXPECT_EQ(object->GetRefCount(), 1);
}

}  // namespace
}  // namespace Tessa
