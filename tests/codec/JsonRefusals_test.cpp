// Every way in which a JSON text may be broken, and the neighbours of each that are not.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "nox/Faults.h"
#include "nox/Host.h"
#include "nox/Kova.h"
#include "orbis/Json.h"
#include "orbis/ParseException.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/Types.h"
#include "tessa/Throwable.h"
#include "tests/codec/Refusals.h"
#include "tests/codec/Samples.h"

namespace Codec {
namespace {

using namespace std::string_literals;
using Orbis::Limits;
using Orbis::Missing;

constexpr Limits untrusted = Limits::Untrusted();

std::string Groups(const std::string& members) {
  return "{\"@type\": \"KovaHostIpConfig\"" + members + "}";
}
const std::string goodGroups = ",\n\"masterGroup\": \"m\",\n\"agentGroup\": \"a\"";
std::string Size(const std::string& blockSize, const std::string& block) {
  return "{\"@type\": \"HostDiskDimensionsLba\",\n\"blockSize\": " + blockSize + ",\n\"block\": " + block +
         "\n}";
}
std::string Config(const std::string& members) {
  return "{\"@type\": \"KovaHostConfigInfo\",\n" + members + "}";
}
std::string AnyValue(const std::string& value) {
  return "{\"@type\": \"KeyAnyValue\", \"key\": \"k\",\n\"value\": " + value + "}";
}
std::string Disk(const std::string& members) {
  return "{" + members +
         "\"deviceName\": \"\", \"deviceType\": \"\", \"uuid\": \"\", \"lunType\": \"\", "
         "\"capacity\": {\"blockSize\": 1, \"block\": 1}}";
}
std::string Mapping(const std::string& ssd, const std::string& more = "") {
  return "{\"@type\": \"KovaHostDiskMapping\",\n\"ssd\": " + ssd + more + "}";
}
std::string Fault(const std::string& members) {
  return "{\"@type\": \"DiskIsUSB\",\n" + members + "}";
}

Ref<Any> ReadNamed(const std::string& text) {
  return Orbis::ReadJson(text, untrusted, nullptr);
}

class RefusedJson : public ::testing::TestWithParam<Refusal> {};

TEST_P(RefusedJson, SaysWhereAndWhy) {
  ExpectRefused(GetParam(), &ReadNamed);
}

class AcceptedJson : public ::testing::TestWithParam<Acceptance> {};

TEST_P(AcceptedJson, IsRead) {
  EXPECT_NO_THROW(EXPECT_TRUE(ReadNamed(GetParam().text))) << GetParam().text;
}

const auto nameOfRow = [](const auto& row) { return row.param.name; };

INSTANTIATE_TEST_SUITE_P(
    Syntax, RefusedJson,
    ::testing::Values(
        Refusal{"Empty", "", "(root)", 1, "unexpected end of input"},
        Refusal{"OnlyBlanks", " \n ", "(root)", 2, "unexpected end of input"},
        Refusal{"TextBehindTheValue", Groups(goodGroups) + "\nhello", "(root)", 4, "invalid literal"},
        Refusal{"ValueBehindTheValue", Groups(goodGroups) + "\n{}", "(root)", 4, "unexpected '{'"},
        Refusal{"CommaAtTheEnd", Groups(goodGroups + ","), "agentGroup", 3, "unexpected '}'"},
        Refusal{"MissingComma", Groups(",\n\"masterGroup\": \"m\"\n\"agentGroup\": \"a\""), "masterGroup", 3,
                "unexpected"},
        Refusal{"SingleQuotes", "{'@type': 1}", "(root)", 1, "invalid literal"},
        Refusal{"Comment", Groups(goodGroups + " // a comment\n"), "agentGroup", 3, "invalid literal"},
        Refusal{"NotANumber", Size("NaN", "1"), "blockSize", 2, "invalid literal"},
        Refusal{"Infinity", Size("1e999", "1"), "blockSize", 2, "number overflow"},
        Refusal{"PlusSign", Size("+1", "1"), "blockSize", 2, "invalid literal"},
        Refusal{"LeadingZero", Size("01", "1"), "blockSize", 2, "unexpected number literal"},
        Refusal{"BareLineFeedInAText", Groups(",\n\"masterGroup\": \"a\nb\""), "masterGroup", 2,
                "control character"},
        Refusal{"NulInAText", Groups(",\n\"masterGroup\": \"a\0b\""s), "masterGroup", 2, "control character"},
        Refusal{"UnknownEscape", Groups(",\n\"masterGroup\": \"\\x\""), "masterGroup", 2, "backslash"},
        Refusal{"LoneHighSurrogate", Groups(",\n\"masterGroup\": \"\\ud800\""), "masterGroup", 2,
                "surrogate"},
        Refusal{"LoneLowSurrogate", Groups(",\n\"masterGroup\": \"\\udc00\""), "masterGroup", 2, "surrogate"},
        Refusal{"LoneByte", Groups(",\n\"masterGroup\": \"\xff\""), "masterGroup", 2, "ill-formed UTF-8"},
        Refusal{"OverlongNul", Groups(",\n\"masterGroup\": \"\xc0\x80\""), "masterGroup", 2,
                "ill-formed UTF-8"},
        Refusal{"EncodedSurrogate", Groups(",\n\"masterGroup\": \"\xed\xa0\x80\""), "masterGroup", 2,
                "ill-formed UTF-8"},
        Refusal{"CutCharacter", Groups(",\n\"masterGroup\": \"\xe2\x82\""), "masterGroup", 2,
                "ill-formed UTF-8"},
        Refusal{"ByteOutsideTexts", "{\n\xff}", "(root)", 2, "invalid literal"}),
    nameOfRow);

INSTANTIATE_TEST_SUITE_P(
    Values, RefusedJson,
    ::testing::Values(
        Refusal{"NumberForText", Groups(",\n\"masterGroup\": 5"), "masterGroup", 2,
                "wanted a text, found the number 5"},
        Refusal{"NullForText", Groups(",\n\"masterGroup\": null"), "masterGroup", 2, "found null"},
        Refusal{"TextForNumber", Size("\"512\"", "1"), "blockSize", 2, "found the text '512'"},
        Refusal{"FractionForNumber", Size("1.0", "1"), "blockSize", 2, "found the number 1.0"},
        Refusal{"ExponentForNumber", Size("1e3", "1"), "blockSize", 2, "found the number 1e3"},
        Refusal{"IntOverflow", Size("2147483648", "1"), "blockSize", 2, "integer of 32 bits"},
        Refusal{"IntUnderflow", Size("-2147483649", "1"), "blockSize", 2, "integer of 32 bits"},
        Refusal{"LongOverflow", Size("1", "9223372036854775808"), "block", 3,
                "found the number 9223372036854775808"},
        Refusal{"LongUnderflow", Size("1", "-9223372036854775809"), "block", 3, "integer of 64 bits"},
        Refusal{"HugeNumber", Size("1", std::string(300, '9')), "block", 3, "integer of 64 bits"},
        Refusal{"TextForBoolean", Config("\"enabled\": \"true\""), "enabled", 2, "wanted a boolean"},
        Refusal{"NumberForBoolean", Config("\"enabled\": 1"), "enabled", 2, "found the number 1"},
        Refusal{"NullForOptional", Config("\"enabled\": null"), "enabled", 2, "found null"},
        Refusal{"NullForObject", Config("\"clusterInfo\": null"), "clusterInfo", 2,
                "wanted an object, found null"},
        Refusal{"ArrayForObject", Config("\"clusterInfo\": []"), "clusterInfo", 2, "found an array"},
        Refusal{"ObjectForList", Mapping(Disk(""), ",\n\"nonSsd\": {}"), "nonSsd", 3,
                "wanted an array, found an object"},
        Refusal{"NullForList", Mapping(Disk(""), ",\n\"nonSsd\": null"), "nonSsd", 3, "wanted an array"},
        Refusal{"NullInList", Mapping(Disk(""), ",\n\"nonSsd\": [" + Disk("") + ",\nnull]"), "nonSsd[1]", 4,
                "found null"},
        Refusal{"ListInList", Mapping(Disk(""), ",\n\"nonSsd\": [[]]"), "nonSsd[0]", 3, "found an array"},
        Refusal{"DeepInAList",
                Mapping(Disk(""),
                        ",\n\"nonSsd\": [" + Disk("") + "," + Disk("") + ",\n" + Disk("\"ssd\": 1,") + "]"),
                "nonSsd[2].ssd", 4, "wanted a boolean"},
        Refusal{"NumberInTexts", Mapping(Disk("\"operationalState\": [\"ok\", 5],")),
                "ssd.operationalState[1]", 2, "wanted a text"},
        Refusal{"Base64Junk", Mapping(Disk("\"standardInquiry\": \"Zg\",")), "ssd.standardInquiry", 2,
                "base64"},
        Refusal{"DateOfNoDay",
                AnyValue("{\"@type\": \"xsd:dateTime\", \"@value\": \"2020-02-30T00:00:00Z\"}"),
                "value.@value", 2, "wanted a date"},
        Refusal{"LongTextIsCutInTheReason", Size("\"" + std::string(100'000, 'x') + "\"", "1"), "blockSize",
                2, "xxxx"}),
    nameOfRow);

INSTANTIATE_TEST_SUITE_P(
    Structure, RefusedJson,
    ::testing::Values(
        Refusal{"MissingRequired", Groups(",\n\"masterGroup\": \"m\""), "(root)", 1,
                "required field 'agentGroup' is missing"},
        Refusal{"MissingDeepInside", Mapping("\n{}"), "ssd", 3, "required field 'deviceName' is missing"},
        Refusal{"UnknownKey", Groups(goodGroups + ",\n\"colour\": \"red\""), "colour", 4,
                "KovaHostIpConfig has none of that name"},
        Refusal{"KeyInOtherCase", Groups(goodGroups + ",\n\"Agentgroup\": \"a\""), "Agentgroup", 4,
                "unknown field"},
        Refusal{"EmptyKey", Groups(goodGroups + ",\n\"\": 1"), "''", 4, "unknown field"},
        Refusal{"KeyTwice", Groups(goodGroups + ",\n\"masterGroup\": \"m\""), "agentGroup", 4,
                "key 'masterGroup' stands twice"},
        Refusal{"KeyTwiceByAnEscape", Groups(goodGroups + ",\n\"m\\u0061sterGroup\": \"m\""), "agentGroup", 4,
                "key 'masterGroup' stands twice"},
        Refusal{"TypeTwice", Groups(goodGroups + ",\n\"@type\": \"KovaHostIpConfig\""), "agentGroup", 4,
                "key '@type' stands twice"},
        Refusal{"ValueKeyInAnObject", Groups(goodGroups + ",\n\"@value\": 1"), "@value", 4, "unknown field"}),
    nameOfRow);

INSTANTIATE_TEST_SUITE_P(
    Types, RefusedJson,
    ::testing::Values(
        Refusal{"NoType", "{\"masterGroup\": \"m\"}", "(root)", 1, "needs \"@type\""},
        Refusal{"TextAtTheTop", "\"hello\"", "(root)", 1, "wanted an object, found the text 'hello'"},
        Refusal{"ArrayAtTheTop", "[]", "(root)", 1, "wanted an object, found an array"},
        Refusal{"NullAtTheTop", "null", "(root)", 1, "found null"},
        Refusal{"UnknownType", "{\n\"@type\": \"Lamp\"}", "@type", 2, "unknown type 'Lamp'"},
        Refusal{"UnknownSimpleType", AnyValue("{\"@type\": \"xsd:float\", \"@value\": 1}"), "value.@type", 2,
                "unknown type 'xsd:float'"},
        Refusal{"SimpleTypeWithoutPrefix", AnyValue("{\"@type\": \"int\", \"@value\": 1}"), "value.@type", 2,
                "unknown type 'int'"},
        Refusal{"ListOfLists", AnyValue("{\"@type\": \"TextListList\", \"@value\": []}"), "value.@type", 2,
                "unknown type"},
        Refusal{"TypeWithBlanks", "{\"@type\": \"KovaHostIpConfig \"}", "@type", 1, "unknown type"},
        Refusal{"TypeThatIsNoText", "{\"@type\": 5}", "@type", 1, "wanted the name of a type"},
        Refusal{"AbstractType", Fault("\"cause\": {\"@type\": \"ServiceFault\"}"), "cause", 2,
                "ServiceFault has no objects"},
        Refusal{"AbstractByDeclaration", Fault("\"cause\": {}"), "cause", 2, "MethodFault has no objects"},
        Refusal{"UnrelatedType", Mapping(Disk("\"@type\": \"KovaHostIpConfig\",")), "ssd.@type", 2,
                "KovaHostIpConfig is not a HostScsiDisk"},
        Refusal{"BaseWhereDerivedIsDeclared", Mapping(Disk("\"@type\": \"HostScsiLun\",")), "ssd.@type", 2,
                "HostScsiLun is not a HostScsiDisk"},
        Refusal{"SimpleWhereAnObjectIsDeclared", Mapping("{\"@type\": \"xsd:int\", \"@value\": 1}"),
                "ssd.@type", 2, "int is not a HostScsiDisk"},
        Refusal{"BareAnyValue", AnyValue("5"), "value", 2, "wanted an object, found the number 5"},
        Refusal{"AnyWithoutType", AnyValue("{\"@value\": 5}"), "value", 2, "needs \"@type\""},
        Refusal{"AnyWithoutValue", AnyValue("{\"@type\": \"xsd:int\"}"), "value", 2,
                "exactly \"@type\" and \"@value\""},
        Refusal{"AnyWithMore", AnyValue("{\"@type\": \"xsd:int\", \"@value\": 5, \"unit\": \"m\"}"), "value",
                2, "exactly \"@type\" and \"@value\""},
        Refusal{"AnyOfAnotherKind", AnyValue("{\"@type\": \"xsd:int\", \"@value\": \"5\"}"), "value.@value",
                2, "integer of 32 bits"},
        Refusal{"AnyListOfAnotherKind", AnyValue("{\"@type\": \"TextList\", \"@value\": [\"a\", 1]}"),
                "value.@value[1]", 2, "wanted a text"}),
    nameOfRow);

INSTANTIATE_TEST_SUITE_P(
    Neighbours, AcceptedJson,
    ::testing::Values(
        Acceptance{"Plain", Groups(goodGroups)},
        Acceptance{"BlanksAround", " \n\t" + Groups(goodGroups) + "\r\n "},
        Acceptance{"ByteOrderMark", "\xef\xbb\xbf" + Groups(goodGroups)},
        Acceptance{"AnyOrder",
                   "{\"agentGroup\": \"a\", \"@type\": \"KovaHostIpConfig\", \"masterGroup\": \"m\"}"},
        Acceptance{"TypeLeftOutInside", Mapping(Disk(""))},
        Acceptance{"DeclaredTypeSaidAgain", Mapping(Disk("\"@type\": \"HostScsiDisk\","))},
        Acceptance{"DerivedWhereTheBaseIsDeclared", "{\"@type\": \"HostStorageDeviceInfo\", \"scsiLun\": [" +
                                                        Disk("\"@type\": \"HostScsiDisk\",") + "]}"},
        Acceptance{"BoundsOfNumbers", Size("-2147483648", "9223372036854775807")},
        Acceptance{"LowestLong", Size("2147483647", "-9223372036854775808")},
        Acceptance{"NegativeZero", Size("-0", "0")},
        Acceptance{"EmptyList", Mapping(Disk(""), ", \"nonSsd\": []")},
        Acceptance{"EscapedSurrogates",
                   Groups(",\"masterGroup\": \"\\ud834\\udd1e\", \"agentGroup\": \"\\u0000\"")},
        Acceptance{"SimpleAtTheTop", "{\"@type\": \"xsd:int\", \"@value\": 3}"},
        Acceptance{"ListAtTheTopByName", "{\"@type\": \"HostScsiDiskList\", \"@value\": []}"},
        Acceptance{"AbstractListByName",
                   "{\"@type\": \"MethodFaultList\", \"@value\": [" + Fault("\"device\": \"d\"") + "]}"},
        Acceptance{"ConcreteCause", Fault("\"cause\": {\"@type\": \"DiskIsUSB\"}")}),
    nameOfRow);

TEST(DeclaredJson, NeedsNoTypeAtTheTop) {
  const auto read = [](const std::string& text, const TypeDescriptor& type) {
    return Orbis::ReadJson(text, untrusted, &type);
  };
  const TypeDescriptor& groups = Nox::Kova::Host::IpConfig::StaticType();
  EXPECT_EQ(&read("{\"masterGroup\": \"m\", \"agentGroup\": \"a\"}", groups)->GetType(), &groups);
  EXPECT_EQ(&read("[]", *groups.array)->GetType(), groups.array);
  EXPECT_EQ(&read("[\"a\"]", Orbis::TextList::StaticType())->GetType(), &Orbis::TextList::StaticType());
  EXPECT_EQ(
      &read("{\"@type\": \"xsd:int\", \"@value\": 3}", Orbis::Boxed<std::int32_t>::StaticType())->GetType(),
      &Orbis::Boxed<std::int32_t>::StaticType());
}

TEST(DeclaredJson, MustBeOfTheDeclaredType) {
  const auto refuse = [](const Refusal& refusal, const TypeDescriptor& type) {
    ExpectRefused(refusal, [&](const std::string& text) { return Orbis::ReadJson(text, untrusted, &type); });
  };
  const TypeDescriptor& groups = Nox::Kova::Host::IpConfig::StaticType();
  refuse({"object", Fault("\"device\": \"d\""), "@type", 1, "DiskIsUSB is not a KovaHostIpConfig"}, groups);
  refuse({"object for list", Groups(goodGroups), "(root)", 1, "wanted an array"}, *groups.array);
  refuse({"list for object", "[]", "(root)", 1, "wanted an object"}, groups);
  refuse({"element", "[\n" + Fault("\"device\": \"d\"") + "]", "[0].@type", 2, "is not a"}, *groups.array);
  refuse({"simple", "[]", "(root)", 1, "wanted an object"}, Orbis::Boxed<std::int32_t>::StaticType());
}

TEST(MissingFields, TakeTheValuesOfANewObjectWhenThatIsWanted) {
  const Ref<Any> read = Orbis::ReadJson("{\"canonicalName\": \"naa.1\"}", untrusted,
                                        &Nox::Host::ScsiDisk::StaticType(), {.missing = Missing::Default});
  const auto& disk = static_cast<const Nox::Host::ScsiDisk&>(*read);
  EXPECT_EQ(disk.GetCanonicalName(), "naa.1");
  EXPECT_EQ(disk.GetUuid(), "");
  ASSERT_TRUE(disk.GetCapacity());
  EXPECT_EQ(disk.GetCapacity()->GetBlock(), 0);
}

TEST(MissingFields, AreTheOnlyThingThatIsForgiven) {
  ExpectRefused({"unknown key", "{\"colour\": \"red\"}", "colour", 1, "unknown field"},
                [](const std::string& text) {
                  return Orbis::ReadJson(text, untrusted, &Nox::Host::ScsiDisk::StaticType(),
                                         {.missing = Missing::Default});
                });
}

class CutJson : public ::testing::TestWithParam<std::string> {};

TEST_P(CutJson, IsRefusedWhereverItIsCut) {
  const Ref<Any> sample = MakeSample(*Orbis::FindType(GetParam()));
  std::string text;
  Orbis::WriteJson(*sample, text);
  ExpectRefusedWhenCutOff(
      text, [&](const std::string& part) { return Orbis::ReadJson(part, untrusted, &sample->GetType()); });
}

INSTANTIATE_TEST_SUITE_P(Types, CutJson, ::testing::ValuesIn(TypeNames()),
                         [](const auto& row) { return row.param; });

std::string ChainOfCauses(std::size_t faults) {
  return Repeated("{\"@type\":\"DiskIsUSB\",\"cause\":", faults - 1) + "{\"@type\":\"DiskIsUSB\"}" +
         Repeated("}", faults - 1);
}

TEST(JsonBounds, OfDepthHoldOnBothSides) {
  const std::size_t deepest = untrusted.depth;
  const std::string path = "cause" + Repeated(".cause", deepest - 1);
  EXPECT_TRUE(ReadNamed(ChainOfCauses(deepest)));
  ExpectRefused({"one deeper", ChainOfCauses(deepest + 1), path, 1, "deeper than 64"}, &ReadNamed);
  ExpectRefused({"far deeper", ChainOfCauses(200'000), path, 1, "deeper than 64"}, &ReadNamed);
  ExpectRefused(
      {"arrays never closed", std::string(200'000, '['), Repeated("[0]", deepest), 1, "deeper than 64"},
      &ReadNamed);
}

TEST(JsonBounds, OfTextsAndKeysHoldOnBothSides) {
  const auto master = [](std::size_t size) {
    return Groups(",\"masterGroup\": \"" + std::string(size, 'x') + "\", \"agentGroup\": \"a\"");
  };
  EXPECT_TRUE(ReadNamed(master(untrusted.textBytes)));
  ExpectRefused({"text", master(untrusted.textBytes + 1), "masterGroup", 1, "text longer than 1048576"},
                &ReadNamed);
  const auto withKey = [](std::size_t size) { return Groups(",\"" + std::string(size, 'k') + "\": 1"); };
  ExpectRefused({"key", withKey(untrusted.nameBytes + 1), "@type", 1, "key longer than 256"}, &ReadNamed);
  EXPECT_THAT([&] { ReadNamed(withKey(untrusted.nameBytes)); },
              ::testing::ThrowsMessage<Orbis::ParseException>(::testing::HasSubstr("is missing")));
}

TEST(JsonBounds, OfValuesHoldOnBothSides) {
  const auto list = [](std::size_t items) {
    std::string text = "[" + Repeated("\"\",", items);
    text.back() = ']';
    return text;
  };
  const auto read = [](const std::string& text) {
    return Orbis::ReadJson(text, untrusted, &Orbis::TextList::StaticType());
  };
  EXPECT_TRUE(read(list(untrusted.elements - 1)));
  EXPECT_THAT([&] { read(list(untrusted.elements)); }, ::testing::ThrowsMessage<Orbis::ParseException>(
                                                           ::testing::HasSubstr("more than 500000 values")));
}

TEST(JsonBounds, OfTheDocumentHoldOnBothSides) {
  const std::string text = Groups(goodGroups);
  const std::size_t room = untrusted.documentBytes - text.size();
  EXPECT_TRUE(ReadNamed(text + std::string(room, ' ')));
  ExpectRefused({"larger", text + std::string(room + 1, ' '), "(root)", 0, "larger than 16777216"},
                &ReadNamed);
}

TEST(WriteJson, AppendsAndCutsItsTextBackWhenItThrows) {
  std::string text = "before";
  const Ref<Orbis::DataArray<Nox::Host::ScsiDisk>> list =
      Orbis::MakeRef<Orbis::DataArray<Nox::Host::ScsiDisk>>();
  Orbis::WriteJson(*list, text);
  EXPECT_EQ(text, "before[]");
  list->Append(Orbis::MakeRef<Nox::Host::ScsiDisk>());
  list->Append(nullptr);
  EXPECT_THAT(
      [&] { Orbis::WriteJson(*list, text); },
      ::testing::ThrowsMessage<Tessa::NotInitializedException>(::testing::HasSubstr("HostScsiDiskList")));
  EXPECT_EQ(text, "before[]");
  EXPECT_THAT(
      [&] { Orbis::WriteJson(*Orbis::MakeRef<Orbis::KeyAnyValue>(), text); },
      ::testing::ThrowsMessage<Tessa::NotInitializedException>(::testing::HasSubstr("KeyAnyValue.value")));
  EXPECT_EQ(text, "before[]");
}

}  // namespace
}  // namespace Codec
