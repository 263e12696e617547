// The front of a long text, for messages.
#pragma once

#include <string_view>

#include "tessa/text/Utf8.h"

namespace Orbis {

// At most `most` bytes of the text, cut between two characters of UTF-8. A text that is not UTF-8 is cut no
// earlier than a character is long.
inline std::string_view Excerpt(std::string_view text, std::size_t most = 64) {
  constexpr std::size_t mostContinuations = 3;
  if (text.size() <= most) {
    return text;
  }
  std::size_t end = most;
  const auto isInside = [&] { return Tessa::IsContinuationByte(text[end]); };
  while (end > 0 && most - end < mostContinuations && isInside()) {
    --end;
  }
  return text.substr(0, isInside() ? most : end);
}

}  // namespace Orbis
