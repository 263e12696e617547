// The order in which people count the kernel's names.
#pragma once

#include <string_view>

namespace OtxCtl::Linux {

// Numbers by their value, letters by kind of device, then by length, then by the alphabet: nvme2n1, nvme10n1,
// sdb, sdz, sdaa.
// A strict order: of two different names one is before the other.
bool IsNaturallyBefore(std::string_view name, std::string_view other);

}  // namespace OtxCtl::Linux
