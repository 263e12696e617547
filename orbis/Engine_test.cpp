#include "orbis/Engine.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "orbis/Formatter.h"
#include "orbis/Soap.h"
#include "orbis/Types.h"
#include "tessa/Logger.h"

namespace Orbis {
namespace {

using ::testing::StartsWith;

Ref<KeyAnyValue> APair(const char* key, Ref<Any> value) {
  const Ref<KeyAnyValue> pair = MakeRef<KeyAnyValue>();
  pair->SetKey(key);
  pair->SetValue(std::move(value));
  return pair;
}

Ref<LocalizableMessage> AMessage() {
  const Ref<LocalizableMessage> message = MakeRef<LocalizableMessage>();
  message->SetKey("kova.full");
  message->SetArg(MakeRef<DataArray<KeyAnyValue>>());
  message->GetArg()->Append(APair("count", MakeRef<Boxed<std::int32_t>>(3)));
  message->GetArg()->Append(APair("names", MakeRef<TextList>(std::vector<std::string>{"a", "b"})));
  return message;
}

TEST(Clone, OfNullIsNull) {
  EXPECT_FALSE(Clone(Ref<KeyAnyValue>()));
}

TEST(Clone, IsEqualAndSharesNothing) {
  const Ref<LocalizableMessage> original = AMessage();
  const Ref<LocalizableMessage> copy = Clone(original);
  ASSERT_TRUE(Equal(original.Get(), copy.Get()));
  EXPECT_NE(copy->GetArg().Get(), original->GetArg().Get());
  EXPECT_NE((*copy->GetArg())[0], (*original->GetArg())[0]);
  EXPECT_NE((*copy->GetArg())[0]->GetValue().Get(), (*original->GetArg())[0]->GetValue().Get());
  static_cast<Boxed<std::int32_t>&>(*(*copy->GetArg())[0]->GetValue()).Value() = 4;
  EXPECT_FALSE(Equal(original.Get(), copy.Get()));
  EXPECT_EQ(original->GetArg()->GetRefCount(), 1);
}

TEST(Clone, KeepsNullElementsAndTheListOfAFault) {
  const Ref<Fault::SystemError> fault = MakeRef<Fault::SystemError>("r");
  fault->GetFaultMessage()->Append(nullptr);
  fault->GetFaultMessage()->Append(AMessage());
  const Ref<Fault::SystemError> copy = Clone(fault);
  ASSERT_TRUE(Equal(fault.Get(), copy.Get()));
  EXPECT_NE(copy->GetFaultMessage().Get(), fault->GetFaultMessage().Get());
  EXPECT_NE((*copy->GetFaultMessage())[1], (*fault->GetFaultMessage())[1]);
}

TEST(Clone, OfAFaultKeptAsItsBaseIsOfTheFaultsOwnType) {
  const Ref<MethodFault> fault = MakeRef<Fault::SystemError>("r");
  EXPECT_EQ(&Clone(fault)->GetType(), &Fault::SystemError::StaticType());
}

TEST(Equal, ComparesNulls) {
  const Ref<LocalizableMessage> message = AMessage();
  EXPECT_TRUE(Equal(nullptr, nullptr));
  EXPECT_FALSE(Equal(message.Get(), nullptr));
  EXPECT_FALSE(Equal(nullptr, message.Get()));
  EXPECT_TRUE(Equal(message.Get(), message.Get()));
}

TEST(Equal, TakesANullListAndAnEmptyOneForTheSame) {
  const Ref<LocalizableMessage> withNone = MakeRef<LocalizableMessage>();
  const Ref<LocalizableMessage> withEmpty = MakeRef<LocalizableMessage>();
  withEmpty->SetArg(MakeRef<DataArray<KeyAnyValue>>());
  EXPECT_TRUE(Equal(withNone.Get(), withEmpty.Get()));
  EXPECT_TRUE(Equal(withEmpty.Get(), withNone.Get()));
  withEmpty->GetArg()->Append(nullptr);
  EXPECT_FALSE(Equal(withNone.Get(), withEmpty.Get())) << "a list of a null is not empty";
}

TEST(Equal, TellsAnUnsetTextFromAnEmptyOne) {
  const Ref<LocalizableMessage> unset = MakeRef<LocalizableMessage>();
  const Ref<LocalizableMessage> empty = MakeRef<LocalizableMessage>();
  empty->SetMessage("");
  EXPECT_FALSE(Equal(unset.Get(), empty.Get()));
  EXPECT_FALSE(Equal(empty.Get(), unset.Get()));
  unset->SetMessage("");
  EXPECT_TRUE(Equal(unset.Get(), empty.Get()));
}

TEST(Equal, TellsValuesOfDifferentTypes) {
  EXPECT_FALSE(Equal(MakeRef<Boxed<std::int32_t>>(3).Get(), MakeRef<Boxed<std::int64_t>>(3).Get()));
  EXPECT_TRUE(Equal(MakeRef<Boxed<std::int32_t>>(3).Get(), MakeRef<Boxed<std::int32_t>>(3).Get()));
  EXPECT_FALSE(
      Equal(MakeRef<DataArray<KeyAnyValue>>().Get(), MakeRef<DataArray<LocalizableMessage>>().Get()));
  EXPECT_FALSE(Equal(MakeRef<Fault::SystemError>().Get(), MakeRef<Fault::InvalidArgument>().Get()));
  const Ref<KeyAnyValue> withNone = APair("k", nullptr);
  const Ref<KeyAnyValue> withEmptyList = APair("k", MakeRef<TextList>());
  EXPECT_FALSE(Equal(withNone.Get(), withEmptyList.Get())) << "a value of any type is no list field";
}

TEST(Equal, MindsTheOrderAndNumberOfElements) {
  const auto list = [](std::vector<std::string> items) { return MakeRef<TextList>(std::move(items)); };
  EXPECT_TRUE(Equal(list({"a", "b"}).Get(), list({"a", "b"}).Get()));
  EXPECT_FALSE(Equal(list({"a", "b"}).Get(), list({"b", "a"}).Get()));
  EXPECT_FALSE(Equal(list({"a"}).Get(), list({"a", "a"}).Get()));
}

TEST(Print, ShowsTypeAndFieldsThatAreSet) {
  EXPECT_EQ(AMessage()->ToString(),
            "(LocalizableMessage) {key = \"kova.full\", arg = [(KeyAnyValue) {key = \"count\", value = 3}, "
            "(KeyAnyValue) {key = \"names\", value = [\"a\", \"b\"]}]}");
  EXPECT_EQ(MakeRef<Fault::InvalidArgument>()->ToString(), "(InvalidArgument) {}");
}

TEST(Print, AppendsAndShowsNulls) {
  std::string text = "value: ";
  Print(nullptr, text);
  EXPECT_EQ(text, "value: null");
  const Ref<DataArray<KeyAnyValue>> list = MakeRef<DataArray<KeyAnyValue>>();
  list->Append(nullptr);
  EXPECT_EQ(list->ToString(), "[null]");
}

TEST(Print, ShowsEveryKindOfSimpleValue) {
  EXPECT_EQ(MakeRef<Boxed<bool>>(true)->ToString(), "true");
  EXPECT_EQ(MakeRef<Boxed<std::int64_t>>(-5)->ToString(), "-5");
  EXPECT_EQ(MakeRef<Boxed<std::string>>("t")->ToString(), "\"t\"");
  EXPECT_EQ(MakeRef<Boxed<DateTime>>(DateTime{})->ToString(), "\"1970-01-01T00:00:00Z\"");
  EXPECT_EQ(MakeRef<Binary>(Bytes{'f'})->ToString(), "Zg==");
}

std::string Logged(const SerializeFormatter::SerializedObject& object) {
  const Tessa::Service::LogArgument argument(object);
  return argument.ToString();
}

TEST(SerializeFormatter, PrintsTheTextThatWouldBeSent) {
  const Ref<Fault::SystemError> fault = MakeRef<Fault::SystemError>("r");
  std::string sent;
  SerializeObjectToSoap(*fault, nullptr, sent);
  EXPECT_EQ(Logged(SerializeFormatter::Format(fault)), sent);
}

TEST(SerializeFormatter, PrintsNull) {
  EXPECT_EQ(Logged(SerializeFormatter::Format(Ref<MethodFault>())), "(null)");
}

TEST(SerializeFormatter, PrintsForPeopleWhatCannotBeSent) {
  const Ref<KeyAnyValue> withoutValue = APair("k", nullptr);
  EXPECT_EQ(Logged(SerializeFormatter::Format(withoutValue)), "(KeyAnyValue) {key = \"k\"}");
}

}  // namespace
}  // namespace Orbis
