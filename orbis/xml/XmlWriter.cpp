#include "orbis/xml/XmlWriter.h"

#include <array>
#include <cstddef>

#include "tessa/text/Utf8.h"

namespace Orbis::Xml {

namespace {

// What is written for an ASCII character; empty: the character itself.
using Escapes = std::array<std::string_view, 128>;

constexpr Escapes TextEscapes() {
  Escapes escapes{};
  for (std::size_t control = 0; control < 0x20; ++control) {
    escapes[control] = Tessa::replacementCharacter;
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

constexpr Escapes textEscapes = TextEscapes();
constexpr Escapes attributeEscapes = AttributeEscapes();

void Append(std::string& out, std::string_view text, const Escapes& escapes) {
  std::size_t copied = 0;  // everything before is in `out`
  std::size_t at = 0;
  const auto replace = [&](std::size_t size, std::string_view by) {
    out.append(text, copied, at - copied).append(by);
    at += size;
    copied = at;
  };
  while (at < text.size()) {
    if (const auto c = static_cast<unsigned char>(text[at]); c < 0x80) {
      if (escapes[c].empty()) {
        ++at;
      } else {
        replace(1, escapes[c]);
      }
    } else if (const Tessa::Utf8Character character = Tessa::FirstCharacter(text.substr(at));
               character.isValid && !Tessa::IsNonCharacter(character.codePoint)) {
      at += character.size;
    } else {
      replace(character.size, Tessa::replacementCharacter);
    }
  }
  out.append(text, copied);
}

}  // namespace

void AppendText(std::string& out, std::string_view text) {
  Append(out, text, textEscapes);
}

void AppendAttributeValue(std::string& out, std::string_view text) {
  Append(out, text, attributeEscapes);
}

}  // namespace Orbis::Xml
