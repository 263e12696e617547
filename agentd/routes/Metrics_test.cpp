#include "agentd/routes/Metrics.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "agentd/routes/Routes.h"
#include "agentd/testing/FakeApi.h"
#include "agentd/testing/RunningServer.h"

namespace Agentd {
namespace {

using std::chrono::milliseconds;
using testing::HasSubstr;
using testing::Not;

TEST(Metrics, AreATextThatMonitoringReads) {
  Metrics metrics;
  metrics.Count("/b", 200, milliseconds(1500));
  metrics.Count("/b", 200, milliseconds(250));
  metrics.Count("/b", 503, milliseconds(0));
  metrics.Count("/a", 404, milliseconds(1));
  EXPECT_EQ(metrics.Text({.waiting = 1, .running = 2, .done = 3, .failed = 4}, {.running = 5, .waiting = 6}),
            R"(# HELP kova_agent_requests_total Requests answered, by route and status.
# TYPE kova_agent_requests_total counter
kova_agent_requests_total{route="/a",status="404"} 1
kova_agent_requests_total{route="/b",status="200"} 2
kova_agent_requests_total{route="/b",status="503"} 1
# HELP kova_agent_request_seconds Time until requests were answered, by route.
# TYPE kova_agent_request_seconds summary
kova_agent_request_seconds_sum{route="/a"} 0.001000000
kova_agent_request_seconds_count{route="/a"} 1
kova_agent_request_seconds_sum{route="/b"} 1.750000000
kova_agent_request_seconds_count{route="/b"} 3
# HELP kova_agent_changes_total Changes that have ended, by outcome.
# TYPE kova_agent_changes_total counter
kova_agent_changes_total{outcome="done"} 3
kova_agent_changes_total{outcome="failed"} 4
# HELP kova_agent_changes_running Changes at work: 0 or 1.
# TYPE kova_agent_changes_running gauge
kova_agent_changes_running 2
# HELP kova_agent_changes_waiting Changes that wait for their turn.
# TYPE kova_agent_changes_waiting gauge
kova_agent_changes_waiting 1
# HELP kova_agent_queries_running Queries at work.
# TYPE kova_agent_queries_running gauge
kova_agent_queries_running 5
# HELP kova_agent_queries_waiting Queries that wait for a place.
# TYPE kova_agent_queries_waiting gauge
kova_agent_queries_waiting 6
)");
}

class MetricsRoute : public testing::Test {
 protected:
  HttpAnswer Ask(const HttpRequest& request, HttpRole role = HttpRole::Change) const {
    return Testing::AnswerOf(
        [this](const HttpRequest& asked, const HttpResponder& responder) { _router.Serve(asked, responder); },
        request, role);
  }
  std::string Metrics() const { return Ask({"GET", "/metrics", "", ""}).body; }

  Testing::FakeApi _api;
  TaskQueue _tasks;
  const Router _router{_api, _tasks};
};

TEST_F(MetricsRoute, CountsEachRequestByRouteAndStatus) {
  Ask({"GET", "/api/v1/disks?names=naa.1", "", ""});
  Ask({"GET", "/api/v1/disks?other=1", "", ""});
  Ask({"GET", "/api/v1/tasks/task-1", "", ""});
  Ask({"POST", "/api/v1/GetConfigInfo", "application/json", "{}"});
  Ask({"POST", "/soap", "text/xml", "no message"});
  Ask({"GET", "/nowhere\"}", "", ""});
  Ask({"GET", "/a%zz", "", ""});
  const std::string text = Metrics();
  EXPECT_THAT(text, HasSubstr("requests_total{route=\"/api/v1/disks\",status=\"200\"} 1\n"));
  EXPECT_THAT(text, HasSubstr("requests_total{route=\"/api/v1/disks\",status=\"400\"} 1\n"));
  EXPECT_THAT(text, HasSubstr("requests_total{route=\"/api/v1/tasks/\",status=\"404\"} 1\n"));
  EXPECT_THAT(text, HasSubstr("requests_total{route=\"/api/v1/GetConfigInfo\",status=\"200\"} 1\n"));
  EXPECT_THAT(text, HasSubstr("requests_total{route=\"/soap\",status=\"500\"} 1\n"));
  EXPECT_THAT(text, HasSubstr("requests_total{route=\"none\",status=\"400\"} 1\n"));
  EXPECT_THAT(text, HasSubstr("requests_total{route=\"none\",status=\"404\"} 1\n"));
  EXPECT_THAT(text, Not(HasSubstr("nowhere"))) << "what a client makes up becomes no name";
}

TEST_F(MetricsRoute, CountsChangesByWhatBecameOfThem) {
  Ask({"POST", "/api/v1/AddAllEligibleDisks", "application/json", "{}"});
  _api.answer = Host::FailedWith("no");
  Ask({"POST", "/api/v1/AddAllEligibleDisks", "application/json", "{}"});
  Ask({"POST", "/api/v1/AddAllEligibleDisks", "application/json", "{}"});
  EXPECT_THAT(Metrics(), AllOf(HasSubstr("changes_total{outcome=\"done\"} 1\n"),
                               HasSubstr("changes_total{outcome=\"failed\"} 2\n"),
                               HasSubstr("\nkova_agent_changes_waiting 0\n")));
}

TEST_F(MetricsRoute, AreForThoseWhoMayRead) {
  EXPECT_EQ(Ask({"GET", "/metrics", "", ""}, HttpRole::None).status, 403u);
  const HttpAnswer answer = Ask({"GET", "/metrics", "", ""}, HttpRole::Read);
  EXPECT_EQ(answer.status, 200u);
  EXPECT_EQ(answer.contentType, "text/plain; version=0.0.4; charset=utf-8");
  EXPECT_EQ(Ask({"GET", "/metrics?x=1", "", ""}).status, 400u);
}

}  // namespace
}  // namespace Agentd
