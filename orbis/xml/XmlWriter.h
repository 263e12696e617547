// Escapes texts into XML that is being written.
//
// Both functions append to `out` and never fail on what the text holds, for a device or a program can
// put anything into a name: what XML 1.0 cannot hold (control characters, U+FFFE, U+FFFF) and what is
// not UTF-8 becomes U+FFFD. Of broken UTF-8 every longest beginning of a character, or else every single
// byte, becomes one U+FFFD; an encoded surrogate therefore becomes three.
//
// Threads: any; there is no state.
#pragma once

#include <string>
#include <string_view>

namespace Orbis::Xml {

// As character data. A reader gets back the very text, carriage returns included.
void AppendText(std::string& out, std::string_view text);

// Between quotes of either kind. A reader gets back the very text, tabs and line ends included.
void AppendAttributeValue(std::string& out, std::string_view text);

}  // namespace Orbis::Xml
