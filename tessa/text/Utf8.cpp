#include "tessa/text/Utf8.h"

#include <utf8.h>

#include <algorithm>
#include <array>

namespace Tessa {
namespace {

constexpr std::size_t longestCharacter = 4;

// How many bytes of a text whose first character is broken begin one that would be valid if only
// continuation bytes followed; at least 1. Its second byte decides that, so any of them will do.
std::size_t SizeOfBroken(std::string_view text) noexcept {
  for (std::size_t size = std::min(text.size(), longestCharacter - 1); size > 1; --size) {
    std::array<char, longestCharacter> completed;
    completed.fill('\x80');
    text.copy(completed.data(), size);
    for (std::size_t whole = size + 1; whole <= longestCharacter; ++whole) {
      if (utf8::is_valid(std::string_view(completed.data(), whole))) {
        return size;
      }
    }
  }
  return 1;
}

}  // namespace

Utf8Character FirstCharacter(std::string_view text) noexcept {
  const std::string_view front = text.substr(0, longestCharacter);
  if (utf8::find_invalid(front) == 0) {
    return {SizeOfBroken(front), U'\uFFFD', false};
  }
  const char* end = front.data();
  const char32_t codePoint = utf8::unchecked::next(end);
  return {static_cast<std::size_t>(end - front.data()), codePoint, true};
}

bool IsValidUtf8(std::string_view text) noexcept {
  return utf8::is_valid(text);
}

std::string ReplaceInvalidUtf8(std::string_view text) {
  std::string valid;
  while (!text.empty()) {
    const std::string_view run = text.substr(0, utf8::find_invalid(text));
    valid += run;
    text.remove_prefix(run.size());
    if (!text.empty()) {
      valid += replacementCharacter;
      text.remove_prefix(FirstCharacter(text).size);
    }
  }
  return valid;
}

std::size_t CountCharacters(std::string_view text) noexcept {
  return static_cast<std::size_t>(utf8::unchecked::distance(text.begin(), text.end()));
}

}  // namespace Tessa
