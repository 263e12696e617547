#include "agentd/http/HttpServer.h"

#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/network_v6.hpp>
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

#include "agentd/http/Descriptors.h"
#include "agentd/http/HttpConnection.h"
#include "agentd/http/HttpListener.h"
#include "agentd/http/HttpMessages.h"
#include "agentd/http/HttpPlaces.h"
#include "agentd/http/RefusalTally.h"
#include "agentd/http/TlsServer.h"
#include "agentd/http/TlsSessions.h"
#include "agentd/http/UnixSocket.h"
#include "tessa/Logger.h"

namespace Agentd {
namespace {

namespace asio = boost::asio;
using boost::system::error_code;
using Socket = HttpListener::Protocol::socket;

constexpr std::size_t otherDescriptors = 64;  // logs, the host's files, and what is about to be closed

HttpAnswer TooMany(HttpRefusal why) {
  return RefusedWith(503, std::string(KindOf(why).text) + "; try again later");
}

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

// Nothing when the client has gone already.
std::optional<asio::ip::tcp::endpoint> RemoteOf(const Socket& socket) {
  error_code error;
  const auto remote = socket.remote_endpoint(error);
  asio::ip::tcp::endpoint endpoint;
  if (error || remote.size() > endpoint.capacity()) {
    return std::nullopt;
  }
  endpoint.resize(remote.size());
  std::memcpy(endpoint.data(), remote.data(), remote.size());
  return endpoint;
}

// What counts as one client: of version 6, everybody has a whole network of addresses.
std::string ShareOf(const asio::ip::address& address) {
  constexpr unsigned short networkBits = 64;
  return address.is_v6() ? asio::ip::make_network_v6(address.to_v6(), networkBits).canonical().to_string()
                         : address.to_string();
}

// For those that there is no time to listen to.
void SayAndClose(Socket& socket, HttpRefusal why) {
  const HttpResponse response = ResponseOf(TooMany(why), {.keepAlive = false});
  error_code ignored;
  socket.non_blocking(true, ignored);
  boost::beast::http::write(socket, response, ignored);
}

void Log(const std::string& line) {
  if (const auto logger = Tessa::Service::GetDefaultLogger()) {
    Tessa::Service::LogInternal(logger, Tessa::Service::LogLevel::Warning, "%1", line);
  }
}

// An address that is listened on, and the places that it has.
struct Entrance {
  Entrance(const HttpLimits& limits, bool tls)
      : isTls(tls),
        served(limits.connections, limits.connectionsOfPeer),
        refused(limits.refusedConnections, limits.refusedConnections) {}

  const bool isTls;
  HttpPlaces served;
  HttpPlaces refused;  // by those who are only told that there are no others
};

// Who has connected.
struct Arrival {
  HttpPeer peer;
  std::string share;  // whose places are counted; empty: nobody's
};

}  // namespace

class HttpServer::Impl {
 public:
  Impl(const HttpOptions& options, HttpDeferringHandler handler, HttpAdmit admit);
  ~Impl();

  std::vector<HttpAddress> Addresses() const;
  HttpLoad Now() const;
  bool Run();
  void Stop() {
    asio::post(_network, [this] { BeginDrain(); });
  }
  void OnStopping(std::function<void()> listener) { _onStopping = std::move(listener); }
  void OnRefusal(RefusalEncoder encodeRefusal) { _context.encodeRefusal = std::move(encodeRefusal); }

 private:
  void Listen(const HttpAddress& address);
  void StartConnection(const HttpListener& listener, Entrance& entrance, Socket socket);
  Arrival ArrivalAt(const HttpListener& listener, Socket& socket) const;
  void RenewTicketSecretInTime();
  void TurnAway(HttpRefusal why, const std::string& who);
  void CatchUpLater();
  void BeginDrain();

