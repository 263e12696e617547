// Texts for readers of an older API version, with types made by hand as the generator would make them.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <optional>
#include <string>

#include "orbis/Engine.h"
#include "orbis/FieldAccess.h"
#include "orbis/ParseException.h"
#include "orbis/Soap.h"
#include "orbis/Types.h"
#include "orbis/Version.h"

namespace Orbis {
namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::ThrowsMessage;

FieldDescriptor Since(int since, FieldDescriptor field) {
  field.since = since;
  return field;
}

// In the API since its first version; it got its watts in version 2.
class Lamp : public DataObject {
 public:
  static const TypeDescriptor& StaticType() {
    using namespace Generated;
    static const TypeDescriptor& type =
        Complete({.name = "Lamp",
                  .source = "Lamp",
                  .base = &DataObject::StaticType(),
                  .ownFields = {Scalar<&Lamp::name>("name", FieldKind::String, Presence::Required),
                                Since(2, Scalar<&Lamp::watts>("watts", FieldKind::Int, Presence::Required))},
                  .create = &Create<Lamp>,
                  .copy = &Copy<Lamp>},
                 &CreateArray<Lamp>);
    return type;
  }
  const TypeDescriptor& GetType() const override { return StaticType(); }

  std::string name;
  std::int32_t watts = 0;
};

// New in version 3.
class CleverLamp final : public Lamp {
 public:
  static const TypeDescriptor& StaticType() {
    using namespace Generated;
    static const TypeDescriptor& type =
        Complete({.name = "CleverLamp",
                  .source = "CleverLamp",
                  .base = &Lamp::StaticType(),
                  .ownFields = {Since(
                      3, Scalar<&CleverLamp::address>("address", FieldKind::String, Presence::Optional))},
                  .create = &Create<CleverLamp>,
                  .copy = &Copy<CleverLamp>,
                  .since = 3},
                 &CreateArray<CleverLamp>);
    return type;
  }
  const TypeDescriptor& GetType() const override { return StaticType(); }

  std::optional<std::string> address;
};

class Room final : public DataObject {
 public:
  static const TypeDescriptor& StaticType() {
    using namespace Generated;
    static const TypeDescriptor& type = Complete(
        {.name = "Room",
         .source = "Room",
         .base = &DataObject::StaticType(),
         .ownFields = {Reference<&Room::lamps>("lamps", FieldKind::Object, Presence::List, &Lamp::StaticType),
                       Reference<&Room::thing>("thing", FieldKind::Any, Presence::Optional)},
         .create = &Create<Room>,
         .copy = &Copy<Room>},
        &CreateArray<Room>);
    return type;
  }
  const TypeDescriptor& GetType() const override { return StaticType(); }

