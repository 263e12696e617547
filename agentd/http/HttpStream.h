// The bytes of one client, with or without TLS. Part of the server; nobody else includes this.
//
// Threads: the network's only. One read or one write at a time.
#pragma once

#include <boost/asio/error.hpp>
#include <boost/asio/generic/stream_protocol.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/ssl/stream.hpp>
#include <boost/beast/core/bind_handler.hpp>
#include <optional>
#include <utility>

namespace Agentd {

// A socket whose time can be over: then nothing more begins on it. To cancel alone would not do: what has
// just been completed, and is about to go on, cannot be cancelled.
class TimedSocket {
 public:
  // NOLINTBEGIN(readability-identifier-naming): what the library asks of a stream, here and below
  using Socket = boost::asio::generic::stream_protocol::socket;
  using lowest_layer_type = Socket::lowest_layer_type;
  using executor_type = Socket::executor_type;
  using Error = boost::system::error_code;

  explicit TimedSocket(Socket socket) : _socket(std::move(socket)) {
    Error ignored;
    _socket.non_blocking(true, ignored);  // whoever writes past this class must not be held up
  }

  executor_type get_executor() { return _socket.get_executor(); }
  lowest_layer_type& lowest_layer() { return _socket.lowest_layer(); }
  Socket& Plain() { return _socket; }

  void Cancel() {
    Error ignored;
    _socket.cancel(ignored);
  }
  void Expire() {
    _isExpired = true;
    Cancel();
  }
  void Renew() { _isExpired = false; }
  bool IsExpired() const { return _isExpired; }

  template <class Buffers, class Handler>
  void async_read_some(const Buffers& buffers, Handler&& handler) {
    if (!Refuses(handler)) {
      _socket.async_read_some(buffers, std::forward<Handler>(handler));
    }
  }
  template <class Buffers, class Handler>
  void async_write_some(const Buffers& buffers, Handler&& handler) {
    if (!Refuses(handler)) {
      _socket.async_write_some(buffers, std::forward<Handler>(handler));
    }
  }

 private:
  template <class Handler>
  bool Refuses(Handler& handler) {
    if (_isExpired) {
      const Error aborted = boost::asio::error::operation_aborted;
      boost::asio::post(get_executor(),
                        boost::beast::bind_front_handler(std::move(handler), aborted, std::size_t{0}));
    }
    return _isExpired;
  }

  Socket _socket;
  bool _isExpired = false;
};

class HttpStream {
 public:
  using Socket = TimedSocket::Socket;
  using executor_type = Socket::executor_type;
  using Tls = boost::asio::ssl::stream<TimedSocket&>;

  // Null: no TLS.
  HttpStream(Socket socket, boost::asio::ssl::context* tls) : _socket(std::move(socket)) {
    if (tls != nullptr) {
      _tls.emplace(_socket, *tls);
    }
  }
  HttpStream(const HttpStream&) = delete;
  HttpStream& operator=(const HttpStream&) = delete;

  executor_type get_executor() { return _socket.get_executor(); }
  TimedSocket& Bare() { return _socket; }
  // Null without TLS.
  Tls* Secured() { return _tls ? &*_tls : nullptr; }

  template <class Buffers, class Handler>
  void async_read_some(const Buffers& buffers, Handler&& handler) {
    _tls ? _tls->async_read_some(buffers, std::forward<Handler>(handler))
         : _socket.async_read_some(buffers, std::forward<Handler>(handler));
  }
  template <class Buffers, class Handler>
  void async_write_some(const Buffers& buffers, Handler&& handler) {
    _tls ? _tls->async_write_some(buffers, std::forward<Handler>(handler))
         : _socket.async_write_some(buffers, std::forward<Handler>(handler));
  }
  // NOLINTEND(readability-identifier-naming)

 private:
  TimedSocket _socket;
  std::optional<Tls> _tls;
};

}  // namespace Agentd
