#include "tessa/text/Base64.h"

#include <algorithm>
#include <array>

namespace Tessa {
namespace {

using Bytes = std::vector<std::uint8_t>;

constexpr std::string_view alphabet = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
constexpr std::uint8_t invalid = 0xff;

constexpr std::array<std::uint8_t, 256> MakeValues() {
  std::array<std::uint8_t, 256> values{};
  values.fill(invalid);
  for (std::size_t i = 0; i < alphabet.size(); ++i) {
    values[static_cast<unsigned char>(alphabet[i])] = static_cast<std::uint8_t>(i);
  }
  return values;
}
constexpr std::array<std::uint8_t, 256> values = MakeValues();

}  // namespace

void AppendBase64(const Bytes& bytes, std::string& out) {
  out.reserve(out.size() + (bytes.size() + 2) / 3 * 4);
  for (std::size_t at = 0; at < bytes.size(); at += 3) {
    const std::size_t count = std::min<std::size_t>(3, bytes.size() - at);
    unsigned bits = 0;
    for (std::size_t i = 0; i < 3; ++i) {
      bits = bits << 8 | (i < count ? bytes[at + i] : 0u);
    }
    for (std::size_t digit = 0; digit < 4; ++digit) {
      out.push_back(digit <= count ? alphabet[bits >> (18 - 6 * digit) & 63] : '=');
    }
  }
}

bool ParseBase64(std::string_view text, Bytes& bytes) {
  if (text.size() % 4 != 0) {
    return false;
  }
  Bytes read;
  read.reserve(text.size() / 4 * 3);
  for (std::size_t at = 0; at < text.size(); at += 4) {
    const bool last = at + 4 == text.size();
    const std::size_t padding = !last || text[at + 3] != '=' ? 0 : text[at + 2] != '=' ? 1 : 2;
    unsigned bits = 0;
    for (std::size_t i = 0; i < 4; ++i) {
      const std::uint8_t value =
          i < 4 - padding ? values[static_cast<unsigned char>(text[at + i])] : std::uint8_t{0};
      if (value == invalid) {
        return false;
      }
      bits = bits << 6 | value;
    }
    if ((bits & ((1u << (8 * padding)) - 1)) != 0) {
      return false;
    }
    for (std::size_t i = 0; i < 3 - padding; ++i) {
      read.push_back(static_cast<std::uint8_t>(bits >> (16 - 8 * i)));
    }
  }
  bytes = std::move(read);
  return true;
}

}  // namespace Tessa
