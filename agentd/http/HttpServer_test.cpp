#include "agentd/http/HttpServer.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <condition_variable>
#include <csignal>
#include <filesystem>
#include <mutex>
#include <stdexcept>

#include "agentd/testing/RawClient.h"
#include "agentd/testing/RunningServer.h"

namespace Agentd {
namespace {

using testing::AllOf;
using Testing::Gate;
using testing::HasSubstr;
using Testing::RawAnswer;
using Testing::RawClient;
using Testing::RunningServer;

constexpr std::string_view get = "GET /a HTTP/1.1\r\nHost: x\r\n\r\n";

// Stands between "the server was told to stop" and "it accepts no more".
void WaitUntilNobodyAnswers(const std::string& path) {
  try {
    for (;;) {
      const RawClient client(path);
      std::this_thread::yield();
    }
  } catch (const std::runtime_error&) {
  }
}

TEST(HttpServer, HandsMethodTargetTypeAndBodyToTheHandler) {
  HttpRequest seen;
  RunningServer server([&seen](const HttpRequest& request) {
    seen = request;
    return HttpAnswer{201, "text/x", "made"};
  });
  RawClient client(server.Path());
  client.Send("POST /a?b=%20c HTTP/1.1\r\nHost: x\r\nContent-Type: text/y\r\nContent-Length: 4\r\n\r\nbody");
  const RawAnswer answer = client.Receive();
  EXPECT_EQ(seen.method, "POST");
  EXPECT_EQ(seen.target, "/a?b=%20c");
  EXPECT_EQ(seen.contentType, "text/y");
  EXPECT_EQ(seen.body, "body");
  EXPECT_EQ(answer.status, 201u);
  EXPECT_THAT(answer.header, HasSubstr("content-type: text/x"));
  EXPECT_EQ(answer.body, "made");
}

TEST(HttpServer, ReadsABodyInChunksAndInPieces) {
  RunningServer server;
  RawClient client(server.Path());
  client.Send("POST / HTTP/1.1\r\nHost: x\r\nTransfer-En");
  client.Send("coding: chunked\r\n\r\n4\r\nbo");
  client.Send("dy\r\n0\r\n\r\n");
  EXPECT_EQ(client.Receive().body, "POST / body");
}

TEST(HttpServer, ServesOneRequestAfterAnotherOnAConnection) {
  RunningServer server;
  RawClient client(server.Path());
  for (int i = 0; i < 3; ++i) {
    client.Send(get);
    EXPECT_EQ(client.Receive().body, "GET /a ");
  }
}

TEST(HttpServer, ServesRequestsThatWereSentTogetherInOrder) {
  RunningServer server;
  RawClient client(server.Path());
  client.Send("GET /1 HTTP/1.1\r\nHost: x\r\n\r\nGET /2 HTTP/1.1\r\nHost: x\r\n\r\n");
  EXPECT_EQ(client.Receive().body, "GET /1 ");
  EXPECT_EQ(client.Receive().body, "GET /2 ");
}

TEST(HttpServer, ClosesTheConnectionWhenTheClientAsksForIt) {
  RunningServer server;
  RawClient client(server.Path());
  client.Send("GET / HTTP/1.1\r\nHost: x\r\nConnection: close\r\n\r\n");
  EXPECT_EQ(client.Receive().status, 200u);
  EXPECT_TRUE(client.IsClosed());

  RawClient old(server.Path());
  old.Send("GET / HTTP/1.0\r\n\r\n");
  EXPECT_EQ(old.Receive().status, 200u);
  EXPECT_TRUE(old.IsClosed());
}

TEST(HttpServer, SendsNoBodyToHead) {
  RunningServer server;
  RawClient client(server.Path());
  client.Send("HEAD /a HTTP/1.1\r\nHost: x\r\n\r\n");
  EXPECT_THAT(client.ReceiveHeader(), AllOf(HasSubstr(" 200 "), HasSubstr("content-length: 8")));
  client.Send(get);
  EXPECT_EQ(client.Receive().body, "GET /a ") << "the next answer begins where it should";
}

TEST(HttpServer, AnswersWhatAHandlerThrowsWith500AndItsText) {
  RunningServer server([](const HttpRequest& request) -> HttpAnswer {
    if (request.target == "/int") {
      throw 1;
    }
    throw std::runtime_error("out of luck");
  });
  RawClient client(server.Path());
  client.Send(get);
  const RawAnswer answer = client.Receive();
  EXPECT_EQ(answer.status, 500u);
  EXPECT_EQ(answer.body, "out of luck\n");
  client.Send("GET /int HTTP/1.1\r\nHost: x\r\n\r\n");
  EXPECT_EQ(client.Receive().status, 500u);
}

TEST(HttpServer, ASlowRequestHoldsUpNobodyElse) {
  Gate gate;
  RunningServer server([&gate](const HttpRequest& request) {
    if (request.target == "/slow") {
      gate.Enter();
    }
    return Testing::Echo(request);
  });
  RawClient slow(server.Path());
  slow.Send("GET /slow HTTP/1.1\r\nHost: x\r\n\r\n");
  gate.WaitUntilEntered();
  RawClient quick(server.Path());
  quick.Send(get);
  EXPECT_EQ(quick.Receive().body, "GET /a ");
  gate.Open();
  EXPECT_EQ(slow.Receive().body, "GET /slow ");
}

TEST(HttpServer, GoesOnAfterAClientThatLeftInTheMiddle) {
  RunningServer server;
  { RawClient(server.Path()).Send("POST / HTTP/1.1\r\nHost: x\r\nContent-Length: 10\r\n\r\nhalf"); }
  { RawClient(server.Path()).Send(get); }  // left before its answer
  RawClient client(server.Path());
  client.Send(get);
  EXPECT_EQ(client.Receive().status, 200u);
}

TEST(HttpServer, ServesManyClientsAtOnce) {
  RunningServer server;
  std::vector<std::future<int>> clients;
  for (int i = 0; i < 8; ++i) {
    clients.push_back(std::async(std::launch::async, [&server] {
      int good = 0;
      RawClient client(server.Path());
      for (int round = 0; round < 50; ++round) {
        client.Send(get);
        good += client.Receive().status == 200u ? 1 : 0;
      }
      return good;
    }));
  }
  for (auto& client : clients) {
    EXPECT_EQ(client.get(), 50);
  }
}

TEST(HttpServer, StoppedWhileNobodyIsConnectedReturnsAndRemovesTheSocket) {
  RunningServer server;
  { RawClient client(server.Path()); }
  EXPECT_TRUE(server.Stop());
  EXPECT_FALSE(std::filesystem::exists(server.Path()));
}

TEST(HttpServer, StoppedBeforeItRunsReturnsAtOnce) {
  const std::string path = Testing::FreshSocketPath();
  HttpServer server(Testing::OnSocket(path), &Testing::Echo);
  server.Stop();
  EXPECT_TRUE(server.Run());
}

TEST(HttpServer, ThatNeverRanRemovesItsSocket) {
  const std::string path = Testing::FreshSocketPath();
  { HttpServer server(Testing::OnSocket(path), &Testing::Echo); }
  EXPECT_FALSE(std::filesystem::exists(path));
}

TEST(HttpServer, StoppedClosesConnectionsThatOnlyWait) {
  RunningServer server;
  RawClient client(server.Path());
  client.Send(get);
  EXPECT_EQ(client.Receive().status, 200u);
  EXPECT_TRUE(server.Stop());
  EXPECT_TRUE(client.IsClosed());
}

// A connection may be given back by a worker just when the server begins to end all that wait for a request:
// each round stops the server a little earlier before that.
TEST(HttpServer, StoppedJustWhenAnAnswerIsSentMissesNoConnection) {
  HttpLimits limits;
  limits.readTime = std::chrono::minutes(2);  // one that was missed would wait as long, and the server for it
  limits.drainTime = std::chrono::seconds(10);
  for (int round = 0; round < 200; ++round) {
    std::atomic<HttpServer*> running{nullptr};
    RunningServer server(
        [&running, round](const HttpRequest& request) {
          running.load()->Stop();
          for (std::atomic<int> delay{0}; delay < 100 * round; ++delay) {
          }
          return Testing::Echo(request);
        },
        limits);
    running = &server.Server();
    RawClient client(server.Path());
    client.Send("GET /a HTTP/1.1\r\nHost: x\r\n\r\n");
    ASSERT_EQ(client.Receive().status, 200u);
    ASSERT_TRUE(server.Wait()) << "in round " << round;
    ASSERT_TRUE(client.IsClosed());
  }
}

TEST(HttpServer, ASignalEndsItAfterTheRequestsInFlight) {
  Gate gate;
  RunningServer server([&gate](const HttpRequest& request) {
    gate.Enter();
    return Testing::Echo(request);
  });
  RawClient client(server.Path());
  client.Send(get);
  gate.WaitUntilEntered();
  kill(getpid(), SIGTERM);
  WaitUntilNobodyAnswers(server.Path());
  EXPECT_FALSE(std::filesystem::exists(server.Path())) << "a new agent can start meanwhile";
  gate.Open();
  const RawAnswer answer = client.Receive();
  EXPECT_EQ(answer.body, "GET /a ");
  EXPECT_THAT(answer.header, HasSubstr("connection: close"));
  EXPECT_TRUE(client.IsClosed());
  EXPECT_TRUE(server.Wait());
}

TEST(HttpServer, LeavesASuccessorsSocketAlone) {
  Gate gate;
  auto server = std::make_unique<RunningServer>([&gate](const HttpRequest& request) {
    gate.Enter();
    return Testing::Echo(request);
  });
  const std::string path = server->Path();
  RawClient client(path);
  client.Send(get);
  gate.WaitUntilEntered();
  server->Server().Stop();
  WaitUntilNobodyAnswers(path);
  const HttpServer successor(Testing::OnSocket(path), &Testing::Echo);
  gate.Open();
  server.reset();
  EXPECT_TRUE(std::filesystem::exists(path));
}

TEST(HttpServer, GivesUpOnRequestsThatTakeLongerThanTheDrainTime) {
  Gate gate;
  HttpLimits limits;
  limits.drainTime = std::chrono::milliseconds(20);
  RunningServer server(
      [&gate](const HttpRequest& request) {
        gate.Enter();
        return Testing::Echo(request);
      },
      limits);
  RawClient client(server.Path());
  client.Send(get);
  gate.WaitUntilEntered();
  EXPECT_FALSE(server.Stop());
  gate.Open();
}

// Keeps the responders of the requests it is handed, for the test to answer.
class Deferral {
 public:
  HttpDeferringHandler Handler() {
    return [this](const HttpRequest& request, const HttpResponder& responder) {
      const std::lock_guard guard(_mutex);
      _kept.emplace_back(request.target, responder);
      _changed.notify_all();
    };
  }
  // Waits for the request.
  HttpResponder Take(const std::string& target) {
    std::unique_lock lock(_mutex);
    for (;;) {
      const auto found = std::find_if(_kept.begin(), _kept.end(),
                                      [&target](const auto& kept) { return kept.first == target; });
      if (found != _kept.end()) {
        HttpResponder responder = found->second;
        _kept.erase(found);
        return responder;
      }
      _changed.wait(lock);
    }
  }

