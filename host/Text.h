// Texts from outside, made fit to be shown.
#pragma once

#include <string>
#include <string_view>

namespace Host {

// The text with control characters and bytes that are not UTF-8 written as "\xNN", so that it can neither
// move the cursor of a terminal nor begin a line of its own.
std::string Printable(std::string_view text);

// Whether the text is UTF-8 without control characters.
bool IsClean(std::string_view text);

}  // namespace Host
