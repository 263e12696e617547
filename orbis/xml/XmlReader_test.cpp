#include "orbis/xml/XmlReader.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <random>
#include <string>
#include <vector>

#include "orbis/ParseException.h"
#include "tests/support/Seed.h"

namespace Orbis::Xml {
namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::StartsWith;
using ::testing::ThrowsMessage;

constexpr Limits untrusted = Limits::Untrusted();

// Bounds so large that only the one under test can be met.
Limits Roomy() {
  return {.documentBytes = 1u << 28,
          .depth = 1u << 20,
          .elements = 1u << 24,
          .attributes = 1u << 20,
          .nameBytes = 1u << 26,
          .textBytes = 1u << 27};
}

std::string Repeat(std::string_view piece, std::size_t times) {
  std::string text;
  text.reserve(piece.size() * times);
  for (std::size_t i = 0; i < times; ++i) {
    text += piece;
  }
  return text;
}

Document Read(std::string_view text, const Limits& limits = untrusted,
              Attributes attributes = Attributes::Refuse) {
  return Document(text, limits, attributes);
}

void ExpectRefused(std::string_view text, std::string_view reason, const Limits& limits = untrusted,
                   Attributes attributes = Attributes::Refuse) {
  EXPECT_THAT([&] { Read(text, limits, attributes); },
              ThrowsMessage<ParseException>(HasSubstr(std::string(reason))))
      << text.substr(0, 200);
}

void ExpectAccepted(std::string_view text, const Limits& limits = untrusted,
                    Attributes attributes = Attributes::Refuse) {
  EXPECT_NO_THROW(Read(text, limits, attributes)) << text.substr(0, 200);
}

std::string TextOf(std::string_view text) {
  return std::string(Read(text).Root().text);
}

constexpr std::string_view xsiBinding = "xmlns:xsi='http://www.w3.org/2001/XMLSchema-instance'";

std::string WithXsi(std::string_view attributes, std::string_view content = "") {
  return "<a xmlns='urn:d' xmlns:p='urn:p' " + std::string(xsiBinding) + ' ' + std::string(attributes) + '>' +
         std::string(content) + "</a>";
}

// A document that uses every construct the reader accepts.
constexpr std::string_view everything =
    "\xEF\xBB\xBF<?xml version=\"1.0\" encoding=\"UTF-8\" standalone='yes'?>\n"
    "<!-- before -->\n"
    "<object xmlns='urn:nox' xmlns:i=\"http://www.w3.org/2001/XMLSchema-instance\" i:type='Thing'>\n"
    "  <!-- between -->\n"
    "  <name>a&amp;b &#60;&#x3C; \xC3\xA9\xE2\x82\xAC\xF0\x9F\x98\x80</name>\n"
    "  <other:value xmlns:other='urn:other' i:type='other:Value' i:nil='true'/>\n"
    "  <cdata><![CDATA[<raw> & ]]]></cdata>\n"
    "</object>\n"
    "<!-- after -->\n";

// ---- The tree ------------------------------------------------------------------------------------

TEST(XmlReader, KeepsNamesTextsAndOrderOfElements) {
  const Document document =
      Read("<r xmlns='urn:x'><first>1</first><second xmlns='urn:y'> 2 </second><third/></r>");
  const Element& root = document.Root();
  ASSERT_NE(root.firstChild, nullptr);
  const Element& first = *root.firstChild;
  const Element& second = *first.nextSibling;
  const Element& third = *second.nextSibling;
  EXPECT_EQ(root.name, "r");
  EXPECT_EQ(root.nameSpace, "urn:x");
  EXPECT_EQ(root.text, "");
  EXPECT_EQ(first.name, "first");
  EXPECT_EQ(first.text, "1");
  EXPECT_EQ(second.nameSpace, "urn:y");
  EXPECT_EQ(second.text, " 2 ");
  EXPECT_EQ(third.nameSpace, "urn:x");
  EXPECT_EQ(third.text, "");
  EXPECT_EQ(third.nextSibling, nullptr);
  EXPECT_EQ(third.parent, &root);
  EXPECT_EQ(root.parent, nullptr);
}

TEST(XmlReader, AcceptsEveryConstructOfAnHonestDocument) {
  const Document document = Read(everything);
  const Element& name = *document.Root().firstChild;
  EXPECT_EQ(name.text, "a&b << \xC3\xA9\xE2\x82\xAC\xF0\x9F\x98\x80");
  const Element& value = *name.nextSibling;
  EXPECT_EQ(value.nameSpace, "urn:other");
  EXPECT_TRUE(value.nil);
  EXPECT_EQ(value.type.nameSpace, "urn:other");
  EXPECT_EQ(value.type.name, "Value");
  EXPECT_EQ(value.nextSibling->text, "<raw> & ]");
  EXPECT_EQ(document.Root().type.nameSpace, "urn:nox");
}

TEST(XmlReader, OutlivesTheTextAndMayBeMoved) {
  std::string text = "<root xmlns='urn:x'><a>value</a></root>";
  Document first = Read(text);
  text.assign(text.size(), '#');
  Document second = Read("<b/>");
  second = std::move(first);
  const Document third = std::move(second);
  EXPECT_EQ(third.Root().nameSpace, "urn:x");
  EXPECT_EQ(third.Root().firstChild->name, "a");
  EXPECT_EQ(third.Root().firstChild->text, "value");
}

TEST(XmlReader, KeepsTheLineOfEveryElementWhateverTheLineEnds) {
  const Document document = Read("<r>\n<a/>\r\n\r\n<b\n/>\n<c>x\ny</c></r>");
  const Element& a = *document.Root().firstChild;
  EXPECT_EQ(document.Root().line, 1);
  EXPECT_EQ(a.line, 2);
  EXPECT_EQ(a.nextSibling->line, 4);
  EXPECT_EQ(a.nextSibling->nextSibling->line, 6);
}

TEST(XmlReader, UnifiesLineEndsInValuesButKeepsReferences) {
  EXPECT_EQ(TextOf("<a>1\r\n2\r3\n4&#13;5&#10;6</a>"), "1\n2\n3\n4\r5\n6");
}

TEST(XmlReader, ReadsTextsThatSpanManyChunks) {
  const std::string value = Repeat("0123456789\xE2\x82\xAC", 70'000);
  EXPECT_EQ(TextOf("<a>" + value + "</a>"), value);
}

// ---- Paths and lines of errors ---------------------------------------------------------------------

TEST(XmlReader, PathCountsOnlySiblingsOfOneName) {
  const Document document = Read("<object><disk/><result/><result><disk/></result><result/></object>");
  const Element& disk = *document.Root().firstChild;
  const Element& secondResult = *disk.nextSibling->nextSibling;
  EXPECT_EQ(PathOf(document.Root()), "/object");
  EXPECT_EQ(PathOf(disk), "/object/disk");
  EXPECT_EQ(PathOf(*disk.nextSibling), "/object/result[0]");
  EXPECT_EQ(PathOf(*secondResult.firstChild), "/object/result[1]/disk");
}

TEST(XmlReader, TwoSiblingsAreEnoughForAnIndex) {
  const Document document = Read("<r><a/><a/></r>");
  EXPECT_EQ(PathOf(*document.Root().firstChild), "/r/a[0]");
  EXPECT_EQ(PathOf(*document.Root().firstChild->nextSibling), "/r/a[1]");
}

TEST(XmlReader, ErrorsNameThePathAndTheLine) {
  const auto read = [] { Read("<object>\n<r/>\n<r/>\n<r>\n<disk b='1'/></r></object>"); };
  EXPECT_THAT(read, ThrowsMessage<ParseException>(
                        AllOf(StartsWith("/object/r[2]/disk, line 5: "), HasSubstr("attribute \"b\""))));
}

TEST(XmlReader, SyntaxErrorsNameTheOpenElement) {
  EXPECT_THAT([] { Read("<a>\n<b>\n</c></a>"); },
              ThrowsMessage<ParseException>(AllOf(StartsWith("/a/b, line 3: "), HasSubstr("mismatched"))));
}

TEST(XmlReader, ErrorsOutsideTheRootHaveAPathToo) {
  EXPECT_THAT([] { Read("\n<!DOCTYPE a><a/>"); }, ThrowsMessage<ParseException>(StartsWith("/, line 2: ")));
  EXPECT_THAT([] { Read("<a/>\n\nx"); }, ThrowsMessage<ParseException>(StartsWith("/, line 3: ")));
}

// ---- What never stands in a document of ours -------------------------------------------------------

TEST(XmlReader, StopsAtADoctypeWhateverItHolds) {
  const std::string chain = [] {
    std::string entities = "<!ENTITY e0 'x'>";
    for (int i = 1; i < 100'000; ++i) {
      entities += "<!ENTITY e" + std::to_string(i) + " '&e" + std::to_string(i - 1) + ";'>";
    }
    return entities;
  }();
  const std::string doctypes[] = {
      "<!DOCTYPE a>",
      "<!DOCTYPE a SYSTEM 'file:///etc/passwd'>",
      "<!DOCTYPE a PUBLIC '-//x//y' 'http://127.0.0.1:1/x.dtd'>",
      "<!DOCTYPE a [<!ENTITY l 'lol'><!ENTITY m '&l;&l;&l;&l;&l;&l;&l;&l;&l;&l;'>]>",
      "<!DOCTYPE a [<!ENTITY e SYSTEM 'file:///etc/passwd'>]>",
      "<!DOCTYPE a [<!ENTITY % p SYSTEM 'http://127.0.0.1:1/x'> %p;]>",
      "<!DOCTYPE a [<!ATTLIST a b CDATA 'default'>]>",
      "<!DOCTYPE a [" + chain + "]>",
      "<!DOCTYPE a [<!ENTITY q '" + std::string(1'000'000, 'q') + "'>]>",
  };
  for (const std::string& doctype : doctypes) {
    ExpectRefused(doctype + "<a>&l;</a>", "a DOCTYPE is not accepted", Roomy());
  }
}

TEST(XmlReader, RefusesUndefinedEntities) {
  ExpectRefused("<a>&nbsp;</a>", "undefined entity");
  ExpectRefused("<?xml version='1.0' standalone='no'?><a>&x;</a>", "undefined entity");
  ExpectAccepted("<a>&lt;&gt;&amp;&quot;&apos;</a>");
}

TEST(XmlReader, RefusesProcessingInstructionsEverywhere) {
  for (const char* text : {"<?x y?><a/>", "<a><?x?></a>", "<a/><?x y?>", "<a><b/><?x y?></a>"}) {
    ExpectRefused(text, "processing instruction");
  }
}

TEST(XmlReader, SkipsCommentsBesideElements) {
  const Document document = Read("<!--0--><a><!--1--> <b>x</b> <!--2--><!--3--><c/><!--4--></a><!--5-->");
  EXPECT_EQ(document.Root().firstChild->text, "x");
  EXPECT_EQ(TextOf("<a><!--only--></a>"), "");
}

TEST(XmlReader, RefusesACommentThatSplitsAValue) {
  for (const char* text :
       {"<a>1<!---->2</a>", "<a><!---->2</a>", "<a>1<!----></a>", "<a> <!----> </a>", "<a><!----> </a>",
        "<a><![CDATA[x]]><!----></a>", "<a><!----><![CDATA[2]]></a>", "<a>x&#32;<!----></a>"}) {
    ExpectRefused(text, "a comment stands inside a value");
  }
  ExpectRefused("<a>1--><!-- -- --></a>", "");
}

TEST(XmlReader, AcceptsCdataAsAWholeValueOnly) {
  EXPECT_EQ(TextOf("<a><![CDATA[a<b]]></a>"), "a<b");
  EXPECT_EQ(TextOf("<a><![CDATA[]]></a>"), "");
  for (const char* text : {"<a>1<![CDATA[2]]></a>", "<a><![CDATA[2]]>3</a>", "<a> <![CDATA[2]]></a>",
                           "<a><![CDATA[1]]><![CDATA[2]]></a>"}) {
    ExpectRefused(text, "a CDATA section is mixed with other text");
  }
}

TEST(XmlReader, RefusesTextBesideElements) {
  for (const char* text :
       {"<a>x<b/></a>", "<a><b/>x</a>", "<a><b/>x<c/></a>", "<a><b/><![CDATA[ ]]></a>",
        "<a><![CDATA[]]><b/></a>", "<a>\n <b/>&#160;</a>", "<a>x&#32;<b/></a>", "<a>x<!----><b/></a>"}) {
    ExpectRefused(text, "text stands beside child elements");
  }
  ExpectAccepted("<a> \t\r\n<b/> <c/>&#32;</a>");
}

TEST(XmlReader, RefusesWhatIsNotWellFormed) {
  const std::vector<std::string> texts = {
      "",
      " ",
      "text",
      "<a>",
      "</a>",
      "<a></b>",
      "<a/><b/>",
      "<a/>text",
      "<a/></a>",
      "<a/><![CDATA[]]>",
      "<a b='1' b='2'/>",
      "<a xmlns:p='u' xmlns:q='u' p:b='1' q:b='2'/>",
      "<p:a/>",
      "<a p:b='1'/>",
      "<a xmlns:p=''/>",
      "<a xmlns:xml='urn:x'/>",
      "<a xmlns:xmlns='urn:x'/>",
      "<a xmlns='urn:x&#10;y'/>",
      "<a b=1/>",
      "<a b/>",
      "<a b='<'/>",
      "<a b='1'c='2'/>",
      "<a>]]></a>",
      "<a><!-- -- --></a>",
      "<a>&</a>",
      "<a>&amp</a>",
      "<a><![CDATA[</a>",
      "<1/>",
      "<a:b:c xmlns:a='u'/>",
      "<a\xC3\x97/>",
      "<?xml version='1.0\"?><a/>",
      "<?xml encoding='UTF-8'?><a/>",
      " <?xml version='1.0'?><a/>",
      "<a><?xml version='1.0'?></a>",
  };
  for (const std::string& text : texts) {
    EXPECT_THROW(Read(text, untrusted, Attributes::RefuseOnData), ParseException) << text;
  }
}

TEST(XmlReader, RefusesADocumentCutOffAtAnyOffset) {
  const std::size_t end = everything.find("</object>") + std::string_view("</object>").size();
  for (std::size_t size = 0; size < end; ++size) {
    EXPECT_THROW(Read(everything.substr(0, size)), ParseException) << "cut to " << size << " bytes";
  }
  ExpectAccepted(everything.substr(0, end));
}

TEST(XmlReader, SurvivesAnyDamageToAByte) {
  const TestSupport::Seed seed;
  std::mt19937 random(seed.Value());
  for (int round = 0; round < 20'000; ++round) {
    std::string text(everything);
    for (std::uint32_t changes = 1 + random() % 3; changes > 0; --changes) {
      text[random() % text.size()] = static_cast<char>(random() % 256);
    }
    try {
      EXPECT_NE(Read(text).Root().name, "");
    } catch (const ParseException& error) {
      EXPECT_GE(error.GetLine(), 0);
      EXPECT_THAT(error.GetPath(), StartsWith("/"));
    }
  }
}

// ---- Bytes -----------------------------------------------------------------------------------------

TEST(XmlReader, RefusesEncodingsOtherThanUtf8) {
  ExpectRefused("<?xml version='1.0' encoding='utf-7'?><a/>", "an encoding other than UTF-8");
  ExpectRefused("<?xml version='1.0' encoding='ISO-8859-1'?><a>\xE9</a>", "an encoding other than UTF-8");
  ExpectRefused("<?xml version='1.0' encoding='UTF-16'?><a/>", "an encoding other than UTF-8");
  ExpectRefused("<?xml version='1.1'?><a/>", "not XML 1.0");
  ExpectRefused("\xFE\xFF<a/>", "UTF-16");
  ExpectRefused(std::string_view("\xFF\xFE<\0a\0/\0>\0", 10), "UTF-16");
  ExpectRefused(std::string_view("<\0a\0/\0>\0", 8), "NUL");
  ExpectAccepted("<?xml version='1.0' encoding='utf-8'?><a/>");
  ExpectAccepted("\xEF\xBB\xBF<a/>");
}

TEST(XmlReader, RefusesNulBytesAnywhere) {
  for (const std::string_view text : {std::string_view("<a>\n\0</a>", 9), std::string_view("<a/>\n\0", 6),
                                      std::string_view("\n\0<a/>", 6)}) {
    EXPECT_THAT([&] { Read(text); },
                ThrowsMessage<ParseException>(AllOf(HasSubstr("NUL"), HasSubstr("line 2"))));
  }
}

TEST(XmlReader, RefusesReferencesToWhatIsNoCharacter) {
  for (const char* reference : {"&#0;", "&#x0;", "&#x1;", "&#xD800;", "&#xDFFF;", "&#xFFFE;", "&#xFFFF;",
                                "&#x110000;", "&#99999999999;", "&#;", "&#x;", "&#-1;"}) {
    EXPECT_THROW(Read("<a>" + std::string(reference) + "</a>"), ParseException) << reference;
    EXPECT_THROW(Read("<a b='" + std::string(reference) + "'/>", untrusted, Attributes::RefuseOnData),
                 ParseException)
        << reference;
  }
  EXPECT_EQ(TextOf("<a>&#x10FFFF;&#xD7FF;&#xE000;&#xFFFD;&#9;</a>"),
            "\xF4\x8F\xBF\xBF\xED\x9F\xBF\xEE\x80\x80\xEF\xBF\xBD\t");
}

TEST(XmlReader, RefusesBrokenUtf8WhereverItStands) {
  const char* const broken[] = {
      "\xFF",              // never a byte of UTF-8
      "\x80",              // no lead byte
      "\xC0\x80",          // overlong NUL
      "\xC1\xBF",          // overlong
      "\xE0\x9F\xBF",      // overlong
      "\xF0\x8F\xBF\xBF",  // overlong
      "\xED\xA0\x80",      // surrogate
      "\xED\xBF\xBF",      // surrogate
      "\xF4\x90\x80\x80",  // beyond U+10FFFF
      "\xF5\x80\x80\x80",  // beyond U+10FFFF
      "\xF8\x88\x80\x80\x80",
      "\xC3",          // cut off
      "\xE2\x82",      // cut off
      "\xF0\x9F\x98",  // cut off
      "\xEF\xBF\xBE",  // U+FFFE
      "\xEF\xBF\xBF",  // U+FFFF
      "\x01",
      "\x1F",
  };
  for (const std::string bytes : broken) {
    for (const std::string& text :
         {"<a>" + bytes + "</a>", "<a>" + bytes + " x</a>", "<a><![CDATA[" + bytes + "]]></a>",
          "<a><!--" + bytes + "--></a>", "<a b='" + bytes + "'/>", "<a xmlns='" + bytes + "'/>",
          "<a" + bytes + "/>", "<a/><!--" + bytes + "-->", "<a/>" + bytes, bytes + "<a/>"}) {
      EXPECT_THROW(Read(text, untrusted, Attributes::RefuseOnData), ParseException)
          << testing::PrintToString(text);
    }
  }
}

TEST(XmlReader, AcceptsTheNeighboursOfBrokenUtf8) {
  for (const char* character :
       {"\x7F", "\xC2\x80", "\xDF\xBF", "\xE0\xA0\x80", "\xED\x9F\xBF", "\xEE\x80\x80", "\xEF\xBF\xBD",
        "\xF0\x90\x80\x80", "\xF4\x8F\xBF\xBF", "\t"}) {
    EXPECT_EQ(TextOf("<a>" + std::string(character) + "</a>"), character);
  }
}

// ---- Bounds, from both sides -----------------------------------------------------------------------

TEST(XmlReader, BoundsTheSizeOfTheDocument) {
  const std::string text = "<a>12345</a>";
  Limits limits = Roomy();
  limits.documentBytes = text.size();
  ExpectAccepted(text, limits);
  ExpectRefused(text + ' ', "the document is longer than 12 bytes", limits);
}

TEST(XmlReader, BoundsTheDepth) {
  Limits limits = Roomy();
  limits.depth = 5;
  ExpectAccepted(Repeat("<a>", 5) + Repeat("</a>", 5), limits);
  ExpectAccepted("<r>" + Repeat("<a><b><c></c></b></a>", 100) + "</r>", limits);
  ExpectRefused(Repeat("<a>", 6) + Repeat("</a>", 6), "nested deeper than 5 levels", limits);
}

TEST(XmlReader, BoundsTheNumberOfElements) {
  Limits limits = Roomy();
  limits.elements = 10;
  ExpectAccepted("<a>" + Repeat("<b/>", 9) + "</a>", limits);
  ExpectRefused("<a>" + Repeat("<b/>", 10) + "</a>", "more than 10 elements", limits);
}

TEST(XmlReader, BoundsTheAttributesOfAnElementDeclarationsIncluded) {
  Limits limits = Roomy();
  limits.attributes = 3;
  const auto accepted = [&](const char* text) { ExpectAccepted(text, limits, Attributes::RefuseOnData); };
  const auto refused = [&](const char* text) {
    ExpectRefused(text, "more than 3 attributes", limits, Attributes::RefuseOnData);
  };
  accepted("<a b='' c='' d=''><a b='' c='' d=''/></a>");
  accepted("<a xmlns='u' xmlns:p='u' c=''><a xmlns='v' c='' d=''/><a xmlns='v' c='' d=''/></a>");
  accepted("<a xmlns='u' xmlns:p='u' xmlns:q='u'/>");
  refused("<a b='' c='' d='' e=''/>");
  refused("<a xmlns='u' xmlns:p='u' c='' d=''/>");
  refused("<a xmlns='u' xmlns:p='u' xmlns:q='u' d=''/>");
  refused("<a xmlns='u' xmlns:p='u' xmlns:q='u' xmlns:r='u'/>");
}

TEST(XmlReader, BoundsNamesWithTheirNamespace) {
  Limits limits = Roomy();
  limits.nameBytes = 10;
  const auto accepted = [&](const char* text) { ExpectAccepted(text, limits, Attributes::RefuseOnData); };
  const auto refused = [&](const char* text) {
    ExpectRefused(text, "is longer than 10 bytes", limits, Attributes::RefuseOnData);
  };
  accepted("<a123456789/>");
  refused("<a1234567890/>");
  accepted("<p:a1234 xmlns:p='urn:x'/>");
  refused("<p:a12345 xmlns:p='urn:x'/>");
  accepted("<a b123456789=''/>");
  refused("<a b1234567890=''/>");
  accepted("<a xmlns:p='urn:x' p:b1234=''/>");
  refused("<a xmlns:p='urn:x' p:b12345=''/>");
  accepted("<a xmlns:p='urn:567890'/>");
  refused("<a xmlns:p='urn:5678901'/>");
  accepted("<a xmlns:p123456789='u'/>");
  refused("<a xmlns:p1234567890='u'/>");
}

TEST(XmlReader, BoundsTheNameInATypeAttribute) {
  Limits limits = Roomy();
  limits.nameBytes = 50;
  ExpectAccepted(WithXsi("xsi:type='p:" + std::string(45, 't') + "'"), limits);
  ExpectRefused(WithXsi("xsi:type='p:" + std::string(46, 't') + "'"), "is longer than 50 bytes", limits);
  ExpectRefused(WithXsi("xsi:type='p:" + std::string(500, 't') + "'"), "is longer than 50 bytes", limits);
}

TEST(XmlReader, BoundsTextsAsTheyAddUp) {
  Limits limits = Roomy();
  limits.textBytes = 8;
  ExpectAccepted("<a>1&amp;3\n5678</a>", limits);
  ExpectRefused("<a>1&amp;3\n56789</a>", "the text is longer than 8 bytes", limits);
  ExpectAccepted("<a><![CDATA[12345678]]></a>", limits);
  ExpectRefused("<a><![CDATA[123456789]]></a>", "the text is longer than 8 bytes", limits);
  ExpectAccepted("<r><a>12345678</a><a>12345678</a></r>", limits);
  ExpectAccepted("<a b='12345678' c='&#x10FFFF;5678'/>", limits, Attributes::RefuseOnData);
  ExpectRefused("<a b='123456789'/>", "longer than 8 bytes", limits, Attributes::RefuseOnData);
  ExpectRefused("<a c='&#x10FFFF;56789'/>", "longer than 8 bytes", limits, Attributes::RefuseOnData);
  ExpectAccepted("<a><!--12345678--><b/></a>", limits);
  ExpectRefused("<a><!--123456789--><b/></a>", "a comment is longer than 8 bytes", limits);
}

TEST(XmlReader, MeetsTheExactBoundsOfUntrustedTexts) {
  const std::size_t text = untrusted.textBytes;
  ExpectAccepted("<a>" + std::string(text, 'x') + "</a>");
  ExpectRefused("<a>" + std::string(text + 1, 'x') + "</a>", "the text is longer");
  ExpectAccepted("<a b='" + std::string(text, 'x') + "'/>", untrusted, Attributes::RefuseOnData);
  ExpectRefused("<a b='" + std::string(text + 1, 'x') + "'/>", "is longer", untrusted,
                Attributes::RefuseOnData);
  ExpectAccepted("<a>" + Repeat("<i/>", untrusted.elements - 1) + "</a>");
  ExpectRefused("<a>" + Repeat("<i/>", untrusted.elements) + "</a>", "elements");
  const std::string unclosed = "<a>" + Repeat("<i></i>", 10);
  ExpectAccepted(unclosed + std::string(untrusted.documentBytes - unclosed.size() - 4, ' ') + "</a>");
  ExpectRefused(unclosed + std::string(untrusted.documentBytes - unclosed.size() - 3, ' ') + "</a>",
                "the document is longer");
}

// A tag, a comment and a reference each come as a whole; a long one must still be accepted.
TEST(XmlReader, AcceptsTokensOfManyChunksWithinTheBounds) {
  Limits limits = Roomy();
  limits.nameBytes = 10;
  limits.textBytes = 400'000;
  limits.attributes = 10'002;
  std::string tag = "<a" + std::string(200'000, ' ') + "b='" + Repeat("&lt;", limits.textBytes) + "' c=\"" +
                    Repeat("'=/>", limits.textBytes / 4) + "\" ";
  for (int i = 0; i < 10'000; ++i) {
    tag += "d" + std::to_string(i) + "='" + std::to_string(i) + "' \n";
  }
  ExpectAccepted(tag + "><!--" + std::string(limits.textBytes, 'x') + "--><b/></a>", limits,
                 Attributes::RefuseOnData);
  EXPECT_EQ(Read("<a>&#" + std::string(300'000, '0') + "65;</a>", limits).Root().text, "A");
}

TEST(XmlReader, RefusesGiantsWithoutReadingThemToTheEnd) {
  // Nothing of these texts is complete, so only the bounds can have refused them.
  Limits limits = Roomy();
  limits.nameBytes = 256;
  limits.textBytes = 1u << 20;
  limits.attributes = 32;
  limits.depth = 64;
  const auto refused = [&](const std::string& text, std::string_view reason) {
    ExpectRefused(text, reason, limits, Attributes::RefuseOnData);
  };
  constexpr std::size_t fifty = 50u << 20;
  refused("<a b='" + std::string(fifty, 'x'), "the value of an attribute is too long");
  refused("<a b=\"" + Repeat("&amp;", fifty / 5), "the value of an attribute is too long");
  refused("<a b='>' c='" + std::string(fifty, 'x'), "the value of an attribute is too long");
  refused("<" + std::string(5u << 20, 'n'), "a name is too long");
  refused("<a></" + std::string(5u << 20, 'n'), "a name is too long");
  refused("<a " + std::string(5u << 20, 'n'), "a name is too long");
  refused("<a>" + std::string(fifty, 'x'), "the text is longer");
  refused("<a><![CDATA[" + std::string(fifty, 'x'), "the text is longer");
  refused("<a><!--" + std::string(fifty, 'x'), "a comment, declaration or reference is too long");
  refused("<a>&" + std::string(fifty, 'x'), "a comment, declaration or reference is too long");
  refused(Repeat("<a>", 200'000), "nested deeper than 64");
  std::string many = "<a";
  std::string declarations = "<a";
  for (int i = 0; i < 20'000; ++i) {
    many += " a" + std::to_string(i) + "='1'";
    declarations += " xmlns:a" + std::to_string(i) + "='u'";
  }
  refused(many, "too many attributes");
  refused(declarations, "too many attributes");
}

TEST(XmlReader, ReadsDeepDocumentsWithoutRecursion) {
  constexpr std::size_t levels = 200'000;
  const Document document = Read(Repeat("<a>", levels) + Repeat("</a>", levels), Roomy());
  std::size_t depth = 0;
  for (const Element* at = &document.Root(); at != nullptr; at = at->firstChild) {
    ++depth;
  }
  EXPECT_EQ(depth, levels);
  ExpectRefused(Repeat("<a>", levels), "no element found", Roomy());
}

TEST(XmlReader, GiantTokensWithinTheBoundsCostNoMoreThanTheirSize) {
  const std::string giant(50u << 20, 'x');
  ExpectAccepted("<a b='" + giant + "'/>", Roomy(), Attributes::RefuseOnData);
  ExpectRefused("<a b='" + giant, "unclosed token", Roomy(), Attributes::RefuseOnData);
  ExpectRefused("<!DOCTYPE " + giant, "no element found", Roomy());
  ExpectAccepted(std::string(giant.size(), ' ') + "<a/>", Roomy());
}

// ---- xsi attributes --------------------------------------------------------------------------------

TEST(XmlReader, ResolvesTypesByNamespaceNotByPrefix) {
  const Document document = Read(
      "<r xmlns='urn:d' xmlns:p='urn:p' xmlns:z='http://www.w3.org/2001/XMLSchema-instance' z:type='A'>"
      "<b z:type='p:B'/><c xmlns:p='urn:other' xmlns='' z:type='p:C'><d z:type='D'/></c>"
      "<e z:type='p:E'/><f z:type='xml:F'/></r>");
  const Element& b = *document.Root().firstChild;
  const Element& c = *b.nextSibling;
  const Element& e = *c.nextSibling;
  EXPECT_EQ(document.Root().type.nameSpace, "urn:d");
  EXPECT_EQ(b.type.nameSpace, "urn:p");
  EXPECT_EQ(b.type.name, "B");
  EXPECT_EQ(c.type.nameSpace, "urn:other");
  EXPECT_EQ(c.firstChild->type.nameSpace, "");
  EXPECT_EQ(c.firstChild->type.name, "D");
  EXPECT_EQ(e.type.nameSpace, "urn:p");
  EXPECT_EQ(e.nextSibling->type.nameSpace, "http://www.w3.org/XML/1998/namespace");
}

TEST(XmlReader, TypesWithoutAnyDefaultNamespaceAreInNone) {
  const Document document = Read("<a " + std::string(xsiBinding) + " xsi:type='T'/>");
  EXPECT_EQ(document.Root().type.nameSpace, "");
  EXPECT_EQ(document.Root().type.name, "T");
}

TEST(XmlReader, RefusesTypesThatAreNoQualifiedName) {
  for (const char* type : {" T", "T ", "p: T", "p :T", "\nT", "p:T\tU", "&#10;T", ""}) {
    ExpectRefused(WithXsi("xsi:type='" + std::string(type) + "'"), "xsi:type is empty or holds a blank");
  }
  for (const char* type : {":T", "p:", ":", "p:q:T"}) {
    ExpectRefused(WithXsi("xsi:type='" + std::string(type) + "'"), "xsi:type is not a qualified name");
  }
  ExpectRefused(WithXsi("xsi:type='q:T'"), "the undeclared prefix \"q\"");
  ExpectRefused(WithXsi("", "<b xmlns:q='u'/><c xsi:type='q:T'/>"), "the undeclared prefix \"q\"");
  ExpectAccepted(WithXsi("", "<b xmlns:q='u' xsi:type='q:T'/>"));
}

TEST(XmlReader, AReboundXsiPrefixIsNoXsi) {
  ExpectRefused("<a xmlns:xsi='urn:other' xsi:type='T'/>", "attribute \"type\" is not known here");
  EXPECT_EQ(
      Read("<a xmlns:xsi='urn:other' xsi:type='T'/>", untrusted, Attributes::RefuseOnData).Root().type.name,
      "");
}

TEST(XmlReader, ReadsNil) {
  for (const char* yes : {"true", "1"}) {
    EXPECT_TRUE(Read(WithXsi("xsi:nil='" + std::string(yes) + "'")).Root().nil);
  }
  for (const char* no : {"false", "0"}) {
    EXPECT_FALSE(Read(WithXsi("xsi:nil='" + std::string(no) + "'", "text")).Root().nil);
  }
  for (const char* neither : {"", "TRUE", " true", "2", "yes"}) {
    ExpectRefused(WithXsi("xsi:nil='" + std::string(neither) + "'"), "xsi:nil is neither true nor false");
  }
}

TEST(XmlReader, RefusesContentBesideNil) {
  for (const char* content : {"x", " ", "<b/>"}) {
    ExpectRefused(WithXsi("xsi:nil='true'", content), "has content although xsi:nil is true");
  }
}

TEST(XmlReader, RefusesOrIgnoresEveryOtherAttributeAsTold) {
  for (const char* attribute : {"b='1'", "id='x'", "href='#x'", "p:b='1'", "xml:lang='en'", "type='T'",
                                "xsi:schemaLocation='urn:d http://127.0.0.1:1/x.xsd'",
                                "xsi:noNamespaceSchemaLocation='x.xsd'", "xsi:other='1'"}) {
    const std::string text = WithXsi(attribute);
    ExpectRefused(text, "is not known here");
    EXPECT_EQ(Read(text, untrusted, Attributes::RefuseOnData).Root().type.name, "");
  }
}

}  // namespace
}  // namespace Orbis::Xml
