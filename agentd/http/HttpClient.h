// One HTTP request over a Unix socket, and its answer.
#pragma once

#include <chrono>
#include <stdexcept>
#include <string>

#include "agentd/http/HttpTypes.h"

namespace Agentd {

// Nobody answers, or what answers does not speak HTTP. The text names the socket.
class ConnectionError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// Connects, asks, reads the whole answer (at most 1 GiB) and closes. `request.contentType` goes with a
// body. Throws ConnectionError. Blocks; without an answer for `patience`, it gives up.
HttpAnswer Exchange(const std::string& socketPath, const HttpRequest& request,
                    std::chrono::milliseconds patience = std::chrono::seconds(600));

}  // namespace Agentd
