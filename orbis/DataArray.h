// Lists of data objects.
#pragma once

#include <cstddef>
#include <utility>
#include <vector>

#include "orbis/Any.h"

namespace Orbis {

// What a list is, whatever its elements. Elements may be null.
class TESSA_API DataArrayBase : public Any {
 public:
  std::size_t Size() const noexcept { return _items.size(); }
  bool IsEmpty() const noexcept { return _items.empty(); }
  void Reserve(std::size_t count) { _items.reserve(count); }
  const std::vector<Ref<Any>>& Items() const noexcept { return _items; }

  // Appends null or an object of the element type or one derived from it; any other throws
  // Tessa::TypeMismatchException and leaves the list as it was.
  void AppendAny(Ref<Any> element);

 protected:
  DataArrayBase() = default;
  DataArrayBase(const DataArrayBase&) = default;
  DataArrayBase& operator=(const DataArrayBase&) = default;
  ~DataArrayBase() override;

  std::vector<Ref<Any>> _items;
};

const TypeDescriptor& ArrayTypeOf(const TypeDescriptor& element);

template <class T>
class TESSA_API DataArray final : public DataArrayBase {
 public:
  static const TypeDescriptor& StaticType() { return ArrayTypeOf(T::StaticType()); }
  const TypeDescriptor& GetType() const override { return StaticType(); }

  void Append(Ref<T> element) { _items.push_back(std::move(element)); }
  // Puts it in the place of another. No bounds are checked.
  void Replace(std::size_t index, Ref<T> element) { _items[index] = std::move(element); }

  // The element, borrowed; the list keeps it. No bounds are checked.
  T* operator[](std::size_t index) const noexcept { return static_cast<T*>(_items[index].Get()); }

  class Iterator {
   public:
    explicit Iterator(const Ref<Any>* at) noexcept : _at(at) {}
    T* operator*() const noexcept { return static_cast<T*>(_at->Get()); }
    Iterator& operator++() noexcept {
      ++_at;
      return *this;
    }
    bool operator==(const Iterator&) const noexcept = default;

   private:
    const Ref<Any>* _at;
  };
  Iterator begin() const noexcept { return Iterator(_items.data()); }
  Iterator end() const noexcept { return Iterator(_items.data() + _items.size()); }
};

}  // namespace Orbis