  const std::vector<std::string> _serverNames;
  std::function<void()> _onStopping;
  // In this order: whatever still holds connections goes down before what connections use.
  RefusalTally _tally{&Log};
  std::vector<std::unique_ptr<Entrance>> _entrances;  // of the listeners, in their order
  HttpContext _context;
  asio::io_context _network{1};
  asio::thread_pool _workers;
  std::vector<std::unique_ptr<HttpListener>> _listeners;
  asio::signal_set _signals;
  asio::steady_timer _drainTimer;
  asio::steady_timer _tallyTimer;
  bool _tallyTimerRuns = false;
  std::chrono::steady_clock::time_point _ticketSecretUntil = std::chrono::steady_clock::time_point::min();
};

HttpServer::Impl::Impl(const HttpOptions& options, HttpDeferringHandler handler, HttpAdmit admit)
    : _serverNames(options.serverNames),
      _context{.limits = options.limits,
               .access = options.access,
               .tls = TlsOf(options),
               .handler = std::move(handler),
               .admit = std::move(admit),
               .onRefused = [this](HttpRefusal why, const std::string& who) { TurnAway(why, who); },
               .network = _network,
               .workers = _workers,
               .onLastGone = {}},
      _workers(options.limits.workers),
      _signals(_network),
      _drainTimer(_network),
      _tallyTimer(_network) {
  const HttpLimits& limits = options.limits;
  RequireDescriptors(options.listen.size() * (1 + limits.connections + limits.refusedConnections) +
                     otherDescriptors);
  for (const HttpAddress& address : options.listen) {
    Listen(address);
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

void HttpServer::Impl::Listen(const HttpAddress& address) {
  DemandSafe(address, _context.tls.has_value());
  _listeners.push_back(std::make_unique<HttpListener>(_network, address));
  _entrances.push_back(std::make_unique<Entrance>(_context.limits, !address.isUnix && _context.tls));
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

HttpLoad HttpServer::Impl::Now() const {
  HttpLoad load{.refused = _tally.Counts(), .bodyBytes = _context.bodies.Held()};
  for (std::size_t i = 0; i < _listeners.size(); ++i) {
    load.listeners.push_back({_listeners[i]->Address().Text(), _entrances[i]->served.Taken()});
  }
  return load;
}

bool HttpServer::Impl::Run() {
  for (std::size_t i = 0; i < _listeners.size(); ++i) {
    HttpListener& listener = *_listeners[i];
    listener.Accept([this, &listener, &entrance = *_entrances[i]](
                        Socket socket) { StartConnection(listener, entrance, std::move(socket)); },
                    [this, &listener](error_code error) {
                      TurnAway(HttpRefusal::Descriptors,
                               "a client on " + listener.Address().Text() + " (" + error.message() + ")");
                    });
  }
  _network.run();
  return _context.connections.empty();
}

void HttpServer::Impl::StartConnection(const HttpListener& listener, Entrance& entrance, Socket socket) {
  Arrival arrival = ArrivalAt(listener, socket);
  const std::optional<HttpRefusal> full = entrance.served.WhyFull(arrival.share);
  if (full) {
    TurnAway(*full, arrival.peer.identity + " on " + listener.Address().Text());
  }
  if (full && entrance.refused.WhyFull(arrival.share)) {
    if (!entrance.isTls) {
      SayAndClose(socket, *full);
    }
    return;
  }
  if (entrance.isTls) {
    RenewTicketSecretInTime();
  }
  HttpDoor door{.isTls = entrance.isTls};
  if (!listener.Address().isUnix) {
    error_code ignored;
    socket.set_option(asio::ip::tcp::no_delay(true), ignored);
    door.tcpPort = listener.Address().port;
    door.serverNames = _serverNames;
  }
  HttpPlaces::Place place = (full ? entrance.refused : entrance.served).Take(arrival.share);
  std::make_shared<HttpConnection>(_context, std::move(door), std::move(arrival.peer), std::move(place),
                                   std::move(socket))
      ->Start(full ? std::optional(TooMany(*full)) : std::nullopt);
}

Arrival HttpServer::Impl::ArrivalAt(const HttpListener& listener, Socket& socket) const {
  if (!listener.Address().isUnix) {
    // With TLS, nothing is granted before the certificate is known.
    const HttpRole role = _context.tls ? HttpRole::None : HttpRole::Read;
    const auto remote = RemoteOf(socket);
    return remote ? Arrival{{role, HttpAddress{false, remote->address().to_string(), remote->port()}.Name()},
                            ShareOf(remote->address())}
                  : Arrival{{role, "an unknown address"}, "unknown"};
  }
  try {
    const HttpPeer peer = _context.access.PeerOf(CredentialsOf(socket.native_handle()));
    return {peer, peer.role == HttpRole::Change ? "" : peer.identity};
  } catch (const std::runtime_error& unknown) {
    return {{HttpRole::None, unknown.what()}, "unknown"};
  }
}

void HttpServer::Impl::RenewTicketSecretInTime() {
  const auto now = std::chrono::steady_clock::now();
  if (now >= _ticketSecretUntil) {
    RenewTicketSecret(_context.tls->native_handle());
    _ticketSecretUntil = now + tlsSessionLife;
  }
}

void HttpServer::Impl::TurnAway(HttpRefusal why, const std::string& who) {
  _tally.Count(why, who, std::chrono::steady_clock::now());
  if (_tally.IsBehind() && !_tallyTimerRuns && !_context.draining) {
    CatchUpLater();
  }
}

void HttpServer::Impl::CatchUpLater() {
  _tallyTimerRuns = true;
  _tallyTimer.expires_after(RefusalTally::silence);
  _tallyTimer.async_wait([this](error_code cancelled) {
    _tallyTimerRuns = false;
    if (cancelled) {
      return;
    }
    _tally.CatchUp(std::chrono::steady_clock::now());
    if (_tally.IsBehind()) {
      CatchUpLater();
    }
  });
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
  _tallyTimer.cancel();
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

HttpServer::HttpServer(const HttpOptions& options, HttpHandler handler, HttpAdmit admit)
    : HttpServer(options,
                 HttpDeferringHandler([handler = std::move(handler)](const HttpRequest& request,
                                                                     const HttpResponder& responder) {
                   responder.Answer(handler(request));
                 }),
                 std::move(admit)) {}
HttpServer::HttpServer(const HttpOptions& options, HttpDeferringHandler handler, HttpAdmit admit)
    : _impl(std::make_unique<Impl>(options, std::move(handler), std::move(admit))) {}
HttpServer::~HttpServer() = default;
std::vector<HttpAddress> HttpServer::Addresses() const {
  return _impl->Addresses();
}
HttpLoad HttpServer::Now() const {
  return _impl->Now();
}
bool HttpServer::Run() {
  return _impl->Run();
}
void HttpServer::Stop() {
  _impl->Stop();
}
void HttpServer::OnRefusal(RefusalEncoder encodeRefusal) {
  _impl->OnRefusal(std::move(encodeRefusal));
}
void HttpServer::OnStopping(std::function<void()> listener) {
  _impl->OnStopping(std::move(listener));
}

}  // namespace Agentd
