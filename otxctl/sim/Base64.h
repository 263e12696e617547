// Base64 with padding, as JSON texts carry bytes.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace OtxCtl::Sim {

std::string EncodeBase64(const std::vector<std::uint8_t>& bytes);

// Nothing for a text that EncodeBase64 would not write: blanks, missing padding, stray bits.
std::optional<std::vector<std::uint8_t>> DecodeBase64(std::string_view text);

}  // namespace OtxCtl::Sim
