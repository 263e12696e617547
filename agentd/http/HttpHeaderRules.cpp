#include "agentd/http/HttpHeaderRules.h"

#include <algorithm>
#include <boost/asio/ip/address.hpp>
#include <boost/beast/core/string.hpp>

namespace Agentd {
namespace {

namespace beast = boost::beast;
namespace http = beast::http;
namespace ip = boost::asio::ip;

constexpr std::uint16_t defaultPort = 80;
constexpr std::uint16_t defaultTlsPort = 443;
constexpr std::size_t longestPort = 5;  // digits

// What two of would leave open which one counts.
constexpr http::field onceOnly[] = {http::field::host, http::field::content_length,
                                    http::field::transfer_encoding, http::field::content_type,
                                    http::field::expect};

bool HasTwice(const HttpHeader& header) {
  return std::any_of(std::begin(onceOnly), std::end(onceOnly),
                     [&header](http::field name) { return header.count(name) > 1; });
}

// Whether every field of that name says just that, or there is none.
bool SaysOnly(const HttpHeader& header, http::field name, std::string_view value) {
  const auto [begin, end] = header.equal_range(name);
  return std::all_of(begin, end, [value](const auto& field) { return beast::iequals(field.value(), value); });
}

bool IsLoopbackName(std::string_view name) {
  if (beast::iequals(name, "localhost")) {
    return true;
  }
  const bool bracketed = name.size() > 2 && name.front() == '[' && name.back() == ']';
  boost::system::error_code error;
  const ip::address address =
      ip::make_address(std::string(bracketed ? name.substr(1, name.size() - 2) : name), error);
  return !error && address.is_v6() == bracketed && address.is_loopback();
}

struct HostParts {
  std::string_view name;
  std::string_view port;  // empty: not given
};

HostParts Split(std::string_view host) {
  const std::size_t colon = host.rfind(':');
  const std::size_t bracket = host.rfind(']');
  if (colon == std::string_view::npos || (bracket != std::string_view::npos && bracket > colon)) {
    return {host, ""};
  }
  return {host.substr(0, colon), host.substr(colon + 1)};
}

bool IsDigit(char byte) {
  return byte >= '0' && byte <= '9';
}

bool IsLetter(char byte) {
  return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z');
}

bool HasOnly(std::string_view text, std::string_view others) {
  return std::all_of(text.begin(), text.end(), [others](char byte) {
    return IsDigit(byte) || IsLetter(byte) || others.find(byte) != std::string_view::npos;
  });
}

}  // namespace

HttpAnswer RefusedWith(unsigned status, const std::string& text) {
  return {status, "text/plain; charset=utf-8", text + "\n"};
}

HttpAsked WhatIsAsked(const HttpHeader& header) {
  const std::string_view target = header.target();
  for (const std::string_view scheme : {"http://", "https://"}) {
    if (!beast::iequals(target.substr(0, scheme.size()), scheme)) {
      continue;
    }
    const std::string_view rest = target.substr(scheme.size());
    const std::size_t end = std::min(rest.find_first_of("/?"), rest.size());
    const std::string_view path = rest.substr(end);
    return {std::string(rest.substr(0, end)),
            (path.empty() || path.front() == '?' ? "/" : "") + std::string(path)};
  }
  return {std::string(header[http::field::host]), std::string(target)};
}

bool IsHost(std::string_view host) {
  const auto [name, port] = Split(host);
  const bool bracketed = name.size() > 2 && name.front() == '[' && name.back() == ']';
  return port.size() <= longestPort && std::all_of(port.begin(), port.end(), &IsDigit) &&
         (bracketed ? HasOnly(name.substr(1, name.size() - 2), ":.") : HasOnly(name, "-._~%"));
}

bool IsOwnHost(std::string_view host, const HttpDoor& door) {
  const auto [name, port] = Split(host);
  const std::uint16_t assumed = door.isTls ? defaultTlsPort : defaultPort;
  const bool hasOwnPort = port == std::to_string(*door.tcpPort) || (port.empty() && *door.tcpPort == assumed);
  if (hasOwnPort && IsLoopbackName(name)) {
    return true;
  }
  // Whatever the port: something that forwards may stand before the server, with one of its own.
  return std::any_of(door.serverNames.begin(), door.serverNames.end(),
                     [name = name](const std::string& own) { return beast::iequals(name, own); });
}

std::optional<HttpAnswer> RefusalOf(const HttpHeader& header, const HttpDoor& door) {
  if (HasTwice(header)) {
    return RefusedWith(400, "a header field that may stand there once stands there twice");
  }
  if (header.version() >= 11 && header.count(http::field::host) == 0) {
    return RefusedWith(400, "the Host header is missing");
  }
  const std::string host = WhatIsAsked(header).authority;
  if (!IsHost(host)) {
    return RefusedWith(400, "the Host header is not written as a host is");
  }
  if (door.tcpPort && !IsOwnHost(host, door)) {
    return RefusedWith(421, "the Host header does not name this agent");
  }
  if (!SaysOnly(header, http::field::transfer_encoding, "chunked")) {
    return RefusedWith(501, "of the transfer encodings, only 'chunked' is understood");
  }
  if (!SaysOnly(header, http::field::content_encoding, "identity")) {
    return RefusedWith(415, "the body must not be compressed");
  }
  if (!SaysOnly(header, http::field::expect, "100-continue")) {
    return RefusedWith(417, "nothing can be expected but '100-continue'");
  }
  return std::nullopt;
}

bool WantsContinue(const HttpHeader& header) {
  return header.version() >= 11 && beast::iequals(header[http::field::expect], "100-continue");
}

}  // namespace Agentd
