#include "tessa/Object.h"

#include <cxxabi.h>

#include <cstdlib>
#include <memory>
#include <typeinfo>

namespace Tessa {

Object::~Object() = default;

ObjectImpl::ObjectImpl(const ObjectImpl& other) : Object(other) {}
ObjectImpl& ObjectImpl::operator=(const ObjectImpl&) { return *this; }
ObjectImpl::~ObjectImpl() = default;

void ObjectImpl::IncRef() const {
  if (_refCount.fetch_add(1, std::memory_order_relaxed) == 0) {
    FirstIncRef();
  }
}

void ObjectImpl::DecRef() const {
  // Release what this thread wrote to the object; the thread that deletes it acquires it all.
  if (_refCount.fetch_sub(1, std::memory_order_acq_rel) == 1) {
    FinalDecRef();
  }
}

std::string ObjectImpl::ToString() const {
  int status = 0;
  const std::unique_ptr<char, decltype(&std::free)> name(
      abi::__cxa_demangle(typeid(*this).name(), nullptr, nullptr, &status), &std::free);
  return status == 0 ? name.get() : typeid(*this).name();
}

int ObjectImpl::GetRefCount() const noexcept { return _refCount.load(std::memory_order_relaxed); }

void ObjectImpl::FirstIncRef() const {}
void ObjectImpl::FinalDecRef() const { delete this; }

}  // namespace Tessa
