// One thing about a disk that its source may not know.
#pragma once

#include <cassert>
#include <optional>
#include <string>
#include <utility>

namespace OtxCtl::Disks {

// Either a value, or why nobody knows it, in words that name what would have told it. A fact that nobody has
// looked for is unknown too. There is no way to read an unknown fact as if it were known.
template <typename Value>
class Fact {
 public:
  Fact() = default;
  Fact(Value value) : _value(std::move(value)) {}  // NOLINT(google-explicit-constructor): facts are values

  static Fact Unknown(std::string why) {
    Fact fact;
    fact._why = std::move(why);
    return fact;
  }

  bool IsKnown() const noexcept { return _value.has_value(); }

  const Value& Get() const {
    assert(IsKnown());
    return *_value;
  }

  const std::string& WhyUnknown() const noexcept { return _why; }

  // Known, and the same as `value`.
  bool Is(const Value& value) const { return _value == value; }

 private:
  std::optional<Value> _value;
  std::string _why = "nobody has looked";
};

}  // namespace OtxCtl::Disks
