// Requests and answers as plain values, free of the HTTP library.
#pragma once

#include <chrono>
#include <cstddef>
#include <string>

namespace Agentd {

struct HttpRequest {
  std::string method;       // "GET"
  std::string target;       // as sent: "/api/v1/disks?names=naa.1"
  std::string contentType;  // empty: none
  std::string body;
  std::string soapAction = {};  // of the header of that name; empty: none
};

struct HttpAnswer {
  unsigned status = 200;
  std::string contentType = "application/json";
  std::string body;
  int retryAfterSeconds = 0;  // 0: the header is not sent
};

// What a connection may cost before it is refused.
struct HttpLimits {
  std::size_t headerBytes = 16 << 10;  // beyond: 431
  std::size_t bodyBytes = 16 << 20;    // beyond: 413
  std::size_t connections = 256;       // beyond: 503
  // For one whole request. Beyond: 408, or closed when nothing of a request has come.
  std::chrono::milliseconds readTime = std::chrono::seconds(30);
  std::chrono::milliseconds writeTime = std::chrono::seconds(60);  // for one whole answer; beyond: closed
  std::chrono::milliseconds drainTime = std::chrono::seconds(60);  // for what is in flight when stopping
  unsigned workers = 4;  // requests handled at the same time; one that is answered later counts no more
};

}  // namespace Agentd
