// Many clients at once, each with a mixture of requests, on a running server.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <future>
#include <set>

#include "agentd/routes/Routes.h"
#include "agentd/tasks/TaskQueue.h"
#include "agentd/testing/FakeApi.h"
#include "agentd/testing/RawClient.h"
#include "agentd/testing/RunningServer.h"

namespace Agentd {
namespace {

using Testing::RawAnswer;
using Testing::RawClient;

constexpr int clients = 64;
constexpr int rounds = 20;

std::string Get(const std::string& target) {
  return "GET " + target + " HTTP/1.1\r\nHost: kova.test\r\n\r\n";
}

std::string Post(const std::string& target, const std::string& type, const std::string& body) {
  return "POST " + target + " HTTP/1.1\r\nHost: kova.test\r\nContent-Type: " + type +
         "\r\nContent-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body;
}

std::string Soap(const std::string& operation) {
  return Post("/soap", "text/xml",
              "<e:Envelope xmlns:e='http://schemas.xmlsoap.org/soap/envelope/'><e:Body><" + operation +
                  " xmlns='urn:nox'/></e:Body></e:Envelope>");
}

// A request, and the statuses it may be answered with: a change, also that too many wait (503, or 500 for
// SOAP).
struct Request {
  std::string text;
  std::set<unsigned> statuses;
};

const std::vector<Request>& Mixture() {
  static const std::vector<Request> mixture = {
      {Get("/healthz"), {200}},
      {Get("/api/v1/disks?names=naa.1"), {200}},
      {Post("/api/v1/RemoveDisk", "application/json", R"({"disk": "naa.1"})"), {200, 503}},
      {Get("/api/v1/tasks"), {200}},
      {Soap("GetStorageInfo"), {200}},
      {Post("/api/v1/AddAllEligibleDisks", "application/json", R"({"wait": false})"), {202, 503}},
      {Soap("AddAllEligibleDisks"), {200, 500}},
      {Post("/api/v1/RemoveDisk", "application/json", R"({"disk": )"), {400}},
      {Post("/api/v1/host", "application/json", R"({"set": {}})"), {200, 503}},
      {Get("/nowhere"), {404}},
  };
  return mixture;
}

// How often an answer was another than it may be, or missing.
int Misanswered(const HttpAddress& address, int client) {
  RawClient connection = address.isUnix ? RawClient(address.place) : RawClient(address);
  int wrong = 0;
  for (int round = 0; round < rounds; ++round) {
    const Request& request = Mixture()[static_cast<std::size_t>(client + round) % Mixture().size()];
    connection.Send(request.text);
    wrong += static_cast<int>(1 - request.statuses.count(connection.Receive().status));
  }
  return wrong;
}

class ManyClients : public testing::Test {
 protected:
  HttpDeferringHandler Handler() const {
    return [this](const HttpRequest& request, const HttpResponder& responder) {
      // Each address would grant its own role; here, all may change.
      _router.Serve(Testing::By(HttpRole::Change, request), responder);
    };
  }

  Testing::FakeApi _api;
  TaskQueue _tasks{{.waiting = 8, .remembered = 16}};
  const Router _router{_api, _tasks};
};

TEST_F(ManyClients, AreAllAnsweredAndChangesComeOneByOne) {
  std::atomic<int> atWork{0};
  std::atomic<int> overlaps{0};
  _api.onChange = [&] {
    overlaps += ++atWork > 1 ? 1 : 0;
    std::this_thread::yield();
    --atWork;
  };
  HttpOptions options = Testing::OnSocket(Testing::FreshSocketPath());
  options.listen.push_back({false, "127.0.0.1", 0});
  options.serverNames = {"kova.test"};
  Testing::RunningServer server(options, Handler());
  std::vector<std::future<int>> running;
  for (int client = 0; client < clients; ++client) {
    running.push_back(
        std::async(std::launch::async, [address = server.Address(static_cast<std::size_t>(client % 2)),
                                        client] { return Misanswered(address, client); }));
  }
  for (auto& client : running) {
    EXPECT_EQ(client.get(), 0);
  }
  EXPECT_TRUE(server.Stop());
  _tasks.Finish();
  EXPECT_EQ(overlaps, 0);
}

}  // namespace
}  // namespace Agentd
