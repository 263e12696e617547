// One client of the HTTP server. Part of the server; nobody else includes this.
//
// Threads: everything here runs on the thread of the network, except for Handle, which runs on a worker.
// Ownership: a connection keeps itself alive while something of it is under way, an outstanding answer
// included, and leaves the list of connections when it goes.
#pragma once

#include <array>
#include <boost/asio/io_context.hpp>
#include <boost/asio/local/stream_protocol.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/asio/thread_pool.hpp>
#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/http.hpp>
#include <functional>
#include <memory>
#include <optional>
#include <set>

#include "agentd/http/HttpServer.h"

namespace Agentd {

class HttpConnection;

// What the server and its connections share.
struct HttpContext {
  HttpLimits limits;
  HttpDeferringHandler handler;
  boost::asio::io_context& network;
  boost::asio::thread_pool& workers;
  std::function<void()> onLastGone;  // told when the last connection has gone
  std::set<HttpConnection*> connections = {};
  bool draining = false;  // answers are the last on their connection
};

class HttpConnection : public std::enable_shared_from_this<HttpConnection> {
 public:
  using Socket = boost::asio::local::stream_protocol::socket;

  HttpConnection(HttpContext& context, Socket socket);
  ~HttpConnection();

  // Waits for a request, answers it, and so on.
  void Read();
  // Answers without having read a request to its end, and closes.
  void Refuse(HttpAnswer answer);
  // Ends after the request under way; at once if there is none.
  void Drain();

 private:
  using Error = boost::system::error_code;

  void OnRead(Error error);
  void PassOn();
  // Takes the reference along to where the answer comes from: the network's thread must be the one that sees
  // the connection go, so no worker may keep one.
  static void Handle(std::shared_ptr<HttpConnection> self, const HttpRequest& request);
  void Write(HttpAnswer answer);
  void OnWritten(Error error);
  // Reads what the client still sends, for a moment: closed at once, it might never see the answer.
  void Discard();
  // Cancels what is under way on the socket after that time.
  void SetDeadline(std::chrono::milliseconds time);

  HttpContext& _context;
  Socket _socket;
  boost::asio::steady_timer _deadline;
  boost::beast::flat_buffer _buffer;
  std::optional<boost::beast::http::request_parser<boost::beast::http::string_body>> _parser;
  std::optional<boost::beast::http::response<boost::beast::http::string_body>> _response;
  std::array<char, 16384> _discarded;
  unsigned _version = 11;
  bool _keepAlive = true;
  bool _withBody = true;  // the answer's body is sent: not to HEAD
  bool _waiting = false;  // for a request, or for its end
  bool _refused = false;  // the client may still be sending
  bool _late = false;     // the deadline has passed
};

}  // namespace Agentd
