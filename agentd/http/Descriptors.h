// The file descriptors that this process may have.
#pragma once

#include <cstddef>

namespace Agentd {

// Sees to it that as many can be open at the same time: raises the process's own limit where it may. Throws
// std::runtime_error that names both numbers where it may not.
void RequireDescriptors(std::size_t number);

}  // namespace Agentd
