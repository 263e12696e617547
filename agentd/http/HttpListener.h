// One address that a server answers on. Part of the server; nobody else includes this.
//
// Threads: the network's only, once Accept has been called.
#pragma once

#include <boost/asio/basic_socket_acceptor.hpp>
#include <boost/asio/generic/stream_protocol.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/steady_timer.hpp>
#include <functional>

#include "agentd/http/HttpAddress.h"

namespace Agentd {

class HttpListener {
 public:
  using Protocol = boost::asio::generic::stream_protocol;
  using AcceptHandler = std::function<void(Protocol::socket socket)>;
  using Failed = std::function<void(boost::system::error_code error)>;

  // Binds; a Unix socket has mode 0660. Throws std::runtime_error that names the address.
  HttpListener(boost::asio::io_context& network, const HttpAddress& address);
  ~HttpListener() { Close(); }
  HttpListener(const HttpListener&) = delete;
  HttpListener& operator=(const HttpListener&) = delete;

  // The address as it is answered on: with the port that was found.
  const HttpAddress& Address() const { return _address; }

  // Until Close, every client is welcomed. `failed` is told when one cannot be accepted; it may be later.
  void Accept(AcceptHandler onAccept, Failed failed);
  // Accepts no more; the file of a Unix socket goes.
  void Close();

 private:
  void BindUnix();
  void BindTcp();
  void AcceptNext();
  void OnAccept(boost::system::error_code error, Protocol::socket socket);

  HttpAddress _address;
  boost::asio::basic_socket_acceptor<Protocol> _acceptor;
  boost::asio::steady_timer _pause;
  AcceptHandler _welcome;
  Failed _failed;
};

}  // namespace Agentd
