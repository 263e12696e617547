// Exceptions by the name of their class: what fault rules throw and call records write.
//
// The names are those of HostCtl::Lib without their namespace, and "std::runtime_error".
#pragma once

#include <exception>
#include <string>
#include <string_view>

namespace OtxCtl::Provider {

bool IsExceptionName(std::string_view name) noexcept;

// Throws a new exception of the named class. `disk` is dropped where the class carries none.
// A name that is not in the table is thrown as std::invalid_argument.
[[noreturn]] void ThrowNamed(std::string_view name, const std::string& message, const std::string& disk);

// The name of the exception's class. A class that is not in the table is called by its nearest base in it,
// in the end "std::exception".
std::string_view ExceptionName(const std::exception& exception) noexcept;

}  // namespace OtxCtl::Provider
