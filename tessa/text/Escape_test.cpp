#include "tessa/text/Escape.h"

#include <gtest/gtest.h>

#include <vector>

namespace Tessa {
namespace {

struct Row {
  const char* title;
  std::string text;
};

TEST(PrintableTexts, AreUtf8WithoutControlCharacters) {
  const std::vector<Row> printable = {
      {"empty", ""},
      {"ASCII", "naa.5000 ~"},
      {"two bytes", "\xC2\xA0\xC3\xA9"},
      {"three bytes", "\xE2\x82\xAC\xEF\xBF\xBD"},
      {"four bytes, the last character", "\xF4\x8F\xBF\xBF"},
  };
  for (const Row& row : printable) {
    EXPECT_TRUE(IsPrintable(row.text)) << row.title;
    EXPECT_EQ(Sanitize(row.text), row.text) << row.title;
  }
}

TEST(PrintableTexts, HoldNoOtherBytes) {
  const std::vector<Row> dirty = {
      {"NUL", std::string("a\0b", 3)},
      {"newline", "a\n"},
      {"escape", "\x1B[31m"},
      {"delete", "\x7F"},
      {"control of the second block", "\xC2\x85"},
      {"overlong", "\xC0\x80"},
      {"overlong, three bytes", "\xE0\x80\xAF"},
      {"surrogate", "\xED\xA0\x80"},
      {"beyond the last character", "\xF4\x90\x80\x80"},
      {"U+FFFE", "\xEF\xBF\xBE"},
      {"U+FFFF", "a\xEF\xBF\xBF"},
      {"lone byte", "\xFF"},
      {"lone continuation", "\x80"},
      {"cut off", "\xE2\x82"},
      {"broken off by ASCII", "\xE2\x82z"},
  };
  for (const Row& row : dirty) {
    EXPECT_FALSE(IsPrintable(row.text)) << row.title;
    EXPECT_TRUE(IsPrintable(Sanitize(row.text))) << row.title;
  }
}

TEST(SanitizingAText, DropsControlsReplacesBadBytesAndTrims) {
  EXPECT_EQ(Sanitize("  LAB\t \x1B[1mX "), "LAB [1mX");
  EXPECT_EQ(Sanitize("a\xFF"), "a\xEF\xBF\xBD");
  EXPECT_EQ(Sanitize("a\xEF\xBF\xBF"), "a\xEF\xBF\xBD");
  EXPECT_EQ(Sanitize("   "), "");
}

TEST(QuotingAText, CutsLongOnesBetweenCharacters) {
  EXPECT_EQ(Quote("naa.1"), "\"naa.1\"");
  std::string longText;
  for (int count = 0; count < 200; ++count) {
    longText += "\xE2\x82\xAC";
  }
  const std::string quoted = Quote(longText);
  EXPECT_LT(quoted.size(), 140U);
  EXPECT_TRUE(IsPrintable(quoted));
}

struct EscapedRow {
  const char* what;
  std::string text;
  std::string escaped;
};

class Escaping : public testing::TestWithParam<EscapedRow> {};

TEST_P(Escaping, WritesWhatIsNotPrintableAsHex) {
  EXPECT_EQ(Escape(GetParam().text), GetParam().escaped);
  EXPECT_EQ(IsPrintable(GetParam().text), GetParam().text == GetParam().escaped);
  EXPECT_TRUE(IsPrintable(Escape(GetParam().text)));
}

INSTANTIATE_TEST_SUITE_P(
    Texts, Escaping,
    testing::Values(EscapedRow{"empty", "", ""}, EscapedRow{"plain", "naa.1", "naa.1"},
                    EscapedRow{"letters beyond ASCII", "Größe €", "Größe €"},
                    EscapedRow{"beyond the first plane", "\xF0\x9F\x92\xBE", "\xF0\x9F\x92\xBE"},
                    EscapedRow{"line feed", "a\nb", "a\\x0ab"},
                    EscapedRow{"escape sequence", "\x1b[2J", "\\x1b[2J"},
                    EscapedRow{"zero", std::string("a\0b", 3), "a\\x00b"},
                    EscapedRow{"delete", "\x7f", "\\x7f"}, EscapedRow{"C1 control", "\xC2\x9B", "\\xc2\\x9b"},
                    EscapedRow{"first behind C1", "\xC2\xA0", "\xC2\xA0"},
                    EscapedRow{"stray continuation byte", "a\x80z", "a\\x80z"},
                    EscapedRow{"cut short", "\xE2\x82", "\\xe2\\x82"},
                    EscapedRow{"overlong slash", "\xC0\xAF", "\\xc0\\xaf"},
                    EscapedRow{"surrogate", "\xED\xA0\x80", "\\xed\\xa0\\x80"},
                    EscapedRow{"backslash stays", "\\x41", "\\x41"}));

TEST(EscapingText, OfALongTextKeepsEveryCharacterAroundABrokenOne) {
  std::string text(10'000, 'a');
  text[5'000] = '\n';
  const std::string escaped = Escape(text);
  EXPECT_EQ(escaped.size(), text.size() + 3);
  EXPECT_EQ(escaped.substr(5'000, 4), "\\x0a");
}

TEST(EscapingToAscii, LeavesNamesAsTheyAre) {
  EXPECT_EQ(EscapeToAscii("naa.5000 [x]/y:z=1?"), "naa.5000 [x]/y:z=1?");
  EXPECT_EQ(EscapeToAscii(""), "");
}

TEST(EscapingToAscii, EscapesWhatCouldBeReadAsSomethingElse) {
  EXPECT_EQ(EscapeToAscii("<b>"), "\\x3cb\\x3e");
  EXPECT_EQ(EscapeToAscii("'\"&`\\"), "\\x27\\x22\\x26\\x60\\x5c");
  EXPECT_EQ(EscapeToAscii(std::string_view("\r\n\0\x1b\x7f\xc3", 6)), "\\x0d\\x0a\\x00\\x1b\\x7f\\xc3");
}

TEST(EscapingToAscii, CutsOffWhatIsLong) {
  EXPECT_EQ(EscapeToAscii(std::string(64, 'a')), std::string(64, 'a'));
  EXPECT_EQ(EscapeToAscii(std::string(65, 'a')), std::string(64, 'a') + "..");
}

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

}  // namespace
}  // namespace Tessa
