// Texts that nobody vouches for, made fit for messages, logs, answers and terminals.
//
// Threads: any; nothing is kept.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace Tessa {

// Whether the text may go everywhere and come back as it was: UTF-8 without control characters (U+0000 to
// U+001F and U+007F to U+009F), and without U+FFFE and U+FFFF, which XML cannot hold.
bool IsPrintable(std::string_view text) noexcept;

// The text with the bytes of all that is not printable written as "\xNN", so that it can neither move the
// cursor of a terminal nor begin a line of its own.
std::string Escape(std::string_view text);

// Letters, digits and what cannot end a quotation or begin a tag, a line or an escape; every other byte is
// written as "\xNN". Cut off after some 64 bytes.
std::string EscapeToAscii(std::string_view text);

// The text without control characters and without blanks at either end. Bytes that are no UTF-8, and what
// XML cannot hold, become U+FFFD, one for each.
std::string Sanitize(std::string_view text);

// The front of a long text: at most `most` bytes, cut between two characters of UTF-8. A text that is not
// UTF-8 is cut no earlier than a character is long.
std::string_view Excerpt(std::string_view text, std::size_t most = 64);

// The text for a message, cut short after some 120 bytes, and three dots to tell it. `text` must be
// printable.
std::string Abbreviate(std::string_view text);

// The same in quotes.
std::string Quote(std::string_view text);

}  // namespace Tessa
