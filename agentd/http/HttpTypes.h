// Requests and answers as plain values, free of the HTTP library.
#pragma once

#include <chrono>
#include <cstddef>
#include <limits>
#include <optional>
#include <string>
#include <string_view>

namespace Agentd {

// What a client may ask for. Each role includes those before it.
enum class HttpRole { None, Read, Change };

constexpr std::string_view NameOf(HttpRole role) {
  constexpr std::string_view names[] = {"none", "read", "change"};
  return names[static_cast<std::size_t>(role)];
}

// Who asks. Made by the server, never by what the client says of itself.
struct HttpPeer {
  HttpRole role = HttpRole::None;
  std::string identity = {};  // for people and logs; printable
};

struct HttpRequest {
  std::string method;       // "GET"
  std::string target;       // as sent: "/api/v1/disks?names=naa.1"
  std::string contentType;  // empty: none
  std::string body;
  std::string soapAction = {};  // of the header of that name; empty: none
  bool hasOrigin = false;       // a page in a browser sends this
  HttpPeer peer = {};
  // How the client came. The authority is whom it asked, as it wrote it: "kova.example:9443". On TCP that is
  // one of the server's own names; on a Unix socket it may be any host, or empty.
  std::string scheme = "http";  // or "https", behind TLS
  std::string authority = {};   // letters, digits, "-._~%:[]" only
};

struct HttpAnswer {
  unsigned status = 200;
  std::string contentType = "application/json";
  std::string body;
  int retryAfterSeconds = 0;  // 0: the header is not sent
  std::string allow = {};     // with 405: the methods that are served there, "GET, HEAD"
};

// What becomes of a request of which only the header is known.
struct HttpAdmission {
  std::optional<HttpAnswer> refusal = std::nullopt;  // the body is then never read
  // The most that the body may have, within the limits of the server. Beyond: 413.
  std::size_t bodyBytes = std::numeric_limits<std::size_t>::max();
};

// What clients may cost before they are refused.
struct HttpLimits {
  std::size_t headerBytes = 16 << 10;  // beyond: 431
  std::size_t bodyBytes = 16 << 20;    // of one request; beyond: 413
  // Of all requests that are read or wait for a worker; those who may not change get a quarter of it at most.
  // Beyond: 503.
  std::size_t allBodyBytes = 64 << 20;
  // Each address that is listened on has its own share. Beyond: 503.
  std::size_t connections = 256;
  // Of those, how many one client may have: on TCP an address (of version 6, a network of 64 bits), on a Unix
  // socket a user who may not change. Beyond: 503.
  std::size_t connectionsOfPeer = 64;
  // How many more, of each address that is listened on, are told that they are too many. Beyond: closed.
  std::size_t refusedConnections = 32;
  std::chrono::milliseconds handshakeTime =
      std::chrono::seconds(5);  // for the secrets of TLS; beyond: closed
  // For one whole request. Beyond: 408, or closed when nothing of a request has come.
  std::chrono::milliseconds readTime = std::chrono::seconds(30);
  std::chrono::milliseconds writeTime = std::chrono::seconds(60);  // for one whole answer; beyond: closed
  std::chrono::milliseconds drainTime = std::chrono::seconds(60);  // for what is in flight when stopping
  unsigned workers = 6;  // requests handled at the same time; one that is answered later counts no more
};

}  // namespace Agentd
