#include "agentd/http/HttpAddress.h"

#include <boost/asio/ip/address.hpp>
#include <boost/url/authority_view.hpp>
#include <charconv>
#include <optional>
#include <stdexcept>

namespace Agentd {
namespace {

namespace ip = boost::asio::ip;

constexpr std::string_view unixScheme = "unix:";
constexpr std::string_view tcpScheme = "tcp:";
constexpr std::string_view tlsScheme = "tls:";

bool StartsWith(std::string_view text, std::string_view start) {
  return text.substr(0, start.size()) == start;
}

std::optional<std::uint16_t> ParsePort(std::string_view text) {
  std::uint16_t port = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), port);
  const bool whole = error == std::errc() && end == text.data() + text.size();
  return whole && !text.empty() ? std::optional(port) : std::nullopt;
}

constexpr std::string_view nameCharacters =
    "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-.";
constexpr std::size_t longestName = 253;

bool IsHostName(std::string_view text) {
  return !text.empty() && text.size() <= longestName && text.front() != '-' &&
         text.find_first_not_of(nameCharacters) == std::string_view::npos;
}

// "127.0.0.1" or "::1", as it is written shortest.
std::optional<std::string> ParseNumeric(const std::string& text, bool isBracketed) {
  boost::system::error_code error;
  const ip::address address = ip::make_address(text, error);
  return error || address.is_v6() != isBracketed ? std::nullopt : std::optional(address.to_string());
}

// Takes the zone out of "[fe80::1%eth0]:80", as the library of URLs knows none: "%eth0".
std::string TakeZone(std::string& text) {
  const std::size_t start = text.find('%');
  const std::size_t end = text.rfind(']');
  if (text.substr(0, 1) != "[" || start == std::string::npos || end == std::string::npos || end < start) {
    return {};
  }
  const std::string zone = text.substr(start, end - start);
  text.erase(start, zone.size());
  return zone;
}

// "127.0.0.1:80", "[::1]:80" or, with TLS, "kova.example:80".
std::optional<HttpAddress> ParseTcp(std::string text, bool isTls) {
  const std::string zone = TakeZone(text);
  const auto authority = boost::urls::parse_authority(text);
  if (!authority || authority->has_userinfo()) {
    return std::nullopt;
  }
  std::string host(std::string_view(authority->encoded_host()));
  const bool isBracketed = host.size() > 2 && host.front() == '[';
  if (isBracketed) {
    host = host.substr(1, host.size() - 2) + zone;
  }
  const std::optional<std::uint16_t> port = ParsePort(authority->port());
  std::optional<std::string> place = ParseNumeric(host, isBracketed);
  if (!place && isTls && !isBracketed && IsHostName(host)) {
    place = host;
  }
  return port && place ? std::optional(HttpAddress{false, *place, *port, isTls}) : std::nullopt;
}

std::optional<HttpAddress> ParseAny(std::string_view text) {
  if (StartsWith(text, unixScheme) && text.size() > unixScheme.size()) {
    return UnixAddress(std::string(text.substr(unixScheme.size())));
  }
  if (StartsWith(text, tcpScheme)) {
    return ParseTcp(std::string(text.substr(tcpScheme.size())), false);
  }
  return StartsWith(text, tlsScheme) ? ParseTcp(std::string(text.substr(tlsScheme.size())), true)
                                     : std::nullopt;
}

[[noreturn]] void Refuse(std::string_view text, const char* forms) {
  throw std::invalid_argument("'" + std::string(text) + "' is no address; addresses are " + forms +
                              ", with a numeric address such as 127.0.0.1 or [::1]");
}

}  // namespace

std::string HttpAddress::Text() const {
  return std::string(isUnix ? unixScheme : isTls ? tlsScheme : tcpScheme) + Name();
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
  const std::optional<HttpAddress> address = ParseAny(text);
  if (!address || address->isTls) {
    Refuse(text, "unix:PATH and tcp:ADDRESS:PORT");
  }
  return *address;
}

HttpAddress ParseAgentAddress(std::string_view text) {
  const std::optional<HttpAddress> address = ParseAny(text);
  if (!address) {
    Refuse(text, "unix:PATH, tls:HOST:PORT and tcp:ADDRESS:PORT");
  }
  return *address;
}

}  // namespace Agentd
