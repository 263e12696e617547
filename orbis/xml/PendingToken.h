// Looks into a token whose end has not come yet.
//
// A parser must keep a tag or a comment until it is complete, and would keep megabytes of one that
// can only be refused in the end. This finds out early, in one pass over the bytes, and says so only
// when the finished token is certain to break a bound: the exact bounds are checked on the finished one.
#pragma once

#include <cstddef>
#include <string_view>

#include "orbis/Limits.h"

namespace Orbis::Xml {

class PendingToken {
 public:
  explicit PendingToken(const Limits& limits) : _limits(limits) {}

  // `text`: what was read so far; `start`: where the unfinished token begins. Calls for one token
  // continue where the last one stopped. Returns why the token cannot be accepted, or an empty text.
  std::string_view Examine(std::string_view text, std::size_t start);

 private:
  std::string_view ExamineTag(std::string_view text);
  void StepOutsideQuotes(char c);
  void StepInsideQuotes(char c);

  Limits _limits;
  std::size_t _start = static_cast<std::size_t>(-1);
  std::size_t _next = 0;       // the first byte not yet looked at
  std::size_t _nameBytes = 0;  // of the name that is going on
  std::size_t _valueBytes = 0;
  std::size_t _values = 0;
  char _quote = '\0';  // '\0': outside quotes
  bool _reference = false;
};

}  // namespace Orbis::Xml
