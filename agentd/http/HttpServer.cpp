#include "agentd/http/HttpServer.h"

#include <sys/stat.h>
#include <unistd.h>

#include <boost/asio/io_context.hpp>
#include <boost/asio/local/stream_protocol.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/signal_set.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/asio/thread_pool.hpp>
#include <boost/beast/core.hpp>
#include <boost/beast/http.hpp>
#include <csignal>
#include <optional>
#include <set>
#include <stdexcept>
#include <utility>

#include "agentd/http/UnixSocket.h"

namespace Agentd {
namespace {

namespace asio = boost::asio;
namespace beast = boost::beast;
namespace http = beast::http;
using Protocol = asio::local::stream_protocol;
using Stream = beast::basic_stream<Protocol>;
using boost::system::error_code;

constexpr int socketMask = 0117;  // 0660: owner and group

// What a request that could not be read is answered with; nothing when the client has gone.
std::optional<HttpAnswer> Refusal(const error_code& error) {
  struct Row {
    error_code error;
    unsigned status;
    const char* reason;
  };
  static const Row rows[] = {
      {http::error::body_limit, 413, "the body is too large"},
      {http::error::header_limit, 431, "the header is too large"},
      {beast::error::timeout, 408, "the request took too long"},
  };
  for (const Row& row : rows) {
    if (error == row.error) {
      return HttpAnswer{row.status, "text/plain", std::string(row.reason) + "\n"};
    }
  }
  const bool gone = error == http::error::end_of_stream || error == asio::error::operation_aborted ||
                    error.category() == asio::error::get_system_category();
  if (gone) {
    return std::nullopt;
  }
  return HttpAnswer{400, "text/plain", "not a request: " + error.message() + "\n"};
}

}  // namespace

class HttpServer::Impl {
 public:
  Impl(const std::string& socketPath, const HttpLimits& limits, HttpHandler handler);
  ~Impl();

  void Run();
  void Stop() {
    asio::post(_network, [this] { BeginDrain(); });
  }

 private:
  class Connection;

  void Accept();
  void BeginDrain();
  void Forget(Connection* connection);

  const std::string _path;
  const HttpLimits _limits;
  const HttpHandler _handler;
  std::set<Connection*> _connections;  // before the network, which may still hold some when it goes down
  asio::io_context _network{1};
  asio::thread_pool _workers;
  Protocol::acceptor _acceptor;
  asio::signal_set _signals;
  asio::steady_timer _drainTimer;
  bool _draining = false;
  bool _goingDown = false;
};

// One client. Keeps itself alive while something of it is under way.
class HttpServer::Impl::Connection : public std::enable_shared_from_this<Connection> {
 public:
  Connection(Impl& server, Protocol::socket socket) : _server(server), _stream(std::move(socket)) {
    _server._connections.insert(this);
  }
  ~Connection() { _server.Forget(this); }

  void Read() {
    _parser.emplace();
    _parser->header_limit(static_cast<std::uint32_t>(_server._limits.headerBytes));
    _parser->body_limit(_server._limits.bodyBytes);
    _stream.expires_after(_server._limits.readTime);
    _reading = true;
    http::async_read(_stream, _buffer, *_parser,
                     [self = shared_from_this()](error_code error, std::size_t) { self->OnRead(error); });
  }

  // Answers without having read, and closes.
  void Refuse(HttpAnswer answer) {
    _keepAlive = false;
    Write(std::move(answer));
  }

  // A connection that only waits for a request has nothing to lose.
  void Drain() {
    _keepAlive = false;
    if (_reading && !_parser->got_some()) {
      _stream.cancel();
    }
  }

 private:
  void OnRead(error_code error) {
    _reading = false;
    if (error) {
      if (auto refusal = Refusal(error)) {
        Refuse(std::move(*refusal));
      }
      return;
    }
    http::request<http::string_body> message = _parser->release();
    _keepAlive = message.keep_alive() && !_server._draining;
    _version = message.version();
    HttpRequest request{std::string(message.method_string()), std::string(message.target()),
                        std::string(message[http::field::content_type]), std::move(message.body())};
    asio::post(_server._workers, [self = shared_from_this(), request = std::move(request)]() mutable {
      HttpAnswer answer = self->Handle(request);
      asio::io_context& network = self->_server._network;
      // Back to the network's thread, which is the only one that touches the connection.
      asio::post(network, [self = std::move(self), answer = std::move(answer)]() mutable {
        self->Write(std::move(answer));
      });
    });
  }

