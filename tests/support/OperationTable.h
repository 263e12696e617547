// Where a virtual operation stands in its class's operation table, on platforms whose pointers to members
// tell.
#pragma once

#include <cstddef>
#include <cstring>
#include <stdexcept>
#include <type_traits>

namespace TestSupport {

#if defined(__x86_64__) && defined(__GXX_ABI_VERSION)
#define TEST_SUPPORT_KNOWS_OPERATION_TABLES
// A pointer to a virtual member holds its offset in the table plus one.
template <class Method>
std::size_t SlotOf(Method method) {
  std::size_t words[2] = {};
  static_assert(sizeof method == sizeof words);
  std::memcpy(words, &method, sizeof words);
  if (words[0] % sizeof(void*) != 1) {
    throw std::invalid_argument("not virtual");
  }
  return words[0] / sizeof(void*);
}
#endif

// Whether the class has that base, and virtually: only then there is no way down from it without a search.
template <class Derived, class Base>
constexpr bool hasVirtualBase = std::is_convertible_v<Derived*, Base*> && !requires(Base * base) {
  static_cast<Derived*>(base);
};

}  // namespace TestSupport
