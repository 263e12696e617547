// What a request must be before it may reach the plug-in.
//
// The plug-in takes a mistyped or half-filled request for impossible and ends the process over it. So every
// request of a client passes here first, and what is refused is answered with a fault that names the thing.
//
// Threads: any.
#pragma once

#include <string>
#include <vector>

#include "orbis/Types.h"

namespace Host::Gate {

inline constexpr std::size_t longestName = 1024;  // bytes
inline constexpr std::size_t mostNames = 100'000;

// Null when the names may pass: not empty, not too long, UTF-8 without control characters, not too many.
// Otherwise an InvalidArgument whose property is the place ("names[3]") and whose message says why.
Tessa::Ref<Orbis::MethodFault> CheckNames(const std::string& property, const std::vector<std::string>& names);

}  // namespace Host::Gate
