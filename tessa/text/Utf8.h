// UTF-8, as one library checks it for the whole program: no overlong forms, no surrogates, nothing beyond
// U+10FFFF. The one place that knows the library.
//
// Threads: any; nothing is kept.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace Tessa {

constexpr std::string_view replacementCharacter = "\xEF\xBF\xBD";  // U+FFFD

// What a text begins with.
struct Utf8Character {
  std::size_t size;    // in bytes, never 0
  char32_t codePoint;  // U+FFFD when broken
  bool isValid;
};

// `text` must not be empty. Of broken UTF-8 the longest beginning of a character counts as one, or else a
// single byte: "\xE2\x82" is one broken character, an encoded surrogate three.
Utf8Character FirstCharacter(std::string_view text) noexcept;

bool IsValidUtf8(std::string_view text) noexcept;

// The text with U+FFFD for each broken character.
std::string ReplaceInvalidUtf8(std::string_view text);

// `text` must be valid.
std::size_t CountCharacters(std::string_view text) noexcept;

// Whether the byte stands inside of a character.
constexpr bool IsContinuationByte(char byte) noexcept {
  return (static_cast<unsigned char>(byte) & 0xC0) == 0x80;
}

// The two characters that no XML text can hold, though UTF-8 has them.
constexpr bool IsNonCharacter(char32_t codePoint) noexcept {
  return codePoint == 0xFFFE || codePoint == 0xFFFF;
}

}  // namespace Tessa
