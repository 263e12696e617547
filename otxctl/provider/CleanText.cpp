#include "otxctl/provider/CleanText.h"

#include <array>
#include <cstdint>

namespace OtxCtl::Provider {
namespace {

constexpr std::size_t kLongestQuote = 120;

struct Character {
  std::uint32_t codePoint = 0;
  std::size_t length = 0;  // in bytes; 0: the text does not begin with a character
};

// The forms of UTF-8: the lead byte's fixed bits, and the smallest code point that may use the form.
struct Form {
  std::uint8_t mask;
  std::uint8_t lead;
  std::size_t length;
  std::uint32_t smallest;
};
constexpr std::array<Form, 4> kForms = {{
    {0x80, 0x00, 1, 0},
    {0xE0, 0xC0, 2, 0x80},
    {0xF0, 0xE0, 3, 0x800},
    {0xF8, 0xF0, 4, 0x10000},
}};

bool IsScalarValue(std::uint32_t codePoint) noexcept {
  const bool isSurrogate = codePoint >= 0xD800 && codePoint <= 0xDFFF;
  return codePoint <= 0x10FFFF && !isSurrogate;
}

// `text` is not empty.
Character Decode(std::string_view text) noexcept {
  const auto lead = static_cast<std::uint8_t>(text.front());
  for (const Form& form : kForms) {
    if ((lead & form.mask) != form.lead) {
      continue;
    }
    if (text.size() < form.length) {
      return {};
    }
    std::uint32_t codePoint = lead & static_cast<std::uint8_t>(~form.mask);
    for (std::size_t index = 1; index < form.length; ++index) {
      const auto next = static_cast<std::uint8_t>(text[index]);
      if ((next & 0xC0) != 0x80) {
        return {};
      }
      codePoint = codePoint << 6 | (next & 0x3FU);
    }
    const bool isValid = codePoint >= form.smallest && IsScalarValue(codePoint);
    return isValid ? Character{codePoint, form.length} : Character{};
  }
  return {};
}

bool IsControl(std::uint32_t codePoint) noexcept {
  return codePoint < 0x20 || (codePoint >= 0x7F && codePoint <= 0x9F);
}

// What no XML text can hold, and so neither a request nor an answer.
bool IsNoCharacter(std::uint32_t codePoint) noexcept {
  return codePoint == 0xFFFE || codePoint == 0xFFFF;
}

std::string Trimmed(const std::string& text) {
  const std::size_t first = text.find_first_not_of(' ');
  if (first == std::string::npos) {
    return {};
  }
  return text.substr(first, text.find_last_not_of(' ') - first + 1);
}

}  // namespace

bool IsCleanText(std::string_view text) noexcept {
  while (!text.empty()) {
    const Character next = Decode(text);
    if (next.length == 0 || IsControl(next.codePoint) || IsNoCharacter(next.codePoint)) {
      return false;
    }
    text.remove_prefix(next.length);
  }
  return true;
}

std::string CleanText(std::string_view text) {
  std::string clean;
  while (!text.empty()) {
    const Character next = Decode(text);
    if (next.length == 0) {
      clean += "\xEF\xBF\xBD";
      text.remove_prefix(1);
      continue;
    }
    if (IsNoCharacter(next.codePoint)) {
      clean += "\xEF\xBF\xBD";
    } else if (!IsControl(next.codePoint)) {
      clean += text.substr(0, next.length);
    }
    text.remove_prefix(next.length);
  }
  return Trimmed(clean);
}

std::string Shortened(std::string_view text) {
  if (text.size() <= kLongestQuote) {
    return std::string(text);
  }
  std::size_t end = 0;
  while (end < kLongestQuote) {
    const Character next = Decode(text.substr(end));
    end += next.length == 0 ? 1 : next.length;
  }
  return std::string(text.substr(0, end)) + "...";
}

std::string Quoted(std::string_view text) {
  return "\"" + Shortened(text) + "\"";
}

}  // namespace OtxCtl::Provider
