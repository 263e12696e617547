// What the agent's routes refuse before a body is read, and how much of one they take.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "agentd/routes/Routes.h"
#include "agentd/tasks/TaskQueue.h"
#include "agentd/testing/FakeApi.h"
#include "agentd/testing/RawClient.h"
#include "agentd/testing/RunningServer.h"

namespace Agentd {
namespace {

using testing::HasSubstr;
using testing::IsEmpty;
using Testing::RawClient;

constexpr std::size_t unbounded = HttpAdmission().bodyBytes;
constexpr std::size_t mib = 1 << 20;

class Admission : public testing::Test {
 protected:
  ~Admission() override { _tasks.Finish(); }

  HttpAdmission Admit(HttpRole role, const std::string& method, const std::string& target,
                      const std::string& type = "application/json") const {
    return _router.Admit(Testing::By(role, {method, target, type, ""}));
  }
  // 0: it goes on.
  unsigned StatusOf(HttpRole role, const std::string& method, const std::string& target,
                    const std::string& type = "application/json") const {
    const HttpAdmission admission = Admit(role, method, target, type);
    return admission.refusal ? admission.refusal->status : 0;
  }

  Testing::FakeApi _api;
  TaskQueue _tasks;
  Router _router{_api, _tasks};
};

TEST_F(Admission, WhatIsNotServedIsRefused) {
  EXPECT_EQ(StatusOf(HttpRole::Change, "POST", "/nowhere"), 404u);
  EXPECT_EQ(StatusOf(HttpRole::Change, "PUT", "/api/v1/AddDisks"), 405u);
  EXPECT_EQ(StatusOf(HttpRole::Change, "POST", "/api/v1/AddDisks", "text/plain"), 415u);
  EXPECT_EQ(StatusOf(HttpRole::Change, "POST", "/soap", "application/json"), 415u);
  EXPECT_EQ(StatusOf(HttpRole::Change, "POST", "/%"), 400u);
  EXPECT_EQ(StatusOf(HttpRole::Change, "POST", "/api/v1/AddDisks"), 0u);
}

TEST_F(Admission, WhoMayNotIsRefused) {
  EXPECT_EQ(StatusOf(HttpRole::Read, "POST", "/api/v1/AddDisks"), 403u);
  EXPECT_EQ(StatusOf(HttpRole::Read, "POST", "/api/v1/host"), 403u);
  EXPECT_EQ(StatusOf(HttpRole::None, "POST", "/api/v1/QueryDisksForKova"), 403u);
  EXPECT_EQ(StatusOf(HttpRole::None, "POST", "/soap", "text/xml"), 500u) << "a fault in SOAP";
  EXPECT_EQ(StatusOf(HttpRole::None, "GET", "/healthz"), 0u);
  EXPECT_EQ(StatusOf(HttpRole::Read, "POST", "/api/v1/QueryDisksForKova"), 0u);
}

TEST_F(Admission, ABodyMayBeAsLargeAsTheRoleAllows) {
  EXPECT_EQ(Admit(HttpRole::None, "GET", "/healthz").bodyBytes, 0u);
  EXPECT_EQ(Admit(HttpRole::Read, "POST", "/soap", "text/xml").bodyBytes, mib);
  EXPECT_EQ(Admit(HttpRole::Read, "POST", "/api/v1/QueryDisksForKova").bodyBytes, mib);
  EXPECT_EQ(Admit(HttpRole::Change, "POST", "/soap", "text/xml").bodyBytes, unbounded);
}

TEST_F(Admission, ARefusalIsCounted) {
  Admit(HttpRole::Read, "POST", "/api/v1/AddDisks");
  Admit(HttpRole::Read, "POST", "/nowhere");
  const HttpAnswer metrics = Testing::AnswerOf(
      [this](const HttpRequest& asked, const HttpResponder& responder) { _router.Serve(asked, responder); },
      {"GET", "/metrics", "", ""});
  EXPECT_THAT(metrics.body, HasSubstr(R"(requests_total{route="/api/v1/AddDisks",status="403"} 1)"));
  EXPECT_THAT(metrics.body, HasSubstr(R"(requests_total{route="none",status="404"} 1)"));
  EXPECT_THAT(metrics.body, HasSubstr("kova_agent_connections"));
}

TEST_F(Admission, MetricsTellOfTheServer) {
  _router.OnLoad([] { return HttpLoad{.bodyBytes = 4711}; });
  const HttpAnswer metrics = Testing::AnswerOf(
      [this](const HttpRequest& asked, const HttpResponder& responder) { _router.Serve(asked, responder); },
      {"GET", "/metrics", "", ""});
  EXPECT_THAT(metrics.body, HasSubstr("kova_agent_body_bytes 4711\n"));
}

// Somebody who may only read, on TCP, asks a server that serves these routes.
TEST_F(Admission, ByTheServerIsToldBeforeTheBodyIsSent) {
  Testing::RunningServer server(
      {.listen = {{false, "127.0.0.1", 0}}},
      HttpDeferringHandler([this](const HttpRequest& asked, const HttpResponder& responder) {
        _router.Serve(asked, responder);
      }),
      [this](const HttpRequest& head) { return _router.Admit(head); });
  const std::string rest = " HTTP/1.1\r\nHost: " + server.Address().Name() +
                           "\r\nExpect: 100-continue\r\nContent-Type: application/json\r\nContent-Length: ";
  const auto answer = [&](const std::string& target, const std::string& length) {
    RawClient client(server.Address());
    client.Send("POST " + target + rest + length + "\r\n\r\n");
    return client.ReceiveHeader();
  };
  EXPECT_THAT(answer("/nowhere", "9"), HasSubstr(" 404 "));
  EXPECT_THAT(answer("/healthz", "9"), testing::AllOf(HasSubstr(" 405 "), HasSubstr("allow: get, head")));
  EXPECT_THAT(answer("/soap", "9"), HasSubstr(" 415 "));
  EXPECT_THAT(answer("/api/v1/AddDisks", "9"), HasSubstr(" 403 "));
  EXPECT_THAT(answer("/api/v1/QueryDisksForKova", "1048577"), HasSubstr(" 413 "));
  EXPECT_THAT(answer("/api/v1/QueryDisksForKova", "1048576"), HasSubstr(" 100 "));
  EXPECT_THAT(_api.Asked(), IsEmpty());
}

}  // namespace
}  // namespace Agentd
