// Reference-counted objects.
//
// An object's count starts at 0: the first Ref to it makes it 1, the last one to go deletes it. A copy
// of an object is a new object and starts at 0 too. Never make a Ref to `this` in a constructor: the
// count would return to 0 and the object would be deleted while it is being built.
//
// Threads: counts are atomic; everything else is the derived class's business.
#pragma once

#include <atomic>
#include <string>

#include "tessa/Api.h"

namespace Tessa {

// What every counted object can do. A virtual base, so that an object that is several things at once
// has one count.
class TESSA_API Object {
 public:
  virtual void IncRef() const = 0;
  virtual void DecRef() const = 0;

  // For people: logs and messages. Never throws for a sound object.
  virtual std::string ToString() const = 0;

  virtual int GetRefCount() const noexcept = 0;

 protected:
  Object() = default;
  Object(const Object&) = default;
  Object& operator=(const Object&) = default;
  virtual ~Object();

  // Called when the count leaves 0 for the first time, and when it returns to 0 (which deletes).
  virtual void FirstIncRef() const = 0;
  virtual void FinalDecRef() const = 0;
};

class TESSA_API ObjectImpl : public virtual Object {
 public:
  void IncRef() const override;
  void DecRef() const override;
  std::string ToString() const override;
  int GetRefCount() const noexcept override;

 protected:
  ObjectImpl() = default;
  ObjectImpl(const ObjectImpl& other);
  ObjectImpl& operator=(const ObjectImpl& other);
  ~ObjectImpl() override;

  void FirstIncRef() const override;
  void FinalDecRef() const override;

 private:
  mutable std::atomic<int> _refCount{0};
};

}  // namespace Tessa
