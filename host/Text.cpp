#include "host/Text.h"

#include "otxctl/provider/CleanText.h"

namespace Host {
namespace {

constexpr std::size_t longestCharacter = 4;

// How many bytes of the front are one clean character; 0 when none are.
std::size_t CleanPrefix(std::string_view text) {
  for (std::size_t length = 1; length <= longestCharacter && length <= text.size(); ++length) {
    if (OtxCtl::Provider::IsCleanText(text.substr(0, length))) {
      return length;
    }
  }
  return 0;
}

}  // namespace

std::string Printable(std::string_view text) {
  constexpr std::string_view digits = "0123456789abcdef";
  if (IsClean(text)) {
    return std::string(text);
  }
  std::string shown;
  while (!text.empty()) {
    const std::size_t length = CleanPrefix(text);
    if (length == 0) {
      const auto byte = static_cast<unsigned char>(text.front());
      shown.append("\\x").append({digits[byte >> 4], digits[byte & 15]});
    } else {
      shown.append(text.substr(0, length));
    }
    text.remove_prefix(length == 0 ? 1 : length);
  }
  return shown;
}

bool IsClean(std::string_view text) {
  return OtxCtl::Provider::IsCleanText(text);
}

}  // namespace Host
