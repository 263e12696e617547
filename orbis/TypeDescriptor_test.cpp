#include "orbis/TypeDescriptor.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>

#include "orbis/Types.h"
#include "orbis/Version.h"
#include "tessa/Throwable.h"

namespace Orbis {
namespace {

using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsSupersetOf;
using ::testing::ThrowsMessage;

TEST(FindType, KnowsTypesTheirListsAndAbstractOnes) {
  EXPECT_EQ(FindType("KeyAnyValue"), &KeyAnyValue::StaticType());
  EXPECT_EQ(FindType("MethodFault"), &MethodFault::StaticType());
  EXPECT_TRUE(FindType("MethodFault")->IsAbstract());
  EXPECT_EQ(FindType("KeyAnyValueList"), &DataArray<KeyAnyValue>::StaticType());
  EXPECT_EQ(FindType("MethodFaultList"), &DataArray<MethodFault>::StaticType());
  EXPECT_EQ(FindType("TextList"), &TextList::StaticType());
}

TEST(FindType, KnowsNothingElse) {
  for (const char* name : {"", "List", "ArrayOfKeyAnyValue", "ArrayOfString", "KeyAnyValueListList",
                           "TextListList", "NothingList", "Nothing", "string", "int", "intList",
                           "KeyAnyValuList", "keyAnyValue", "KeyAnyValue ", "Orbis::KeyAnyValue"}) {
    EXPECT_EQ(FindType(name), nullptr) << name;
  }
}

TEST(FindSimpleType, KnowsOnlySimpleTypes) {
  EXPECT_EQ(FindSimpleType("string"), &Boxed<std::string>::StaticType());
  for (const char* name : {"", "String", "anyType", "integer", "KeyAnyValue", "TextList", "base64"}) {
    EXPECT_EQ(FindSimpleType(name), nullptr) << name;
  }
}

TEST(AllTypes, GivesEveryTypeOnceInOrderOfNames) {
  std::vector<std::string> names;
  for (const TypeDescriptor* type : AllTypes()) {
    names.push_back(type->name);
  }
  EXPECT_THAT(names, IsSupersetOf({"InvalidArgument", "KeyAnyValue", "LocalizableMessage", "MethodFault",
                                   "ServiceFault", "SystemError"}));
  EXPECT_TRUE(std::is_sorted(names.begin(), names.end()));
  EXPECT_EQ(std::adjacent_find(names.begin(), names.end()), names.end());
}

TEST(TypeDescriptor, HasTheFieldsOfItsBasesFirst) {
  std::vector<std::string_view> names;
  for (const FieldDescriptor* field : Fault::SystemError::StaticType().fields) {
    names.push_back(field->name);
  }
  EXPECT_THAT(names, ElementsAre("cause", "faultMessage", "reason"));
}

TEST(TypeDescriptor, KnowsItsAncestors) {
  const TypeDescriptor& type = Fault::SystemError::StaticType();
  EXPECT_TRUE(type.IsA(type));
  EXPECT_TRUE(type.IsA(ServiceFault::StaticType()));
  EXPECT_TRUE(type.IsA(MethodFault::StaticType()));
  EXPECT_TRUE(type.IsA(DataObject::StaticType()));
  EXPECT_FALSE(type.IsA(Fault::InvalidArgument::StaticType()));
  EXPECT_FALSE(ServiceFault::StaticType().IsA(type));
  EXPECT_FALSE(DataArray<Fault::SystemError>::StaticType().IsA(type));
}

TEST(TypeDescriptor, FindsAFieldOfItsOwnOrOfABaseByName) {
  const TypeDescriptor& type = Fault::SystemError::StaticType();
  for (const FieldDescriptor* field : type.fields) {
    EXPECT_EQ(type.FindField(field->name), field);
  }
  EXPECT_EQ(type.FindField("reason"), &type.ownFields[0]);
  EXPECT_EQ(type.FindField("faultMessage"), MethodFault::StaticType().FindField("faultMessage"));
  EXPECT_EQ(type.FindField("Reason"), nullptr);
  EXPECT_EQ(type.FindField(""), nullptr);
  EXPECT_EQ(DataArray<Fault::SystemError>::StaticType().FindField("reason"), nullptr);
}

TEST(TypeDescriptor, OfAnAbstractTypeMakesNothing) {
  EXPECT_EQ(MethodFault::StaticType().create, nullptr);
  EXPECT_FALSE(DataArray<MethodFault>::StaticType().IsAbstract()) << "a list of them can still be made";
  EXPECT_NE(MethodFault::StaticType().array->createArray, nullptr);
}

TEST(FieldDescriptor, RefusesAnObjectOfAnotherType) {
  const Ref<LocalizableMessage> message = MakeRef<LocalizableMessage>();
  const FieldDescriptor* const field = LocalizableMessage::StaticType().FindField("arg");
  ASSERT_NE(field, nullptr);
  EXPECT_THROW(field->assign(*message, MakeRef<KeyAnyValue>()), Tessa::TypeMismatchException);
  EXPECT_FALSE(message->GetArg());
  field->assign(*message, MakeRef<DataArray<KeyAnyValue>>());
  EXPECT_TRUE(message->GetArg());
}

TEST(DataArray, HoldsItsElementsInOrderAndMayHoldNull) {
  const Ref<DataArray<KeyAnyValue>> list = MakeRef<DataArray<KeyAnyValue>>();
  EXPECT_TRUE(list->IsEmpty());
  const Ref<KeyAnyValue> first = MakeRef<KeyAnyValue>();
  list->Append(first);
  list->Append(nullptr);
  EXPECT_EQ(list->Size(), 2u);
  EXPECT_EQ((*list)[0], first.Get());
  EXPECT_EQ((*list)[1], nullptr);
  EXPECT_EQ(first->GetRefCount(), 2);
  EXPECT_THAT(std::vector<KeyAnyValue*>({*list->begin(), *++list->begin()}),
              ElementsAre(first.Get(), nullptr));
}

TEST(DataArray, PutsAnElementInThePlaceOfAnother) {
  const Ref<DataArray<KeyAnyValue>> list = MakeRef<DataArray<KeyAnyValue>>();
  const Ref<KeyAnyValue> first = MakeRef<KeyAnyValue>();
  const Ref<KeyAnyValue> second = MakeRef<KeyAnyValue>();
  list->Append(first);
  list->Append(nullptr);
  list->Replace(0, second);
  list->Replace(1, first);
  EXPECT_EQ((*list)[0], second.Get());
  EXPECT_EQ((*list)[1], first.Get());
  EXPECT_EQ(first->GetRefCount(), 2) << "its first place has let it go";
  EXPECT_EQ(list->Size(), 2u);
}

TEST(DataArray, TakesObjectsOfItsElementTypeOnly) {
  const Ref<DataArray<ServiceFault>> list = MakeRef<DataArray<ServiceFault>>();
  list->AppendAny(MakeRef<Fault::SystemError>());
  list->AppendAny(nullptr);
  EXPECT_THAT([&] { list->AppendAny(MakeRef<KeyAnyValue>()); },
              ThrowsMessage<Tessa::TypeMismatchException>(HasSubstr("KeyAnyValue")));
  EXPECT_EQ(list->Size(), 2u);
}

TEST(Version, IsFoundByItsName) {
  const Ref<Version> unstable = FindVersionByTyrlName("nox.version.unstable");
  ASSERT_TRUE(unstable);
  EXPECT_EQ(unstable->GetName(), "nox.version.unstable");
  EXPECT_EQ(unstable->ToString(), "nox.version.unstable");
  EXPECT_TRUE(FindVersionByTyrlName("nox.version.unstable") == unstable);
  EXPECT_TRUE(unstable->Has(1'000'000));
}

TEST(Version, OfAnotherNameIsNotThere) {
  for (const char* name : {"", "nox.version", "nox.version.unstable ", "nox.version.version1", "unstable"}) {
    EXPECT_FALSE(FindVersionByTyrlName(name)) << name;
  }
}

TEST(Version, HasWhatIsNotNewerThanIt) {
  const Ref<Version> version = MakeRef<Version>("nox.version.version3", 3);
  EXPECT_TRUE(version->Has(0));
  EXPECT_TRUE(version->Has(3));
  EXPECT_FALSE(version->Has(4));
}

}  // namespace
}  // namespace Orbis
