// What the server does with clients that ask too much of it.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "agentd/http/HttpClient.h"
#include "agentd/testing/RawClient.h"
#include "agentd/testing/RunningServer.h"

namespace Agentd {
namespace {

using testing::HasSubstr;
using Testing::RawAnswer;
using Testing::RawClient;
using Testing::RunningServer;

constexpr std::string_view get = "GET /a HTTP/1.1\r\nHost: x\r\n\r\n";

std::string Post(std::size_t bodyBytes) {
  return "POST / HTTP/1.1\r\nHost: x\r\nContent-Length: " + std::to_string(bodyBytes) + "\r\n\r\n" +
         std::string(bodyBytes, 'b');
}

TEST(HttpServerLimits, ABodyOfTheLimitIsReadAndALongerOneRefused) {
  HttpLimits limits;
  limits.bodyBytes = 1000;
  RunningServer server(&Testing::Echo, limits);
  RawClient client(server.Path());
  client.Send(Post(1000));
  EXPECT_EQ(client.Receive().status, 200u);
  client.Send(Post(1001));
  const RawAnswer refused = client.Receive();
  EXPECT_EQ(refused.status, 413u);
  EXPECT_THAT(refused.body, HasSubstr("too large"));
  EXPECT_TRUE(client.IsClosed());
}

TEST(HttpServerLimits, AChunkedBodyIsCountedToo) {
  HttpLimits limits;
  limits.bodyBytes = 10;
  RunningServer server(&Testing::Echo, limits);
  RawClient client(server.Path());
  client.Send(
      "POST / HTTP/1.1\r\nHost: x\r\nTransfer-Encoding: chunked\r\n\r\n8\r\n12345678\r\n8\r\n12345678\r\n");
  EXPECT_EQ(client.Receive().status, 413u);
}

TEST(HttpServerLimits, AClientThatIsStillSendingLearnsWhyItIsRefused) {
  HttpLimits limits;
  limits.bodyBytes = 1000;
  RunningServer server(&Testing::Echo, limits);
  const HttpAnswer answer = Exchange(UnixAddress(server.Path()),
                                     {"POST", "/", "text/plain", std::string(std::size_t{4} << 20, 'b')});
  EXPECT_EQ(answer.status, 413u);

  RawClient stubborn(server.Path());
  EXPECT_TRUE(stubborn.Send(Post(std::size_t{4} << 20)))
      << "one that reads only after it has sent everything";
  EXPECT_EQ(stubborn.Receive().status, 413u);
}

TEST(HttpServerLimits, ALongHeaderIsRefused) {
  HttpLimits limits;
  limits.headerBytes = 500;
  RunningServer server(&Testing::Echo, limits);
  RawClient client(server.Path());
  client.Send("GET / HTTP/1.1\r\nHost: x\r\nX: " + std::string(400, 'x') + "\r\n\r\n");
  EXPECT_EQ(client.Receive().status, 200u);
  client.Send("GET / HTTP/1.1\r\nHost: x\r\nX: " + std::string(600, 'x') + "\r\n\r\n");
  EXPECT_EQ(client.Receive().status, 431u);
}

class NoRequest : public testing::TestWithParam<const char*> {};

TEST_P(NoRequest, IsRefusedAndTheConnectionClosed) {
  RunningServer server;
  RawClient client(server.Path());
  client.Send(GetParam());
  client.EndSending();
  const RawAnswer answer = client.Receive();
  EXPECT_EQ(answer.status, 400u);
  EXPECT_THAT(answer.body, HasSubstr("not a request"));
  EXPECT_TRUE(client.IsClosed());
}

INSTANTIATE_TEST_SUITE_P(
    Texts, NoRequest,
    testing::Values("rubbish\r\n\r\n", "GET /\r\n\r\n", "GET / HTTP/3.0\r\n\r\n",
                    "GET / HTTP/1.1\r\nno colon\r\n\r\n", "\x16\x03\x01 hello\r\n\r\n",
                    "POST / HTTP/1.1\r\nContent-Length: -1\r\n\r\n",
                    "POST / HTTP/1.1\r\nContent-Length: 1\r\nContent-Length: 2\r\n\r\n",
                    "POST / HTTP/1.1\r\nHost: x\r\nTransfer-Encoding: chunked\r\n\r\nzz\r\n",
                    "POST / HTTP/1.1\r\nHost: x\r\nContent-Length: 9\r\n\r\nhalf"));

TEST(HttpServerLimits, ARequestThatTakesTooLongIsAnsweredWith408) {
  HttpLimits limits;
  limits.readTime = std::chrono::milliseconds(20);
  RunningServer server(&Testing::Echo, limits);
  RawClient client(server.Path());
  client.Send("POST / HTTP/1.1\r\nHost: x\r\nContent-Length: 10\r\n\r\nhalf");
  EXPECT_EQ(client.Receive().status, 408u);
  EXPECT_EQ(server.Now().refused[static_cast<std::size_t>(HttpRefusal::Slow)], 1u);
  EXPECT_TRUE(client.IsClosed());
}

TEST(HttpServerLimits, AConnectionOnWhichNothingComesIsClosedWithoutAWord) {
  HttpLimits limits;
  limits.readTime = std::chrono::milliseconds(20);
  RunningServer server(&Testing::Echo, limits);
  RawClient fresh(server.Path());
  EXPECT_TRUE(fresh.IsClosed());
  RawClient idle(server.Path());
  idle.Send(get);
  EXPECT_EQ(idle.Receive().status, 200u);
  EXPECT_TRUE(idle.IsClosed());
}

TEST(HttpServerLimits, AHandlerMayTakeLongerThanTheTimeForReading) {
  HttpLimits limits;
  limits.readTime = std::chrono::milliseconds(20);
  Testing::Gate gate;
  RunningServer server(
      [&gate](const HttpRequest& request) {
        gate.Enter();
        return Testing::Echo(request);
      },
      limits);
  RawClient client(server.Path());
  client.Send(get);
  gate.WaitUntilEntered();
  RawClient clock(server.Path());
  EXPECT_TRUE(clock.IsClosed()) << "this one began later, and its time is over";
  gate.Open();
  EXPECT_EQ(client.Receive().status, 200u);
}

TEST(HttpServerLimits, AClientThatDoesNotReadItsAnswerIsGivenUp) {
  HttpLimits limits;
  limits.writeTime = std::chrono::milliseconds(20);
  limits.drainTime = std::chrono::seconds(60);
  Testing::Gate handled;
  RunningServer server(
      [&handled](const HttpRequest&) {
        handled.Enter();
        return HttpAnswer{200, "text/plain", std::string(std::size_t{8} << 20, 'a')};
      },
      limits);
  RawClient client(server.Path());
  client.Send(get);
  handled.WaitUntilEntered();
  handled.Open();
  EXPECT_TRUE(server.Stop()) << "well before the drain time, for the connection is gone";
}

TEST(HttpServerLimits, OneConnectionTooManyIsAnsweredWith503) {
  HttpLimits limits;
  limits.connections = 1;
  RunningServer server(&Testing::Echo, limits);
  RawClient first(server.Path());
  first.Send(get);
  EXPECT_EQ(first.Receive().status, 200u);

  RawClient second(server.Path());
  second.Send(get);
  const RawAnswer refused = second.Receive();
  EXPECT_EQ(refused.status, 503u);
  EXPECT_THAT(refused.body, HasSubstr("too many connections"));

  first.Send(get);
  EXPECT_EQ(first.Receive().status, 200u) << "those inside stay";
}

TEST(HttpServerLimits, AConnectionThatEndsMakesRoomForAnother) {
  HttpLimits limits;
  limits.connections = 1;
  RunningServer server(&Testing::Echo, limits);
  for (int i = 0; i < 20; ++i) {
    RawClient client(server.Path());
    client.Send("GET / HTTP/1.1\r\nHost: x\r\nConnection: close\r\n\r\n");
    EXPECT_EQ(client.Receive().status, 200u);
    EXPECT_TRUE(client.IsClosed());
  }
}

}  // namespace
}  // namespace Agentd
