#include "otxctl/provider/CleanText.h"

#include "tessa/text/Utf8.h"

namespace OtxCtl::Provider {
namespace {

using Tessa::FirstCharacter;
using Tessa::IsNonCharacter;
using Tessa::replacementCharacter;
using Tessa::Utf8Character;

constexpr std::size_t kLongestQuote = 120;

bool IsControl(char32_t codePoint) noexcept {
  return codePoint < 0x20 || (codePoint >= 0x7F && codePoint <= 0x9F);
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
    const Utf8Character next = FirstCharacter(text);
    if (!next.isValid || IsControl(next.codePoint) || IsNonCharacter(next.codePoint)) {
      return false;
    }
    text.remove_prefix(next.size);
  }
  return true;
}

std::string CleanText(std::string_view text) {
  std::string clean;
  while (!text.empty()) {
    const Utf8Character next = FirstCharacter(text);
    if (!next.isValid) {
      clean += replacementCharacter;
      text.remove_prefix(1);
      continue;
    }
    if (IsNonCharacter(next.codePoint)) {
      clean += replacementCharacter;
    } else if (!IsControl(next.codePoint)) {
      clean += text.substr(0, next.size);
    }
    text.remove_prefix(next.size);
  }
  return Trimmed(clean);
}

std::string Shortened(std::string_view text) {
  if (text.size() <= kLongestQuote) {
    return std::string(text);
  }
  std::size_t end = 0;
  while (end < kLongestQuote) {
    end += FirstCharacter(text.substr(end)).size;
  }
  return std::string(text.substr(0, end)) + "...";
}

std::string Quoted(std::string_view text) {
  return "\"" + Shortened(text) + "\"";
}

}  // namespace OtxCtl::Provider
