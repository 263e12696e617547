#include "nox/OperationTable.h"

#include <algorithm>

#include "orbis/TypeDescriptor.h"
#include "tessa/Throwable.h"

namespace Nox {

namespace Operation {

Query::~Query() = default;
Change::~Change() = default;

}  // namespace Operation

const OperationDescriptor* FindOperation(std::string_view name) {
  const std::span<const OperationDescriptor> all = Operations();
  const auto found = std::find_if(all.begin(), all.end(),
                                  [name](const OperationDescriptor& one) { return one.name == name; });
  return found == all.end() ? nullptr : &*found;
}

const OperationDescriptor& OperationOf(const Orbis::DataObject& request) {
  for (const OperationDescriptor& one : Operations()) {
    if (&one.request == &request.GetType()) {
      return one;
    }
  }
  Tessa::TypeMismatchException::Throw("a request", request.GetType().name);
}

}  // namespace Nox
