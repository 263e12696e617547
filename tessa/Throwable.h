// The runtime's family of exceptions. All of them derive, once and not virtually, from std::exception.
#pragma once

#include <exception>
#include <string>

#include "tessa/Api.h"

namespace Tessa {

class TESSA_API Throwable : public std::exception {
 public:
  explicit Throwable(std::string text);
  Throwable(const Throwable&);
  Throwable& operator=(const Throwable&);
  ~Throwable() override;

  const char* what() const noexcept override;

 private:
  std::string _text;
};

// A value was read that nobody has set: "Not initialized" for texts and objects, "optional value not
// set" for scalars.
class TESSA_API NotInitializedException : public Throwable {
 public:
  using Throwable::Throwable;
  ~NotInitializedException() override;

  [[noreturn]] static void ThrowNotInitialized();
  [[noreturn]] static void ThrowOptionalNotSet();
};

// An object is of another type than the one asked for.
class TESSA_API TypeMismatchException : public Throwable {
 public:
  using Throwable::Throwable;
  ~TypeMismatchException() override;

  [[noreturn]] static void Throw(const std::string& wanted, const std::string& found);
};

}  // namespace Tessa
