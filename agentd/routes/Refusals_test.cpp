// In which form a client is told that its request comes to nothing.

#include "agentd/routes/Refusals.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "agentd/routes/Routes.h"
#include "agentd/tasks/TaskQueue.h"
#include "agentd/testing/FakeApi.h"
#include "agentd/testing/RunningServer.h"
#include "host/Answer.h"
#include "host/Gate.h"
#include "machines/SimulatedMachine.h"
#include "nox/Faults.h"
#include "orbis/ParseException.h"
#include "orbis/Types.h"

namespace Agentd {
namespace {

using testing::HasSubstr;
using testing::IsEmpty;

// The fault of an answer that is nothing else, as a client reads it: "argument | message".
std::string OutcomeText(const HttpAnswer& http) {
  EXPECT_EQ(http.contentType, "application/json");
  const Host::Answer answer = Host::ReadJsonAnswer(http.body, nullptr);
  EXPECT_FALSE(answer.result);
  const auto& fault = dynamic_cast<const Orbis::Fault::InvalidArgument&>(*answer.fault);
  return (fault.HasArgument() ? fault.GetArgument() : "") + " | " +
         (*fault.GetFaultMessage())[0]->GetMessage();
}

TEST(Refusals, AreJsonForProgramsAndALineForEverybodyElse) {
  for (const char* path : {"/api/v1", "/api/v1/", "/api/v1/disks", "/api/v1?x", "/api/v1/%"}) {
    const HttpAnswer http = RefusalAt(path, 418, "no tea");
    EXPECT_EQ(http.status, 418u);
    EXPECT_EQ(OutcomeText(http), " | no tea") << path;
  }
  for (const char* path : {"", "/", "/api", "/api/v12", "/api/v", "/healthz", "/soap"}) {
    const HttpAnswer http = RefusalAt(path, 418, "no tea");
    EXPECT_EQ(http.status, 418u);
    EXPECT_EQ(http.body, "no tea\n") << path;
  }
}

TEST(Refusals, OfABodyNameThePlace) {
  const HttpAnswer http = RefusalAt("/api/v1/AddDisks", Orbis::ParseException("disks[0]", 3, "is no disk"));
  EXPECT_EQ(http.status, 400u);
  EXPECT_EQ(OutcomeText(http), "disks[0] | disks[0], line 3: is no disk");
}

TEST(Refusals, OfTheServerItselfKeepTheirStatusAndHeaders) {
  const HttpAnswer line{
      .status = 405, .contentType = "text/plain", .body = "no tea\n", .retryAfterSeconds = 7, .allow = "GET"};
  const HttpAnswer json = EncodeRefusal("/api/v1/AddDisks", line);
  EXPECT_EQ(json.status, 405u);
  EXPECT_EQ(OutcomeText(json), " | no tea");
  EXPECT_EQ(json.retryAfterSeconds, 7);
  EXPECT_EQ(json.allow, "GET");
  EXPECT_EQ(EncodeRefusal("/soap", line).body, "no tea\n");
}

TEST(Refusals, OfAServerThatHasTooMuchToDoAreBusy) {
  const HttpAnswer json = EncodeRefusal(
      "/api/v1/disks",
      {.status = 503, .contentType = "text/plain", .body = "too much\n", .retryAfterSeconds = 7});
  EXPECT_EQ(json.status, 503u);
  const Host::Answer answer = Host::ReadJsonAnswer(json.body, nullptr);
  const auto& busy = dynamic_cast<const Nox::Fault::Busy&>(*answer.fault);
  EXPECT_EQ(busy.GetRetryAfterSeconds(), 7);
  EXPECT_EQ((*busy.GetFaultMessage())[0]->GetMessage(), "too much");
}

class RefusedRoutes : public testing::Test {
 protected:
  HttpAnswer Send(const HttpRequest& request) const {
    return Testing::AnswerOf(
        [this](const HttpRequest& asked, const HttpResponder& responder) { _router.Serve(asked, responder); },
        request);
  }
  HttpAnswer Get(const std::string& target) const { return Send({"GET", target, "", ""}); }
  HttpAnswer Post(const std::string& target, const std::string& body) const {
    return Send({"POST", target, "application/json", body});
  }

