// Bytes as base64 text, with padding.
#pragma once

#include <string>
#include <string_view>

#include "orbis/Any.h"

namespace Orbis {

void AppendBase64(const Bytes& bytes, std::string& out);

// False, and the bytes as they were, if the text is not exactly base64: blanks, missing padding, bits set
// behind the last byte.
bool ParseBase64(std::string_view text, Bytes& bytes);

}  // namespace Orbis
