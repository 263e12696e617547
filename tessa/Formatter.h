// Printing objects into log lines, not before the line is known to be written.
#pragma once

#include <string>

#include "tessa/Api.h"
#include "tessa/Object.h"
#include "tessa/Ref.h"

namespace Tessa::PrintFormatter {

// What FormatObject gives: refers to the object, which must outlive the statement.
class TESSA_API PrintedObject {
 public:
  explicit PrintedObject(const Object* object) noexcept : _object(object) {}
  void PrintTo(std::string& out) const;

 private:
  const Object* _object;
};

// Prints what the object's ToString() says, "(null)" for none, and never throws: an object that cannot
// be printed appears as "(unprintable)".
template <class T>
PrintedObject FormatObject(const Ref<T>& object) {
  return PrintedObject(object.Get());
}

}  // namespace Tessa::PrintFormatter
