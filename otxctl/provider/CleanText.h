// Texts that may go everywhere and come back as they were: valid UTF-8 without control characters, and
// without U+FFFE and U+FFFF, which XML cannot hold.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace OtxCtl::Provider {

// Control characters are U+0000 to U+001F and U+007F to U+009F.
bool IsCleanText(std::string_view text) noexcept;

// The text without control characters and without blanks at either end. Bytes that are no UTF-8, and what
// XML cannot hold, become U+FFFD, one for each.
std::string CleanText(std::string_view text);

// The text for a message, cut short if it is long. `text` must be clean.
std::string Shortened(std::string_view text);

// The same in quotes.
std::string Quoted(std::string_view text);

}  // namespace OtxCtl::Provider
