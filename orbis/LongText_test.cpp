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

// 63 letters, and a character of two bytes over the edge.
const std::string letters(63, 'l');
const std::string tooLong = letters + "\xC3\xA4";

TEST(LongText, IsCutInMessagesBetweenTwoCharacters) {
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
