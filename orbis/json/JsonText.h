// JSON texts: read into a tree of values, bounded as JsonEvents.h says, and written.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "orbis/Limits.h"

namespace Orbis::Json {

enum class Kind { Null, Boolean, Integer, Number, String, Array, Object };

struct Member;

struct Value {
  Kind kind = Kind::Null;
  int line = 0;
  bool boolean = false;
  std::int64_t integer = 0;  // Integer; what does not fit in 64 bits is a Number
  std::string text;          // String; of a Number, the digits as they stood
  std::vector<Value> items;
  std::vector<Member> members;  // in order; no key twice

  // The member of that key, or null.
  const Value* Find(std::string_view key) const noexcept;
};

struct Member {
  std::string key;
  Value value;
};

// "an object", "the text 'x'", for messages.
std::string Describe(const Value& value);

// Throws ParseException.
Value Parse(std::string_view text, const Limits& limits);

// Whether the character stands for itself in a JSON string, alone.
constexpr bool IsPlain(char character) {
  return character >= ' ' && character < 0x7F && character != '"' && character != '\\';
}

// Appends a JSON string, quotes included. What is not UTF-8 becomes U+FFFD.
void AppendString(std::string_view text, std::string& out);

}  // namespace Orbis::Json
