// What a caller of the two SOAP functions can rely on, whatever the types.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "orbis/Engine.h"
#include "orbis/ParseException.h"
#include "orbis/Soap.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/Types.h"
#include "tessa/Throwable.h"

namespace Orbis {
namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::ThrowsMessage;

constexpr std::string_view head =
    "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
    "<object xmlns=\"urn:nox\" xmlns:xsd=\"http://www.w3.org/2001/XMLSchema\" "
    "xmlns:xsi=\"http://www.w3.org/2001/XMLSchema-instance\" ";

std::string Written(const Any& value) {
  std::string text;
  SerializeObjectToSoap(value, nullptr, text);
  return text;
}

Ref<KeyAnyValue> APair(const char* key, Ref<Any> value) {
  const Ref<KeyAnyValue> pair = MakeRef<KeyAnyValue>();
  pair->SetKey(key);
  pair->SetValue(std::move(value));
  return pair;
}

TEST(SerializeObjectToSoap, WritesWholeTexts) {
  EXPECT_EQ(Written(*MakeRef<Fault::SystemError>("a < b")),
            std::string(head) + "xsi:type=\"SystemError\"><reason>a &lt; b</reason></object>");
  EXPECT_EQ(Written(*MakeRef<DataArray<KeyAnyValue>>()),
            std::string(head) + "xsi:type=\"KeyAnyValueList\"></object>");
  EXPECT_EQ(Written(*MakeRef<TextList>(std::vector<std::string>{"a", ""})),
            std::string(head) + "xsi:type=\"TextList\"><item>a</item><item></item></object>");
  EXPECT_EQ(Written(*MakeRef<Boxed<std::int32_t>>(3)), std::string(head) + "xsi:type=\"xsd:int\">3</object>");
}

TEST(SerializeObjectToSoap, NamesTheTypeOfValuesOfAnyType) {
  EXPECT_EQ(Written(*APair("k", MakeRef<Boxed<std::string>>("v"))),
            std::string(head) +
                "xsi:type=\"KeyAnyValue\"><key>k</key><value xsi:type=\"xsd:string\">v</value></object>");
  EXPECT_THAT(Written(*APair("k", MakeRef<TextList>(std::vector<std::string>{"v"}))),
              HasSubstr("<value xsi:type=\"TextList\"><item>v</item></value>"));
  EXPECT_THAT(
      Written(*APair("k", APair("l", MakeRef<Boxed<bool>>(true)))),
      HasSubstr("<value xsi:type=\"KeyAnyValue\"><key>l</key><value xsi:type=\"xsd:boolean\">true</value>"));
}

TEST(SerializeObjectToSoap, AppendsBehindWhatTheTextHolds) {
  std::string text = "two texts: ";
  const Ref<Fault::SystemError> fault = MakeRef<Fault::SystemError>("r");
  SerializeObjectToSoap(*fault, nullptr, text);
  SerializeObjectToSoap(*fault, nullptr, text);
  EXPECT_EQ(text, "two texts: " + Written(*fault) + Written(*fault));
}

TEST(SerializeObjectToSoap, CutsItsTextBackWhenAListHoldsANull) {
  const Ref<DataArray<Fault::SystemError>> list = MakeRef<DataArray<Fault::SystemError>>();
  list->Append(MakeRef<Fault::SystemError>("written before the null"));
  list->Append(nullptr);
  std::string text = "before";
  EXPECT_THAT([&] { SerializeObjectToSoap(*list, nullptr, text); },
              ThrowsMessage<Tessa::NotInitializedException>(HasSubstr("SystemErrorList")));
  EXPECT_EQ(text, "before");
}

TEST(SerializeObjectToSoap, CutsItsTextBackWhenARequiredFieldIsNull) {
  std::string text = "before";
  EXPECT_THAT([&] { SerializeObjectToSoap(*APair("k", nullptr), nullptr, text); },
              ThrowsMessage<Tessa::NotInitializedException>(HasSubstr("KeyAnyValue.value")));
  EXPECT_EQ(text, "before");
}

TEST(DeserializeSoapToObject, ReplacesTheValueOnSuccessOnly) {
  const Ref<Any> before = MakeRef<Fault::SystemError>("before");
  Ref<Any> value = before;
  EXPECT_THROW(DeserializeSoapToObject("<object/>", value), ParseException);
  EXPECT_TRUE(value == before);
  DeserializeSoapToObject(Written(*MakeRef<Fault::SystemError>("after")), value);
  EXPECT_EQ(static_cast<const Fault::SystemError&>(*value).GetReason(), "after");
}

TEST(DeserializeSoapToObject, AcceptsTheExpectedTypeAndItsKinds) {
  const std::string text = Written(*MakeRef<Fault::SystemError>("r"));
  for (const TypeDescriptor* type : {&Fault::SystemError::StaticType(), &ServiceFault::StaticType(),
                                     &MethodFault::StaticType(), &DataObject::StaticType()}) {
    Ref<Any> value;
    DeserializeSoapToObject(text, value, nullptr, type);
    EXPECT_EQ(&value->GetType(), &Fault::SystemError::StaticType()) << type->name;
  }
}

TEST(DeserializeSoapToObject, RefusesAnotherThanTheExpectedType) {
  const std::string text = Written(*MakeRef<Fault::SystemError>("r"));
  for (const TypeDescriptor* type :
       {&Fault::InvalidArgument::StaticType(), &DataArray<Fault::SystemError>::StaticType(),
        &Boxed<std::string>::StaticType(), &TextList::StaticType()}) {
    Ref<Any> value;
    EXPECT_THAT([&] { DeserializeSoapToObject(text, value, nullptr, type); },
                ThrowsMessage<ParseException>(
                    AllOf(HasSubstr("/object, line 2"), HasSubstr("SystemError is not a " + type->name))));
    EXPECT_FALSE(value);
  }
}

TEST(DeserializeSoapToObject, KeepsListsOfDifferentElementsApart) {
  Ref<Any> value;
  EXPECT_THROW(DeserializeSoapToObject(Written(*MakeRef<DataArray<Fault::SystemError>>()), value, nullptr,
                                       &DataArray<MethodFault>::StaticType()),
               ParseException);
}

TEST(TypeFilter, MustAllowEveryTypeOfTheText) {
  const Ref<KeyAnyValue> pair = APair("k", MakeRef<Fault::SystemError>("r"));
  std::vector<std::string> asked;
  const TypeFilter everything = [&](const TypeDescriptor& type) {
    asked.push_back(type.name);
    return true;
  };
  Ref<Any> value;
  DeserializeSoapToObject(Written(*pair), value, nullptr, nullptr, &everything);
  EXPECT_THAT(asked, ::testing::ElementsAre("KeyAnyValue", "SystemError"));
  EXPECT_TRUE(Equal(value.Get(), pair.Get()));

  const TypeFilter noErrors = [](const TypeDescriptor& type) { return type.name != "SystemError"; };
  EXPECT_THAT([&] { DeserializeSoapToObject(Written(*pair), value, nullptr, nullptr, &noErrors); },
              ThrowsMessage<ParseException>(AllOf(HasSubstr("/object/value, line 2"),
                                                  HasSubstr("SystemError"), HasSubstr("not allowed"))));
  EXPECT_TRUE(Equal(value.Get(), pair.Get())) << "left as it was";
}

}  // namespace
}  // namespace Orbis
