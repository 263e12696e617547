// Requests as clients of other makes write them, with types made by hand as the generator would make them.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <optional>
#include <string>

#include "orbis/Engine.h"
#include "orbis/Envelope.h"
#include "orbis/FieldAccess.h"

namespace Orbis {
namespace {

using ::testing::HasSubstr;
using ::testing::ThrowsMessage;

class Thing : public DataObject {
 public:
  static const TypeDescriptor& StaticType() {
    using namespace Generated;
    static const TypeDescriptor& type =
        Complete({.name = "Thing",
                  .source = "Thing",
                  .base = &DataObject::StaticType(),
                  .ownFields = {Scalar<&Thing::name>("name", FieldKind::String, Presence::Optional),
                                Output(Scalar<&Thing::weight>("weight", FieldKind::Int, Presence::Required))},
                  .create = &Create<Thing>,
                  .copy = &Copy<Thing>},
                 &CreateArray<Thing>);
    return type;
  }
  const TypeDescriptor& GetType() const override { return StaticType(); }

  std::optional<std::string> name;
  std::int32_t weight = 0;
};

class Book final : public Thing {
 public:
  static const TypeDescriptor& StaticType() {
    using namespace Generated;
    static const TypeDescriptor& type =
        Complete({.name = "Book",
                  .source = "Book",
                  .base = &Thing::StaticType(),
                  .ownFields = {Scalar<&Book::pages>("pages", FieldKind::Int, Presence::Required)},
                  .create = &Create<Book>,
                  .copy = &Copy<Book>},
                 &CreateArray<Book>);
    return type;
  }
  const TypeDescriptor& GetType() const override { return StaticType(); }

  std::int32_t pages = 0;
};

class PackIt final : public DataObject {
 public:
  static const TypeDescriptor& StaticType() {
    using namespace Generated;
    static const TypeDescriptor& type =
        Complete({.name = "PackIt",
                  .source = "PackIt",
                  .base = &DataObject::StaticType(),
                  .ownFields = {Reference<&PackIt::things>("things", FieldKind::Object, Presence::List,
                                                           &Thing::StaticType),
                                Reference<&PackIt::words>("words", FieldKind::Strings, Presence::List),
                                Reference<&PackIt::ribbon>("ribbon", FieldKind::Base64, Presence::Optional),
                                Reference<&PackIt::best>("best", FieldKind::Object, Presence::Optional,
                                                         &Thing::StaticType)},
                  .create = &Create<PackIt>,
                  .copy = &Copy<PackIt>},
                 &CreateArray<PackIt>);
    return type;
  }
  const TypeDescriptor& GetType() const override { return StaticType(); }

