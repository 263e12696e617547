#include "tessa/Throwable.h"

#include <utility>

namespace Tessa {

Throwable::Throwable(std::string text) : _text(std::move(text)) {}
Throwable::Throwable(const Throwable&) = default;
Throwable& Throwable::operator=(const Throwable&) = default;
Throwable::~Throwable() = default;
const char* Throwable::what() const noexcept {
  return _text.c_str();
}

NotInitializedException::~NotInitializedException() = default;
void NotInitializedException::ThrowNotInitialized() {
  throw NotInitializedException("Not initialized");
}
void NotInitializedException::ThrowOptionalNotSet() {
  throw NotInitializedException("optional value not set");
}

TypeMismatchException::~TypeMismatchException() = default;
void TypeMismatchException::Throw(const std::string& wanted, const std::string& found) {
  throw TypeMismatchException("expected an object of type " + wanted + ", found " + found);
}

}  // namespace Tessa
