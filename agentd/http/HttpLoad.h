// How things stand at the doors of a server, for monitoring.
#pragma once

#include <array>
#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace Agentd {

// Why a client is turned away by the server itself.
enum class HttpRefusal { Connections, ConnectionsOfPeer, Descriptors, Handshake, Slow, Bodies };

struct HttpRefusalKind {
  std::string_view name;  // for programs
  std::string_view text;  // for people
};

constexpr std::array<HttpRefusalKind, 6> httpRefusals = {{
    {"connections", "too many connections to this address of the agent"},
    {"connectionsOfPeer", "too many connections of this client"},
    {"descriptors", "a connection could not be accepted"},
    {"handshake", "TLS came to nothing"},
    {"slow", "the request took too long"},
    {"bodies", "too much is being sent to the agent at the same time"},
}};

constexpr const HttpRefusalKind& KindOf(HttpRefusal refusal) {
  return httpRefusals[static_cast<std::size_t>(refusal)];
}

struct HttpLoad {
  struct Listener {
    std::string address;  // as HttpAddress::Text has it
    std::size_t connections = 0;
  };
  std::vector<Listener> listeners = {};
  std::array<unsigned long, httpRefusals.size()> refused = {};  // since the start, by kind
  std::size_t bodyBytes = 0;  // of requests that are read or wait for a worker
};

}  // namespace Agentd
