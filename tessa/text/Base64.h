// Bytes as base64 text, with padding: each list of bytes has one text only.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace Tessa {

void AppendBase64(const std::vector<std::uint8_t>& bytes, std::string& out);

// False, and the bytes as they were, if the text is not exactly base64: blanks, missing padding, bits set
// behind the last byte.
bool ParseBase64(std::string_view text, std::vector<std::uint8_t>& bytes);

}  // namespace Tessa
