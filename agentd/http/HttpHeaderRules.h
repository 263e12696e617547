// What the server demands of the header of a request, before it reads the body. Part of the server; nobody
// else includes this.
#pragma once

#include <boost/beast/http/fields.hpp>
#include <boost/beast/http/message.hpp>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "agentd/http/HttpTypes.h"

namespace Agentd {

using HttpHeader = boost::beast::http::request_header<>;

// Where the request came in.
struct HttpDoor {
  std::optional<std::uint16_t> tcpPort = std::nullopt;  // none: a Unix socket
  std::vector<std::string> serverNames = {};            // the server's own besides loopback's
  bool isTls = false;
};

// Whom a request is for, and what it asks of it. A target in its absolute form
// ("http://kova.example/healthz") names both, and the Host header then counts no more.
struct HttpAsked {
  std::string authority;
  std::string target;  // "/healthz"
};
HttpAsked WhatIsAsked(const HttpHeader& header);

// Nothing when the request may be read on.
std::optional<HttpAnswer> RefusalOf(const HttpHeader& header, const HttpDoor& door);

// Whether the client waits to be told before it sends the body.
bool WantsContinue(const HttpHeader& header);

// Whether that is how a host is written, with a port or without: "kova.example:9443", "[::1]", or nothing.
bool IsHost(std::string_view host);

// Whether a host means this server: a name or address of loopback with the port
// (needless where it is the one that everybody assumes), or one of the
// server's own names. A page of a stranger whose name was made to lead here still bears its own.
bool IsOwnHost(std::string_view host, const HttpDoor& door);

// A line of text.
HttpAnswer RefusedWith(unsigned status, const std::string& text);

}  // namespace Agentd
