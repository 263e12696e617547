// The root of everything the data binding can carry, and the boxes for simple values.
//
// Threads: values are not guarded. One that several threads read must not be written meanwhile.
#pragma once

#include <compare>
#include <cstdint>
#include <string>
#include <vector>

#include "tessa/Object.h"
#include "tessa/Ref.h"

namespace Orbis {

using Tessa::MakeRef;
using Tessa::Ref;

struct TypeDescriptor;

class TESSA_API Any : public Tessa::ObjectImpl {
 public:
  virtual const TypeDescriptor& GetType() const = 0;

  // The value as orbis/Print.h prints it.
  std::string ToString() const override;

 protected:
  Any() = default;
  Any(const Any&) = default;
  Any& operator=(const Any&) = default;
  ~Any() override;
};

// A moment, in microseconds since 1970-01-01T00:00:00Z. Years 1 to 9999.
struct DateTime {
  std::int64_t microseconds = 0;

  friend auto operator<=>(const DateTime&, const DateTime&) = default;
};

using Bytes = std::vector<std::uint8_t>;

// A simple value that stands where a value of any type may stand.
template <class T>
class TESSA_API Boxed final : public Any {
 public:
  explicit Boxed(T value = T()) : _value(std::move(value)) {}

  static const TypeDescriptor& StaticType();
  const TypeDescriptor& GetType() const override { return StaticType(); }

  const T& GetValue() const noexcept { return _value; }
  T& Value() noexcept { return _value; }

 private:
  T _value;
};

extern template class Boxed<bool>;
extern template class Boxed<std::int32_t>;
extern template class Boxed<std::int64_t>;
extern template class Boxed<DateTime>;
extern template class Boxed<std::string>;
extern template class Boxed<Bytes>;

using Binary = Boxed<Bytes>;

// A list of texts.
class TESSA_API TextList final : public Any {
 public:
  TextList() = default;
  explicit TextList(std::vector<std::string> items) : _items(std::move(items)) {}

  static const TypeDescriptor& StaticType();
  const TypeDescriptor& GetType() const override { return StaticType(); }

  const std::vector<std::string>& Items() const noexcept { return _items; }
  std::vector<std::string>& Items() noexcept { return _items; }

 private:
  std::vector<std::string> _items;
};

}  // namespace Orbis
