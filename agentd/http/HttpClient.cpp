#include "agentd/http/HttpClient.h"

#include <boost/asio/generic/stream_protocol.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/local/stream_protocol.hpp>
#include <boost/beast/core.hpp>
#include <boost/beast/http.hpp>

namespace Agentd {
namespace {

namespace asio = boost::asio;
namespace beast = boost::beast;
namespace http = beast::http;
using Protocol = asio::generic::stream_protocol;
using boost::system::error_code;

constexpr std::uint64_t longestAnswer = std::uint64_t{1} << 30;

Protocol::endpoint EndpointOf(const HttpAddress& address) {
  if (address.isUnix) {
    return asio::local::stream_protocol::endpoint(address.place);
  }
  return asio::ip::tcp::endpoint(asio::ip::make_address(address.place), address.port);
}

// Blocking calls on a stream that knows time limits: each is started and the network run until it is done.
class Exchanger {
 public:
  Exchanger(const HttpAddress& address, std::chrono::milliseconds patience)
      : _address(address), _patience(patience), _stream(_network) {}

  void Connect() {
    Demand(Await([&](auto done) { _stream.async_connect(EndpointOf(_address), done); }),
           "no agent answers on");
  }

  // A request that cannot be sent to its end may still have an answer: the reason why it was refused.
  void Ask(const http::request<http::string_body>& message,
           http::response_parser<http::string_body>& parser) {
    const error_code sent = Await([&](auto done) {
      http::async_write(_stream, message, [done](error_code error, std::size_t) { done(error); });
    });
    const error_code received = Await([&](auto done) {
      http::async_read(_stream, _buffer, parser, [done](error_code error, std::size_t) { done(error); });
    });
    if (received) {
      Demand(sent, "cannot send to the agent on");
      Demand(received, "no answer from the agent on");
    }
  }

 private:
  template <class Start>
  error_code Await(Start start) {
    error_code result;
    _stream.expires_after(_patience);
    start([&result](error_code error) { result = error; });
    _network.restart();
    _network.run();
    return result;
  }

  void Demand(error_code result, const char* failure) const {
    if (result) {
      throw ConnectionError(std::string(failure) + " " + _address.Name() + ": " + result.message());
    }
  }

  HttpAddress _address;
  std::chrono::milliseconds _patience;
  asio::io_context _network;
  beast::basic_stream<Protocol> _stream;
  beast::flat_buffer _buffer;
};

}  // namespace

HttpAnswer Exchange(const HttpAddress& address, const HttpRequest& request,
                    std::chrono::milliseconds patience) {
  const std::size_t length = address.place.size();
  if (address.isUnix && (length == 0 || length > sizeof(sockaddr_un::sun_path) - 1)) {
    throw ConnectionError("'" + address.place + "' cannot be the path of a socket: it must have 1 to " +
                          std::to_string(sizeof(sockaddr_un::sun_path) - 1) + " bytes");
  }
  Exchanger exchanger(address, patience);
  exchanger.Connect();
  http::request<http::string_body> message(http::string_to_verb(request.method), request.target, 11);
  message.set(http::field::host, address.isUnix ? "localhost" : address.Name());
  message.keep_alive(false);
  if (!request.contentType.empty()) {
    message.set(http::field::content_type, request.contentType);
  }
  message.body() = request.body;
  message.prepare_payload();

  http::response_parser<http::string_body> parser;
  parser.body_limit(longestAnswer);
  exchanger.Ask(message, parser);
  http::response<http::string_body> response = parser.release();
  return {response.result_int(), std::string(response[http::field::content_type]),
          std::move(response.body())};
}

}  // namespace Agentd
