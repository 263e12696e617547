#include "agentd/http/Shown.h"

namespace Agentd {
namespace {

constexpr std::size_t longest = 64;
constexpr std::string_view digits = "0123456789abcdef";
constexpr std::string_view special = "\"'<>&\\`";

bool IsPlain(char byte) {
  return byte >= ' ' && byte <= '~' && special.find(byte) == std::string_view::npos;
}

}  // namespace

std::string Shown(std::string_view text) {
  std::string shown;
  for (const char byte : text.substr(0, longest)) {
    if (IsPlain(byte)) {
      shown.push_back(byte);
      continue;
    }
    const auto value = static_cast<unsigned char>(byte);
    shown.append("\\x").append({digits[value >> 4], digits[value & 15]});
  }
  return text.size() > longest ? shown + ".." : shown;
}

}  // namespace Agentd
