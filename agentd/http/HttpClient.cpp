#include "agentd/http/HttpClient.h"

#include <boost/asio/generic/stream_protocol.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/local/stream_protocol.hpp>
#include <boost/asio/ssl/stream.hpp>
#include <boost/beast/core.hpp>
#include <boost/beast/http.hpp>
#include <optional>
#include <vector>

#include "agentd/http/TlsClient.h"

namespace Agentd {
namespace {

namespace asio = boost::asio;
namespace beast = boost::beast;
namespace http = beast::http;
using Protocol = asio::generic::stream_protocol;
using boost::system::error_code;

constexpr std::uint64_t longestAnswer = std::uint64_t{1} << 30;

using Message = http::request<http::string_body>;
using Parser = http::response_parser<http::string_body>;

// Where an address leads. Only a name can lead to more places than one, or to none.
std::vector<Protocol::endpoint> EndpointsOf(const HttpAddress& address, asio::io_context& network) {
  if (address.isUnix) {
    return {asio::local::stream_protocol::endpoint(address.place)};
  }
  error_code error;
  if (const auto numeric = asio::ip::make_address(address.place, error); !error) {
    return {asio::ip::tcp::endpoint(numeric, address.port)};
  }
  asio::ip::tcp::resolver resolver(network);
  const auto found = resolver.resolve(address.place, std::to_string(address.port), error);
  if (error) {
    throw ConnectionError("nobody knows where '" + address.place + "' is: " + error.message());
  }
  std::vector<Protocol::endpoint> endpoints;
  for (const auto& entry : found) {
    endpoints.emplace_back(entry.endpoint());
  }
  return endpoints;
}

// Blocking calls on a stream that knows time limits: each is started and the network run until it is done.
class Exchanger {
 public:
  Exchanger(const HttpAddress& address, std::chrono::milliseconds patience, const TlsClientFiles& files)
      : _address(address), _patience(patience), _files(files), _stream(_network) {
    if (address.isTls) {
      _context.emplace(MakeTlsContext(files));
      _tls.emplace(_stream, *_context);
      RequireHost(_tls->native_handle(), address.place);
    }
  }

  void Connect() {
    error_code result;
    for (const Protocol::endpoint& endpoint : EndpointsOf(_address, _network)) {
      result = Await([&](auto done) { _stream.async_connect(endpoint, done); });
      if (!result) {
        break;
      }
      _stream.close();  // the next one may be of another family
    }
    if (result) {
      throw ConnectionError("no agent answers on " + _address.Name() + ": " + result.message());
    }
    if (_tls) {
      Secure();
    }
  }

  void Ask(const Message& message, Parser& parser) {
    if (_tls) {
      Ask(*_tls, message, parser);
    } else {
      Ask(_stream, message, parser);
    }
  }

 private:
  using Stream = beast::basic_stream<Protocol>;

  void Secure() {
    const error_code error =
        Await([&](auto done) { _tls->async_handshake(asio::ssl::stream_base::client, done); });
    if (error) {
      throw TlsError(WhyTlsFailed(error, _tls->native_handle(), _address, _files));
    }
  }

  // A request that cannot be sent to its end may still have an answer: the reason why it was refused.
  template <class AnyStream>
  void Ask(AnyStream& stream, const Message& message, Parser& parser) {
    const error_code sent = Await([&](auto done) {
      http::async_write(stream, message, [done](error_code error, std::size_t) { done(error); });
    });
    const error_code received = Await([&](auto done) {
      http::async_read(stream, _buffer, parser, [done](error_code error, std::size_t) { done(error); });
    });
    if (!received) {
      return;
    }
    // What an agent has against a client's certificate, it says only now.
    if (_tls && IsOfTls(received) && !parser.got_some()) {
      throw TlsError(WhyTlsFailed(received, _tls->native_handle(), _address, _files));
    }
    Require(sent, "cannot send to the agent on", Guess());
    Require(received, "no answer from the agent on", Guess());
  }

  // Why one who could be reached may have hung up.
  std::string Guess() const {
    if (_tls) {
      return _files.certificate.empty() ? "" : "; it may have refused the certificate " + _files.certificate;
    }
    return _address.isUnix ? "" : "; if it speaks TLS, its address is tls:" + _address.Name();
  }

  template <class Start>
  error_code Await(Start start) {
    error_code result;
    _stream.expires_after(_patience);
    start([&result](error_code error) { result = error; });
    _network.restart();
    _network.run();
    return result;
  }

  void Require(error_code result, const char* failure, const std::string& guess) const {
    if (result) {
      throw AnswerError(std::string(failure) + " " + _address.Name() + ": " + result.message() + guess);
    }
  }

  const HttpAddress& _address;
  const std::chrono::milliseconds _patience;
  const TlsClientFiles& _files;
  asio::io_context _network;
  Stream _stream;
  std::optional<asio::ssl::context> _context;
  std::optional<asio::ssl::stream<Stream&>> _tls;  // none without TLS
  beast::flat_buffer _buffer;
};

}  // namespace

HttpAnswer Exchange(const HttpAddress& address, const HttpRequest& request,
                    std::chrono::milliseconds patience, const TlsClientFiles& files) {
  const std::size_t length = address.place.size();
  if (address.isUnix && (length == 0 || length > sizeof(sockaddr_un::sun_path) - 1)) {
    throw ConnectionError("'" + address.place + "' cannot be the path of a socket: it must have 1 to " +
                          std::to_string(sizeof(sockaddr_un::sun_path) - 1) + " bytes");
  }
  Exchanger exchanger(address, patience, files);
  exchanger.Connect();
  Message message(http::string_to_verb(request.method), request.target, 11);
  message.set(http::field::host, address.isUnix ? "localhost" : address.Name());
  message.keep_alive(false);
  if (!request.contentType.empty()) {
    message.set(http::field::content_type, request.contentType);
  }
  message.body() = request.body;
  message.prepare_payload();

  Parser parser;
  parser.body_limit(longestAnswer);
  exchanger.Ask(message, parser);
  http::response<http::string_body> response = parser.release();
  return {response.result_int(), std::string(response[http::field::content_type]),
          std::move(response.body())};
}

}  // namespace Agentd
