// The file that a Unix socket is reached by.
#pragma once

#include <string>

namespace Agentd {

// Makes the place ready for a socket to be bound: creates a missing folder (0750), and removes a socket
// that nobody answers on. Throws std::runtime_error that names the path when another program answers there,
// when something else stands there, or when the path is too long.
void PrepareSocketPath(const std::string& path);

}  // namespace Agentd
