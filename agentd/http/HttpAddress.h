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

  // As it is written: "unix:/run/kova/agentd.sock", "tcp:127.0.0.1:8080", "tcp:[::1]:8080".
  std::string Text() const;
  // What it is called in messages, and in the Host header: "/run/kova/agentd.sock", "[::1]:8080".
  std::string Name() const;
  bool IsLoopback() const;  // nobody on another host can reach it
};

HttpAddress UnixAddress(const std::string& path);

// Throws std::invalid_argument that says how addresses are written.
HttpAddress ParseAddress(std::string_view text);

}  // namespace Agentd