  HttpAnswer Handle(const HttpRequest& request) const {
    try {
      return _server._handler(request);
    } catch (const std::exception& exception) {
      return {500, "text/plain", std::string(exception.what()) + "\n"};
    }
  }

  void Write(HttpAnswer answer) {
    _keepAlive = _keepAlive && !_server._draining;
    _response.emplace(static_cast<http::status>(answer.status), _version);
    _response->set(http::field::content_type, answer.contentType);
    _response->body() = std::move(answer.body);
    _response->keep_alive(_keepAlive);
    _response->prepare_payload();
    _stream.expires_after(_server._limits.writeTime);
    http::async_write(_stream, *_response, [self = shared_from_this()](error_code error, std::size_t) {
      if (!error && self->_keepAlive) {
        self->Read();
      } else {
        error_code ignored;
        self->_stream.socket().shutdown(Protocol::socket::shutdown_send, ignored);
      }
    });
  }

  Impl& _server;
  Stream _stream;
  beast::flat_buffer _buffer;
  std::optional<http::request_parser<http::string_body>> _parser;
  std::optional<http::response<http::string_body>> _response;
  unsigned _version = 11;
  bool _keepAlive = true;
  bool _reading = false;
};

HttpServer::Impl::Impl(const std::string& socketPath, const HttpLimits& limits, HttpHandler handler)
    : _path(socketPath),
      _limits(limits),
      _handler(std::move(handler)),
      _workers(limits.workers),
      _acceptor(_network),
      _signals(_network),
      _drainTimer(_network) {
  PrepareSocketPath(_path);
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

HttpServer::Impl::~Impl() {
  _goingDown = true;
  _workers.join();
  unlink(_path.c_str());
}

void HttpServer::Impl::Run() {
  for (const int signal : {SIGTERM, SIGINT}) {
    _signals.add(signal);
  }
  _signals.async_wait([this](error_code error, int) {
    if (!error) {
      BeginDrain();
    }
  });
  Accept();
  _network.run();
}

void HttpServer::Impl::Accept() {
  _acceptor.async_accept([this](error_code error, Protocol::socket socket) {
    if (_draining || error == asio::error::operation_aborted) {
      return;
    }
    if (!error) {
      const bool full = _connections.size() >= _limits.connections;
      const auto connection = std::make_shared<Connection>(*this, std::move(socket));
      if (full) {
        connection->Refuse({503, "text/plain", "too many connections; try again later\n"});
      } else {
        connection->Read();
      }
    }
    Accept();
  });
}

void HttpServer::Impl::BeginDrain() {
  if (_draining) {
    return;
  }
  _draining = true;
  error_code ignored;
  _acceptor.close(ignored);
  _signals.cancel(ignored);
  if (_connections.empty()) {
    return;
  }
  // Run goes on as long as the timer waits: until the last connection is gone, or the time is over.
  _drainTimer.expires_after(_limits.drainTime);
  _drainTimer.async_wait([this](error_code error) {
    if (!error) {
      _network.stop();
    }
  });
  for (Connection* connection : _connections) {
    connection->Drain();
  }
}

void HttpServer::Impl::Forget(Connection* connection) {
  _connections.erase(connection);
  if (_draining && !_goingDown && _connections.empty()) {
    _drainTimer.cancel();
  }
}

HttpServer::HttpServer(const std::string& socketPath, const HttpLimits& limits, HttpHandler handler)
    : _impl(std::make_unique<Impl>(socketPath, limits, std::move(handler))) {}
HttpServer::~HttpServer() = default;
void HttpServer::Run() { _impl->Run(); }
void HttpServer::Stop() { _impl->Stop(); }

}  // namespace Agentd
