// The order in which people count the kernel's names.
#pragma once

#include <string_view>

namespace OtxCtl::Linux {

// Numbers by their value, other runs by length and then by the alphabet: sdb, sdz, sdaa; nvme2n1, nvme10n1.
// A strict order: of two different names one is before the other.
bool IsNaturallyBefore(std::string_view name, std::string_view other);

}  // namespace OtxCtl::Linux
