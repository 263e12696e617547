// The example host that programs start with when they are given none.
#pragma once

#include <string_view>

#include "otxctl/sim/HostDescription.h"

namespace OtxCtl::Sim {

// The text of examples/hosts/default.json, as it was when the program was built.
std::string_view DefaultHostText() noexcept;

HostDescription DefaultHost();

}  // namespace OtxCtl::Sim
