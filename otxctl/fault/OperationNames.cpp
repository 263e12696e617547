#include "otxctl/fault/OperationNames.h"

#include <algorithm>

namespace OtxCtl::Fault {

bool IsOperationName(std::string_view name) noexcept {
  return std::find(kOperationNames.begin(), kOperationNames.end(), name) != kOperationNames.end();
}

}  // namespace OtxCtl::Fault
