// Requests and answers, between the HTTP library's form and plain values. Part of the server; nobody else
// includes this.
#pragma once

#include <boost/beast/http/message.hpp>
#include <boost/beast/http/string_body.hpp>
#include <chrono>
#include <optional>
#include <string>

#include "agentd/http/HttpHeaderRules.h"
#include "agentd/http/HttpTypes.h"

namespace Agentd {

using HttpResponse = boost::beast::http::response<boost::beast::http::string_body>;

// All but the body.
HttpRequest RequestOf(const HttpHeader& header, const HttpDoor& door, const HttpPeer& peer);

// What a request that could not be read is answered with; nothing when the client has gone.
std::optional<HttpAnswer> RefusalOf(const boost::system::error_code& error);

struct HttpForm {
  unsigned version = 11;
  bool withBody = true;  // not to HEAD; its length is told all the same
  bool keepAlive = true;
};
HttpResponse ResponseOf(HttpAnswer answer, const HttpForm& form);

// As headers have it: "Sun, 06 Nov 1994 08:49:37 GMT".
std::string HttpDate(std::chrono::system_clock::time_point time);

}  // namespace Agentd
