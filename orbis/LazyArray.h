// A list that an object makes when somebody first asks for it.
#pragma once

#include <atomic>

#include "orbis/DataArray.h"

namespace Orbis {

// Threads: any number may read, also while the list is being made: a thread that loses the race to make
// it releases its own and uses the winner's. Replacing the list is an atomic exchange; but who replaces
// it releases the old one, so nobody may then be reading it.
template <class T>
class LazyArray {
 public:
  LazyArray() noexcept = default;
  LazyArray(const LazyArray& other) { Replace(other.Get()); }
  LazyArray& operator=(const LazyArray& other) {
    Replace(other.Get());
    return *this;
  }
  LazyArray& operator=(Ref<DataArray<T>> list) {
    Replace(list.Get());
    return *this;
  }
  ~LazyArray() { Replace(nullptr); }

  // The list, or null when nobody has asked for it yet.
  DataArray<T>* Get() const noexcept { return _list.load(std::memory_order_acquire); }

  // The list, made if there is none.
  DataArray<T>* GetOrCreate() const {
    if (DataArray<T>* list = Get()) {
      return list;
    }
    const Ref<DataArray<T>> made = MakeRef<DataArray<T>>();
    DataArray<T>* expected = nullptr;
    if (_list.compare_exchange_strong(expected, made.Get(), std::memory_order_acq_rel)) {
      made->IncRef();  // the reference that _list now is
      return made.Get();
    }
    return expected;
  }

 private:
  void Replace(DataArray<T>* list) {
    if (list != nullptr) {
      list->IncRef();
    }
    if (DataArray<T>* old = _list.exchange(list, std::memory_order_acq_rel)) {
      old->DecRef();
    }
  }

  mutable std::atomic<DataArray<T>*> _list{nullptr};
};

}  // namespace Orbis
