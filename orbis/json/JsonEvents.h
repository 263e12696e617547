// The one bounded reader of JSON texts that nobody vouches for: text in, events out, in the order of the
// text. Bounded in size, depth, number of values and length of texts; no key may stand twice in an object.
// Who makes something of the events, and words of what is refused, is its handler.
//
// Threads: any; a handler is called by the thread that reads.
#pragma once

#include <cstddef>
#include <cstdint>
#include <set>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "orbis/Limits.h"

namespace Orbis::Json {

struct Float {
  double value;
  std::string digits;  // as they stood
};

// A value that holds no others. A whole number below zero is signed; one that no 64 bits hold is a Float.
using Scalar = std::variant<std::nullptr_t, bool, std::int64_t, std::uint64_t, Float, std::string>;

// An array or object that is open where the reader stands.
struct Level {
  bool isArray;
  std::size_t count = 0;             // of the values in it, as far as they were read
  const std::string* key = nullptr;  // of the member that was read last
  std::set<std::string> keys;        // ordered, not hashed: a sender must not be able to choose collisions
};

enum class Bound { Bytes, Depth, Values, Length, UniqueKeys, Syntax };

// What a text breaks, and where.
struct Refusal {
  Bound bound;
  std::string reason;       // in words; of Syntax the library's, which may hold any bytes of the text
  int line;                 // from 1; 0 of Bytes, which is refused unread
  std::size_t position;     // of Syntax: how many bytes were read, the one that is refused among them
  std::string_view newKey;  // of UniqueKeys: the one that stands there again
  const std::vector<Level>& levels;  // from the root
};

class EventHandler {
 public:
  virtual ~EventHandler() = default;

  // A value, or the beginning of one that holds others. `line` is where it ends, or begins to hold them.
  virtual void OnScalar(Scalar&& value, int line) = 0;
  virtual void OnOpen(bool isArray, int line) = 0;
  virtual void OnClose() = 0;
  // Of the member whose value comes next.
  virtual void OnKey(std::string key) = 0;
  // Must throw.
  virtual void OnRefusal(const Refusal& refusal) = 0;
};

void ReadEvents(std::string_view text, const Limits& limits, EventHandler& handler);

}  // namespace Orbis::Json
