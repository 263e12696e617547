#include "agentd/http/HttpServer.h"

#include <sys/stat.h>
#include <unistd.h>

#include <boost/asio/io_context.hpp>
#include <boost/asio/local/stream_protocol.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/signal_set.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/asio/thread_pool.hpp>
#include <csignal>
#include <stdexcept>
#include <utility>

#include "agentd/http/HttpConnection.h"
#include "agentd/http/UnixSocket.h"

namespace Agentd {
namespace {

namespace asio = boost::asio;
using Protocol = asio::local::stream_protocol;
using boost::system::error_code;

constexpr int socketMask = 0117;  // 0660: owner and group
constexpr std::chrono::milliseconds acceptPause(100);

}  // namespace

class HttpServer::Impl {
 public:
  Impl(const std::string& socketPath, const HttpLimits& limits, HttpDeferringHandler handler);
  ~Impl();

  bool Run();
  void Stop() {
    asio::post(_network, [this] { BeginDrain(); });
  }
  void OnStopping(std::function<void()> listener) { _onStopping = std::move(listener); }

 private:
  void Listen();
  void Accept();
  void OnAccept(error_code error, Protocol::socket socket);
  void Welcome(Protocol::socket socket);
  void BeginDrain();
  void CloseSocket();

  const std::string _path;
  std::function<void()> _onStopping;
  // In this order: whatever still holds connections goes down before what connections use.
  HttpContext _context;
  asio::io_context _network{1};
  asio::thread_pool _workers;
  Protocol::acceptor _acceptor;
  asio::steady_timer _acceptTimer;
  asio::signal_set _signals;
  asio::steady_timer _drainTimer;
};

HttpServer::Impl::Impl(const std::string& socketPath, const HttpLimits& limits, HttpDeferringHandler handler)
    : _path(socketPath),
      _context{.limits = limits,
               .handler = std::move(handler),
               .network = _network,
               .workers = _workers,
               .onLastGone = {}},
      _workers(limits.workers),
      _acceptor(_network),
      _acceptTimer(_network),
      _signals(_network),
      _drainTimer(_network) {
  Listen();
  // Now, not when the server runs: whoever sees the socket may already tell it to stop.
  _signals.add(SIGTERM);
  _signals.add(SIGINT);
  _signals.async_wait([this](error_code error, int) {
    if (!error) {
      BeginDrain();
    }
  });
}

HttpServer::Impl::~Impl() {
  _context.onLastGone = {};
  CloseSocket();
  _workers.stop();  // what no worker has begun is dropped
  _workers.join();
}

void HttpServer::Impl::Listen() {
  const SocketPlace place(_path);
  _acceptor.open();
  // The mask belongs to the process; nothing else makes files while the agent starts.
  const mode_t before = umask(socketMask);
  error_code error;
  _acceptor.bind(Protocol::endpoint(_path), error);
  umask(before);
  if (!error) {
    _acceptor.listen(asio::socket_base::max_listen_connections, error);
  }
  if (error) {
    throw std::runtime_error("cannot listen on " + _path + ": " + error.message());
  }
}

bool HttpServer::Impl::Run() {
  Accept();
  _network.run();
  return _context.connections.empty();
}

void HttpServer::Impl::Accept() {
  _acceptor.async_accept(
      [this](error_code error, Protocol::socket socket) { OnAccept(error, std::move(socket)); });
}

void HttpServer::Impl::OnAccept(error_code error, Protocol::socket socket) {
  if (_context.draining || error == asio::error::operation_aborted) {
    return;
  }
  if (!error) {
    Welcome(std::move(socket));
    Accept();
    return;
  }
  // No descriptors left, for one: trying again at once would only burn the processor.
  _acceptTimer.expires_after(acceptPause);
  _acceptTimer.async_wait([this](error_code cancelled) {
    if (!cancelled) {
      Accept();
    }
  });
}

void HttpServer::Impl::Welcome(Protocol::socket socket) {
  const std::size_t before = _context.connections.size();
  const std::size_t limit = _context.limits.connections;
  if (before >= 2 * limit) {
    return;  // even those that wait for their refusal are too many
  }
  const auto connection = std::make_shared<HttpConnection>(_context, std::move(socket));
  if (before >= limit) {
    connection->Refuse({503, "text/plain", "too many connections; try again later\n"});
  } else {
    connection->Read();
  }
}

void HttpServer::Impl::BeginDrain() {
  if (_context.draining) {
    return;
  }
  _context.draining = true;
  CloseSocket();
  _acceptTimer.cancel();
  error_code ignored;
  _signals.cancel(ignored);
  if (_onStopping) {
    _onStopping();
  }
  if (_context.connections.empty()) {
    return;
  }
  // Run goes on as long as the timer waits: until the last connection is gone, or the time is over.
  _drainTimer.expires_after(_context.limits.drainTime);
  _drainTimer.async_wait([this](error_code error) {
    if (!error) {
      _network.stop();
    }
  });
  _context.onLastGone = [this] { _drainTimer.cancel(); };
  for (HttpConnection* connection : _context.connections) {
    connection->Drain();
  }
}

// The file goes first, and only while the socket is ours: later, another agent's may stand there.
void HttpServer::Impl::CloseSocket() {
  if (_acceptor.is_open()) {
    unlink(_path.c_str());
    error_code ignored;
    _acceptor.close(ignored);
  }
}

HttpServer::HttpServer(const std::string& socketPath, const HttpLimits& limits, HttpHandler handler)
    : HttpServer(socketPath, limits,
                 HttpDeferringHandler([handler = std::move(handler)](const HttpRequest& request,
                                                                     const HttpResponder& responder) {
                   responder.Answer(handler(request));
                 })) {}
HttpServer::HttpServer(const std::string& socketPath, const HttpLimits& limits, HttpDeferringHandler handler)
    : _impl(std::make_unique<Impl>(socketPath, limits, std::move(handler))) {}
HttpServer::~HttpServer() = default;
bool HttpServer::Run() {
  return _impl->Run();
}
void HttpServer::Stop() {
  _impl->Stop();
}
void HttpServer::OnStopping(std::function<void()> listener) {
  _impl->OnStopping(std::move(listener));
}

}  // namespace Agentd
