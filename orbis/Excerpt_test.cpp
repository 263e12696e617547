#include "orbis/Excerpt.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "orbis/Json.h"
#include "orbis/ParseException.h"
#include "orbis/Soap.h"
#include "orbis/Types.h"
#include "orbis/json/JsonText.h"

namespace Orbis {
namespace {

using testing::HasSubstr;

TEST(Excerpt, IsTheWholeOfAShortText) {
  EXPECT_EQ(Excerpt("", 4), "");
  EXPECT_EQ(Excerpt("abcd", 4), "abcd");
  EXPECT_EQ(Excerpt("abcde", 4), "abcd");
}

TEST(Excerpt, IsCutBetweenTwoCharacters) {
  EXPECT_EQ(Excerpt("abc\xC3\xA4", 4), "abc");
  EXPECT_EQ(Excerpt("ab\xC3\xA4x", 4), "ab\xC3\xA4");
  EXPECT_EQ(Excerpt("a\xF0\x9F\x98\x80", 4), "a");
  EXPECT_EQ(Excerpt("\xF0\x9F\x98\x80x", 4), "\xF0\x9F\x98\x80");
}

TEST(Excerpt, OfWhatIsNotUtf8IsCutAnywhere) {
  EXPECT_EQ(Excerpt(std::string(9, '\x80'), 4), std::string(4, '\x80'));
  EXPECT_EQ(Excerpt(std::string(9, '\xFF'), 4), std::string(4, '\xFF'));
}

// 63 letters, and a character of two bytes over the edge.
const std::string letters(63, 'l');
const std::string tooLong = letters + "\xC3\xA4";

TEST(Excerpt, IsWhatMessagesShowOfALongText) {
  EXPECT_EQ(Json::Describe(Json::Parse("\"" + tooLong + "\"", Limits::Untrusted())),
            "the text '" + letters + "'");
  const auto whyNot = [](const std::string& item) {
    try {
      ReadSoap(
          "<object xmlns='urn:nox' xmlns:xsd='http://www.w3.org/2001/XMLSchema' "
          "xmlns:xsi='http://www.w3.org/2001/XMLSchema-instance' " +
              item + "</object>",
          Limits::Untrusted());
      return std::string("read");
    } catch (const ParseException& refused) {
      return refused.GetReason();
    }
  };
  EXPECT_THAT(whyNot("xsi:type='xsd:int'>" + tooLong), HasSubstr("'" + letters + "'"));
  EXPECT_THAT(whyNot("xsi:type='SystemError'>" + tooLong), HasSubstr("'" + letters + "'"));
}

}  // namespace
}  // namespace Orbis