 private:
  std::mutex _mutex;
  std::condition_variable _changed;
  std::vector<std::pair<std::string, HttpResponder>> _kept;
};

TEST(HttpServerDeferred, AnAnswerMayComeLaterAndFromElsewhere) {
  Deferral deferral;
  RunningServer server(deferral.Handler());
  RawClient first(server.Path());
  RawClient second(server.Path());
  first.Send("GET /1 HTTP/1.1\r\nHost: x\r\n\r\n");
  second.Send("GET /2 HTTP/1.1\r\nHost: x\r\n\r\n");
  const HttpResponder firstAnswer = deferral.Take("/1");
  deferral.Take("/2").Answer({200, "text/plain", "second"});
  EXPECT_EQ(second.Receive().body, "second");
  firstAnswer.Answer({503, "text/plain", "first", 7});
  const RawAnswer answer = first.Receive();
  EXPECT_EQ(answer.body, "first");
  EXPECT_THAT(answer.header, HasSubstr("retry-after: 7"));
}

TEST(HttpServerDeferred, OutstandingAnswersHoldUpNoWorker) {
  Deferral deferral;
  HttpLimits limits;
  limits.workers = 1;
  RunningServer server(deferral.Handler(), limits);
  std::vector<std::unique_ptr<RawClient>> clients;
  std::vector<HttpResponder> responders;
  for (int i = 0; i < 20; ++i) {
    const std::string target = "/" + std::to_string(i);
    clients.push_back(std::make_unique<RawClient>(server.Path()));
    clients.back()->Send("GET " + target + " HTTP/1.1\r\nHost: x\r\n\r\n");
    responders.push_back(deferral.Take(target));
  }
  for (int i = 0; i < 20; ++i) {
    responders[i].Answer({200, "text/plain", std::to_string(i)});
    EXPECT_EQ(clients[i]->Receive().body, std::to_string(i));
  }
}

TEST(HttpServerDeferred, TheFirstAnswerCounts) {
  Deferral deferral;
  RunningServer server(deferral.Handler());
  RawClient client(server.Path());
  client.Send(get);
  const HttpResponder responder = deferral.Take("/a");
  const HttpResponder copy = responder;
  responder.Answer({200, "text/plain", "one"});
  copy.Answer({200, "text/plain", "two"});
  EXPECT_EQ(client.Receive().body, "one");
  client.Send("GET /b HTTP/1.1\r\nHost: x\r\n\r\n");
  deferral.Take("/b").Answer({200, "text/plain", "three"});
  EXPECT_EQ(client.Receive().body, "three");
}

TEST(HttpServerDeferred, ARequestThatIsDroppedIsAnsweredWith500) {
  Deferral deferral;
  RunningServer server(deferral.Handler());
  RawClient client(server.Path());
  client.Send(get);
  deferral.Take("/a");
  EXPECT_EQ(client.Receive().status, 500u);
}

TEST(HttpServerDeferred, AnAnswerToAClientThatHasLeftHarmsNobody) {
  Deferral deferral;
  RunningServer server(deferral.Handler());
  { RawClient(server.Path()).Send(get); }
  deferral.Take("/a").Answer({200, "text/plain", std::string(1 << 20, 'x')});
  RawClient client(server.Path());
  client.Send("GET /b HTTP/1.1\r\nHost: x\r\n\r\n");
  deferral.Take("/b").Answer({200, "text/plain", "well"});
  EXPECT_EQ(client.Receive().body, "well");
}

TEST(HttpServerDeferred, AStopTellsTheListenerAndThenWaitsForOutstandingAnswers) {
  Deferral deferral;
  std::promise<void> stopping;
  RunningServer server(deferral.Handler(), {}, [&stopping] { stopping.set_value(); });
  RawClient client(server.Path());
  client.Send(get);
  const HttpResponder responder = deferral.Take("/a");
  server.Server().Stop();
  stopping.get_future().wait();
  responder.Answer({200, "text/plain", "last"});
  const RawAnswer answer = client.Receive();
  EXPECT_EQ(answer.body, "last");
  EXPECT_THAT(answer.header, HasSubstr("connection: close"));
  EXPECT_TRUE(server.Wait());
}

TEST(HttpServerDeferred, AStopGivesUpOnAnswersThatDoNotComeInTime) {
  Deferral deferral;
  HttpLimits limits;
  limits.drainTime = std::chrono::milliseconds(20);
  RunningServer server(deferral.Handler(), limits);
  RawClient client(server.Path());
  client.Send(get);
  const HttpResponder responder = deferral.Take("/a");
  EXPECT_FALSE(server.Stop());
  responder.Answer({200, "text/plain", "too late"});
}

}  // namespace
}  // namespace Agentd
