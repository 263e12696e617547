#include "agentd/http/HttpListener.h"

#include <sys/stat.h>
#include <unistd.h>

#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/ip/v6_only.hpp>
#include <boost/asio/local/stream_protocol.hpp>
#include <stdexcept>
#include <utility>

#include "agentd/http/UnixSocket.h"

namespace Agentd {
namespace {

namespace asio = boost::asio;
using boost::system::error_code;

constexpr int socketMask = 0117;  // 0660: owner and group
constexpr std::chrono::milliseconds acceptPause(100);

}  // namespace

HttpListener::HttpListener(asio::io_context& network, const HttpAddress& address)
    : _address(address), _acceptor(network), _pause(network) {
  _address.isUnix ? BindUnix() : BindTcp();
}

void HttpListener::BindUnix() {
  const SocketPlace place(_address.place);
  const asio::local::stream_protocol::endpoint endpoint(_address.place);
  _acceptor.open(endpoint.protocol());
  // The mask belongs to the process; nothing else makes files while the agent starts.
  const mode_t before = umask(socketMask);
  error_code error;
  _acceptor.bind(endpoint, error);
  umask(before);
  if (!error) {
    _acceptor.listen(asio::socket_base::max_listen_connections, error);
  }
  if (error) {
    throw std::runtime_error("cannot listen on " + _address.place + ": " + error.message());
  }
}

void HttpListener::BindTcp() {
  const asio::ip::tcp::endpoint endpoint(asio::ip::make_address(_address.place), _address.port);
  error_code error;
  _acceptor.open(endpoint.protocol(), error);
  if (!error) {
    _acceptor.set_option(asio::socket_base::reuse_address(true));
    if (endpoint.address().is_v6()) {
      _acceptor.set_option(asio::ip::v6_only(true));  // 0.0.0.0 is an address of its own
    }
    _acceptor.bind(endpoint, error);
  }
  if (!error) {
    _acceptor.listen(asio::socket_base::max_listen_connections, error);
  }
  if (error) {
    throw std::runtime_error("cannot listen on " + _address.Text() + ": " + error.message());
  }
  const Protocol::endpoint bound = _acceptor.local_endpoint();
  asio::ip::tcp::endpoint real;
  real.resize(bound.size());
  std::memcpy(real.data(), bound.data(), bound.size());
  _address.port = real.port();
}

void HttpListener::Accept(AcceptHandler onAccept, Failed failed) {
  _welcome = std::move(onAccept);
  _failed = std::move(failed);
  AcceptNext();
}

void HttpListener::AcceptNext() {
  _acceptor.async_accept(
      [this](error_code error, Protocol::socket socket) { OnAccept(error, std::move(socket)); });
}

void HttpListener::OnAccept(error_code error, Protocol::socket socket) {
  if (!_acceptor.is_open() || error == asio::error::operation_aborted) {
    return;
  }
  if (!error) {
    _welcome(std::move(socket));
    AcceptNext();
    return;
  }
  _failed(error);
  // No descriptors left, for one: trying again at once would only burn the processor.
  _pause.expires_after(acceptPause);
  _pause.async_wait([this](error_code cancelled) {
    if (!cancelled) {
      AcceptNext();
    }
  });
}

// The file goes first, and only while the socket is ours: later, another agent's may stand there.
void HttpListener::Close() {
  if (!_acceptor.is_open()) {
    return;
  }
  if (_address.isUnix) {
    unlink(_address.place.c_str());
  }
  error_code ignored;
  _acceptor.close(ignored);
  _pause.cancel();
}

}  // namespace Agentd
