#include "tessa/Formatter.h"

namespace Tessa::PrintFormatter {

void PrintedObject::PrintTo(std::string& out) const {
  if (_object == nullptr) {
    out.append("(null)");
    return;
  }
  try {
    out.append(_object->ToString());
  } catch (...) {
    out.append("(unprintable)");
  }
}

}  // namespace Tessa::PrintFormatter
