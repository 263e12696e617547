// Asking an object for the type it really has.
#pragma once

#include "tessa/Ref.h"
#include "tessa/Throwable.h"
#include "tessa/TypeName.h"

namespace Tessa {

// The same object as a T. Null stays null; an object of another type throws TypeMismatchException.
template <class T, class U>
Ref<T> NarrowToType(const Ref<U>& object) {
  T* const narrowed = dynamic_cast<T*>(object.Get());
  if (object && narrowed == nullptr) {
    TypeMismatchException::Throw(TypeName(typeid(T)), object->ToString());
  }
  return Ref<T>(narrowed);
}

}  // namespace Tessa
