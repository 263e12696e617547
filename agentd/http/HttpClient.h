// One HTTP request to a server, over a Unix socket or TCP, with or without TLS, and its answer.
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

// Somebody answers, but not as an agent that serves: it refuses to, hangs up, or says what cannot be
// understood. To start another would not help.
class AnswerError : public ConnectionError {
 public:
  using ConnectionError::ConnectionError;
};

// TLS comes to nothing: one side does not trust the other, or does not speak it. The text says whose fault it
// is, and names the file where it is a file's.
class TlsError : public AnswerError {
 public:
  using AnswerError::AnswerError;
};

// Files in PEM form, for an address with TLS.
struct TlsClientFiles {
  std::string ca = {};           // of the server's certificate; empty: any that this host trusts
  std::string certificate = {};  // the client's, with those between it and its root; empty: it shows none
  std::string key = {};
};

// Connects, asks, reads the whole answer (at most 1 GiB) and closes. `request.contentType` goes with a
// body. With TLS (1.2 or newer), the server's certificate must be for the address's place. Throws
// ConnectionError, and std::runtime_error for files that cannot be used. Blocks; without an answer for
// `patience`, it gives up.
HttpAnswer Exchange(const HttpAddress& address, const HttpRequest& request,
                    std::chrono::milliseconds patience = std::chrono::seconds(600),
                    const TlsClientFiles& files = {});

}  // namespace Agentd
