// One client of a server under load: it keeps its connection, and asks the same again and again.
//
// The request is written once and the answer read into a buffer that is kept, so that little of the measured
// time is the client's own.
//
// Threads: each client on its own.
#pragma once

#include <boost/asio/generic/stream_protocol.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/beast/core/flat_buffer.hpp>
#include <string>
#include <string_view>

#include "agentd/http/HttpAddress.h"

namespace Bench {

// Where a server answers, whatever kind of socket that is.
using Address = boost::asio::generic::stream_protocol::endpoint;

Address ToAddress(const Agentd::HttpAddress& address);

// Requests as they go over the wire.
std::string GetRequest(std::string_view target);
std::string PostRequest(std::string_view target, std::string_view contentType, std::string_view body);

class EndpointClient {
 public:
  // Throws boost::system::system_error when nobody answers.
  explicit EndpointClient(const Address& address);

  // The body of the answer, good until the next request. Throws std::runtime_error for any status but 200,
  // boost::system::system_error when the connection breaks.
  const std::string& Ask(const std::string& request);

 private:
  boost::asio::io_context _context;
  boost::asio::generic::stream_protocol::socket _socket{_context};
  boost::beast::flat_buffer _buffer;
  std::string _answer;
};

}  // namespace Bench
