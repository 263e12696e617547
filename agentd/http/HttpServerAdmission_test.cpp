// What is refused by its header alone, and what bodies may take.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <future>
#include <memory>
#include <vector>

#include "agentd/testing/RawClient.h"
#include "agentd/testing/RunningServer.h"

namespace Agentd {
namespace {

using testing::HasSubstr;
using Testing::RawAnswer;
using Testing::RawClient;
using Testing::RunningServer;

// "/no" is refused; "/small" may have ten bytes.
HttpAdmission ByTarget(const HttpRequest& head) {
  EXPECT_EQ(head.body, "");
  if (head.target == "/no") {
    return {.refusal = HttpAnswer{403, "text/plain", "not you"}};
  }
  return head.target == "/small" ? HttpAdmission{.bodyBytes = 10} : HttpAdmission();
}

HttpOptions Options(const HttpLimits& limits = {}) {
  return Testing::OnSocket(Testing::FreshSocketPath(), limits);
}

std::string Post(const std::string& target, std::size_t bytes, const std::string& more = "") {
  return "POST " + target + " HTTP/1.1\r\nHost: x\r\n" + more + "Content-Length: " + std::to_string(bytes) +
         "\r\n\r\n";
}

constexpr const char* expects = "Expect: 100-continue\r\n";

// A worker lets go of a body just after the answer has gone.
void WaitUntilNothingIsHeld(const RunningServer& server) {
  while (server.Now().bodyBytes != 0) {
    std::this_thread::yield();
  }
}

class HttpServerAdmission : public testing::Test {
 protected:
  RunningServer _server{Options(), &Testing::Echo, &ByTarget};
  const std::string _path = _server.Address().place;
};

TEST_F(HttpServerAdmission, WhatIsRefusedIsAnsweredBeforeItsBodyIsSent) {
  RawClient client(_path);
  client.Send(Post("/no", 1000));
  const RawAnswer refused = client.Receive();
  EXPECT_EQ(refused.status, 403u);
  EXPECT_EQ(refused.body, "not you");
  EXPECT_THAT(refused.header, HasSubstr("connection: close"));
}

TEST_F(HttpServerAdmission, WhoWaitsToBeToldIsToldNo) {
  RawClient client(_path);
  client.Send(Post("/no", 1000, expects));
  EXPECT_EQ(client.Receive().status, 403u);
  RawClient tooLarge(_path);
  tooLarge.Send(Post("/small", 11, expects));
  EXPECT_EQ(tooLarge.Receive().status, 413u);
  RawClient fits(_path);
  fits.Send(Post("/small", 4, expects));
  EXPECT_EQ(fits.ReceiveHeader(), "http/1.1 100 continue");
  fits.Send("body");
  EXPECT_EQ(fits.Receive().body, "POST /small body");
}

TEST_F(HttpServerAdmission, ARefusalWithoutABodyToSkipEndsNoConnection) {
  RawClient client(_path);
  client.Send("GET /no HTTP/1.1\r\nHost: x\r\n\r\nGET /a HTTP/1.1\r\nHost: x\r\n\r\n");
  EXPECT_EQ(client.Receive().status, 403u);
  EXPECT_EQ(client.Receive().body, "GET /a ");
  client.Send("GET /no HTTP/1.1\r\nHost: x\r\nConnection: close\r\n\r\n");
  EXPECT_EQ(client.Receive().status, 403u);
  EXPECT_TRUE(client.IsClosed());
}

TEST_F(HttpServerAdmission, ABoundIsKeptInChunksToo) {
  RawClient client(_path);
  client.Send("POST /small HTTP/1.1\r\nHost: x\r\nTransfer-Encoding: chunked\r\n\r\n8\r\n12345678\r\n");
  client.Send("8\r\n12345678\r\n");
  EXPECT_EQ(client.Receive().status, 413u);
}

TEST(HttpServerBodies, BeyondTheMemoryForAllTheyAreRefusedUntilThereIsRoom) {
  RunningServer server(Options({.bodyBytes = 100, .allBodyBytes = 150}), &Testing::Echo);
  const std::string path = server.Address().place;
  RawClient first(path);
  first.Send(Post("/", 100, expects));
  EXPECT_EQ(first.ReceiveHeader(), "http/1.1 100 continue") << "room is held for it";
  EXPECT_EQ(server.Now().bodyBytes, 100u);

  RawClient second(path);
  second.Send(Post("/", 60, expects));
  const RawAnswer refused = second.Receive();
  EXPECT_EQ(refused.status, 503u);
  EXPECT_THAT(refused.header, HasSubstr("retry-after: 1"));
  EXPECT_EQ(server.Now().refused[static_cast<std::size_t>(HttpRefusal::Bodies)], 1u);

  first.Send(std::string(100, 'b'));
  EXPECT_EQ(first.Receive().status, 200u);
  WaitUntilNothingIsHeld(server);
  RawClient third(path);
  third.Send(Post("/", 60, expects));
  EXPECT_EQ(third.ReceiveHeader(), "http/1.1 100 continue");
}

TEST(HttpServerBodies, InChunksTheyTakeRoomAsTheyCome) {
  RunningServer server(Options({.bodyBytes = 1000, .allBodyBytes = 150}), &Testing::Echo);
  RawClient client(server.Address().place);
  client.Send("POST / HTTP/1.1\r\nHost: x\r\nTransfer-Encoding: chunked\r\n\r\n64\r\n" +
              std::string(100, 'b') + "\r\n");
  client.Send("64\r\n" + std::string(100, 'b') + "\r\n");
  EXPECT_EQ(client.Receive().status, 503u);
}

TEST(HttpServerBodies, OfThoseWhoMayOnlyReadTheyHaveAQuarter) {
  RunningServer server({.listen = {{false, "127.0.0.1", 0}}, .limits = {.allBodyBytes = 100}},
                       &Testing::Echo);
  const std::string own = "Host: " + server.Address().Name() + "\r\n";
  RawClient client(server.Address());
  client.Send("POST / HTTP/1.1\r\n" + own + "Content-Length: 25\r\n\r\n" + std::string(25, 'b'));
  EXPECT_EQ(client.Receive().status, 200u);
  client.Send("POST / HTTP/1.1\r\n" + own + "Content-Length: 26\r\n\r\n");
  EXPECT_EQ(client.Receive().status, 503u);
}

TEST(HttpServerBodies, HoldTheirRoomUntilTheyAreHandled) {
  Testing::Gate gate;
  RunningServer server(Options({.allBodyBytes = 100}), [&gate](const HttpRequest& request) {
    gate.Enter();
    return Testing::Echo(request);
  });
  const std::string path = server.Address().place;
  RawClient client(path);
  client.Send(Post("/", 80) + std::string(80, 'b'));
  gate.WaitUntilEntered();
  EXPECT_EQ(server.Now().bodyBytes, 80u);
  RawClient other(path);
  other.Send(Post("/", 80));
  EXPECT_EQ(other.Receive().status, 503u);
  gate.Open();
  EXPECT_EQ(client.Receive().status, 200u);
}

TEST(HttpServerRefusals, AreToldAsIsUsualAtTheirTarget) {
  HttpServer server(Options({.bodyBytes = 10}), &Testing::Echo);
  server.OnRefusal([](std::string_view target, HttpAnswer refusal) {
    refusal.body = std::string(target) + ": " + refusal.body;
    return refusal;
  });
  auto run = std::async(std::launch::async, [&server] { return server.Run(); });
  const auto answerTo = [&server](const std::string& text) {
    RawClient client(server.Addresses().front().place);
    client.Send(text);
    return client.Receive();
  };
  EXPECT_EQ(answerTo(Post("http://x/a", 11)).body, "/a: the body is too large\n");
  EXPECT_EQ(answerTo("GET /b HTTP/1.1\r\n\r\n").body.substr(0, 4), "/b: ");
  EXPECT_EQ(answerTo("GET /c HTTP/1.1\r\nbroken\r\n\r\n").body.substr(0, 13), "not a request")
      << "of no target";
  server.Stop();
  EXPECT_TRUE(run.get());
}

}  // namespace
}  // namespace Agentd
