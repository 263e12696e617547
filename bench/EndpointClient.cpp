#include "bench/EndpointClient.h"

#include <boost/asio/buffer.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/local/stream_protocol.hpp>
#include <boost/asio/write.hpp>
#include <boost/beast/http.hpp>
#include <limits>
#include <stdexcept>
#include <utility>

namespace Bench {

namespace asio = boost::asio;
namespace http = boost::beast::http;

Address ToAddress(const Agentd::HttpAddress& address) {
  if (address.isUnix) {
    return asio::local::stream_protocol::endpoint(address.place);
  }
  return asio::ip::tcp::endpoint(asio::ip::make_address(address.place), address.port);
}

std::string GetRequest(std::string_view target) {
  return "GET " + std::string(target) + " HTTP/1.1\r\nHost: localhost\r\n\r\n";
}

std::string PostRequest(std::string_view target, std::string_view contentType, std::string_view body) {
  return "POST " + std::string(target) +
         " HTTP/1.1\r\nHost: localhost\r\nContent-Type: " + std::string(contentType) +
         "\r\nContent-Length: " + std::to_string(body.size()) + "\r\n\r\n" + std::string(body);
}

EndpointClient::EndpointClient(const Address& address) {
  _socket.connect(address);
  if (address.protocol().family() != AF_UNIX) {
    _socket.set_option(asio::ip::tcp::no_delay(true));
  }
}

const std::string& EndpointClient::Ask(const std::string& request) {
  asio::write(_socket, asio::buffer(request));
  http::response_parser<http::string_body> parser;
  parser.get().body() = std::move(_answer);
  parser.get().body().clear();
  parser.body_limit(std::numeric_limits<std::uint64_t>::max());
  http::read(_socket, _buffer, parser);
  _answer = std::move(parser.get().body());
  if (parser.get().result() != http::status::ok) {
    throw std::runtime_error("answered " + std::to_string(parser.get().result_int()) + ": " + _answer);
  }
  return _answer;
}

}  // namespace Bench
