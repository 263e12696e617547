#include "agentd/http/HttpConnection.h"

#include <boost/asio/buffer.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/write.hpp>
#include <utility>

#include "agentd/http/TlsServer.h"

namespace Agentd {
namespace {

namespace asio = boost::asio;
namespace http = boost::beast::http;
using boost::system::error_code;

constexpr std::chrono::milliseconds discardTime = std::chrono::seconds(2);
constexpr std::size_t bodyPiece = 64 << 10;  // read at a time
constexpr std::string_view goOn = "HTTP/1.1 100 Continue\r\n\r\n";

// What a request that could not be read is answered with; nothing when the client has gone.
std::optional<HttpAnswer> Refusal(const error_code& error) {
  if (error == http::error::body_limit) {
    return RefusedWith(413, "the body is too large");
  }
  if (error == http::error::header_limit) {
    return RefusedWith(431, "the header is too large");
  }
  if (error == http::error::buffer_overflow) {
    return RefusedWith(431, "the header of a chunk is too large");
  }
  const bool gone = error == http::error::end_of_stream ||
                    error.category() != http::make_error_code(http::error::end_of_stream).category();
  return gone ? std::nullopt : std::optional(RefusedWith(400, "not a request: " + error.message()));
}

HttpRequest FromHeader(const HttpHeader& header, const HttpDoor& door, const HttpPeer& peer) {
  return {.method = std::string(header.method_string()),
          .target = std::string(header.target()),
          .contentType = std::string(header[http::field::content_type]),
          .body = {},
          .soapAction = std::string(header["SOAPAction"]),
          .hasOrigin = header.count(http::field::origin) != 0,
          .peer = peer,
          .scheme = door.isTls ? "https" : "http",
          .authority = std::string(header[http::field::host])};
}

}  // namespace

HttpConnection::HttpConnection(HttpContext& context, HttpDoor door, HttpPeer peer, HttpStream::Socket socket,
                               asio::ssl::context* tls)
    : _context(context),
      _door(std::move(door)),
      _peer(std::move(peer)),
      _stream(std::move(socket), tls),
      _deadline(context.network),
      _buffer(context.limits.headerBytes + bodyPiece) {
  _context.connections.insert(this);
}

HttpConnection::~HttpConnection() {
  _context.connections.erase(this);
  if (_context.connections.empty() && _context.onLastGone) {
    _context.onLastGone();
  }
}

void HttpConnection::Start(std::optional<HttpAnswer> refusal) {
  SetDeadline(_context.limits.readTime);
  _waiting = true;
  if (_stream.Secured() == nullptr) {
    Begin(std::move(refusal));
    return;
  }
  _stream.Secured()->async_handshake(
      HttpStream::Tls::server,
      [self = shared_from_this(), refusal = std::move(refusal)](error_code error) mutable {
        self->OnHandshake(error, std::move(refusal));
      });
}

void HttpConnection::OnHandshake(Error error, std::optional<HttpAnswer> refusal) {
  if (error) {
    // The client may still be sending: closed at once, it might never read what is wrong with its
    // certificate.
    SetDeadline(discardTime);
    _waiting = false;
    _refused = true;
    CloseSending();
    return;
  }
  HttpPeer known = _context.access.PeerOf(CertificateNames(_stream.Secured()->native_handle()));
  known.identity += " at " + _peer.identity;
  _peer = std::move(known);
  Begin(std::move(refusal));
}

void HttpConnection::Begin(std::optional<HttpAnswer> refusal) {
  if (refusal) {
    Refuse(std::move(*refusal));
  } else {
    Read(shared_from_this());
  }
}

void HttpConnection::Read(std::shared_ptr<HttpConnection> self) {
  HttpConnection& connection = *self;
  connection._waiting = true;
  connection._parser.emplace();
  connection._parser->header_limit(static_cast<std::uint32_t>(connection._context.limits.headerBytes));
  connection._parser->body_limit(connection._context.limits.bodyBytes);
  http::async_read_header(connection._stream, connection._buffer, *connection._parser,
                          [self = std::move(self)](error_code error, std::size_t) { self->OnHeader(error); });
}

void HttpConnection::OnHeader(Error error) {
  if (error) {
    GiveUp(error);
    return;
  }
  const HttpHeader& header = _parser->get();
  _version = header.version();
  _withBody = header.method() != http::verb::head;
  if (auto refusal = RefusalOf(header, _door)) {
    Refuse(std::move(*refusal));
    return;
  }
  _request = FromHeader(header, _door, _peer);
  if (_parser->is_done() || !WantsContinue(header)) {
    ReadBody();
    return;
  }
  asio::async_write(_stream, asio::buffer(goOn.data(), goOn.size()),
                    [self = shared_from_this()](error_code unsent, std::size_t) {
                      if (unsent) {
                        self->GiveUp(unsent);
                      } else {
                        self->ReadBody();
                      }
                    });
}

void HttpConnection::ReadBody() {
  http::async_read(_stream, _buffer, *_parser,
                   [self = shared_from_this()](error_code error, std::size_t) { self->OnBody(error); });
}

void HttpConnection::OnBody(Error error) {
  if (error) {
    GiveUp(error);
    return;
  }
  _waiting = false;
  ClearDeadline();
  PassOn();
}

void HttpConnection::GiveUp(Error error) {
  const bool tooLate = _stream.Bare().IsExpired() && error == asio::error::operation_aborted && HasBegun();
  if (auto refusal = tooLate ? RefusedWith(408, "the request took too long") : Refusal(error)) {
    Refuse(std::move(*refusal));
  }
}

void HttpConnection::PassOn() {
  http::request<http::string_body> message = _parser->release();
  _keepAlive = message.keep_alive();
  _request.body = std::move(message.body());
  asio::post(_context.workers, [self = shared_from_this(), request = std::move(_request)]() mutable {
    Handle(std::move(self), request);
  });
}

void HttpConnection::Handle(std::shared_ptr<HttpConnection> self, const HttpRequest& request) {
  const HttpDeferringHandler& handler = self->_context.handler;
  const HttpResponder responder(
      [self = std::move(self)](HttpAnswer answer) mutable { Answer(std::move(self), std::move(answer)); });
  try {
    handler(request, responder);
  } catch (const std::exception& exception) {
    responder.Answer(RefusedWith(500, exception.what()));
  } catch (...) {
    responder.Answer(RefusedWith(500, "an error of an unknown kind"));
  }
}

void HttpConnection::Answer(std::shared_ptr<HttpConnection> self, HttpAnswer answer) {
  self->Compose(std::move(answer));
  if (self->SendAtOnce() && GiveBack(self)) {
    return;
  }
  asio::io_context& network = self->_context.network;
  asio::post(network, [self = std::move(self)] { self->Write(); });
}

void HttpConnection::Compose(HttpAnswer answer) {
  _keepAlive = _keepAlive && !_context.draining;
  _response.emplace(static_cast<http::status>(answer.status), _version);
  _response->set(http::field::content_type, answer.contentType);
  _response->set("X-Content-Type-Options", "nosniff");  // a browser must take no answer for a page
  if (answer.retryAfterSeconds > 0) {
    _response->set(http::field::retry_after, std::to_string(answer.retryAfterSeconds));
  }
  _response->content_length(answer.body.size());
  if (_withBody) {
    _response->body() = std::move(answer.body);
  }
  _response->keep_alive(_keepAlive);
  _unsent.emplace(*_response);
}

bool HttpConnection::SendAtOnce() {
  if (_stream.Secured() != nullptr) {
    return false;
  }
  error_code error;
  while (!error && !_unsent->is_done()) {
    http::write_some(_stream.Bare().Plain(), *_unsent, error);
  }
  return !error;
}

bool HttpConnection::GiveBack(std::shared_ptr<HttpConnection>& self) {
  HttpContext& context = self->_context;
  const std::lock_guard guard(context.givingBack);
  if (!self->_keepAlive || context.draining) {
    return false;
  }
  self->SetDeadline(context.limits.readTime);
  Read(std::move(self));
  return true;
}

void HttpConnection::Refuse(HttpAnswer answer) {
  _waiting = false;
  _keepAlive = false;
  _refused = true;
  Compose(std::move(answer));
  Write();
}

void HttpConnection::Write() {
  if (_unsent->is_done()) {
    OnWritten({});
    return;
  }
  SetDeadline(_context.limits.writeTime);
  http::async_write(_stream, *_unsent,
                    [self = shared_from_this()](error_code error, std::size_t) { self->OnWritten(error); });
}

void HttpConnection::OnWritten(Error error) {
  if (error) {
    return;
  }
  if (_keepAlive && !_context.draining) {
    SetDeadline(_context.limits.readTime);
    Read(shared_from_this());
  } else {
    End();
  }
}

void HttpConnection::End() {
  SetDeadline(discardTime);
  if (_stream.Secured() == nullptr) {
    CloseSending();
    return;
  }
  _stream.Secured()->async_shutdown([self = shared_from_this()](error_code) { self->CloseSending(); });
}

void HttpConnection::CloseSending() {
  error_code ignored;
  _stream.Bare().Plain().shutdown(HttpStream::Socket::shutdown_send, ignored);
  if (_refused) {
    Discard();
  }
}

void HttpConnection::Discard() {
  _stream.Bare().async_read_some(asio::buffer(_discarded),
                                 [self = shared_from_this()](error_code error, std::size_t) {
                                   if (!error) {
                                     self->Discard();
                                   }
                                 });
}

void HttpConnection::Drain() {
  // One that only waits for a request has nothing to lose.
  if (_waiting && !HasBegun()) {
    _stream.Bare().Cancel();
  }
}

void HttpConnection::SetDeadline(std::chrono::milliseconds time) {
  _stream.Bare().Renew();
  _deadline.expires_after(time);
  // Weak: a deadline far away must not keep a client alive that has gone.
  _deadline.async_wait([weak = weak_from_this(), number = ++_deadlines](error_code error) {
    const auto self = weak.lock();
    // One that was cleared or moved when it had just passed counts no more.
    if (!error && self && self->_deadlines == number) {
      const std::lock_guard guard(self->_context.givingBack);  // that worker may not have let go of it yet
      self->_stream.Bare().Expire();
    }
  });
}

void HttpConnection::ClearDeadline() {
  ++_deadlines;
  _deadline.cancel();
}

}  // namespace Agentd
