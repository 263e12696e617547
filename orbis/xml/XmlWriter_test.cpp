#include "orbis/xml/XmlWriter.h"

#include <expat.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <random>
#include <string>
#include <string_view>

#include "orbis/xml/XmlReader.h"
#include "tests/support/Seed.h"

namespace Orbis::Xml {
namespace {

const std::string replaced = "\xEF\xBF\xBD";

std::string Text(std::string_view text) {
  std::string out;
  AppendText(out, text);
  return out;
}

std::string AttributeValue(std::string_view text) {
  std::string out;
  AppendAttributeValue(out, text);
  return out;
}

std::string ReadAsText(std::string_view written) {
  const std::string document = "<a>" + std::string(written) + "</a>";
  return std::string(Document(document, Limits::OwnOutput()).Root().text);
}

// The data tree does not keep attribute values, so they are read back with the library itself.
std::optional<std::string> ReadAsAttribute(std::string_view written, char quote) {
  const std::string document = std::string("<a b=") + quote + std::string(written) + quote + "/>";
  const std::unique_ptr<XML_ParserStruct, decltype(&XML_ParserFree)> parser(XML_ParserCreate("UTF-8"),
                                                                            &XML_ParserFree);
  std::optional<std::string> value;
  XML_SetUserData(parser.get(), &value);
  XML_SetStartElementHandler(parser.get(), [](void* self, const XML_Char*, const XML_Char** attributes) {
    *static_cast<std::optional<std::string>*>(self) = attributes[1];
  });
  const XML_Status status = XML_Parse(parser.get(), document.data(), static_cast<int>(document.size()), 1);
  return status == XML_STATUS_OK ? value : std::nullopt;
}

// What a text is after cleaning, worked out from the ranges of code points, not from a table of bytes:
// every longest piece that some character begins with, or else a single byte, counts as one.
struct Piece {
  std::size_t size = 1;
  bool whole = false;
  std::uint32_t character = 0;
};

struct CodePointRange {
  std::uint32_t first;
  std::uint32_t last;
};

constexpr CodePointRange codePointsOfSize[] = {
    {1, 0}, {0, 0x7F}, {0x80, 0x7FF}, {0x800, 0xFFFF}, {0x10000, 0x10FFFF}};

std::size_t SizeSaidBy(unsigned char lead) {
  return lead < 0x80 ? 1 : lead < 0xC0 ? 0 : lead < 0xE0 ? 2 : lead < 0xF0 ? 3 : lead < 0xF8 ? 4 : 0;
}

std::optional<Piece> BeginningOfACharacter(std::string_view bytes) {
  const std::size_t size = SizeSaidBy(static_cast<unsigned char>(bytes[0]));
  if (bytes.size() > size) {
    return std::nullopt;
  }
  std::uint32_t low = static_cast<unsigned char>(bytes[0]) & (size == 1 ? 0x7Fu : 0xFFu >> (size + 1));
  std::uint32_t high = low;
  for (std::size_t i = 1; i < size; ++i) {
    const auto byte = i < bytes.size() ? static_cast<unsigned char>(bytes[i]) : 0x80u;
    if ((byte & 0xC0u) != 0x80u) {
      return std::nullopt;
    }
    low = (low << 6) | (byte & 0x3Fu);
    high = (high << 6) | (i < bytes.size() ? byte & 0x3Fu : 0x3Fu);
  }
  low = std::max(low, codePointsOfSize[size].first);
  high = std::min(high, codePointsOfSize[size].last);
  const bool onlySurrogates = low >= 0xD800 && high <= 0xDFFF;
  if (low > high || onlySurrogates) {
    return std::nullopt;
  }
  return Piece{bytes.size(), bytes.size() == size, low};
}

Piece NextPiece(std::string_view text) {
  for (std::size_t size = std::min<std::size_t>(4, text.size()); size > 0; --size) {
    if (const std::optional<Piece> piece = BeginningOfACharacter(text.substr(0, size))) {
      return *piece;
    }
  }
  return {};
}

bool IsXmlCharacter(std::uint32_t c) {
  return c == '\t' || c == '\n' || c == '\r' || (c >= 0x20 && c != 0xFFFE && c != 0xFFFF);
}

std::string Cleaned(std::string_view text) {
  std::string clean;
  while (!text.empty()) {
    const Piece piece = NextPiece(text);
    clean +=
        piece.whole && IsXmlCharacter(piece.character) ? std::string(text.substr(0, piece.size)) : replaced;
    text.remove_prefix(piece.size);
  }
  return clean;
}

void ExpectReadBack(const std::string& text) {
  const std::string expected = Cleaned(text);
  EXPECT_EQ(ReadAsText(Text(text)), expected) << testing::PrintToString(text);
  EXPECT_EQ(ReadAsAttribute(AttributeValue(text), '"'), expected) << testing::PrintToString(text);
  EXPECT_EQ(ReadAsAttribute(AttributeValue(text), '\''), expected) << testing::PrintToString(text);
}

TEST(XmlWriter, AppendsToWhatIsThere) {
  std::string out = "<a b='";
  AppendAttributeValue(out, "1");
  out += "'>";
  AppendText(out, "2");
  EXPECT_EQ(out, "<a b='1'>2");
}

TEST(XmlWriter, EscapesMarkupInTexts) {
  EXPECT_EQ(Text("a<b>&c ]]> \"'"), "a&lt;b&gt;&amp;c ]]&gt; \"'");
  EXPECT_EQ(Text("\t\n\r\n"), "\t\n&#13;\n");
}

TEST(XmlWriter, EscapesQuotesAndLineEndsInAttributes) {
  EXPECT_EQ(AttributeValue("<&>\"'"), "&lt;&amp;&gt;&quot;&apos;");
  EXPECT_EQ(AttributeValue("\t\n\r "), "&#9;&#10;&#13; ");
}

TEST(XmlWriter, KeepsEveryCharacterOfXml) {
  const std::string text =
      "\x7F\xC2\x80\xDF\xBF\xE0\xA0\x80\xED\x9F\xBF\xEE\x80\x80\xEF\xBF\xBD\xF0\x90\x80\x80\xF4\x8F\xBF\xBF";
  EXPECT_EQ(Text(text), text);
  EXPECT_EQ(AttributeValue(text), text);
}

struct Replacement {
  std::string text;
  std::size_t count;  // of U+FFFD written
};

TEST(XmlWriter, ReplacesWhatXmlCannotHold) {
  const Replacement replacements[] = {
      {std::string(1, '\0'), 1},
      {"\x01", 1},
      {"\x0B\x1F", 2},
      {"\xEF\xBF\xBE", 1},  // U+FFFE
      {"\xEF\xBF\xBF", 1},  // U+FFFF
      {"\xFF", 1},
      {"\x80\xBF", 2},
      {"\xC3", 1},      // cut off
      {"\xE2\x82", 1},  // cut off: one character was begun
      {"\xF0\x9F\x98", 1},
      {"\xF0\x9F\x98\xF0\x9F", 2},
      {"\xC0\x80", 2},  // overlong: no character begins with C0
      {"\xE0\x80\x80", 3},
      {"\xED\xA0\x80", 3},      // surrogate: no character begins with ED A0
      {"\xF4\x90\x80\x80", 4},  // beyond U+10FFFF
      {"\xF8\x88\x80\x80\x80", 5},
  };
  for (const Replacement& replacement : replacements) {
    std::string expected = "x";
    for (std::size_t i = 0; i < replacement.count; ++i) {
      expected += replaced;
    }
    expected += "y";
    const std::string text = "x" + replacement.text + "y";
    EXPECT_EQ(Text(text), expected) << testing::PrintToString(text);
    EXPECT_EQ(AttributeValue(text), expected) << testing::PrintToString(text);
  }
}

TEST(XmlWriter, EveryCodePointComesBack) {
  for (std::uint32_t first = 0; first < 0x110000; first += 0x1000) {
    std::string text;
    for (std::uint32_t c = first; c < first + 0x1000; ++c) {
      const auto put = [&](std::uint32_t byte) {
        text += static_cast<char>(static_cast<unsigned char>(byte));
      };
      if (c < 0x80) {
        put(c);
      } else {
        const std::uint32_t size = c < 0x800 ? 2 : c < 0x10000 ? 3 : 4;
        put(((0xF00u >> size) & 0xFFu) | (c >> (6 * (size - 1))));
        for (std::uint32_t tail = size - 1; tail > 0; --tail) {
          put(0x80u | ((c >> (6 * (tail - 1))) & 0x3Fu));
        }
      }
    }
    ExpectReadBack(text);
  }
}

// Bytes that make broken and whole characters, markup and line ends likely beside each other.
std::string AnyText(std::mt19937& random) {
  constexpr std::string_view likelyBytes =
      "\xC2\xE0\xED\xEF\xF0\xF4\x80\x90\x9F\xA0\xBE\xBF<>&'\"]\r\n\t a;#";
  std::string text(random() % 40, '\0');
  for (char& c : text) {
    c = random() % 4 == 0 ? static_cast<char>(random() % 256) : likelyBytes[random() % likelyBytes.size()];
  }
  return text;
}

TEST(XmlWriter, WhateverIsWrittenIsReadBackCleaned) {
  const TestSupport::Seed seed;
  std::mt19937 random(seed.Value());
  for (int round = 0; round < 20'000 && !HasFailure(); ++round) {
    ExpectReadBack(AnyText(random));
  }
}

}  // namespace
}  // namespace Orbis::Xml
