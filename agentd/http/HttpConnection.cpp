#include "agentd/http/HttpConnection.h"

#include <boost/asio/buffer.hpp>
#include <boost/asio/post.hpp>
#include <utility>

namespace Agentd {
namespace {

namespace asio = boost::asio;
namespace http = boost::beast::http;
using boost::system::error_code;

constexpr std::chrono::milliseconds discardTime = std::chrono::seconds(2);

HttpAnswer PlainText(unsigned status, const std::string& text) {
  return {status, "text/plain", text + "\n"};
}

// What a request that could not be read is answered with; nothing when the client has gone.
std::optional<HttpAnswer> Refusal(const error_code& error) {
  if (error == http::error::body_limit) {
    return PlainText(413, "the body is too large");
  }
  if (error == http::error::header_limit) {
    return PlainText(431, "the header is too large");
  }
  const bool gone =
      error == http::error::end_of_stream || error.category() == asio::error::get_system_category();
  return gone ? std::nullopt : std::optional(PlainText(400, "not a request: " + error.message()));
}

}  // namespace

HttpConnection::HttpConnection(HttpContext& context, Socket socket)
    : _context(context), _socket(std::move(socket)), _deadline(context.network) {
  _context.connections.insert(this);
}

HttpConnection::~HttpConnection() {
  _context.connections.erase(this);
  if (_context.connections.empty() && _context.onLastGone) {
    _context.onLastGone();
  }
}

void HttpConnection::Read() {
  _parser.emplace();
  _parser->header_limit(static_cast<std::uint32_t>(_context.limits.headerBytes));
  _parser->body_limit(_context.limits.bodyBytes);
  SetDeadline(_context.limits.readTime);
  _waiting = true;
  http::async_read(_socket, _buffer, *_parser,
                   [self = shared_from_this()](error_code error, std::size_t) { self->OnRead(error); });
}

void HttpConnection::OnRead(Error error) {
  _waiting = false;
  if (!error) {
    _deadline.cancel();
    PassOn();
    return;
  }
  const bool tooLate = _late && error == asio::error::operation_aborted && _parser->got_some();
  if (auto refusal = tooLate ? PlainText(408, "the request took too long") : Refusal(error)) {
    Refuse(std::move(*refusal));
  }
}

void HttpConnection::PassOn() {
  http::request<http::string_body> message = _parser->release();
  _keepAlive = message.keep_alive();
  _version = message.version();
  _withBody = message.method() != http::verb::head;
  HttpRequest request{std::string(message.method_string()), std::string(message.target()),
                      std::string(message[http::field::content_type]), std::move(message.body()),
                      std::string(message["SOAPAction"])};
  asio::post(_context.workers, [self = shared_from_this(), request = std::move(request)]() mutable {
    Handle(std::move(self), request);
  });
}

void HttpConnection::Handle(std::shared_ptr<HttpConnection> self, const HttpRequest& request) {
  const HttpDeferringHandler& handler = self->_context.handler;
  const HttpResponder responder([self = std::move(self)](HttpAnswer answer) mutable {
    asio::io_context& network = self->_context.network;
    asio::post(network, [self = std::move(self), answer = std::move(answer)]() mutable {
      self->Write(std::move(answer));
    });
  });
  try {
    handler(request, responder);
  } catch (const std::exception& exception) {
    responder.Answer(PlainText(500, exception.what()));
  } catch (...) {
    responder.Answer(PlainText(500, "an error of an unknown kind"));
  }
}

void HttpConnection::Refuse(HttpAnswer answer) {
  _keepAlive = false;
  _refused = true;
  Write(std::move(answer));
}

void HttpConnection::Write(HttpAnswer answer) {
  _keepAlive = _keepAlive && !_context.draining;
  _response.emplace(static_cast<http::status>(answer.status), _version);
  _response->set(http::field::content_type, answer.contentType);
  if (answer.retryAfterSeconds > 0) {
    _response->set(http::field::retry_after, std::to_string(answer.retryAfterSeconds));
  }
  _response->content_length(answer.body.size());
  if (_withBody) {
    _response->body() = std::move(answer.body);
  }
  _response->keep_alive(_keepAlive);
  SetDeadline(_context.limits.writeTime);
  http::async_write(_socket, *_response,
                    [self = shared_from_this()](error_code error, std::size_t) { self->OnWritten(error); });
}

void HttpConnection::OnWritten(Error error) {
  if (error) {
    return;
  }
  if (_keepAlive && !_context.draining) {
    Read();
    return;
  }
  error_code ignored;
  _socket.shutdown(Socket::shutdown_send, ignored);
  if (_refused) {
    SetDeadline(discardTime);
    Discard();
  }
}

void HttpConnection::Discard() {
  _socket.async_read_some(asio::buffer(_discarded),
                          [self = shared_from_this()](error_code error, std::size_t) {
                            if (!error && !self->_late) {
                              self->Discard();
                            }
                          });
}

void HttpConnection::Drain() {
  _keepAlive = false;
  // One that only waits for a request has nothing to lose.
  if (_waiting && !_parser->got_some()) {
    error_code ignored;
    _socket.cancel(ignored);
  }
}

void HttpConnection::SetDeadline(std::chrono::milliseconds time) {
  _late = false;
  _deadline.expires_after(time);
  // Weak: a deadline far away must not keep a client alive that has gone.
  _deadline.async_wait([weak = weak_from_this()](error_code error) {
    const auto self = weak.lock();
    // A deadline that was moved when it had just passed counts no more.
    if (error || !self || self->_deadline.expiry() > std::chrono::steady_clock::now()) {
      return;
    }
    self->_late = true;
    error_code ignored;
    self->_socket.cancel(ignored);
  });
}

}  // namespace Agentd
