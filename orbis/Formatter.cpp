#include "orbis/Formatter.h"

#include <exception>

#include "orbis/Engine.h"
#include "orbis/Soap.h"

namespace Orbis::SerializeFormatter {

void SerializedObject::PrintTo(std::string& out) const {
  if (_object == nullptr) {
    out += "(null)";
    return;
  }
  try {
    SerializeObjectToSoap(*_object, nullptr, out);
  } catch (const std::exception&) {
    Print(_object, out);
  }
}

}  // namespace Orbis::SerializeFormatter
