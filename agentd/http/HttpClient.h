// One HTTP request to a server, over a Unix socket or TCP, and its answer.
#pragma once

#include <chrono>
#include <stdexcept>
#include <string>

#include "agentd/http/HttpAddress.h"
#include "agentd/http/HttpTypes.h"

namespace Agentd {

// Nobody answers, or what answers does not speak HTTP. The text names the address.
class ConnectionError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// Connects, asks, reads the whole answer (at most 1 GiB) and closes. `request.contentType` goes with a
// body. Throws ConnectionError. Blocks; without an answer for `patience`, it gives up.
HttpAnswer Exchange(const HttpAddress& address, const HttpRequest& request,
                    std::chrono::milliseconds patience = std::chrono::seconds(600));

}  // namespace Agentd
