// A counted reference to a Tessa::Object, or null.
//
// Threads: like a plain pointer. Two threads may hold Refs to one object; two threads must not write
// one Ref.
#pragma once

#include <cstddef>
#include <type_traits>
#include <utility>

namespace Tessa {

template <class T>
class Ref {
 public:
  Ref() noexcept = default;
  Ref(std::nullptr_t) noexcept {}
  Ref(T* object) : _object(object) { Take(); }
  Ref(const Ref& other) : _object(other._object) { Take(); }
  Ref(Ref&& other) noexcept : _object(std::exchange(other._object, nullptr)) {}

  template <class U>
  requires std::is_convertible_v<U*, T*> Ref(const Ref<U>& other) : _object(other.Get()) { Take(); }
  template <class U>
  requires std::is_convertible_v<U*, T*> Ref(Ref<U>&& other) : _object(other.Get()) {
    Take();
    other.Reset();
  }

  ~Ref() {
    if (_object != nullptr) {
      _object->DecRef();
    }
  }

  // The old object is released last, so that a release that reads this Ref sees the new one.
  Ref& operator=(Ref other) noexcept {
    std::swap(_object, other._object);
    return *this;
  }

  T* Get() const noexcept { return _object; }
  T* operator->() const noexcept { return _object; }
  T& operator*() const noexcept { return *_object; }
  explicit operator bool() const noexcept { return _object != nullptr; }

  // Lets go of the object. Unlike a destructor it can pass on what a release throws; it is null even then.
  void Reset() {
    if (T* const object = std::exchange(_object, nullptr)) {
      object->DecRef();
    }
  }

  friend bool operator==(const Ref& left, const Ref& right) noexcept { return left._object == right._object; }
  friend bool operator==(const Ref& left, const T* right) noexcept { return left._object == right; }
  friend bool operator==(const Ref& left, std::nullptr_t) noexcept { return left._object == nullptr; }

 private:
  void Take() const {
    if (_object != nullptr) {
      _object->IncRef();
    }
  }

  T* _object = nullptr;
};

// A new object and the first reference to it.
template <class T, class... Args>
Ref<T> MakeRef(Args&&... args) {
  return Ref<T>(new T(std::forward<Args>(args)...));
}

}  // namespace Tessa
