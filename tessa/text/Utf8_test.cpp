#include "tessa/text/Utf8.h"

#include <gtest/gtest.h>

#include <vector>

namespace Tessa {
namespace {

struct Valid {
  std::string text;
  char32_t codePoint;
};

TEST(Utf8, HasCharactersOfOneToFourBytes) {
  const std::vector<Valid> rows = {
      {std::string(1, '\0'), 0},
      {"~", U'~'},
      {"\xC2\x80", 0x80},
      {"\xDF\xBF", 0x7FF},
      {"\xE0\xA0\x80", 0x800},
      {"\xED\x9F\xBF", 0xD7FF},
      {"\xEE\x80\x80", 0xE000},
      {"\xEF\xBF\xBF", 0xFFFF},
      {"\xF0\x90\x80\x80", 0x10000},
      {"\xF4\x8F\xBF\xBF", 0x10FFFF},
  };
  for (const Valid& row : rows) {
    for (const char* const next : {"", "z", "\xFF", "\xC3\xA4\xC3\xA4"}) {
      const Utf8Character character = FirstCharacter(row.text + next);
      EXPECT_TRUE(character.isValid) << row.text;
      EXPECT_EQ(character.size, row.text.size());
      EXPECT_EQ(character.codePoint, row.codePoint);
    }
    EXPECT_TRUE(IsValidUtf8(row.text));
    EXPECT_EQ(ReplaceInvalidUtf8(row.text), row.text);
  }
}

struct Broken {
  const char* title;
  std::string text;
  std::size_t size;   // of the first broken character
  std::size_t count;  // of broken characters
};

TEST(Utf8, CountsTheLongestBeginningOfACharacterAsOneBrokenCharacter) {
  const std::vector<Broken> rows = {
      {"never a byte", "\xFF", 1, 1},
      {"never a lead byte", "\xC1\x81", 1, 2},
      {"lone continuation", "\x80", 1, 1},
      {"two bytes, one there", "\xC3", 1, 1},
      {"three bytes, two there", "\xE2\x82", 2, 1},
      {"four bytes, two there", "\xF0\x9F", 2, 1},
      {"four bytes, three there", "\xF0\x9F\x98", 3, 1},
      {"three bytes, two there, then another lead", "\xE2\x82\xE2", 2, 2},
      {"overlong", "\xC0\xAF", 1, 2},
      {"overlong, three bytes", "\xE0\x80\xAF", 1, 3},
      {"overlong, four bytes", "\xF0\x80\x80\xAF", 1, 4},
      {"surrogate", "\xED\xA0\x80", 1, 3},
      {"beyond the last character", "\xF4\x90\x80\x80", 1, 4},
      {"lead of five bytes", "\xF8\x88\x80\x80\x80", 1, 5},
  };
  for (const Broken& row : rows) {
    for (const std::string next : {"", "z"}) {
      const std::string text = row.text + next;
      EXPECT_FALSE(IsValidUtf8(text)) << row.title;
      EXPECT_FALSE(FirstCharacter(text).isValid) << row.title;
      EXPECT_EQ(FirstCharacter(text).codePoint, 0xFFFDU) << row.title;
      EXPECT_EQ(FirstCharacter(text).size, row.size) << row.title;
      std::string replaced;
      for (std::size_t i = 0; i < row.count; ++i) {
        replaced += replacementCharacter;
      }
      EXPECT_EQ(ReplaceInvalidUtf8("a" + text), "a" + replaced + next) << row.title;
    }
  }
}

TEST(Utf8, CountsCharactersNotBytes) {
  EXPECT_EQ(CountCharacters(""), 0U);
  EXPECT_EQ(CountCharacters("Gr\xC3\xB6\xC3\x9F"
                            "e \xE2\x82\xAC \xF0\x9F\x92\xBE"),
            9U);
}

}  // namespace
}  // namespace Tessa
