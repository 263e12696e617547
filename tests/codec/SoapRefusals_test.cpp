// Every way in which a SOAP text may be broken, and the neighbours of each that are not.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "nox/Faults.h"
#include "nox/Host.h"
#include "nox/Kova.h"
#include "orbis/ParseException.h"
#include "orbis/Soap.h"
#include "orbis/TypeDescriptor.h"
#include "tests/codec/Refusals.h"
#include "tests/codec/Samples.h"

namespace Codec {
namespace {

using namespace std::string_literals;
using Orbis::Limits;

const std::string xsd = "http://www.w3.org/2001/XMLSchema";
const std::string xsi = "http://www.w3.org/2001/XMLSchema-instance";
const std::string namespaces = "xmlns=\"urn:nox\" xmlns:xsd=\"" + xsd + "\" xmlns:xsi=\"" + xsi + "\"";

// A text with that xsi:type and content; the content starts on line 1.
std::string Of(const std::string& type, const std::string& content, const std::string& attributes = "") {
  return "<object " + namespaces + " xsi:type=\"" + type + "\"" + attributes + ">" + content + "</object>";
}

// Multicast groups: two required texts.
std::string Groups(const std::string& content) {
  return Of("KovaHostIpConfig", content);
}
const std::string goodGroups = "\n<masterGroup>m</masterGroup>\n<agentGroup>a</agentGroup>\n";
std::string Master(const std::string& value) {
  return Groups("\n<masterGroup>" + value + "</masterGroup>\n<agentGroup>a</agentGroup>");
}
// An int and a long.
std::string Size(const std::string& blockSize, const std::string& block) {
  return Of("HostDiskDimensionsLba",
            "\n<blockSize>" + blockSize + "</blockSize>\n<block>" + block + "</block>");
}
// An optional boolean.
std::string Enabled(const std::string& element) {
  return Of("KovaHostConfigInfo", "\n" + element);
}
// A value of any type; `value` is the whole element.
std::string AnyValue(const std::string& value) {
  return Of("KeyAnyValue", "<key>k</key>\n" + value);
}
std::string Date(const std::string& text) {
  return AnyValue("<value xsi:type=\"xsd:dateTime\">" + text + "</value>");
}
std::string Base64(const std::string& text) {
  return AnyValue("<value xsi:type=\"xsd:base64Binary\">" + text + "</value>");
}
// A disk as the element of that name.
std::string Disk(const std::string& element, const std::string& type = "") {
  return "<" + element + (type.empty() ? "" : " xsi:type=\"" + type + "\"") +
         "><deviceName/><deviceType/><uuid/><lunType/><capacity><blockSize>1</blockSize><block>1</block></"
         "capacity></" +
         element + ">";
}
std::string Lun(const std::string& element, const std::string& type = "") {
  return "<" + element + (type.empty() ? "" : " xsi:type=\"" + type + "\"") +
         "><deviceName/><deviceType/><uuid/><lunType/></" + element + ">";
}
std::string Mapping(const std::string& ssd) {
  return Of("KovaHostDiskMapping", "\n" + ssd);
}
std::string Cause(const std::string& attributes) {
  return Of("DiskIsUSB", "\n<cause" + attributes + "></cause>");
}

Ref<Any> ReadUntrusted(const std::string& text) {
  return Orbis::ReadSoap(text, Limits::Untrusted());
}
Ref<Any> ReadOwn(const std::string& text) {
  Ref<Any> value;
  Orbis::DeserializeSoapToObject(text, value);
  return value;
}

class RefusedSoap : public ::testing::TestWithParam<Refusal> {};

TEST_P(RefusedSoap, SaysWhereAndWhy) {
  ExpectRefused(GetParam(), &ReadUntrusted);
  ExpectRefused(GetParam(), &ReadOwn);
}

class AcceptedSoap : public ::testing::TestWithParam<Acceptance> {};

TEST_P(AcceptedSoap, IsRead) {
  EXPECT_NO_THROW(EXPECT_TRUE(ReadUntrusted(GetParam().text))) << GetParam().text;
  EXPECT_NO_THROW(EXPECT_TRUE(ReadOwn(GetParam().text)));
}

const auto nameOfRow = [](const auto& row) { return row.param.name; };

INSTANTIATE_TEST_SUITE_P(
    NamespacesAndTypes, RefusedSoap,
    ::testing::Values(
        Refusal{"WrongDefaultNamespace", "<object xmlns=\"urn:other\"/>", "/object", 1,
                "in namespace 'urn:nox'"},
        Refusal{"NoNamespace", "<object/>", "/object", 1, "in namespace 'urn:nox'"},
        Refusal{"WrongRoot", "<thing xmlns=\"urn:nox\"/>", "/thing", 1, "must be 'object'"},
        Refusal{"RootWithoutType", "<object xmlns=\"urn:nox\"/>", "/object", 1, "needs xsi:type"},
        Refusal{"ReboundXsi",
                "<object xmlns=\"urn:nox\" xmlns:xsi=\"urn:other\" xsi:type=\"KovaHostIpConfig\">" +
                    goodGroups + "</object>",
                "/object", 1, "\"type\""},
        Refusal{"ReboundXsiInside",
                Groups("\n<masterGroup xmlns:xsi=\"urn:other\" xsi:type=\"xsd:string\"/>\n<agentGroup/>"),
                "/object/masterGroup", 2, "\"type\""},
        Refusal{"TypeOfAnUndeclaredPrefix", Of("other:KovaHostIpConfig", goodGroups), "/object", 1,
                "\"other\""},
        Refusal{"TypeOfTheSchemaNamespace", Of("xsd:KovaHostIpConfig", goodGroups), "/object", 1,
                "unknown type 'KovaHostIpConfig' in namespace '" + xsd + "'"},
        Refusal{"SimpleTypeOfOurNamespace", Of("int", "3"), "/object", 1,
                "unknown type 'int' in namespace 'urn:nox'"},
        Refusal{"UnknownType", Of("KovaHostIpConfigs", goodGroups), "/object", 1,
                "unknown type 'KovaHostIpConfigs'"},
        Refusal{"TypeInOtherCase", Of("kovaHostIpConfig", goodGroups), "/object", 1, "unknown type"},
        Refusal{"BaseOfAllTypes", Of("DataObject", ""), "/object", 1, "unknown type 'DataObject'"},
        Refusal{"AnyType", Of("xsd:anyType", ""), "/object", 1, "unknown type 'anyType'"},
        Refusal{"UnrelatedType", Mapping(Disk("ssd", "KovaHostIpConfig")), "/object/ssd", 2,
                "KovaHostIpConfig is not a HostScsiDisk"},
        Refusal{"BaseWhereDerivedIsDeclared", Mapping(Lun("ssd", "HostScsiLun")), "/object/ssd", 2,
                "HostScsiLun is not a HostScsiDisk"},
        Refusal{"ListWhereAnObjectIsDeclared", Mapping(Disk("ssd", "HostScsiDiskList")), "/object/ssd", 2,
                "HostScsiDiskList is not a HostScsiDisk"},
        Refusal{"SimpleWhereAnObjectIsDeclared", Mapping("<ssd xsi:type=\"xsd:string\">x</ssd>"),
                "/object/ssd", 2, "string is not a HostScsiDisk"},
        Refusal{"AbstractRoot", Of("MethodFault", ""), "/object", 1, "MethodFault has no objects"},
        Refusal{"AbstractByName", Cause(" xsi:type=\"ServiceFault\""), "/object/cause", 2,
                "ServiceFault has no objects"},
        Refusal{"AbstractByDeclaration", Cause(""), "/object/cause", 2, "MethodFault has no objects"},
        Refusal{"AbstractItem", Of("MethodFaultList", "\n<item/>"), "/object/item", 2,
                "MethodFault has no objects"},
        Refusal{"ListOfLists", Of("TextListList", ""), "/object", 1, "'TextListList'"},
        Refusal{"ListOfNothing", Of("List", ""), "/object", 1, "unknown type 'List'"},
        Refusal{"ListOfASimpleType", Of("intList", ""), "/object", 1, "unknown type 'intList'"},
        Refusal{"BlankBeforeType", Of(" KovaHostIpConfig", goodGroups), "/object", 1, "blank"},
        Refusal{"BlankBehindType", Of("KovaHostIpConfig ", goodGroups), "/object", 1, "blank"},
        Refusal{"BlankInsideType", Of("KovaHost IpConfig", goodGroups), "/object", 1, "blank"},
        Refusal{"LineFeedBehindType", Of("KovaHostIpConfig&#10;", goodGroups), "/object", 1, "blank"},
        Refusal{"EmptyType", Of("", goodGroups), "/object", 1, "empty"},
        Refusal{"TypeOfTwoPrefixes", Of("xsd:xsd:string", "x"), "/object", 1, "not a qualified name"},
        Refusal{"TypeWithoutName", Of("xsd:", "x"), "/object", 1, "not a qualified name"},
        Refusal{"FieldOfAnotherNamespace", Groups("\n<x:masterGroup xmlns:x=\"urn:other\"/>\n<agentGroup/>"),
                "/object/masterGroup", 2, "'masterGroup' in namespace 'urn:other'"},
        Refusal{"FieldOfNoNamespace", Groups("\n<masterGroup xmlns=\"\"/>\n<agentGroup/>"),
                "/object/masterGroup", 2, "in namespace ''"},
        Refusal{"AnyWithoutType", AnyValue("<value>3</value>"), "/object/value", 2, "needs xsi:type"},
        Refusal{"AnyOfAnAbstractType", AnyValue("<value xsi:type=\"MethodFault\"/>"), "/object/value", 2,
                "has no objects"},
        Refusal{"TextFieldOfAnotherSimpleType",
                Groups("\n<masterGroup xsi:type=\"xsd:int\">3</masterGroup><agentGroup/>"),
                "/object/masterGroup", 2, "type int does not fit"},
        Refusal{"TextFieldOfAnObjectType",
                Groups("\n<masterGroup xsi:type=\"KovaHostIpConfig\"/><agentGroup/>"), "/object/masterGroup",
                2, "type KovaHostIpConfig does not fit"}),
    nameOfRow);

INSTANTIATE_TEST_SUITE_P(
    Values, RefusedSoap,
    ::testing::Values(
        Refusal{"IntOverflow", Size("2147483648", "1"), "/object/blockSize", 2, "'2147483648'"},
        Refusal{"IntUnderflow", Size("-2147483649", "1"), "/object/blockSize", 2, "integer of 32 bits"},
        Refusal{"IntJunk", Size("12x", "1"), "/object/blockSize", 2, "'12x' is not an integer"},
        Refusal{"IntEmpty", Size("", "1"), "/object/blockSize", 2, "'' is not an integer"},
        Refusal{"IntBlank", Size(" 12", "1"), "/object/blockSize", 2, "' 12' is not an integer"},
        Refusal{"IntFraction", Size("1.0", "1"), "/object/blockSize", 2, "'1.0'"},
        Refusal{"LongOverflow", Size("1", "9223372036854775808"), "/object/block", 3, "integer of 64 bits"},
        Refusal{"LongJunk", Size("1", "many"), "/object/block", 3, "'many'"},
        Refusal{"BooleanInOtherCase", Enabled("<enabled>True</enabled>"), "/object/enabled", 2,
                "'True' is not a boolean"},
        Refusal{"BooleanInWords", Enabled("<enabled>yes</enabled>"), "/object/enabled", 2, "'yes'"},
        Refusal{"BooleanEmpty", Enabled("<enabled/>"), "/object/enabled", 2, "'' is not a boolean"},
        Refusal{"Base64Cut", Base64("Zm9"), "/object/value", 2, "base64"},
        Refusal{"Base64Unpadded", Base64("Zg"), "/object/value", 2, "base64"},
        Refusal{"Base64Blank", Base64("Zm 9v"), "/object/value", 2, "base64"},
        Refusal{"Base64Junk", Base64("Zm9*"), "/object/value", 2, "'Zm9*' is not base64"},
        Refusal{"DateOfNoDay", Date("2020-02-30T00:00:00Z"), "/object/value", 2, "is not a date"},
        Refusal{"DateWithoutZone", Date("2020-01-31T00:00:00"), "/object/value", 2, "is not a date"},
        Refusal{"DateOfTooFineASecond", Date("2020-01-31T00:00:00.1234567Z"), "/object/value", 2,
                "is not a date"},
        Refusal{"DateEmpty", Date(""), "/object/value", 2, "is not a date"},
        Refusal{"LongJunkIsCutInTheReason", Size(std::string(100'000, 'x'), "1"), "/object/blockSize", 2,
                "xxxx"}),
    nameOfRow);

INSTANTIATE_TEST_SUITE_P(
    Structure, RefusedSoap,
    ::testing::Values(
        Refusal{"MissingFirst", Groups("\n<agentGroup>a</agentGroup>"), "/object/agentGroup", 2,
                "required element 'masterGroup' is missing, found 'agentGroup'"},
        Refusal{"MissingLast", Groups("\n<masterGroup>m</masterGroup>"), "/object", 1,
                "required element 'agentGroup' is missing, found the end"},
        Refusal{"MissingAll", Groups(""), "/object", 1, "'masterGroup' is missing"},
        Refusal{"MissingDeepInside", Mapping("<ssd><deviceName/>\n<deviceType/>\n</ssd>"), "/object/ssd", 2,
                "'uuid' is missing"},
        Refusal{"RepeatedScalar", Groups(goodGroups + "<agentGroup>again</agentGroup>"),
                "/object/agentGroup[1]", 4, "'agentGroup' is repeated or out of order"},
        Refusal{"RepeatedObject", Mapping(Disk("ssd") + "\n" + Disk("ssd")), "/object/ssd[1]", 3,
                "'ssd' is repeated"},
        Refusal{"OptionalOutOfOrder",
                Of("KovaHostConfigInfoClusterInfo", "\n<nodeUuid>n</nodeUuid>\n<clusterUuid>c</clusterUuid>"),
                "/object/clusterUuid", 3, "'clusterUuid' is repeated or out of order"},
        Refusal{"DerivedBeforeBase", Of("DiskIsUSB", "\n<device>d</device>\n<cause xsi:type=\"DiskIsUSB\"/>"),
                "/object/cause", 3, "out of order"},
        Refusal{"ListTornApart",
                Of("KovaHostDiskMapResult",
                   "\n<mapping>" + Disk("ssd") + "</mapping>\n<diskResult>" + Disk("disk") +
                       "<state/></diskResult>\n<error xsi:type=\"DiskIsUSB\"/>\n<diskResult>" + Disk("disk") +
                       "<state/></diskResult>"),
                "/object/diskResult[1]", 5, "'diskResult' is repeated or out of order"},
        Refusal{"UnknownElement", Groups(goodGroups + "<colour>red</colour>"), "/object/colour", 4,
                "unknown element 'colour'"},
        Refusal{"ElementOfTheDerivedType", Of("HostDevice", "<deviceName/><deviceType/>\n<uuid/>"),
                "/object/uuid", 2, "HostDevice has no such field"},
        Refusal{"ElementInASimpleValue", Master("<b>bold</b>"), "/object/masterGroup/b", 2,
                "unexpected element inside a simple value"},
        Refusal{"ElementInAnyText", AnyValue("<value xsi:type=\"xsd:string\"><b/></value>"),
                "/object/value/b", 2, "unexpected element"},
        Refusal{"TextBeforeElements", Groups("\nhello" + goodGroups), "/object", 3, "text"},
        Refusal{"TextBetweenElements", Groups("\n<masterGroup/>\nhello<agentGroup/>"), "/object", 3, "text"},
        Refusal{"TextBehindElements", Groups("\n<masterGroup/>\n<agentGroup/>hello"), "/object", 3, "text"},
        Refusal{"TextInsteadOfElements", Of("KovaHostConfigInfo", "hello"), "/object", 1,
                "unexpected text 'hello'"},
        Refusal{"TextInAList", Of("HostScsiDiskList", "hello"), "/object", 1, "unexpected text 'hello'"},
        Refusal{"TextInATextList", Of("TextList", "hello"), "/object", 1, "unexpected text 'hello'"},
        Refusal{"ListOfAnotherElement", Of("TextList", "\n<item/>\n<items/>"), "/object/items", 3,
                "unexpected element 'items'"},
        Refusal{"ItemOfAnotherNamespace", Of("TextList", "\n<item xmlns=\"urn:other\"/>"), "/object/item", 2,
                "in a list"},
        Refusal{"NilOnRequired", Groups("\n<masterGroup xsi:nil=\"true\"/>\n<agentGroup/>"),
                "/object/masterGroup", 2, "xsi:nil"},
        Refusal{"NilOnOptional", Enabled("<enabled xsi:nil=\"1\"/>"), "/object/enabled", 2, "xsi:nil"},
        Refusal{"NilOnRoot", Of("KovaHostConfigInfo", "", " xsi:nil=\"true\""), "/object", 1, "xsi:nil"},
        Refusal{"NilOnAnItem", Of("TextList", "\n<item xsi:nil=\"true\"/>"), "/object/item", 2, "xsi:nil"},
        Refusal{"NilOnAnyValue", AnyValue("<value xsi:type=\"xsd:int\" xsi:nil=\"true\"/>"), "/object/value",
                2, "xsi:nil"},
        Refusal{"NilNeitherTrueNorFalse", Enabled("<enabled xsi:nil=\"maybe\">true</enabled>"),
                "/object/enabled", 2, "xsi:nil"},
        Refusal{"HrefAttribute", Mapping("<ssd href=\"#1\"/>"), "/object/ssd", 2, "\"href\""},
        Refusal{"IdAttribute", Groups("\n<masterGroup id=\"1\"/>\n<agentGroup/>"), "/object/masterGroup", 2,
                "\"id\""},
        Refusal{"LanguageAttribute", Groups("\n<masterGroup xml:lang=\"de\"/>\n<agentGroup/>"),
                "/object/masterGroup", 2, "\"lang\""},
        Refusal{"AttributeOnRoot", Of("KovaHostConfigInfo", "", " version=\"1\""), "/object", 1,
                "\"version\""},
        Refusal{"CommentInsideAValue", Master("na<!-- x -->a.1"), "/object/masterGroup", 2, "comment"},
        Refusal{"CdataBesideText", Master("na<![CDATA[a]]>.1"), "/object/masterGroup", 2, "CDATA"}),
    nameOfRow);

INSTANTIATE_TEST_SUITE_P(
    Documents, RefusedSoap,
    ::testing::Values(
        Refusal{"Empty", "", "/", 1, "no element found"},
        Refusal{"OnlyBlanks", "\n\n", "/", 3, "no element found"},
        Refusal{"OnlyADeclaration", "<?xml version=\"1.0\"?>", "/", 1, "no element found"},
        Refusal{"TwoRoots", Groups(goodGroups) + "\n<object/>", "/", 5, "junk after document element"},
        Refusal{"TextBehindTheRoot", Groups(goodGroups) + "\nhello", "/", 5, "junk after document element"},
        Refusal{"TextBeforeTheRoot", "hello" + Groups(goodGroups), "/", 1, "not well-formed"},
        Refusal{"MismatchedTag", Groups("\n<masterGroup></agentGroup>"), "/object/masterGroup", 2,
                "mismatched tag"},
        Refusal{"DuplicateAttribute", "<object xmlns=\"urn:nox\" a=\"1\" a=\"2\"/>", "/", 1,
                "duplicate attribute"},
        Refusal{"SameAttributeThroughTwoPrefixes",
                "<object xmlns=\"urn:nox\" xmlns:a=\"" + xsi + "\" xmlns:b=\"" + xsi +
                    "\" a:type=\"xsd:int\" b:type=\"xsd:int\"/>",
                "/", 1, "duplicate attribute"},
        Refusal{"UndeclaredPrefix", Groups("\n<x:masterGroup/>"), "/object", 2, "unbound prefix"},
        Refusal{"UnquotedAttribute", "<object xmlns=urn:nox/>", "/", 1, "not well-formed"},
        Refusal{"MarkupInAnAttribute", "<object xmlns=\"urn:<nox\"/>", "/", 1, "not well-formed"},
        Refusal{"EndOfCdataInText", Master("a]]>b"), "/object/masterGroup", 2, "not well-formed"},
        Refusal{"DashesInAComment", Groups("\n<!-- a -- b -->" + goodGroups), "/object", 2,
                "not well-formed"},
        Refusal{"MixedQuotesInTheDeclaration", "<?xml version=\"1.0'?>" + Groups(goodGroups), "/", 1,
                "XML declaration not well-formed"},
        Refusal{"NoNameCharacter", Groups("\n<master*Group/>"), "/object", 2, "not well-formed"},
        Refusal{"ProcessingInstruction", Groups("\n<?run it?>" + goodGroups), "/object", 2,
                "processing instruction"},
        Refusal{"AnotherVersionOfXml", "<?xml version=\"1.1\"?>" + Groups(goodGroups), "/", 1, "XML 1.0"},
        Refusal{"BareDoctype", "<!DOCTYPE object>" + Groups(goodGroups), "/", 1, "DOCTYPE"},
        Refusal{"InternalEntity", "<!DOCTYPE object [<!ENTITY e \"x\">]>" + Master("&e;"), "/", 1, "DOCTYPE"},
        Refusal{"ExternalEntity",
                "<!DOCTYPE object [<!ENTITY e SYSTEM \"file:///etc/hostname\">]>" + Master("&e;"), "/", 1,
                "DOCTYPE"},
        Refusal{"ParameterEntity",
                "<!DOCTYPE object [<!ENTITY % p SYSTEM \"http://127.0.0.1:9/\"> %p;]>" + Master(""), "/", 1,
                "DOCTYPE"},
        Refusal{"ExponentialEntity",
                "<!DOCTYPE o [<!ENTITY a \"aaaaaaaaaa\"><!ENTITY b \"&a;&a;&a;&a;&a;&a;&a;&a;&a;&a;\">"
                "<!ENTITY c \"&b;&b;&b;&b;&b;&b;&b;&b;&b;&b;\">]>" +
                    Master("&c;"),
                "/", 1, "DOCTYPE"},
        Refusal{"UndefinedEntity", Master("&e;"), "/object/masterGroup", 2, "undefined entity"}),
    nameOfRow);

INSTANTIATE_TEST_SUITE_P(
    Bytes, RefusedSoap,
    ::testing::Values(
        Refusal{"OverlongNul", Master("\xc0\x80"), "/object/masterGroup", 2, "not well-formed"},
        Refusal{"LoneByte", Master("\xff"), "/object/masterGroup", 2, "not well-formed"},
        Refusal{"EncodedSurrogate", Master("\xed\xa0\x80"), "/object/masterGroup", 2, "not well-formed"},
        Refusal{"CutCharacter", Master("\xe2\x82"), "/object/masterGroup", 2, "not well-formed"},
        Refusal{"NonCharacter", Master("\xef\xbf\xbe"), "/object/masterGroup", 2, "not well-formed"},
        Refusal{"ControlCharacter", Master("\x01"), "/object/masterGroup", 2, "not well-formed"},
        Refusal{"NulInText", Master("a\0b"s), "/", 2, "NUL"},
        Refusal{"NulBehindTheRoot", Groups(goodGroups) + "\0"s, "/", 4, "NUL"},
        Refusal{"ReferenceToNul", Master("&#0;"), "/object/masterGroup", 2, "reference to invalid character"},
        Refusal{"ReferenceToAControlCharacter", Master("&#x1;"), "/object/masterGroup", 2,
                "reference to invalid character"},
        Refusal{"ReferenceToASurrogate", Master("&#xD800;"), "/object/masterGroup", 2,
                "reference to invalid character"},
        Refusal{"ReferenceBeyondUnicode", Master("&#x110000;"), "/object/masterGroup", 2,
                "reference to invalid character"},
        Refusal{"Utf16", "\xff\xfe<\0"s, "/", 0, "UTF-16"},
        Refusal{"DeclaredUtf7", "<?xml version=\"1.0\" encoding=\"utf-7\"?>" + Groups(goodGroups), "/", 1,
                "UTF-8"},
        Refusal{"DeclaredLatin1", "<?xml version=\"1.0\" encoding=\"iso-8859-1\"?>" + Master("\xe9"), "/", 1,
                "UTF-8"}),
    nameOfRow);

INSTANTIATE_TEST_SUITE_P(
    Neighbours, AcceptedSoap,
    ::testing::Values(
        Acceptance{"Plain", Groups(goodGroups)},
        Acceptance{"WithDeclaration",
                   "<?xml version=\"1.0\" encoding=\"utf-8\"?>\n" + Groups(goodGroups) + "\n"},
        Acceptance{"WithByteOrderMark", "\xef\xbb\xbf" + Groups(goodGroups)},
        Acceptance{"OtherPrefixes",
                   "<n:object xmlns:n=\"urn:nox\" xmlns:i=\"" + xsi +
                       "\" i:type=\"n:KovaHostIpConfig\"><n:masterGroup/><n:agentGroup/></n:object>"},
        Acceptance{"PrefixDeclaredWhereItIsUsed",
                   AnyValue("<value xmlns:q=\"" + xsd + "\" xsi:type=\"q:int\">3</value>")},
        Acceptance{"DerivedWhereTheBaseIsDeclared",
                   Of("HostStorageDeviceInfo", Disk("scsiLun", "HostScsiDisk") + Lun("scsiLun"))},
        Acceptance{"TheDeclaredTypeSaidAgain", Mapping(Disk("ssd", "HostScsiDisk"))},
        Acceptance{"TextSaidToBeText",
                   Groups("<masterGroup xsi:type=\"xsd:string\">m</masterGroup><agentGroup/>")},
        Acceptance{"ConcreteCause", Cause(" xsi:type=\"DiskIsUSB\"")},
        Acceptance{"ListOfAnAbstractType", Of("MethodFaultList", "")},
        Acceptance{"OptionalLeftOut", Of("KovaHostConfigInfo", "")},
        Acceptance{"ListOfOne", Mapping(Disk("ssd") + Disk("nonSsd"))},
        Acceptance{"NilSaidToBeFalse", Enabled("<enabled xsi:nil=\"false\">true</enabled>")},
        Acceptance{"CommentBetweenElements",
                   Groups("<!-- a --><masterGroup/><!-- b --><agentGroup/><!-- c -->")},
        Acceptance{"CdataAsAWholeValue", Master("<![CDATA[<naa.1>]]>")},
        Acceptance{"References", Master("&lt;&amp;&#65;&#x10FFFF;&quot;")},
        Acceptance{"BoundsOfNumbers", Size("2147483647", "-9223372036854775808")},
        Acceptance{"SignedAndPadded", Size("+7", "007")},
        Acceptance{"BooleanAsDigit", Enabled("<enabled>1</enabled>")},
        Acceptance{"DateInAZone", Date("2020-01-31T12:00:00.123456+14:00")},
        Acceptance{"EmptyBase64", Base64("")}, Acceptance{"ReplacementCharacter", Master("\xef\xbf\xbd")},
        Acceptance{"LastCharacter", Master("\xf4\x8f\xbf\xbf")}),
    nameOfRow);

TEST(SoapText, KeepsBlanksOfAText) {
  const Ref<Any> value = ReadUntrusted(Master(" \n\t "));
  EXPECT_EQ(static_cast<const Nox::Kova::Host::IpConfig&>(*value).GetMasterGroup(), " \n\t ");
}

class CutSoap : public ::testing::TestWithParam<std::string> {};

TEST_P(CutSoap, IsRefusedWhereverItIsCut) {
  std::string text;
  Orbis::SerializeObjectToSoap(*MakeSample(*Orbis::FindType(GetParam())), nullptr, text);
  ExpectRefusedWhenCutOff(text, &ReadUntrusted);
}

INSTANTIATE_TEST_SUITE_P(Types, CutSoap, ::testing::ValuesIn(TypeNames()),
                         [](const auto& row) { return row.param; });

// A fault with so many causes behind it.
std::string ChainOfCauses(std::size_t causes) {
  return Of("DiskIsUSB", Repeated("<cause xsi:type=\"DiskIsUSB\">", causes) + Repeated("</cause>", causes));
}

std::string PathOfCauses(std::size_t causes) {
  return "/object" + Repeated("/cause", causes);
}

TEST(SoapBounds, OfDepthHoldOnBothSides) {
  const std::size_t deepest = Limits::Untrusted().depth - 1;  // the root is one
  EXPECT_TRUE(ReadUntrusted(ChainOfCauses(deepest)));
  ExpectRefused({"one deeper", ChainOfCauses(deepest + 1), PathOfCauses(deepest), 1, "deeper than 64"},
                &ReadUntrusted);
  ExpectRefused({"far deeper", ChainOfCauses(5'000), PathOfCauses(deepest), 1, "deeper than 64"},
                &ReadUntrusted);
  const std::string open = "<object " + namespaces + " xsi:type=\"DiskIsUSB\">" +
                           Repeated("<cause xsi:type=\"DiskIsUSB\">", 200'000);
  ExpectRefused({"never closed", open, PathOfCauses(deepest), 1, "deeper than 64"}, &ReadUntrusted);
  ExpectRefused({"own output", open, PathOfCauses(Limits::OwnOutput().depth - 1), 1, "deeper than 512"},
                &ReadOwn);
}

TEST(SoapBounds, OfDepthHoldForValuesOfAnyType) {
  const auto nested = [](std::size_t values) {
    return Of("KeyAnyValue", Repeated("<key/><value xsi:type=\"KeyAnyValue\">", values) +
                                 "<key/><value xsi:type=\"xsd:int\">1</value>" +
                                 Repeated("</value>", values));
  };
  EXPECT_TRUE(ReadUntrusted(nested(62)));
  EXPECT_THROW(ReadUntrusted(nested(63)), Orbis::ParseException);
}

TEST(SoapBounds, OfTextsHoldOnBothSides) {
  const std::size_t longest = Limits::Untrusted().textBytes;
  EXPECT_TRUE(ReadUntrusted(Master(std::string(longest, 'x'))));
  ExpectRefused({"longer", Master(std::string(longest + 1, 'x')), "/object/masterGroup", 2, "1048576 bytes"},
                &ReadUntrusted);
  EXPECT_TRUE(ReadOwn(Master(std::string(longest + 1, 'x'))));
}

TEST(SoapBounds, OfElementsHoldOnBothSides) {
  const std::size_t most = Limits::Untrusted().elements;
  const auto list = [](std::size_t items) { return Of("TextList", Repeated("<item/>", items)); };
  EXPECT_TRUE(ReadUntrusted(list(most - 1)));
  EXPECT_THAT([&] { ReadUntrusted(list(most)); },
              ::testing::ThrowsMessage<Orbis::ParseException>(::testing::HasSubstr("500000 elements")));
}

TEST(SoapBounds, OfTheDocumentHoldOnBothSides) {
  const std::string text = Groups(goodGroups);
  const std::size_t room = Limits::Untrusted().documentBytes - text.size();
  EXPECT_TRUE(ReadUntrusted(text + std::string(room, '\n')));
  ExpectRefused({"larger", text + std::string(room + 1, '\n'), "/", 0, "longer than 16777216 bytes"},
                &ReadUntrusted);
}

TEST(SoapBounds, OfNamesAndAttributesStopFloods) {
  ExpectRefused({"name", "<" + std::string(5'000'000, 'n') + "/>", "/", 1, "name is too long"},
                &ReadUntrusted);
  std::string declarations;
  for (int i = 0; i < 10'000; ++i) {
    declarations += " xmlns:p" + std::to_string(i) + "=\"urn:p\"";
  }
  ExpectRefused({"declarations", Of("KovaHostConfigInfo", "", declarations), "/", 1, "attributes"},
                &ReadUntrusted);
  ExpectRefused({"attribute", Of(std::string(2'000'000, 't'), ""), "/object", 1, "longer than 1048576"},
                &ReadUntrusted);
}

}  // namespace
}  // namespace Codec
