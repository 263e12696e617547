#include "agentd/http/HttpAddress.h"

#include <boost/asio/ip/address.hpp>
#include <charconv>
#include <optional>
#include <stdexcept>

namespace Agentd {
namespace {

namespace ip = boost::asio::ip;

constexpr std::string_view unixScheme = "unix:";
constexpr std::string_view tcpScheme = "tcp:";

bool StartsWith(std::string_view text, std::string_view start) {
  return text.substr(0, start.size()) == start;
}

std::optional<std::uint16_t> ParsePort(std::string_view text) {
  std::uint16_t port = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), port);
  const bool whole = error == std::errc() && end == text.data() + text.size();
  return whole && !text.empty() ? std::optional(port) : std::nullopt;
}

// "127.0.0.1:80" or "[::1]:80".
std::optional<HttpAddress> ParseTcp(std::string_view text) {
  const std::size_t colon = text.rfind(':');
  if (colon == std::string_view::npos) {
    return std::nullopt;
  }
  const std::optional<std::uint16_t> port = ParsePort(text.substr(colon + 1));
  std::string_view place = text.substr(0, colon);
  const bool bracketed = place.size() > 2 && place.front() == '[' && place.back() == ']';
  if (bracketed) {
    place = place.substr(1, place.size() - 2);
  }
  boost::system::error_code error;
  const ip::address address = ip::make_address(std::string(place), error);
  if (error || !port || address.is_v6() != bracketed) {
    return std::nullopt;
  }
  return HttpAddress{false, address.to_string(), *port};
}

}  // namespace

std::string HttpAddress::Text() const {
  return std::string(isUnix ? unixScheme : tcpScheme) + Name();
}

std::string HttpAddress::Name() const {
  if (isUnix) {
    return place;
  }
  const bool isV6 = place.find(':') != std::string::npos;
  return (isV6 ? "[" + place + "]" : place) + ":" + std::to_string(port);
}

bool HttpAddress::IsLoopback() const {
  return isUnix || ip::make_address(place).is_loopback();
}

HttpAddress UnixAddress(const std::string& path) {
  return {true, path, 0};
}

HttpAddress ParseAddress(std::string_view text) {
  if (StartsWith(text, unixScheme) && text.size() > unixScheme.size()) {
    return UnixAddress(std::string(text.substr(unixScheme.size())));
  }
  if (StartsWith(text, tcpScheme)) {
    if (const std::optional<HttpAddress> address = ParseTcp(text.substr(tcpScheme.size()))) {
      return *address;
    }
  }
  throw std::invalid_argument("'" + std::string(text) +
                              "' is no address; addresses are unix:PATH and tcp:ADDRESS:PORT, with a numeric "
                              "address such as 127.0.0.1 or [::1]");
}

}  // namespace Agentd
