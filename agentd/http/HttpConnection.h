// One client of the HTTP server. Part of the server; nobody else includes this.
//
// Threads: a connection belongs to one thread at a time. That is the network's, except while a request is
// handled: from PassOn on it is the worker's, and whoever answers sends what it can, begins to read the next
// request, and so gives the connection back. Only then does the network look at it again.
//
// Ownership: a connection keeps itself alive while something of it is under way, an outstanding answer
// included, and leaves the list of connections when it goes.
#pragma once

#include <array>
#include <atomic>
#include <boost/asio/io_context.hpp>
#include <boost/asio/ssl/context.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/asio/thread_pool.hpp>
#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/http.hpp>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <set>

#include "agentd/http/BodyBudget.h"
#include "agentd/http/HttpBody.h"
#include "agentd/http/HttpMessages.h"
#include "agentd/http/HttpPlaces.h"
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
  HttpAdmit admit;                                                     // may be empty
  RefusalEncoder encodeRefusal = {};                                   // may be empty
  std::function<void(HttpRefusal, const std::string& who)> onRefused;  // told on the network's thread
  boost::asio::io_context& network;
  boost::asio::thread_pool& workers;
  std::function<void()> onLastGone;  // told when the last connection has gone
  std::set<HttpConnection*> connections = {};
  BodyBudget bodies = {};
  std::atomic<bool> draining{false};  // answers are the last on their connection
  // Held by a worker while it gives a connection back; and by the network to begin draining, which must not
  // miss that one, and before it lets the time of one be over.
  std::mutex givingBack = {};
};

class HttpConnection : public std::enable_shared_from_this<HttpConnection> {
 public:
  // `peer` is who connects; with TLS, its role and name are those of the certificate instead.
  HttpConnection(HttpContext& context, HttpDoor door, HttpPeer peer, HttpPlaces::Place place,
                 HttpStream::Socket socket);
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
  // Waits for the next request, within the time that runs already. Takes the reference along, as Handle does.
  static void Read(std::shared_ptr<HttpConnection> self);
  void OnHeader(Error error);
  // What may be told of the request by its header; the body is then read, or the request refused.
  void Admit();
  void GoOn();
  void ReadBody();
  void OnBody(Error error);
  // Answers what could not be read to its end, if there is still somebody to answer.
  void GiveUp(Error error);
  void PassOn();
  // Takes the reference along to where the answer comes from: the network's thread must be the one that sees
  // the connection go, so no worker may keep one.
  static void Handle(std::shared_ptr<HttpConnection> self, const HttpRequest& request);
  // Sends it and goes on to the next request without the network's thread, which would have to wake up for
  // it; or leaves to the network what remains.
  static void Answer(std::shared_ptr<HttpConnection> self, HttpAnswer answer);
  void Compose(HttpAnswer answer);
  // What the socket takes without waiting. Whether that was all.
  bool SendAtOnce();
  // Reads on, and takes the reference; or leaves it, when the connection has to end.
  static bool GiveBack(std::shared_ptr<HttpConnection>& self);
  // Answers a request that is not handled. Closes if it has a body, of which nothing has been read.
  void Decline(HttpAnswer answer);
  // Answers without having read a request to its end, and closes.
  void Refuse(HttpAnswer answer);
  // The same with a refusal of the server's own, in the form that is usual at the request's target.
  void TellRefusal(HttpAnswer refusal);
  // What is left of the answer.
  void Write();
  void OnWritten(Error error);
  void End();
  void CloseSending();
  // Reads what the client still sends, for a moment: closed at once, it might never see the answer.
  void Discard();
  // Ends what is under way on the stream after that time.
  void SetDeadline(std::chrono::milliseconds time);
  void ClearDeadline();
  bool HasBegun() const { return _parser && _parser->got_some(); }

  HttpContext& _context;
  const HttpDoor _door;
  const HttpPlaces::Place _place;
  HttpPeer _peer;
  HttpStream _stream;
  boost::asio::steady_timer _deadline;
  std::atomic<unsigned> _deadlines{0};  // set or cleared so far; only the last counts
  boost::beast::flat_buffer _buffer;
  std::optional<boost::beast::http::request_parser<HttpBody>> _parser;
  std::optional<HttpResponse> _response;
  // How much of the answer has been sent.
  std::optional<boost::beast::http::response_serializer<boost::beast::http::string_body>> _unsent;
  std::array<char, 16384> _discarded;
  HttpRequest _request;   // what the header says; the fields behind a body in chunks change nothing of it
  HttpForm _form;         // of the answer
  bool _waiting = false;  // for a request, or for its end
  bool _refused = false;  // the client may still be sending
};

}  // namespace Agentd
