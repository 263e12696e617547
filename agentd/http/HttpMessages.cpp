#include "agentd/http/HttpMessages.h"

#include <boost/beast/http/error.hpp>
#include <cstdio>
#include <ctime>
#include <utility>

#include "agentd/http/HttpBody.h"
#include "agentd/http/HttpLoad.h"

namespace Agentd {
namespace {

namespace http = boost::beast::http;
using boost::system::error_code;

constexpr int secondsUntilRoom = 1;

constexpr const char* weekdays[] = {"Sun", "Mon", "Tue", "Wed", "Thu", "Fri", "Sat"};
constexpr const char* months[] = {"Jan", "Feb", "Mar", "Apr", "May", "Jun",
                                  "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};

}  // namespace

HttpRequest RequestOf(const HttpHeader& header, const HttpDoor& door, const HttpPeer& peer) {
  HttpAsked asked = WhatIsAsked(header);
  return {.method = std::string(header.method_string()),
          .target = std::move(asked.target),
          .contentType = std::string(header[http::field::content_type]),
          .body = {},
          .soapAction = std::string(header["SOAPAction"]),
          .hasOrigin = header.count(http::field::origin) != 0,
          .peer = peer,
          .scheme = door.isTls ? "https" : "http",
          .authority = std::move(asked.authority)};
}

std::optional<HttpAnswer> RefusalOf(const error_code& error) {
  if (HttpBody::IsBeyondBudget(error)) {
    HttpAnswer refusal = RefusedWith(503, std::string(KindOf(HttpRefusal::Bodies).text));
    refusal.retryAfterSeconds = secondsUntilRoom;
    return refusal;
  }
  if (error == http::error::body_limit) {
    return RefusedWith(413, "the body is too large");
  }
  if (error == http::error::header_limit) {
    return RefusedWith(431, "the header is too large");
  }
  if (error == http::error::buffer_overflow) {
    return RefusedWith(431, "the header of a chunk is too large");
  }
  const bool gone = error == http::error::end_of_stream ||
                    error.category() != http::make_error_code(http::error::end_of_stream).category();
  return gone ? std::nullopt : std::optional(RefusedWith(400, "not a request: " + error.message()));
}

HttpResponse ResponseOf(HttpAnswer answer, const HttpForm& form) {
  HttpResponse response(static_cast<http::status>(answer.status), form.version);
  response.set(http::field::date, HttpDate(std::chrono::system_clock::now()));
  response.set(http::field::content_type, answer.contentType);
  response.set("X-Content-Type-Options", "nosniff");  // a browser must take no answer for a page
  if (answer.retryAfterSeconds > 0) {
    response.set(http::field::retry_after, std::to_string(answer.retryAfterSeconds));
  }
  if (!answer.allow.empty()) {
    response.set(http::field::allow, answer.allow);
  }
  response.content_length(answer.body.size());
  if (form.withBody) {
    response.body() = std::move(answer.body);
  }
  response.keep_alive(form.keepAlive);
  return response;
}

std::string HttpDate(std::chrono::system_clock::time_point time) {
  const std::time_t seconds = std::chrono::system_clock::to_time_t(time);
  std::tm parts{};
  gmtime_r(&seconds, &parts);
  char text[64];
  std::snprintf(text, sizeof text, "%s, %02d %s %04d %02d:%02d:%02d GMT", weekdays[parts.tm_wday],
                parts.tm_mday, months[parts.tm_mon], parts.tm_year + 1900, parts.tm_hour, parts.tm_min,
                parts.tm_sec);
  return text;
}

}  // namespace Agentd
