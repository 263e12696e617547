#include "orbis/xml/XmlWriter.h"

#include <array>
#include <cstddef>

namespace Orbis::Xml {

namespace {

constexpr std::string_view kReplacement = "\xEF\xBF\xBD";

// What is written for an ASCII character; empty: the character itself.
using Escapes = std::array<std::string_view, 128>;

constexpr Escapes TextEscapes() {
  Escapes escapes{};
  for (std::size_t control = 0; control < 0x20; ++control) {
    escapes[control] = kReplacement;
  }
  escapes['\t'] = {};
  escapes['\n'] = {};
  escapes['\r'] = "&#13;";  // a bare one would be read back as a line feed
  escapes['&'] = "&amp;";
  escapes['<'] = "&lt;";
  escapes['>'] = "&gt;";
  return escapes;
}

constexpr Escapes AttributeEscapes() {
  Escapes escapes = TextEscapes();
  escapes['\t'] = "&#9;";  // bare ones would be read back as blanks
  escapes['\n'] = "&#10;";
  escapes['"'] = "&quot;";
  escapes['\''] = "&apos;";
  return escapes;
}

constexpr Escapes kTextEscapes = TextEscapes();
constexpr Escapes kAttributeEscapes = AttributeEscapes();

// How a character of more than one byte may begin: its size, and the bounds of its second byte, which
// keep out overlong forms, surrogates and what lies beyond U+10FFFF.
struct LeadByte {
  unsigned char first;
  unsigned char last;
  std::size_t size;
  unsigned char secondFrom;
  unsigned char secondTo;
};

constexpr LeadByte kLeadBytes[] = {
    {0xC2, 0xDF, 2, 0x80, 0xBF}, {0xE0, 0xE0, 3, 0xA0, 0xBF}, {0xE1, 0xEC, 3, 0x80, 0xBF},
    {0xED, 0xED, 3, 0x80, 0x9F}, {0xEE, 0xEF, 3, 0x80, 0xBF}, {0xF0, 0xF0, 4, 0x90, 0xBF},
    {0xF1, 0xF3, 4, 0x80, 0xBF}, {0xF4, 0xF4, 4, 0x80, 0x8F},
};

unsigned char ByteAt(std::string_view text, std::size_t at) {
  return static_cast<unsigned char>(text[at]);
}

struct Character {
  std::size_t size;  // bytes of the character, or of what is replaced
  bool valid;
};

bool IsNonCharacter(std::string_view character) {
  return character == "\xEF\xBF\xBE" || character == "\xEF\xBF\xBF";
}

// The character that begins at `at`, where a byte beyond ASCII stands.
Character MeasureCharacter(std::string_view text, std::size_t at) {
  for (const LeadByte& lead : kLeadBytes) {
    if (ByteAt(text, at) < lead.first || ByteAt(text, at) > lead.last) {
      continue;
    }
    std::size_t size = 1;
    unsigned char from = lead.secondFrom;
    unsigned char to = lead.secondTo;
    while (size < lead.size && at + size < text.size() && ByteAt(text, at + size) >= from &&
           ByteAt(text, at + size) <= to) {
      ++size;
      from = 0x80;
      to = 0xBF;
    }
    return {size, size == lead.size && !IsNonCharacter(text.substr(at, size))};
  }
  return {1, false};
}

void Append(std::string& out, std::string_view text, const Escapes& escapes) {
  std::size_t copied = 0;  // everything before is in `out`
  std::size_t at = 0;
  const auto replace = [&](std::size_t size, std::string_view by) {
    out.append(text, copied, at - copied).append(by);
    at += size;
    copied = at;
  };
  while (at < text.size()) {
    if (const unsigned char c = ByteAt(text, at); c < 0x80) {
      if (escapes[c].empty()) {
        ++at;
      } else {
        replace(1, escapes[c]);
      }
    } else if (const Character character = MeasureCharacter(text, at); character.valid) {
      at += character.size;
    } else {
      replace(character.size, kReplacement);
    }
  }
  out.append(text, copied);
}

}  // namespace

void AppendText(std::string& out, std::string_view text) {
  Append(out, text, kTextEscapes);
}

void AppendAttributeValue(std::string& out, std::string_view text) {
  Append(out, text, kAttributeEscapes);
}

}  // namespace Orbis::Xml
