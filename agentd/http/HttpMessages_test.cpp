#include "agentd/http/HttpMessages.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <boost/asio/error.hpp>
#include <boost/beast/http/error.hpp>

namespace Agentd {
namespace {

namespace http = boost::beast::http;
using std::chrono::system_clock;

TEST(HttpMessages, ADateIsWrittenAsHeadersHaveIt) {
  EXPECT_EQ(HttpDate(system_clock::from_time_t(784111777)), "Sun, 06 Nov 1994 08:49:37 GMT");
  EXPECT_EQ(HttpDate(system_clock::from_time_t(951782399)), "Mon, 28 Feb 2000 23:59:59 GMT");
}

TEST(HttpMessages, AnAnswerSaysWhenItWasMadeAndWhatItIs) {
  const auto before = system_clock::now();
  const HttpResponse response = ResponseOf({200, "text/x", "made"}, {});
  const std::string date(response[http::field::date]);
  EXPECT_THAT(date, testing::AnyOf(HttpDate(before), HttpDate(system_clock::now())));
  EXPECT_EQ(response[http::field::content_type], "text/x");
  EXPECT_EQ(response[http::field::content_length], "4");
  EXPECT_EQ(response.body(), "made");
  EXPECT_EQ(response.count(http::field::retry_after), 0u);
  EXPECT_EQ(response.count(http::field::allow), 0u);
}

TEST(HttpMessages, AnAnswerSaysWhenToComeAgainAndWhatIsServed) {
  HttpAnswer answer{405, "text/x", ""};
  answer.retryAfterSeconds = 3;
  answer.allow = "GET, HEAD";
  const HttpResponse response = ResponseOf(answer, {});
  EXPECT_EQ(response[http::field::retry_after], "3");
  EXPECT_EQ(response[http::field::allow], "GET, HEAD");
}

TEST(HttpMessages, WithoutItsBodyAnAnswerStillTellsItsLength) {
  const HttpResponse response = ResponseOf({200, "text/x", "made"}, {.withBody = false});
  EXPECT_EQ(response[http::field::content_length], "4");
  EXPECT_EQ(response.body(), "");
}

TEST(HttpMessages, WhatCannotBeReadHasAStatusAndAClientThatHasGoneHasNone) {
  const auto status = [](const boost::system::error_code& error) {
    const auto refusal = RefusalOf(error);
    return refusal ? refusal->status : 0u;
  };
  EXPECT_EQ(status(http::error::body_limit), 413u);
  EXPECT_EQ(status(http::error::header_limit), 431u);
  EXPECT_EQ(status(http::error::bad_version), 400u);
  EXPECT_EQ(status(http::error::end_of_stream), 0u);
  EXPECT_EQ(status(boost::asio::error::connection_reset), 0u);
}

}  // namespace
}  // namespace Agentd