  Ref<DataArray<Thing>> things;
  Ref<TextList> words;
  Ref<Binary> ribbon;
  Ref<Thing> best;
};

const TypeRegistration registration({&Thing::StaticType, &Book::StaticType, &PackIt::StaticType});

// The request of that content, as it is read.
Ref<Any> ReadAs(const TypeDescriptor& type, const std::string& content, const std::string& attributes = "") {
  const SoapMessage message(
      "<e:Envelope xmlns:e='http://schemas.xmlsoap.org/soap/envelope/' "
      "xmlns:xsi='http://www.w3.org/2001/XMLSchema-instance'><e:Body>"
      "<n:Request xmlns:n='urn:nox' xmlns='urn:nox'" +
          attributes + ">" + content + "</n:Request></e:Body></e:Envelope>",
      Limits::Untrusted());
  return message.Read(type);
}

std::string Read(const TypeDescriptor& type, const std::string& content, const std::string& attributes = "") {
  return ReadAs(type, content, attributes)->ToString();
}

TEST(RequestReading, TakesElementsInAnyOrder) {
  const std::string inOrder = Read(Book::StaticType(), "<name>b</name><weight>3</weight><pages>7</pages>");
  EXPECT_THAT(inOrder, HasSubstr("pages = 7"));
  EXPECT_EQ(Read(Book::StaticType(), "<pages>7</pages><weight>3</weight><name>b</name>"), inOrder);
  EXPECT_EQ(Read(Book::StaticType(), "<weight>3</weight><pages>7</pages><name>b</name>"), inOrder);
}

TEST(RequestReading, TakesElementsInAnyOrderInsideOthers) {
  EXPECT_EQ(Read(PackIt::StaticType(), "<things xsi:type='Book'><pages>7</pages><name>b</name></things>"),
            Read(PackIt::StaticType(), "<things xsi:type='Book'><name>b</name><pages>7</pages></things>"));
}

TEST(RequestReading, CollectsTheElementsOfAListInTheirOrderWhereverTheyStand) {
  EXPECT_EQ(Read(PackIt::StaticType(),
                 "<words>a</words><things><name>x</name></things><words>b</words><things/><words>c</words>"),
            Read(PackIt::StaticType(),
                 "<things><name>x</name></things><things/><words>a</words><words>b</words><words>c</words>"));
}

TEST(RequestReading, MakesUpWhatOnlyAnswersMustHave) {
  const Ref<Any> read = ReadAs(Thing::StaticType(), "<name>n</name>");
  const auto& thing = dynamic_cast<const Thing&>(*read);
  EXPECT_EQ(thing.name, "n");
  EXPECT_EQ(thing.weight, 0);
}

TEST(RequestReading, MissesWhatRequestsMustHave) {
  EXPECT_THAT([] { Read(Book::StaticType(), "<name>n</name>"); },
              ThrowsMessage<ParseException>(
                  HasSubstr("/Envelope/Body/Request, line 1: required element 'pages' is missing")));
}

TEST(RequestReading, TakesWhatIsNilForAbsent) {
  const char* const nil = " xsi:nil='true'/>";
  const Ref<Any> read = ReadAs(PackIt::StaticType(), std::string("<best") + nil + "<words" + nil + "<ribbon" +
                                                         nil + "<things" + nil + "<words>w</words>");
  const auto& request = dynamic_cast<const PackIt&>(*read);
  EXPECT_FALSE(request.best);
  EXPECT_FALSE(request.ribbon);
  EXPECT_FALSE(request.things);
  EXPECT_EQ(request.words->Items(), std::vector<std::string>{"w"});
  const Ref<Any> thing = ReadAs(Thing::StaticType(), std::string("<name") + nil + "<weight" + nil);
  EXPECT_FALSE(dynamic_cast<const Thing&>(*thing).name);
}

TEST(RequestReading, RefusesNilWhereARequestMustHaveAValue) {
  EXPECT_THAT([] { Read(Book::StaticType(), "<pages xsi:nil='true'/>"); },
              ThrowsMessage<ParseException>(HasSubstr("pages, line 1: xsi:nil is not allowed")));
}

TEST(RequestReading, TakesARequestThatIsNilForOneWithoutParameters) {
  const Ref<Any> read = ReadAs(PackIt::StaticType(), "", " xsi:nil='1'");
  EXPECT_FALSE(dynamic_cast<const PackIt&>(*read).best);
  EXPECT_THAT([] { Read(Book::StaticType(), "", " xsi:nil='1'"); },
              ThrowsMessage<ParseException>(HasSubstr("required element 'pages' is missing")));
}

TEST(RequestReading, RefusesASingleValueThatIsRepeated) {
  EXPECT_THAT([] { Read(Book::StaticType(), "<name>n</name><pages>1</pages><name>n</name>"); },
              ThrowsMessage<ParseException>(HasSubstr("element 'name' is repeated")));
}

TEST(RequestReading, RefusesWhatItDoesNotKnow) {
  EXPECT_THAT([] { Read(Book::StaticType(), "<pages>1</pages><colour>red</colour>"); },
              ThrowsMessage<ParseException>(HasSubstr("unknown element 'colour'")));
  EXPECT_THAT([] { Read(Book::StaticType(), "<pages xmlns='urn:other'>1</pages>"); },
              ThrowsMessage<ParseException>(HasSubstr("unknown element 'pages' in namespace 'urn:other'")));
  EXPECT_THAT([] { Read(PackIt::StaticType(), "<things xsi:type='PackIt'/>"); },
              ThrowsMessage<ParseException>(HasSubstr("PackIt is not a Thing")));
}

TEST(RequestReading, PassesOverWhereASchemaMayBeFound) {
  EXPECT_THAT(Read(Book::StaticType(), "<pages>7</pages>",
                   " xsi:schemaLocation='urn:nox nox.xsd' xsi:noNamespaceSchemaLocation='a.xsd'"),
              HasSubstr("pages = 7"));
  EXPECT_THAT([] { Read(Book::StaticType(), "<pages>7</pages>", " xsi:other='a'"); },
              ThrowsMessage<ParseException>(HasSubstr("attribute \"other\" is not known here")));
}

}  // namespace
}  // namespace Orbis
