// An HTTP server on Unix sockets and TCP ports, with TLS or without.
//
// Connections live on one thread, the one in Run; requests are handled on a small pool of workers, so that a
// slow request holds up neither the others nor the network. A handler may also leave its answer for later: it
// then holds up no worker either, however long that takes. Requests beyond a limit are answered with a status
// that says which (see HttpLimits), and those that could come from a stranger's page, or that leave open what
// they mean, with the reason. Each request says who asks: a process on a Unix socket by its user and groups,
// a client of TLS by its certificate (see AccessRules); whoever else reaches a TCP port may read.
//
// What is refused is refused early, and costs others nothing: each address has its own places for
// connections, a request that will not be served is answered before its body is read, and the memory of all
// bodies is bounded. Whom the server turns away is counted (see HttpLoad), and logged in a line now and then.
#pragma once

#include <functional>
#include <memory>
#include <vector>

#include "agentd/http/HttpLoad.h"
#include "agentd/http/HttpOptions.h"
#include "agentd/http/HttpResponder.h"

namespace Agentd {

// Called on the workers, several at a time. What it throws is answered with 500 and its text.
using HttpHandler = std::function<HttpAnswer(const HttpRequest&)>;
// The same, for answers that may come later and from another thread.
using HttpDeferringHandler = std::function<void(const HttpRequest&, const HttpResponder&)>;

// What becomes of a request, told from its header: its body is then read, within bounds, or not at all.
// Called on the thread in Run, which waits for it.
using HttpAdmit = std::function<HttpAdmission(const HttpRequest& head)>;

// How a refusal of the server's own is told to a client of that target: the answer, which is a line of text,
// in the form that is usual there. Called on the thread in Run, which waits for it.
using RefusalEncoder = std::function<HttpAnswer(std::string_view target, HttpAnswer refusal)>;

class HttpServer {
 public:
  // Binds the addresses (Unix sockets with mode 0660) and listens; from here on SIGTERM and SIGINT are the
  // server's. Throws std::runtime_error that names the address or the file, or says that this process may not
  // have as many files open as the limits allow connections. Without `admit`, every body is read.
  HttpServer(const HttpOptions& options, HttpHandler handler, HttpAdmit admit = {});
  HttpServer(const HttpOptions& options, HttpDeferringHandler handler, HttpAdmit admit = {});
  // Waits for handlers that still run. Whoever holds a responder must have let go of it by then.
  ~HttpServer();

  // As they are answered on, in the order of the options: with the ports that were found.
  std::vector<HttpAddress> Addresses() const;

  // Any thread.
  HttpLoad Now() const;

  // Refusals whose target is known are told by `tell`. Set before Run; without it they are lines of text.
  void OnRefusal(RefusalEncoder encodeRefusal);

  // Told, on the thread in Run, when the server stops accepting, and before it waits for what is in flight.
  // Set before Run.
  void OnStopping(std::function<void()> listener);

  // Serves until Stop or one of SIGTERM and SIGINT; then removes the sockets, accepts nothing more, finishes
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
