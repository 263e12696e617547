// Why a host description, or a text that becomes one, was refused.
#pragma once

#include <stdexcept>

namespace OtxCtl::Sim {

// The text begins with the place: a path (`disks[3].ssd: ...`), or line and column where the text is no JSON
// at all (`line 3, column 7: ...`).
class HostDescriptionError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

}  // namespace OtxCtl::Sim
