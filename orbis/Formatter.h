// Printing data objects into log lines as the texts they would be sent as.
#pragma once

#include <string>

#include "orbis/Any.h"

namespace Orbis::SerializeFormatter {

// What Format gives: refers to the object, which must outlive the statement.
class TESSA_API SerializedObject {
 public:
  explicit SerializedObject(const Any* object) noexcept : _object(object) {}
  void PrintTo(std::string& out) const;

 private:
  const Any* _object;
};

// Prints the object's SOAP text, "(null)" for none. Never throws: an object that cannot be serialized is
// printed as Orbis::Print does.
template <class T>
SerializedObject Format(const Ref<T>& object) {
  return SerializedObject(object.Get());
}

}  // namespace Orbis::SerializeFormatter