  Ref<DataArray<Lamp>> lamps;
  Ref<Any> thing;
};

const TypeRegistration registration({&Lamp::StaticType, &CleverLamp::StaticType, &Room::StaticType});

const Version versionOne("test.version1", 1);
const Version versionTwo("test.version2", 2);
const Version versionThree("test.version3", 3);

Ref<CleverLamp> ACleverLamp() {
  const Ref<CleverLamp> lamp = MakeRef<CleverLamp>();
  lamp->name = "desk";
  lamp->watts = 7;
  lamp->address = "10.0.0.1";
  return lamp;
}

Ref<Room> ARoomWithACleverLamp() {
  const Ref<Room> room = MakeRef<Room>();
  room->lamps = MakeRef<DataArray<Lamp>>();
  room->lamps->Append(ACleverLamp());
  return room;
}

// What stands behind the namespaces of the root.
std::string Written(const Any& value, const Version* version) {
  std::string text;
  SerializeObjectToSoap(value, version, text);
  const std::size_t start = text.find(" xsi:type");
  return start == std::string::npos ? text : text.substr(start);
}

std::string Text(const Any& value) {
  std::string text;
  SerializeObjectToSoap(value, nullptr, text);
  return text;
}

TEST(WritingForAVersion, WritesEverythingWhenThereIsNone) {
  EXPECT_EQ(Written(*ACleverLamp(), nullptr),
            " xsi:type=\"CleverLamp\"><name>desk</name><watts>7</watts><address>10.0.0.1</address></object>");
}

TEST(WritingForAVersion, WritesEverythingForTheNewest) {
  EXPECT_EQ(Written(*ACleverLamp(), &versionThree), Written(*ACleverLamp(), nullptr));
  EXPECT_EQ(Written(*ACleverLamp(), FindVersionByTyrlName("nox.version.unstable").Get()),
            Written(*ACleverLamp(), nullptr));
}

TEST(WritingForAVersion, WritesANewerTypeAsItsNearestKnownAncestor) {
  EXPECT_EQ(Written(*ACleverLamp(), &versionTwo),
            " xsi:type=\"Lamp\"><name>desk</name><watts>7</watts></object>");
}

TEST(WritingForAVersion, LeavesNewerFieldsOut) {
  EXPECT_EQ(Written(*ACleverLamp(), &versionOne), " xsi:type=\"Lamp\"><name>desk</name></object>");
}

TEST(WritingForAVersion, DoesNotNameTheTypeWhereTheAncestorIsTheDeclaredOne) {
  EXPECT_EQ(Written(*ARoomWithACleverLamp(), &versionTwo),
            " xsi:type=\"Room\"><lamps><name>desk</name><watts>7</watts></lamps></object>");
  EXPECT_THAT(Written(*ARoomWithACleverLamp(), nullptr), HasSubstr("<lamps xsi:type=\"CleverLamp\">"));
}

TEST(WritingForAVersion, WritesAnyValuesTheSameWay) {
  const Ref<Room> room = MakeRef<Room>();
  room->thing = ACleverLamp();
  EXPECT_EQ(Written(*room, &versionOne),
            " xsi:type=\"Room\"><thing xsi:type=\"Lamp\"><name>desk</name></thing></object>");
}

TEST(WritingForAVersion, WritesAListOfANewerTypeAsOneOfItsNearestKnownAncestor) {
  const Ref<DataArray<CleverLamp>> list = MakeRef<DataArray<CleverLamp>>();
  list->Append(ACleverLamp());
  EXPECT_EQ(Written(*list, &versionOne), " xsi:type=\"LampList\"><item><name>desk</name></item></object>");
  EXPECT_EQ(Written(*list, &versionThree),
            " xsi:type=\"CleverLampList\"><item><name>desk</name><watts>7</watts>"
            "<address>10.0.0.1</address></item></object>");
}

TEST(ReadingForAVersion, ReadsBackWhatWasWrittenForIt) {
  for (const Version* version : {&versionOne, &versionTwo, &versionThree}) {
    std::string text;
    SerializeObjectToSoap(*ARoomWithACleverLamp(), version, text);
    Ref<Any> read;
    DeserializeSoapToObject(text, read, version);
    std::string again;
    SerializeObjectToSoap(*read, version, again);
    EXPECT_EQ(again, text);
  }
}

TEST(ReadingForAVersion, RefusesNewerTypes) {
  Ref<Any> read;
  EXPECT_THAT([&] { DeserializeSoapToObject(Text(*ACleverLamp()), read, &versionTwo); },
              ThrowsMessage<ParseException>(AllOf(HasSubstr("/object, line 2"), HasSubstr("'CleverLamp'"))));
  const Ref<DataArray<CleverLamp>> list = MakeRef<DataArray<CleverLamp>>();
  EXPECT_THAT([&] { DeserializeSoapToObject(Text(*list), read, &versionTwo); },
              ThrowsMessage<ParseException>(HasSubstr("'CleverLampList'")));
  EXPECT_FALSE(read);
}

TEST(ReadingForAVersion, RefusesNewerFields) {
  const Ref<Lamp> lamp = MakeRef<Lamp>();
  Ref<Any> read;
  EXPECT_THAT(
      [&] { DeserializeSoapToObject(Text(*lamp), read, &versionOne); },
      ThrowsMessage<ParseException>(AllOf(HasSubstr("/object/watts"), HasSubstr("unknown element 'watts'"))));
}

TEST(ReadingForAVersion, DemandsNoFieldThatTheVersionLacks) {
  std::string text;
  SerializeObjectToSoap(*ACleverLamp(), &versionOne, text);
  Ref<Any> read;
  DeserializeSoapToObject(text, read, &versionOne);
  EXPECT_EQ(static_cast<const Lamp&>(*read).name, "desk");
  EXPECT_THAT([&] { DeserializeSoapToObject(text, read, &versionTwo); },
              ThrowsMessage<ParseException>(HasSubstr("required element 'watts' is missing")));
}

}  // namespace
}  // namespace Orbis
