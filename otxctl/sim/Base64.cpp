#include "otxctl/sim/Base64.h"

namespace OtxCtl::Sim {
namespace {

constexpr std::string_view kDigits = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

std::optional<std::uint32_t> ValueOf(char digit) {
  const std::size_t position = kDigits.find(digit);
  if (position == std::string_view::npos) {
    return std::nullopt;
  }
  return static_cast<std::uint32_t>(position);
}

}  // namespace

std::string EncodeBase64(const std::vector<std::uint8_t>& bytes) {
  std::string text;
  text.reserve((bytes.size() + 2) / 3 * 4);
  for (std::size_t start = 0; start < bytes.size(); start += 3) {
    const std::size_t count = bytes.size() - start < 3 ? bytes.size() - start : 3;
    std::uint32_t bits = 0;
    for (std::size_t index = 0; index < 3; ++index) {
      bits = bits << 8 | (index < count ? bytes[start + index] : 0U);
    }
    for (std::size_t index = 0; index < 4; ++index) {
      text += index <= count ? kDigits[bits >> (18 - 6 * index) & 0x3FU] : '=';
    }
  }
  return text;
}

std::optional<std::vector<std::uint8_t>> DecodeBase64(std::string_view text) {
  if (text.size() % 4 != 0) {
    return std::nullopt;
  }
  std::string_view digits = text;
  for (int padding = 0; padding < 2 && !digits.empty() && digits.back() == '='; ++padding) {
    digits.remove_suffix(1);
  }
  std::vector<std::uint8_t> bytes;
  bytes.reserve(digits.size() * 3 / 4);
  std::uint32_t bits = 0;
  int bitCount = 0;
  for (const char digit : digits) {
    const std::optional<std::uint32_t> value = ValueOf(digit);
    if (!value) {
      return std::nullopt;
    }
    bits = (bits << 6 | *value) & 0xFFFFU;
    bitCount += 6;
    if (bitCount >= 8) {
      bitCount -= 8;
      bytes.push_back(static_cast<std::uint8_t>(bits >> bitCount));
    }
  }
  // What is left over has to be zero, so that each list of bytes has one text only.
  const std::uint32_t stray = bits & ((1U << bitCount) - 1U);
  if (stray != 0) {
    return std::nullopt;
  }
  return bytes;
}

}  // namespace OtxCtl::Sim
