// Who finds a place when others have come before, and who is told what of it.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/resource.h>

#include <memory>
#include <stdexcept>
#include <vector>

#include "agentd/testing/Certificates.h"
#include "agentd/testing/RawClient.h"
#include "agentd/testing/RunningServer.h"
#include "tests/support/RecordingLogger.h"

namespace Agentd {
namespace {

using testing::AllOf;
using testing::HasSubstr;
using Testing::RawAnswer;
using Testing::RawClient;
using Testing::RunningServer;

const HttpAddress anyPort{false, "127.0.0.1", 0};

unsigned long Refused(const RunningServer& server, HttpRefusal refusal) {
  return server.Now().refused[static_cast<std::size_t>(refusal)];
}

// Its places are taken when these have been answered.
class Crowd {
 public:
  Crowd(const HttpAddress& address, int size) {
    for (int i = 0; i < size; ++i) {
      _clients.push_back(address.isUnix ? std::make_unique<RawClient>(address.place)
                                        : std::make_unique<RawClient>(address));
      _clients.back()->Send("GET /a HTTP/1.1\r\nHost: localhost:" + std::to_string(address.port) +
                            "\r\n\r\n");
      EXPECT_EQ(_clients.back()->Receive().status, 200u) << i;
    }
  }

 private:
  std::vector<std::unique_ptr<RawClient>> _clients;
};

TEST(HttpServerShares, TheNetworkTakesNoPlaceFromTheUnixSocket) {
  RunningServer server(
      {.listen = {UnixAddress(Testing::FreshSocketPath()), anyPort, anyPort}, .limits = {.connections = 3}},
      &Testing::Echo);
  const Crowd crowd(server.Address(1), 3);
  EXPECT_EQ(RawClient(server.Address(1)).Receive().status, 503u);
  const Crowd local(server.Address(0), 3);
  const Crowd other(server.Address(2), 3);
  const HttpLoad load = server.Now();
  ASSERT_EQ(load.listeners.size(), 3u);
  for (std::size_t i = 0; i < 3; ++i) {
    EXPECT_EQ(load.listeners[i].address, server.Address(i).Text());
    EXPECT_EQ(load.listeners[i].connections, 3u) << i;
  }
  EXPECT_EQ(Refused(server, HttpRefusal::Connections), 1u);
}

TEST(HttpServerShares, OneClientOfTheNetworkLeavesPlacesToOthers) {
  RunningServer server(
      {.listen = {{false, "127.0.0.1", 0}}, .limits = {.connections = 100, .connectionsOfPeer = 2}},
      &Testing::Echo);
  const Crowd crowd(server.Address(), 2);
  const RawAnswer refused = RawClient(server.Address()).Receive();
  EXPECT_EQ(refused.status, 503u);
  EXPECT_THAT(refused.body, HasSubstr("too many connections of this client"));
  EXPECT_THAT(refused.header, HasSubstr("content-type: text/plain; charset=utf-8"));
  EXPECT_EQ(Refused(server, HttpRefusal::ConnectionsOfPeer), 1u);
  EXPECT_EQ(Refused(server, HttpRefusal::Connections), 0u);
}

TEST(HttpServerShares, WhoMayChangeIsCountedForHimselfByNobody) {
  RunningServer server(
      {.listen = {UnixAddress(Testing::FreshSocketPath())}, .limits = {.connectionsOfPeer = 1}},
      &Testing::Echo);
  const Crowd crowd(server.Address(), 5);
}

TEST(HttpServerShares, TooManyEvenToBeToldAreClosed) {
  RunningServer server({.listen = {anyPort}, .limits = {.connections = 1, .refusedConnections = 1}},
                       &Testing::Echo);
  const Crowd crowd(server.Address(), 1);
  const RawClient waits(server.Address());  // for two seconds, in which it might say something
  ASSERT_TRUE(waits.HasAnswer(std::chrono::seconds(60)));
  RawClient closed(server.Address());
  EXPECT_EQ(closed.Receive().status, 503u) << "there was time for a line";
  EXPECT_TRUE(closed.IsClosed());
  EXPECT_EQ(server.Now().listeners[0].connections, 1u);
}

TEST(HttpServerShares, HandshakesThatNobodyEndsTakePlacesForAMomentOnly) {
  const Testing::Certificates certificates;
  certificates.MakeCa("a");
  RunningServer server({.listen = {UnixAddress(Testing::FreshSocketPath()), anyPort},
                        .limits = {.connections = 2, .handshakeTime = std::chrono::milliseconds(20)},
                        .tls = certificates.ServerFiles("a", "a")},
                       &Testing::Echo);
  for (int round = 0; round < 3; ++round) {
    RawClient first(server.Address(1));
    RawClient second(server.Address(1));
    EXPECT_TRUE(first.IsClosed());
    EXPECT_TRUE(second.IsClosed());
  }
  const Crowd local(server.Address(0), 2);
  EXPECT_EQ(Refused(server, HttpRefusal::Handshake) + Refused(server, HttpRefusal::Connections), 6u);
}

TEST(HttpServerShares, WhoIsTurnedAwayStandsInTheLogOnce) {
  const auto logger = Tessa::MakeRef<TestSupport::RecordingLogger>();
  const auto before = Tessa::Service::GetDefaultLogger();
  Tessa::Service::SetDefaultLogger(logger);
  {
    RunningServer server({.listen = {anyPort}, .limits = {.connections = 1}}, &Testing::Echo);
    const Crowd crowd(server.Address(), 1);
    for (int i = 0; i < 10; ++i) {
      EXPECT_EQ(RawClient(server.Address()).Receive().status, 503u);
    }
    const auto lines = logger->Lines(Tessa::Service::LogLevel::Warning);
    ASSERT_EQ(lines.size(), 1u) << "the others, in a line later";
    EXPECT_THAT(lines[0].arguments[0],
                AllOf(HasSubstr("Refused 127.0.0.1:"), HasSubstr(server.Address().Text()),
                      HasSubstr("too many connections")));
  }
  Tessa::Service::SetDefaultLogger(before);
}

TEST(HttpServerShares, MorePlacesThanTheProcessMayHaveFilesAreRefusedAtTheStart) {
  rlimit limit{};
  getrlimit(RLIMIT_NOFILE, &limit);
  if (limit.rlim_max == RLIM_INFINITY) {
    GTEST_SKIP() << "there is no limit here";
  }
  EXPECT_THROW(HttpServer({.listen = {anyPort}, .limits = {.connections = limit.rlim_max}}, &Testing::Echo),
               std::runtime_error);
}

}  // namespace
}  // namespace Agentd
