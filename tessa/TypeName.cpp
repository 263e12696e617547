#include "tessa/TypeName.h"

#include <cxxabi.h>

#include <cstdlib>
#include <memory>
#include <string_view>

namespace Tessa {

std::string TypeName(const std::type_info& type) {
  int status = 0;
  const std::unique_ptr<char, decltype(&std::free)> demangled(
      abi::__cxa_demangle(type.name(), nullptr, nullptr, &status), &std::free);
  std::string name = status == 0 ? demangled.get() : type.name();
  constexpr std::string_view inlineNamespace = "__cxx11::";
  if (const std::size_t at = name.find(inlineNamespace); at != std::string::npos) {
    name.erase(at, inlineNamespace.size());
  }
  return name.substr(0, name.find('<'));
}

}  // namespace Tessa
