#include "tessa/Object.h"

#include "tessa/TypeName.h"

namespace Tessa {

Object::~Object() = default;

ObjectImpl::ObjectImpl(const ObjectImpl& other) : Object(other) {}
ObjectImpl& ObjectImpl::operator=(const ObjectImpl&) {
  return *this;
}
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
  return TypeName(typeid(*this));
}

int ObjectImpl::GetRefCount() const noexcept {
  return _refCount.load(std::memory_order_relaxed);
}

void ObjectImpl::FirstIncRef() const {}
void ObjectImpl::FinalDecRef() const {
  delete this;
}

}  // namespace Tessa
