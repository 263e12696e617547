// The server on TCP: addresses, who asks, and what a stranger's page cannot do.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <netinet/in.h>

#include <filesystem>
#include <stdexcept>

#include "agentd/http/HttpClient.h"
#include "agentd/testing/Certificates.h"
#include "agentd/testing/RawClient.h"
#include "agentd/testing/RunningServer.h"

namespace Agentd {
namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::Not;
using Testing::RawAnswer;
using Testing::RawClient;
using Testing::RunningServer;

const HttpAddress anyPort{false, "127.0.0.1", 0};

// Answers who asks.
HttpAnswer Whoami(const HttpRequest& request) {
  return {200, "text/plain", std::string(NameOf(request.peer.role)) + " " + request.peer.identity};
}

HttpAnswer Get(const HttpAddress& address) {
  return Exchange(address, {"GET", "/", "", ""});
}

std::string WhyNot(const HttpOptions& options) {
  try {
    const HttpServer server(options, &Testing::Echo);
    return "it listens";
  } catch (const std::runtime_error& refused) {
    return refused.what();
  }
}

TEST(HttpServerTcp, ListensOnEveryAddressAtOnceAndTellsThePortsItFound) {
  const std::string path = Testing::FreshSocketPath();
  RunningServer server({.listen = {UnixAddress(path), anyPort, anyPort}}, &Testing::Echo);
  EXPECT_EQ(server.Address(0).Text(), "unix:" + path);
  EXPECT_NE(server.Address(1).port, 0);
  EXPECT_NE(server.Address(1).port, server.Address(2).port);
  for (std::size_t i = 0; i < 3; ++i) {
    EXPECT_EQ(Get(server.Address(i)).body, "GET / ") << i;
  }
  EXPECT_TRUE(server.Stop());
  for (std::size_t i = 0; i < 3; ++i) {
    EXPECT_THROW(Get(server.Address(i)), ConnectionError) << i;
  }
}

TEST(HttpServerTcp, ListensOnVersionSixToo) {
  RunningServer server({.listen = {{false, "::1", 0}}}, &Whoami);
  EXPECT_THAT(Get(server.Address()).body, testing::StartsWith("read [::1]:"));
}

TEST(HttpServerTcp, AnAddressThatCannotBeUsedIsNamedAndNothingIsLeftBehind) {
  const std::string path = Testing::FreshSocketPath();
  RunningServer other({.listen = {anyPort}}, &Testing::Echo);
  EXPECT_THAT(WhyNot({.listen = {UnixAddress(path), other.Address()}}), HasSubstr(other.Address().Text()));
  EXPECT_FALSE(std::filesystem::exists(path));
}

TEST(HttpServerTcp, WithoutTlsOtherHostsMustNotReachIt) {
  for (const char* place : {"0.0.0.0", "::", "10.0.0.1"}) {
    EXPECT_THAT(WhyNot({.listen = {{false, place, 0}}}), HasSubstr("without TLS")) << place;
  }
}

TEST(HttpServerTcp, FilesOfTlsThatCannotBeUsedAreNamed) {
  EXPECT_THAT(WhyNot({.listen = {anyPort}, .tls = TlsFiles{"/none/cert", "/none/key", "/none/ca"}}),
              HasSubstr("the certificate /none/cert"));
}

TEST(HttpServerTcp, WithoutTlsAClientMayRead) {
  RunningServer server({.listen = {anyPort}}, &Whoami);
  EXPECT_THAT(Get(server.Address()).body, testing::StartsWith("read 127.0.0.1:"));
}

TEST(HttpServerTcp, OnAUnixSocketAClientIsKnownByItsUser) {
  RunningServer server(&Whoami);
  EXPECT_EQ(Get(UnixAddress(server.Path())).body, "change uid " + std::to_string(geteuid()));
}

TEST(HttpServerTcp, ARequestMeantForAnotherHostIsRefusedBeforeItsBodyIsRead) {
  RunningServer server({.listen = {anyPort}, .serverNames = {"kova.example"}}, &Testing::Echo);
  RawClient client(server.Address());
  client.Send("POST / HTTP/1.1\r\nHost: evil.example\r\nContent-Length: 1000\r\n\r\n");
  const RawAnswer refused = client.Receive();
  EXPECT_EQ(refused.status, 421u);
  EXPECT_THAT(refused.body, AllOf(HasSubstr("Host"), Not(HasSubstr("evil"))));
  RawClient named(server.Address());
  named.Send("GET / HTTP/1.1\r\nHost: kova.example\r\n\r\n");
  EXPECT_EQ(named.Receive().status, 200u);
}

TEST(HttpServerTcp, ATargetInItsAbsoluteFormIsServedAsAnyOther) {
  RunningServer server({.listen = {anyPort}, .serverNames = {"kova.example"}}, &Testing::Echo);
  RawClient client(server.Address());
  client.Send("GET http://kova.example/a?b HTTP/1.1\r\nHost: evil.example\r\n\r\n");
  EXPECT_EQ(client.Receive().body, "GET /a?b ");
  client.Send("GET http://evil.example/a HTTP/1.1\r\nHost: kova.example\r\n\r\n");
  EXPECT_EQ(client.Receive().status, 421u);
}

TEST(HttpServerTcp, TellsTheHandlerOfAPageInABrowser) {
  std::vector<bool> seen;
  RunningServer server([&seen](const HttpRequest& request) {
    seen.push_back(request.hasOrigin);
    return HttpAnswer{200, "text/plain", ""};
  });
  RawClient client(server.Path());
  client.Send("GET / HTTP/1.1\r\nHost: x\r\nOrigin: \r\n\r\n");
  EXPECT_THAT(client.Receive().header, HasSubstr("x-content-type-options: nosniff"));
  client.Send("GET / HTTP/1.1\r\nHost: x\r\n\r\n");
  client.Receive();
  EXPECT_THAT(seen, testing::ElementsAre(true, false));
}

// Answers how the client came.
HttpAnswer WhichWay(const HttpRequest& request) {
  return {200, "text/plain", request.scheme + " " + request.authority};
}

TEST(HttpServerTcp, TellsTheHandlerByWhatNameItWasAsked) {
  const std::string path = Testing::FreshSocketPath();
  RunningServer server({.listen = {UnixAddress(path), anyPort}, .serverNames = {"Kova.example"}}, &WhichWay);
  RawClient local(path);
  local.Send("GET / HTTP/1.1\r\nHost: any.host:1\r\n\r\n");
  EXPECT_EQ(local.Receive().body, "http any.host:1");
  local.Send("GET / HTTP/1.0\r\n\r\n");
  EXPECT_EQ(local.Receive().body, "http ");
  RawClient remote(server.Address(1));
  remote.Send("GET / HTTP/1.1\r\nHost: kova.Example:81\r\n\r\n");
  EXPECT_EQ(remote.Receive().body, "http kova.Example:81");
  const std::string loopback = server.Address(1).Name();
  remote.Send("GET / HTTP/1.1\r\nHost: " + loopback + "\r\n\r\n");
  EXPECT_EQ(remote.Receive().body, "http " + loopback);
}

TEST(HttpServerTcp, FieldsBehindABodyChangeNothingOfTheHeader) {
  HttpRequest seen;
  RunningServer server([&seen](const HttpRequest& request) {
    seen = request;
    return HttpAnswer{200, "text/plain", ""};
  });
  RawClient client(server.Path());
  client.Send(
      "POST / HTTP/1.1\r\nHost: x\r\nTransfer-Encoding: chunked\r\n\r\n"
      "0\r\nContent-Type: application/json\r\nSOAPAction: a\r\n\r\n");
  EXPECT_EQ(client.Receive().status, 200u);
  EXPECT_EQ(seen.contentType, "");
  EXPECT_EQ(seen.soapAction, "");
}

TEST(HttpServerTcp, AClientThatWaitsToBeToldSendsItsBodyThen) {
  RunningServer server;
  RawClient client(server.Path());
  client.Send("POST / HTTP/1.1\r\nHost: x\r\nContent-Length: 4\r\nExpect: 100-continue\r\n\r\n");
  EXPECT_EQ(client.ReceiveHeader(), "http/1.1 100 continue");
  client.Send("body");
  EXPECT_EQ(client.Receive().body, "POST / body");
}

TEST(HttpServerTcp, AClientThatWaitsToBeToldLearnsThatItsBodyIsTooLarge) {
  RunningServer server(&Testing::Echo, {.bodyBytes = 3});
  RawClient client(server.Path());
  client.Send("POST / HTTP/1.1\r\nHost: x\r\nContent-Length: 4\r\nExpect: 100-continue\r\n\r\n");
  EXPECT_EQ(client.Receive().status, 413u);
}

TEST(HttpServerTls, AClientThatNeverAgreesOnTheSecretsIsGivenUp) {
  const Testing::Certificates certificates;
  certificates.MakeCa("a");
  RunningServer server({.listen = {anyPort},
                        .limits = {.handshakeTime = std::chrono::milliseconds(50)},
                        .tls = certificates.ServerFiles("a", "a")},
                       &Testing::Echo);
  RawClient silent(server.Address());
  EXPECT_TRUE(silent.IsClosed());
  RawClient plain(server.Address());
  plain.Send("GET / HTTP/1.1\r\nHost: localhost\r\n\r\n");
  EXPECT_EQ(plain.Receive().status, 0u);
  EXPECT_EQ(server.Now().refused[static_cast<std::size_t>(HttpRefusal::Handshake)], 2u);
}

}  // namespace
}  // namespace Agentd
