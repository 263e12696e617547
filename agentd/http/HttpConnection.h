// One client of the HTTP server. Part of the server; nobody else includes this.
//
// Threads: everything here runs on the thread of the network, except for Handle, which runs on a worker.
// Ownership: a connection keeps itself alive while something of it is under way, an outstanding answer
// included, and leaves the list of connections when it goes.
#pragma once

#include <array>
#include <boost/asio/io_context.hpp>
#include <boost/asio/ssl/context.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/asio/thread_pool.hpp>
#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/http.hpp>
#include <functional>
#include <memory>
#include <optional>
#include <set>

#include "agentd/http/HttpHeaderRules.h"
#include "agentd/http/HttpServer.h"
#include "agentd/http/HttpStream.h"

namespace Agentd {

class HttpConnection;

// What the server and its connections share.
struct HttpContext {
  HttpLimits limits;
  AccessRules access;
  std::optional<boost::asio::ssl::context> tls;
  HttpDeferringHandler handler;
  boost::asio::io_context& network;
  boost::asio::thread_pool& workers;
  std::function<void()> onLastGone;  // told when the last connection has gone
  std::set<HttpConnection*> connections = {};
  bool draining = false;  // answers are the last on their connection
};

class HttpConnection : public std::enable_shared_from_this<HttpConnection> {
 public:
  // `peer` is who connects; with TLS, its role and name are those of the certificate instead. `tls` may be
  // null.
  HttpConnection(HttpContext& context, HttpDoor door, HttpPeer peer, HttpStream::Socket socket,
                 boost::asio::ssl::context* tls);
  ~HttpConnection();

  // Agrees on the secrets of TLS, if there is any. Then answers with the refusal and closes or, without one,
  // waits for a request, answers it, and so on.
  void Start(std::optional<HttpAnswer> refusal);
  // Ends after the request under way; at once if there is none.
  void Drain();

 private:
  using Error = boost::system::error_code;

  void OnHandshake(Error error, std::optional<HttpAnswer> refusal);
  void Begin(std::optional<HttpAnswer> refusal);
  // Waits for the next request, within the time that runs already.
  void Read();
  void OnHeader(Error error);
  void ReadBody();
  void OnBody(Error error);
  // Answers what could not be read to its end, if there is still somebody to answer.
  void GiveUp(Error error);
  void PassOn();
  // Takes the reference along to where the answer comes from: the network's thread must be the one that sees
  // the connection go, so no worker may keep one.
  static void Handle(std::shared_ptr<HttpConnection> self, const HttpRequest& request);
  // Answers without having read a request to its end, and closes.
  void Refuse(HttpAnswer answer);
  void Write(HttpAnswer answer);
  void OnWritten(Error error);
  void End();
  void CloseSending();
  // Reads what the client still sends, for a moment: closed at once, it might never see the answer.
  void Discard();
  // Ends what is under way on the stream after that time.
  void SetDeadline(std::chrono::milliseconds time);
  bool HasBegun() const { return _parser && _parser->got_some(); }

  HttpContext& _context;
  const HttpDoor _door;
  HttpPeer _peer;
  HttpStream _stream;
  boost::asio::steady_timer _deadline;
  boost::beast::flat_buffer _buffer;
  std::optional<boost::beast::http::request_parser<boost::beast::http::string_body>> _parser;
  std::optional<boost::beast::http::response<boost::beast::http::string_body>> _response;
  std::array<char, 16384> _discarded;
  HttpRequest _request;  // what the header says; the fields behind a body in chunks change nothing of it
  unsigned _version = 11;
  bool _keepAlive = true;
  bool _withBody = true;  // the answer's body is sent: not to HEAD
  bool _waiting = false;  // for a request, or for its end
  bool _refused = false;  // the client may still be sending
};

}  // namespace Agentd
