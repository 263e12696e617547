// An HTTP server on a Unix socket.
//
// Connections live on one thread, the one in Run; requests are handled on a small pool of workers, so that a
// slow request holds up neither the others nor the network. A handler may also leave its answer for later: it
// then holds up no worker either, however long that takes. Requests beyond a limit are answered with a status
// that says which (see HttpLimits).
#pragma once

#include <functional>
#include <memory>
#include <string>

#include "agentd/http/HttpResponder.h"
#include "agentd/http/HttpTypes.h"

namespace Agentd {

// Called on the workers, several at a time. What it throws is answered with 500 and its text.
using HttpHandler = std::function<HttpAnswer(const HttpRequest&)>;
// The same, for answers that may come later and from another thread.
using HttpDeferringHandler = std::function<void(const HttpRequest&, const HttpResponder&)>;

class HttpServer {
 public:
  // Binds the socket (mode 0660) and listens; from here on SIGTERM and SIGINT are the server's. Throws
  // std::runtime_error that names the path.
  HttpServer(const std::string& socketPath, const HttpLimits& limits, HttpHandler handler);
  HttpServer(const std::string& socketPath, const HttpLimits& limits, HttpDeferringHandler handler);
  // Waits for handlers that still run. Whoever holds a responder must have let go of it by then.
  ~HttpServer();

  // Told, on the thread in Run, when the server stops accepting, and before it waits for what is in flight.
  // Set before Run.
  void OnStopping(std::function<void()> listener);

  // Serves until Stop or one of SIGTERM and SIGINT; then removes the socket, accepts nothing more, finishes
  // what is in flight within the drain time, and returns. False when the time was too short for that: a
  // handler may still run, or an answer may still be outstanding.
  bool Run();

  // From any thread.
  void Stop();

 private:
  class Impl;
  std::unique_ptr<Impl> _impl;
};

}  // namespace Agentd
