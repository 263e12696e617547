#include "host/Text.h"

#include <gtest/gtest.h>

namespace Host {
namespace {

struct Row {
  const char* what;
  std::string text;
  std::string shown;
};

class PrintableText : public testing::TestWithParam<Row> {};

TEST_P(PrintableText, IsShownAs) {
  EXPECT_EQ(Printable(GetParam().text), GetParam().shown);
  EXPECT_EQ(IsClean(GetParam().text), GetParam().text == GetParam().shown);
  EXPECT_TRUE(IsClean(Printable(GetParam().text)));
}

INSTANTIATE_TEST_SUITE_P(
    Texts, PrintableText,
    testing::Values(
        Row{"empty", "", ""}, Row{"plain", "naa.1", "naa.1"},
        Row{"letters beyond ASCII", "Größe €", "Größe €"},
        Row{"beyond the first plane", "\xF0\x9F\x92\xBE", "\xF0\x9F\x92\xBE"},
        Row{"line feed", "a\nb", "a\\x0ab"}, Row{"escape sequence", "\x1b[2J", "\\x1b[2J"},
        Row{"zero", std::string("a\0b", 3), "a\\x00b"}, Row{"delete", "\x7f", "\\x7f"},
        Row{"C1 control", "\xC2\x9B", "\\xc2\\x9b"}, Row{"first behind C1", "\xC2\xA0", "\xC2\xA0"},
        Row{"stray continuation byte", "a\x80z", "a\\x80z"}, Row{"cut short", "\xE2\x82", "\\xe2\\x82"},
        Row{"overlong slash", "\xC0\xAF", "\\xc0\\xaf"}, Row{"surrogate", "\xED\xA0\x80", "\\xed\\xa0\\x80"},
        Row{"backslash stays", "\\x41", "\\x41"}));

TEST(PrintableText, OfALongTextKeepsEveryCharacterAroundABrokenOne) {
  std::string text(10'000, 'a');
  text[5'000] = '\n';
  const std::string shown = Printable(text);
  EXPECT_EQ(shown.size(), text.size() + 3);
  EXPECT_EQ(shown.substr(5'000, 4), "\\x0a");
}

}  // namespace
}  // namespace Host
