// An HTTP server on a Unix socket.
//
// Connections live on one thread, the one in Run; requests are handled on a small pool of workers, so that a
// slow request holds up neither the others nor the network. Requests beyond a limit are answered with a
// status that says which (see HttpLimits).
#pragma once

#include <functional>
#include <memory>
#include <string>

#include "agentd/http/HttpTypes.h"

namespace Agentd {

// Called on the workers, several at a time. What it throws is answered with 500 and its text.
using HttpHandler = std::function<HttpAnswer(const HttpRequest&)>;

class HttpServer {
 public:
  // Binds the socket (mode 0660) and listens; from here on SIGTERM and SIGINT are the server's. Throws
  // std::runtime_error that names the path.
  HttpServer(const std::string& socketPath, const HttpLimits& limits, HttpHandler handler);
  // Waits for handlers that still run.
  ~HttpServer();

  // Serves until Stop or one of SIGTERM and SIGINT; then removes the socket, accepts nothing more, finishes
  // what is in flight within the drain time, and returns. False when the time was too short for that: a
  // handler may still run.
  bool Run();

  // From any thread.
  void Stop();

 private:
  class Impl;
  std::unique_ptr<Impl> _impl;
};

}  // namespace Agentd
