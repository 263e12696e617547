#include "agentd/routes/Metrics.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>

#include "agentd/routes/Routes.h"
#include "agentd/testing/RunningServer.h"
#include "agentd/testing/ScriptedHost.h"
#include "host/Build.h"

namespace Agentd {
namespace {

using std::chrono::milliseconds;
using testing::AllOf;
using testing::HasSubstr;
using testing::Not;

OutcomeCounts Ended(int done, int partly, int failed) {
  OutcomeCounts counts;
  const std::array<int, 3> each = {done, partly, failed};
  for (std::size_t i = 0; i < each.size(); ++i) {
    for (int n = 0; n < each.at(i); ++n) {
      counts.Add(OutcomeCounts::all.at(i));
    }
  }
  return counts;
}

TEST(Metrics, AreATextThatMonitoringReads) {
  Metrics metrics;
  metrics.Count("/b", 200, milliseconds(1500));
  metrics.Count("/b", 503, milliseconds(0));
  metrics.Count("/a", 404, milliseconds(1));
  const std::string text = metrics.Text({.changes = {.waiting = 1, .running = 2, .ended = Ended(3, 4, 5)},
                                         .queries = {.running = 6, .waiting = 7, .ended = Ended(8, 9, 10)},
                                         .host = HostCounts{11, 12, 13, 14, 15, milliseconds(16)}});
  EXPECT_EQ(text.substr(text.find("# HELP kova_agent_requests_total")),
            R"(# HELP kova_agent_requests_total Requests answered, by route and status.
# TYPE kova_agent_requests_total counter
kova_agent_requests_total{route="/a",status="404"} 1
kova_agent_requests_total{route="/b",status="200"} 1
kova_agent_requests_total{route="/b",status="503"} 1
# HELP kova_agent_request_seconds Time until requests were answered, by route.
# TYPE kova_agent_request_seconds histogram
kova_agent_request_seconds_bucket{route="/a",le="0.001"} 1
kova_agent_request_seconds_bucket{route="/a",le="0.005"} 1
kova_agent_request_seconds_bucket{route="/a",le="0.025"} 1
kova_agent_request_seconds_bucket{route="/a",le="0.1"} 1
kova_agent_request_seconds_bucket{route="/a",le="0.5"} 1
kova_agent_request_seconds_bucket{route="/a",le="1"} 1
kova_agent_request_seconds_bucket{route="/a",le="5"} 1
kova_agent_request_seconds_bucket{route="/a",le="15"} 1
kova_agent_request_seconds_bucket{route="/a",le="60"} 1
kova_agent_request_seconds_bucket{route="/a",le="300"} 1
kova_agent_request_seconds_bucket{route="/a",le="1800"} 1
kova_agent_request_seconds_bucket{route="/a",le="+Inf"} 1
kova_agent_request_seconds_sum{route="/a"} 0.001000000
kova_agent_request_seconds_count{route="/a"} 1
kova_agent_request_seconds_bucket{route="/b",le="0.001"} 1
kova_agent_request_seconds_bucket{route="/b",le="0.005"} 1
kova_agent_request_seconds_bucket{route="/b",le="0.025"} 1
kova_agent_request_seconds_bucket{route="/b",le="0.1"} 1
kova_agent_request_seconds_bucket{route="/b",le="0.5"} 1
kova_agent_request_seconds_bucket{route="/b",le="1"} 1
kova_agent_request_seconds_bucket{route="/b",le="5"} 2
kova_agent_request_seconds_bucket{route="/b",le="15"} 2
kova_agent_request_seconds_bucket{route="/b",le="60"} 2
kova_agent_request_seconds_bucket{route="/b",le="300"} 2
kova_agent_request_seconds_bucket{route="/b",le="1800"} 2
kova_agent_request_seconds_bucket{route="/b",le="+Inf"} 2
kova_agent_request_seconds_sum{route="/b"} 1.500000000
kova_agent_request_seconds_count{route="/b"} 2
# HELP kova_agent_changes_total Changes that have ended, by outcome.
# TYPE kova_agent_changes_total counter
kova_agent_changes_total{outcome="done"} 3
kova_agent_changes_total{outcome="partly"} 4
kova_agent_changes_total{outcome="failed"} 5
# HELP kova_agent_changes_running Changes at work: 0 or 1.
# TYPE kova_agent_changes_running gauge
kova_agent_changes_running 2
# HELP kova_agent_changes_waiting Changes that wait for their turn.
# TYPE kova_agent_changes_waiting gauge
kova_agent_changes_waiting 1
# HELP kova_agent_queries_total Queries that have ended, by outcome.
# TYPE kova_agent_queries_total counter
kova_agent_queries_total{outcome="done"} 8
kova_agent_queries_total{outcome="partly"} 9
kova_agent_queries_total{outcome="failed"} 10
# HELP kova_agent_queries_running Queries at work.
# TYPE kova_agent_queries_running gauge
kova_agent_queries_running 6
# HELP kova_agent_queries_waiting Queries that wait for a place.
# TYPE kova_agent_queries_waiting gauge
kova_agent_queries_waiting 7
# HELP kova_disks Disks of the host by state, when it last told.
# TYPE kova_disks gauge
kova_disks{state="inUse"} 11
kova_disks{state="eligible"} 12
kova_disks{state="ineligible"} 13
# HELP kova_disk_groups Disk groups of the host by state, when it last told.
# TYPE kova_disk_groups gauge
kova_disk_groups{state="mounted"} 14
kova_disk_groups{state="unmounted"} 15
# HELP kova_host_age_seconds Time since the host told of its disks and groups.
# TYPE kova_host_age_seconds gauge
kova_host_age_seconds 0.016000000
)");
}

TEST(Metrics, TellWhichBuildTheyAreOf) {
  EXPECT_THAT(Metrics().Text({}),
              testing::StartsWith("# HELP kova_agent_info What the agent is; always 1.\n"
                                  "# TYPE kova_agent_info gauge\n"
                                  "kova_agent_info{version=\"" +
                                  std::string(Host::Version()) + "\",build=\"" +
                                  std::string(Host::BuildId()) + "\",api=\"nox.version.unstable\"} 1\n"));
}

TEST(Metrics, SayNothingOfAHostThatHasNotTold) {
  EXPECT_THAT(Metrics().Text({}), Not(HasSubstr("kova_disk")));
}

class MetricsRoute : public testing::Test {
 protected:
  HttpAnswer Ask(const HttpRequest& request, HttpRole role = HttpRole::Change) const {
    return Testing::AnswerOf(
        [this](const HttpRequest& asked, const HttpResponder& responder) { _router.Serve(asked, responder); },
        request, role);
  }
  std::string Metrics() const { return Ask({"GET", "/metrics", "", ""}).body; }

