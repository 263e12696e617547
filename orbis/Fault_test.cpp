// Faults as objects and as exceptions; the list of messages that is made when somebody asks for it.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <latch>
#include <set>
#include <thread>
#include <vector>

#include "orbis/Engine.h"
#include "orbis/FaultText.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/Types.h"

namespace Orbis {
namespace {

using ::testing::SizeIs;

Ref<Fault::SystemError> ASystemError(const char* reason) {
  return MakeRef<Fault::SystemError>(reason);
}

Ref<LocalizableMessage> AMessage(const char* key) {
  const Ref<LocalizableMessage> message = MakeRef<LocalizableMessage>();
  message->SetKey(key);
  return message;
}

const Any* MessagesIfMade(const MethodFault& fault) {
  return fault.GetType().FindField("faultMessage")->get(fault);
}

TEST(FaultMessage, IsMadeOnFirstAccess) {
  const Ref<Fault::SystemError> fault = ASystemError("r");
  EXPECT_EQ(MessagesIfMade(*fault), nullptr);
  const auto messages = fault->GetFaultMessage();
  ASSERT_TRUE(messages);
  EXPECT_TRUE(messages->IsEmpty());
  EXPECT_EQ(MessagesIfMade(*fault), messages.Get());
  EXPECT_TRUE(fault->GetFaultMessage() == messages);
  fault->GetFaultMessage()->Append(AMessage("key"));
  EXPECT_EQ(fault->GetFaultMessage()->Size(), 1u);
}

TEST(FaultMessage, IsNotMadeByLookingAtTheFault) {
  const Ref<Fault::SystemError> fault = ASystemError("r");
  const Ref<Fault::SystemError> copy = Clone(fault);
  EXPECT_TRUE(Equal(fault.Get(), copy.Get()));
  fault->ToString();
  EXPECT_EQ(MessagesIfMade(*fault), nullptr);
  EXPECT_EQ(MessagesIfMade(*copy), nullptr);
}

TEST(FaultMessage, CanBeReplacedAndTakenAway) {
  const Ref<Fault::SystemError> fault = ASystemError("r");
  const auto first = fault->GetFaultMessage();
  const Ref<DataArray<LocalizableMessage>> second = MakeRef<DataArray<LocalizableMessage>>();
  fault->SetFaultMessage(second);
  EXPECT_TRUE(fault->GetFaultMessage() == second);
  EXPECT_EQ(first->GetRefCount(), 1);
  fault->SetFaultMessage(nullptr);
  EXPECT_EQ(MessagesIfMade(*fault), nullptr);
  EXPECT_EQ(second->GetRefCount(), 1);
}

TEST(FaultMessage, IsOneListHoweverManyThreadsAskFirst) {
  constexpr int threadCount = 6;
  constexpr int rounds = 200;
  for (int round = 0; round < rounds; ++round) {
    const Ref<Fault::SystemError> fault = ASystemError("r");
    std::latch start(threadCount);
    std::vector<const void*> seen(threadCount);
    std::vector<std::thread> threads;
    for (int i = 0; i < threadCount; ++i) {
      threads.emplace_back([&, i] {
        start.arrive_and_wait();  // all at once
        seen[static_cast<std::size_t>(i)] = fault->GetFaultMessage().Get();
      });
    }
    for (std::thread& thread : threads) {
      thread.join();
    }
    ASSERT_THAT(std::set<const void*>(seen.begin(), seen.end()), SizeIs(1));
    ASSERT_EQ(fault->GetFaultMessage()->GetRefCount(), 2) << "the fault's own and this one";
  }
}

TEST(FaultText, IsTheTypeAndTheReason) {
  EXPECT_EQ(FaultText(*ASystemError("no such host")), "SystemError: no such host");
  EXPECT_EQ(FaultText(*ASystemError("")), "SystemError: ");
}

TEST(FaultText, IsTheTypeAndTheKeysOfItsMessages) {
  const Ref<Fault::InvalidArgument> fault = MakeRef<Fault::InvalidArgument>();
  EXPECT_EQ(FaultText(*fault), "InvalidArgument");
  fault->GetFaultMessage()->Append(AMessage("key1"));
  fault->GetFaultMessage()->Append(nullptr);
  fault->GetFaultMessage()->Append(AMessage("key2"));
  EXPECT_EQ(FaultText(*fault), "InvalidArgument: key1, key2");
}

template <class Base>
void ExpectCaughtAs(const Ref<Fault::SystemError>& fault) {
  try {
    throw Fault::SystemError::Exception(fault);
  } catch (const Base& exception) {
    EXPECT_STREQ(exception.what(), "SystemError: broken");
  } catch (...) {
    ADD_FAILURE() << "not caught as " << typeid(Base).name();
  }
}

TEST(FaultException, IsCaughtAsEveryOneOfItsBases) {
  const Ref<Fault::SystemError> fault = ASystemError("broken");
  ExpectCaughtAs<Fault::SystemError::Exception>(fault);
  ExpectCaughtAs<ServiceFault::Exception>(fault);
  ExpectCaughtAs<MethodFault::Exception>(fault);
  ExpectCaughtAs<Tessa::Throwable>(fault);
  ExpectCaughtAs<std::exception>(fault);
}

TEST(FaultException, IsNotCaughtAsItsSibling) {
  EXPECT_THROW(
      {
        try {
          throw Fault::SystemError::Exception(ASystemError("broken"));
        } catch (const Fault::InvalidArgument::Exception&) {
          ADD_FAILURE();
        }
      },
      Fault::SystemError::Exception);
}

TEST(FaultException, CarriesTheFaultItself) {
  const Ref<Fault::SystemError> fault = ASystemError("broken");
  try {
    throw Fault::SystemError::Exception(fault);
  } catch (const MethodFault::Exception& exception) {
    EXPECT_TRUE(exception.GetFault() == fault.Get());
  }
  EXPECT_EQ(fault->GetRefCount(), 1);
}

}  // namespace
}  // namespace Orbis