  Testing::FakeApi _api;
  TaskQueue _tasks;
  const Router _router{_api, _tasks};
};

TEST_F(RefusedRoutes, BelowTheApiTellInJson) {
  EXPECT_EQ(OutcomeText(Get("/api/v1/nothing")), " | nothing is served here");
  EXPECT_EQ(OutcomeText(Get("/api/v1/AddDisks")), " | that method is not served here");
  EXPECT_EQ(OutcomeText(Get("/api/v1/disks?names=%4")), " | the target holds a broken escape");
  EXPECT_EQ(OutcomeText(Get("/api/v1/disks?name=a")), "name | unknown parameter 'name'; wanted 'names'");
  EXPECT_EQ(OutcomeText(Get("/api/v1/tasks/7")),
            " | no task of that id; those that ended long ago are forgotten");
  EXPECT_EQ(OutcomeText(Get("/api/v1/host")), " | this is no simulated host");
  EXPECT_EQ(OutcomeText(Send({"POST", "/api/v1/AddDisks", "text/xml", "{}"})),
            " | the body must be application/json");
  EXPECT_EQ(OutcomeText(Post("/api/v1/AddDisks", "{}")), "disks | disks, line 1: is missing");
}

TEST_F(RefusedRoutes, ElsewhereTellInALineOfText) {
  for (const HttpAnswer& http : {Get("/nothing"), Post("/healthz", "{}"), Get("/metrics?x=1"), Get("/%"),
                                 Send({"POST", "/soap", "application/json", "{}"})}) {
    EXPECT_EQ(http.contentType, "text/plain; charset=utf-8");
    EXPECT_THAT(http.body, testing::EndsWith("\n"));
  }
}

TEST_F(RefusedRoutes, NeverHoldHalfACharacter) {
  for (const char* body : {"\xC3\xA4", "{\"names\": \xC3\xA4}", "{\"names\": [\"\xC3\xA4\xC3\"]}",
                           "{\"names\": \"\xF0\x9F\x98\x80", "{\"n\": 1, \xE2\x82\xAC}"}) {
    const HttpAnswer http = Post("/api/v1/QueryDisksForKova", body);
    EXPECT_EQ(http.status, 400u);
    EXPECT_NO_THROW(OutcomeText(http)) << http.body;  // the reader takes nothing but UTF-8
  }
}

TEST_F(RefusedRoutes, RepeatNoLongText) {
  const std::string endless = "{\"names\": [\"" + std::string(std::size_t{1} << 20, 'a');
  EXPECT_LT(Post("/api/v1/QueryDisksForKova", endless).body.size(), 1000u);
}

TEST_F(RefusedRoutes, NameAnEmptyKeySoThatItCanBeSeen) {
  EXPECT_THAT(OutcomeText(Post("/api/v1/QueryDisksForKova", R"({"": 1})")),
              HasSubstr("'' | '', line 1: unknown parameter"));
  EXPECT_THAT(OutcomeText(Post("/api/v1/AddDisks", R"({"disks": [{"": 1}]})")),
              HasSubstr("disks[0].'', line 1: unknown field"));
  EXPECT_THAT(OutcomeText(Post("/api/v1/InitializeDisks", R"({"mappings": [{"ssd": "a", "": 1}]})")),
              HasSubstr("mappings[0].'', line 1: unknown field"));
}

TEST_F(RefusedRoutes, LeaveNoTask) {
  const Machines::SimulatedMachine machine(Machines::MachineOptions{});
  _api.checkChange = [&machine](std::string_view change) { Host::Gate::CheckHostChange(machine, change); };
  for (const char* body : {"", "{", "[]", "1", R"({"disks": 1})", R"({"set": 1})", R"({"disk": {}})",
                           R"({"disk": {"name": 1}})", R"({"set": {}, "set": {}})", R"({"": {}})"}) {
    for (const char* target : {"/api/v1/host", "/api/v1/AddDisks", "/api/v1/RemoveDiskMapping"}) {
      const HttpAnswer http = Post(target, body);
      EXPECT_EQ(http.status, 400u) << target << " " << body;
      EXPECT_FALSE(OutcomeText(http).empty());
    }
  }
  EXPECT_THAT(_tasks.List(), IsEmpty());
  EXPECT_THAT(_api.Asked(), IsEmpty());
}

}  // namespace
}  // namespace Agentd
