#include "agentd/http/HttpConnection.h"

#include <algorithm>
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

constexpr int readersPart = 4;  // those who may not change get that part of the memory for bodies

}  // namespace

HttpConnection::HttpConnection(HttpContext& context, HttpDoor door, HttpPeer peer, HttpPlaces::Place place,
                               HttpStream::Socket socket)
    : _context(context),
      _door(std::move(door)),
      _place(std::move(place)),
      _peer(std::move(peer)),
      _stream(std::move(socket), _door.isTls ? &*context.tls : nullptr),
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
  _waiting = true;
  if (_stream.Secured() == nullptr) {
    Begin(std::move(refusal));
    return;
  }
  SetDeadline(_context.limits.handshakeTime);
  _stream.Secured()->async_handshake(
      HttpStream::Tls::server,
      [self = shared_from_this(), refusal = std::move(refusal)](error_code error) mutable {
        self->OnHandshake(error, std::move(refusal));
      });
}

void HttpConnection::OnHandshake(Error error, std::optional<HttpAnswer> refusal) {
  if (error) {
    if (!_context.draining) {
      _context.onRefused(HttpRefusal::Handshake, _peer.identity);
    }
    if (_stream.Bare().IsExpired()) {
      return;
    }
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
    SetDeadline(_context.limits.readTime);
    Read(shared_from_this());
  }
}

void HttpConnection::Read(std::shared_ptr<HttpConnection> self) {
  HttpConnection& connection = *self;
  connection._waiting = true;
  connection._parser.emplace();
  connection._parser->header_limit(static_cast<std::uint32_t>(connection._context.limits.headerBytes));
  connection._parser->body_limit(boost::none);  // until the header is known
  http::async_read_header(connection._stream, connection._buffer, *connection._parser,
                          [self = std::move(self)](error_code error, std::size_t) { self->OnHeader(error); });
}

void HttpConnection::OnHeader(Error error) {
  if (error) {
    GiveUp(error);
    return;
  }
  const HttpHeader& header = _parser->get();
  _form = {header.version(), header.method() != http::verb::head, _parser->keep_alive()};
  if (auto refusal = RefusalOf(header, _door)) {
    TellRefusal(std::move(*refusal));
    return;
  }
  _request = RequestOf(header, _door, _peer);
  Admit();
}

void HttpConnection::Admit() {
  HttpAdmission admission = _context.admit ? _context.admit(_request) : HttpAdmission();
  if (admission.refusal) {
    Decline(std::move(*admission.refusal));
    return;
  }
  const HttpLimits& limits = _context.limits;
  const std::size_t most = std::min(admission.bodyBytes, limits.bodyBytes);
  const std::uint64_t length = _parser->content_length().value_or(0);
  const bool mayChange = _peer.role == HttpRole::Change;
  auto& share = _parser->get().body().share;
  share.emplace(_context.bodies, mayChange ? limits.allBodyBytes : limits.allBodyBytes / readersPart);
  if (length > most) {
    GiveUp(http::error::body_limit);
  } else if (!share->Hold(length)) {
    GiveUp(HttpBody::BeyondBudget());
  } else {
    _parser->body_limit(most);
    GoOn();
  }
}

void HttpConnection::GoOn() {
  if (_parser->is_done() || !WantsContinue(_parser->get())) {
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
  if (tooLate) {
    _context.onRefused(HttpRefusal::Slow, _peer.identity);
  } else if (HttpBody::IsBeyondBudget(error)) {
    _context.onRefused(HttpRefusal::Bodies, _peer.identity);
  }
  if (auto refusal = tooLate ? RefusedWith(408, "the request took too long") : RefusalOf(error)) {
    TellRefusal(std::move(*refusal));
  }
}

void HttpConnection::PassOn() {
  HttpBody::value_type body = _parser->release().body();
  _request.body = std::move(body.text);
  asio::post(_context.workers,
             [self = shared_from_this(), request = std::move(_request),
              share = std::move(*body.share)]() mutable { Handle(std::move(self), request); });
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
  _form.keepAlive = _form.keepAlive && !_context.draining;
  _response.emplace(ResponseOf(std::move(answer), _form));
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
  if (!self->_form.keepAlive || context.draining) {
    return false;
  }
  self->SetDeadline(context.limits.readTime);
  Read(std::move(self));
  return true;
}

void HttpConnection::Decline(HttpAnswer answer) {
  if (!_parser->is_done()) {
    Refuse(std::move(answer));
    return;
  }
  _waiting = false;
  Compose(std::move(answer));
  Write();
}

void HttpConnection::Refuse(HttpAnswer answer) {
  _waiting = false;
  _form.keepAlive = false;
  _refused = true;
  Compose(std::move(answer));
  Write();
}

void HttpConnection::TellRefusal(HttpAnswer refusal) {
  const bool isAsked = _context.encodeRefusal && _parser->is_header_done();
  Refuse(isAsked ? _context.encodeRefusal(WhatIsAsked(_parser->get()).target, std::move(refusal))
                 : std::move(refusal));
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
  if (_form.keepAlive && !_context.draining) {
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
