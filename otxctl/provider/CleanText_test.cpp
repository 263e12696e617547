#include "otxctl/provider/CleanText.h"

#include <gtest/gtest.h>

namespace OtxCtl::Provider {
namespace {

struct Row {
  const char* title;
  std::string text;
};

TEST(CleanTexts, AreUtf8WithoutControlCharacters) {
  const std::vector<Row> clean = {
      {"empty", ""},
      {"ASCII", "naa.5000 ~"},
      {"two bytes", "\xC2\xA0\xC3\xA9"},
      {"three bytes", "\xE2\x82\xAC\xEF\xBF\xBD"},
      {"four bytes, the last character", "\xF4\x8F\xBF\xBF"},
  };
  for (const Row& row : clean) {
    EXPECT_TRUE(IsCleanText(row.text)) << row.title;
    EXPECT_EQ(CleanText(row.text), row.text) << row.title;
  }
}

TEST(CleanTexts, HoldNoOtherBytes) {
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
    EXPECT_FALSE(IsCleanText(row.text)) << row.title;
    EXPECT_TRUE(IsCleanText(CleanText(row.text))) << row.title;
  }
}

TEST(CleaningAText, DropsControlsReplacesBadBytesAndTrims) {
  EXPECT_EQ(CleanText("  LAB\t \x1B[1mX "), "LAB [1mX");
  EXPECT_EQ(CleanText("a\xFF"), "a\xEF\xBF\xBD");
  EXPECT_EQ(CleanText("a\xEF\xBF\xBF"), "a\xEF\xBF\xBD");
  EXPECT_EQ(CleanText("   "), "");
}

TEST(QuotingAText, CutsLongOnesBetweenCharacters) {
  EXPECT_EQ(Quoted("naa.1"), "\"naa.1\"");
  std::string longText;
  for (int count = 0; count < 200; ++count) {
    longText += "\xE2\x82\xAC";
  }
  const std::string quoted = Quoted(longText);
  EXPECT_LT(quoted.size(), 140U);
  EXPECT_TRUE(IsCleanText(quoted));
}

}  // namespace
}  // namespace OtxCtl::Provider