  Testing::ScriptedHost _host;
  Testing::FakeApi& _api = _host.api;
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
  _api.answerTo = {};
  Ask({"POST", "/api/v1/AddAllEligibleDisks", "application/json", "{}"});
  _api.answer = Host::FailedWith("no");
  Ask({"POST", "/api/v1/AddAllEligibleDisks", "application/json", "{}"});
  Ask({"POST", "/api/v1/AddAllEligibleDisks", "application/json", "{}"});
  EXPECT_THAT(Metrics(), AllOf(HasSubstr("changes_total{outcome=\"done\"} 1\n"),
                               HasSubstr("changes_total{outcome=\"failed\"} 2\n"),
                               HasSubstr("\nkova_agent_changes_waiting 0\n")));
}

TEST_F(MetricsRoute, CountsQueriesByWhatBecameOfThemWhicheverDoorTheyCameThrough) {
  const std::string soap =
      "<e:Envelope xmlns:e='http://schemas.xmlsoap.org/soap/envelope/'><e:Body><GetStorageInfo "
      "xmlns='urn:nox'/></e:Body></e:Envelope>";
  Ask({"GET", "/api/v1/groups", "", ""});
  Ask({"POST", "/soap", "text/xml", soap});
  _host.fault = Tessa::MakeRef<Orbis::Fault::SystemError>("no");
  Ask({"GET", "/api/v1/groups", "", ""});
  Ask({"POST", "/soap", "text/xml", soap});
  _api.answerTo = {};
  _api.answer = Host::FailedWith("no");
  Ask({"GET", "/api/v1/groups", "", ""});
  Ask({"POST", "/soap", "text/xml", soap});
  EXPECT_THAT(Metrics(), AllOf(HasSubstr("queries_total{outcome=\"done\"} 2\n"),
                               HasSubstr("queries_total{outcome=\"partly\"} 2\n"),
                               HasSubstr("queries_total{outcome=\"failed\"} 2\n")));
}

TEST_F(MetricsRoute, CountsQueriesWithoutAnAnswerAsFailed) {
  _api.onQuery = [] { throw std::runtime_error("no"); };
  EXPECT_EQ(Ask({"GET", "/api/v1/groups", "", ""}).status, 500u);
  EXPECT_THAT(Metrics(), AllOf(HasSubstr("queries_total{outcome=\"done\"} 0\n"),
                               HasSubstr("queries_total{outcome=\"failed\"} 1\n")));
}

TEST_F(MetricsRoute, TellsOfTheHostWhatItWasToldWhenItWasLastAsked) {
  _host.Tell({"inUse", "eligible", "eligible"}, {true});
  EXPECT_THAT(Metrics(), Not(HasSubstr("kova_disks"))) << "the first answer waits for no host";
  _host.Tell({}, {});
  EXPECT_THAT(
      Metrics(),
      AllOf(HasSubstr("kova_disks{state=\"inUse\"} 1\n"), HasSubstr("kova_disks{state=\"eligible\"} 2\n"),
            HasSubstr("kova_disk_groups{state=\"mounted\"} 1\n"), HasSubstr("kova_host_age_seconds 0.")));
}

TEST_F(MetricsRoute, AreAnsweredBeforeTheHostIsAsked) {
  bool isAnswered = false;
  bool wasAnsweredFirst = false;
  _api.onQuery = [&] { wasAnsweredFirst = isAnswered; };
  _router.Serve(Testing::By(HttpRole::Read, {"GET", "/metrics", "", ""}),
                HttpResponder([&](const HttpAnswer&) { isAnswered = true; }));
  EXPECT_TRUE(wasAnsweredFirst);
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
