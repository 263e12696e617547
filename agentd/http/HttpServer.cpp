#include "agentd/http/HttpServer.h"

#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/signal_set.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/asio/thread_pool.hpp>
#include <boost/asio/write.hpp>
#include <csignal>
#include <cstring>
#include <mutex>
#include <stdexcept>
#include <utility>

#include "agentd/http/HttpConnection.h"
#include "agentd/http/HttpListener.h"
#include "agentd/http/TlsServer.h"
#include "agentd/http/UnixSocket.h"

namespace Agentd {
namespace {

namespace asio = boost::asio;
using boost::system::error_code;
using Socket = HttpListener::Protocol::socket;

const HttpAnswer tooMany{503, "text/plain", "too many connections; try again later\n"};

// The same for those that cannot even be waited for.
constexpr std::string_view farTooMany =
    "HTTP/1.1 503 Service Unavailable\r\nContent-Type: text/plain\r\nContent-Length: 38\r\n"
    "Connection: close\r\n\r\ntoo many connections; try again later\n";

std::optional<asio::ssl::context> TlsOf(const HttpOptions& options) {
  return options.tls ? std::optional(MakeTlsContext(*options.tls)) : std::nullopt;
}

void DemandSafe(const HttpAddress& address, bool hasTls) {
  if (!hasTls && !address.IsLoopback()) {
    throw std::runtime_error("cannot listen on " + address.Text() +
                             " without TLS: other hosts could reach it; give it a certificate, or take a "
                             "loopback address");
  }
}

std::string RemoteName(const Socket& socket) {
  error_code error;
  const auto remote = socket.remote_endpoint(error);
  asio::ip::tcp::endpoint endpoint;
  if (error || remote.size() > endpoint.capacity()) {
    return "an unknown address";
  }
  endpoint.resize(remote.size());
  std::memcpy(endpoint.data(), remote.data(), remote.size());
  return HttpAddress{false, endpoint.address().to_string(), endpoint.port()}.Name();
}

}  // namespace

class HttpServer::Impl {
 public:
  Impl(const HttpOptions& options, HttpDeferringHandler handler);
  ~Impl();

  std::vector<HttpAddress> Addresses() const;
  bool Run();
  void Stop() {
    asio::post(_network, [this] { BeginDrain(); });
  }
  void OnStopping(std::function<void()> listener) { _onStopping = std::move(listener); }

 private:
  void Welcome(const HttpListener& listener, Socket socket);
  HttpPeer PeerOf(const HttpListener& listener, Socket& socket) const;
  void BeginDrain();

  const std::vector<std::string> _serverNames;
  std::function<void()> _onStopping;
  // In this order: whatever still holds connections goes down before what connections use.
  HttpContext _context;
  asio::io_context _network{1};
  asio::thread_pool _workers;
  std::vector<std::unique_ptr<HttpListener>> _listeners;
  asio::signal_set _signals;
  asio::steady_timer _drainTimer;
};

HttpServer::Impl::Impl(const HttpOptions& options, HttpDeferringHandler handler)
    : _serverNames(options.serverNames),
      _context{.limits = options.limits,
               .access = options.access,
               .tls = TlsOf(options),
               .handler = std::move(handler),
               .network = _network,
               .workers = _workers,
               .onLastGone = {}},
      _workers(options.limits.workers),
      _signals(_network),
      _drainTimer(_network) {
  for (const HttpAddress& address : options.listen) {
    DemandSafe(address, _context.tls.has_value());
    _listeners.push_back(std::make_unique<HttpListener>(_network, address));
  }
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
  _listeners.clear();
  _workers.stop();  // what no worker has begun is dropped
  _workers.join();
}

std::vector<HttpAddress> HttpServer::Impl::Addresses() const {
  std::vector<HttpAddress> addresses;
  for (const auto& listener : _listeners) {
    addresses.push_back(listener->Address());
  }
  return addresses;
}

bool HttpServer::Impl::Run() {
  for (const auto& listener : _listeners) {
    listener->Accept([this](const HttpListener& at, Socket socket) { Welcome(at, std::move(socket)); });
  }
  _network.run();
  return _context.connections.empty();
}

void HttpServer::Impl::Welcome(const HttpListener& listener, Socket socket) {
  const HttpAddress& address = listener.Address();
  asio::ssl::context* const tls = address.isUnix || !_context.tls ? nullptr : &*_context.tls;
  const std::size_t before = _context.connections.size();
  const std::size_t limit = _context.limits.connections;
  error_code ignored;
  if (before >= 2 * limit) {  // even those that wait for their refusal are too many
    socket.non_blocking(true, ignored);
    if (tls == nullptr) {
      socket.write_some(asio::buffer(farTooMany.data(), farTooMany.size()), ignored);
    }
    return;
  }
  HttpDoor door;
  if (!address.isUnix) {
    socket.set_option(asio::ip::tcp::no_delay(true), ignored);
    door = {address.port, _serverNames, tls != nullptr};
  }
  HttpPeer peer = PeerOf(listener, socket);
  std::make_shared<HttpConnection>(_context, std::move(door), std::move(peer), std::move(socket), tls)
      ->Start(before >= limit ? std::optional(tooMany) : std::nullopt);
}

HttpPeer HttpServer::Impl::PeerOf(const HttpListener& listener, Socket& socket) const {
  if (!listener.Address().isUnix) {
    // With TLS, nothing is granted before the certificate is known.
    return {_context.tls ? HttpRole::None : HttpRole::Read, RemoteName(socket)};
  }
  try {
    return _context.access.PeerOf(CredentialsOf(socket.native_handle()));
  } catch (const std::runtime_error& unknown) {
    return {HttpRole::None, unknown.what()};
  }
}

void HttpServer::Impl::BeginDrain() {
  if (_context.draining) {
    return;
  }
  {
    const std::lock_guard guard(_context.givingBack);
    _context.draining = true;
  }
  for (const auto& listener : _listeners) {
    listener->Close();
  }
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

HttpServer::HttpServer(const HttpOptions& options, HttpHandler handler)
    : HttpServer(options,
                 HttpDeferringHandler([handler = std::move(handler)](const HttpRequest& request,
                                                                     const HttpResponder& responder) {
                   responder.Answer(handler(request));
                 })) {}
HttpServer::HttpServer(const HttpOptions& options, HttpDeferringHandler handler)
    : _impl(std::make_unique<Impl>(options, std::move(handler))) {}
HttpServer::~HttpServer() = default;
std::vector<HttpAddress> HttpServer::Addresses() const {
  return _impl->Addresses();
}
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
