// Where a server answers, and a client asks.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace Agentd {

struct HttpAddress {
  bool isUnix = true;
  std::string place;       // the path of the socket, or the numeric IP address without brackets
  std::uint16_t port = 0;  // of TCP; 0 when listening: any that is free
  // Of an agent to ask: by TLS, and the place may be the name of a host. Whether a server speaks TLS is no
  // matter of its addresses.
  bool isTls = false;

  // As it is written: "unix:/run/kova/agentd.sock", "tcp:127.0.0.1:8080", "tls:[::1]:8080".
  std::string Text() const;
  // What it is called in messages, and in the Host header: "/run/kova/agentd.sock", "[::1]:8080".
  std::string Name() const;
  bool IsLoopback() const;  // nobody on another host can reach it; not for names
};

HttpAddress UnixAddress(const std::string& path);

// Where to listen. Throws std::invalid_argument that says how addresses are written.
HttpAddress ParseAddress(std::string_view text);

// Whom to ask: also "tls:kova.example:9443". Throws as ParseAddress does.
HttpAddress ParseAgentAddress(std::string_view text);

}  // namespace Agentd
