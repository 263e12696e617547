// The file that a Unix socket is reached by, and who is at its other end.
#pragma once

#include <string>

#include "agentd/http/AccessRules.h"

namespace Agentd {

// The place of a socket, free to be bound. Until this goes, no other SocketPlace in that folder can be made,
// by this process or another: of two agents that start together, the second one finds the first one
// answering.
class SocketPlace {
 public:
  // Creates a missing folder (0750), and removes a socket that nobody answers on. Throws std::runtime_error
  // that names the path when another program answers there, when something else stands there, or when the
  // path is too long.
  explicit SocketPlace(const std::string& path);
  ~SocketPlace();
  SocketPlace(const SocketPlace&) = delete;
  SocketPlace& operator=(const SocketPlace&) = delete;

 private:
  int _folder = -1;  // locked
};

// Of the other side of a connected Unix socket. Throws std::runtime_error.
ProcessCredentials CredentialsOf(int connected);

}  // namespace Agentd
