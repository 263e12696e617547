// What can be done with any value without knowing its type: copying, comparing, printing.
#pragma once

#include <string>

#include "orbis/Any.h"

namespace Orbis {

// A deep copy: nothing is shared with the original. Null gives null.
TESSA_API Ref<Any> CloneAny(const Any* value);

template <class T>
Ref<T> Clone(const Ref<T>& value) {
  return Ref<T>(static_cast<T*>(CloneAny(value.Get()).Get()));
}

// Same type, same fields. A null list and an empty one are equal; an unset field and an empty text are
// not.
TESSA_API bool Equal(const Any* left, const Any* right);

// Appends the value for people: (DiskIsUSB) {device = "naa.5"}. Never fails on a value: what is not set
// is left out, null is written as null.
TESSA_API void Print(const Any* value, std::string& out);

}  // namespace Orbis
