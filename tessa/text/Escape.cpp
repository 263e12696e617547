#include "tessa/text/Escape.h"

#include "tessa/text/Utf8.h"

namespace Tessa {
namespace {

constexpr std::size_t longestAscii = 64;
constexpr std::size_t longestAbbreviated = 120;
constexpr std::string_view special = "\"'<>&\\`";

bool IsControl(char32_t codePoint) noexcept {
  return codePoint < 0x20 || (codePoint >= 0x7F && codePoint <= 0x9F);
}

bool IsPrintable(const Utf8Character& character) noexcept {
  return character.isValid && !IsControl(character.codePoint) && !IsNonCharacter(character.codePoint);
}

bool IsPlainAscii(char byte) noexcept {
  return byte >= ' ' && byte <= '~' && special.find(byte) == std::string_view::npos;
}

void AppendHex(std::string_view bytes, std::string& out) {
  constexpr std::string_view digits = "0123456789abcdef";
  for (const char byte : bytes) {
    const auto value = static_cast<unsigned char>(byte);
    out.append("\\x").append({digits[value >> 4], digits[value & 15]});
  }
}

std::string Trimmed(const std::string& text) {
  const std::size_t first = text.find_first_not_of(' ');
  if (first == std::string::npos) {
    return {};
  }
  return text.substr(first, text.find_last_not_of(' ') - first + 1);
}

}  // namespace

bool IsPrintable(std::string_view text) noexcept {
  while (!text.empty()) {
    const Utf8Character next = FirstCharacter(text);
    if (!IsPrintable(next)) {
      return false;
    }
    text.remove_prefix(next.size);
  }
  return true;
}

std::string Escape(std::string_view text) {
  std::string escaped;
  while (!text.empty()) {
    const Utf8Character next = FirstCharacter(text);
    const std::string_view bytes = text.substr(0, next.size);
    if (IsPrintable(next)) {
      escaped += bytes;
    } else {
      AppendHex(bytes, escaped);
    }
    text.remove_prefix(next.size);
  }
  return escaped;
}

std::string EscapeToAscii(std::string_view text) {
  std::string escaped;
  for (const char byte : text.substr(0, longestAscii)) {
    if (IsPlainAscii(byte)) {
      escaped += byte;
    } else {
      AppendHex({&byte, 1}, escaped);
    }
  }
  return text.size() > longestAscii ? escaped + ".." : escaped;
}

std::string Sanitize(std::string_view text) {
  std::string sane;
  while (!text.empty()) {
    const Utf8Character next = FirstCharacter(text);
    const std::string_view bytes = text.substr(0, next.isValid ? next.size : 1);
    if (IsPrintable(next)) {
      sane += bytes;
    } else if (!next.isValid || IsNonCharacter(next.codePoint)) {
      sane += replacementCharacter;
    }
    text.remove_prefix(bytes.size());
  }
  return Trimmed(sane);
}

std::string_view Excerpt(std::string_view text, std::size_t most) {
  constexpr std::size_t mostContinuations = 3;
  if (text.size() <= most) {
    return text;
  }
  std::size_t end = most;
  while (end > 0 && most - end < mostContinuations && IsContinuationByte(text[end])) {
    --end;
  }
  return text.substr(0, IsContinuationByte(text[end]) ? most : end);
}

std::string Abbreviate(std::string_view text) {
  if (text.size() <= longestAbbreviated) {
    return std::string(text);
  }
  std::size_t end = 0;
  while (end < longestAbbreviated) {
    end += FirstCharacter(text.substr(end)).size;
  }
  return std::string(text.substr(0, end)) + "...";
}

std::string Quote(std::string_view text) {
  return "\"" + Abbreviate(text) + "\"";
}

}  // namespace Tessa
