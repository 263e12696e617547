// What becomes of requests while the host is slow to answer.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <future>

#include "agentd/routes/Routes.h"
#include "agentd/tasks/TaskQueue.h"
#include "agentd/testing/FakeApi.h"
#include "agentd/testing/RunningServer.h"

namespace Agentd {
namespace {

using testing::HasSubstr;

// A query that is asked and not waited for.
class Asked {
 public:
  Asked(const Router& router, const HttpRequest& request) : _answer(_promise->get_future()) {
    router.Serve(Testing::By(HttpRole::Read, request), HttpResponder([promise = _promise](HttpAnswer answer) {
                   promise->set_value(std::move(answer));
                 }));
  }
  bool IsAnswered() const { return _answer.wait_for(std::chrono::seconds(0)) == std::future_status::ready; }
  HttpAnswer Answer() { return _answer.get(); }

 private:
  const std::shared_ptr<std::promise<HttpAnswer>> _promise = std::make_shared<std::promise<HttpAnswer>>();
  std::future<HttpAnswer> _answer;
};

HttpRequest Get(const std::string& target) {
  return {"GET", target, "", ""};
}

HttpRequest Soap(const std::string& operation) {
  return {"POST", "/soap", "text/xml",
          "<e:Envelope xmlns:e='http://schemas.xmlsoap.org/soap/envelope/'><e:Body><" + operation +
              " xmlns='urn:nox'/></e:Body></e:Envelope>"};
}

// One query at a time; the first stays at work until the gate is opened.
class SlowHost : public testing::Test {
 protected:
  SlowHost() {
    _api.onQuery = [this] {
      if (!_hasBegun.exchange(true)) {
        _gate.Enter();
      } else if (_isBroken) {
        throw std::runtime_error("the kernel broke");
      }
    };
    _first = std::async(std::launch::async,
                        [this] { return Testing::AnswerOf(Handler(), Get("/api/v1/groups")); });
    _gate.WaitUntilEntered();
  }
  ~SlowHost() override { LetGo(); }

  void LetGo() {
    if (_first.valid()) {
      _gate.Open();
      EXPECT_EQ(_first.get().status, 200u);
    }
  }

  HttpDeferringHandler Handler() const {
    return [this](const HttpRequest& request, const HttpResponder& responder) {
      _router.Serve(request, responder);
    };
  }

  Testing::FakeApi _api;
  Testing::Gate _gate;
  TaskQueue _tasks;
  const Router _router{_api, _tasks, {.atOnce = 1, .waiting = 4}};
  std::atomic<bool> _hasBegun{false};
  std::atomic<bool> _isBroken{false};
  std::future<HttpAnswer> _first;
};

TEST_F(SlowHost, HoldsUpNothingThatDoesNotAskIt) {
  EXPECT_EQ(Asked(_router, Get("/healthz")).Answer().status, 200u);
  EXPECT_EQ(Asked(_router, Get("/api/v1/tasks")).Answer().status, 200u);
  EXPECT_EQ(Asked(_router, Get("/soap?wsdl")).Answer().status, 200u);
  const HttpRequest change{"POST", "/api/v1/AddAllEligibleDisks", "application/json", "{}"};
  EXPECT_EQ(Testing::AnswerOf(Handler(), change).status, 200u) << "changes have a thread of their own";
}

TEST_F(SlowHost, LetsOtherQueriesWaitHoweverTheyCome) {
  Asked disks(_router, Get("/api/v1/disks"));
  Asked config(_router, {"POST", "/api/v1/GetConfigInfo", "application/json", "{}"});
  Asked soapDisks(_router, Soap("QueryDisksForKova"));
  Asked soapInfo(_router, Soap("GetStorageInfo"));
  EXPECT_FALSE(disks.IsAnswered() || config.IsAnswered() || soapDisks.IsAnswered() || soapInfo.IsAnswered());
  LetGo();
  EXPECT_EQ(disks.Answer().status, 200u);
  EXPECT_EQ(config.Answer().status, 200u);
  EXPECT_THAT(soapDisks.Answer().body, HasSubstr("Envelope"));
  EXPECT_THAT(soapInfo.Answer().body, HasSubstr("Envelope"));
  EXPECT_THAT(_api.Asked(), testing::ElementsAre("GetDiskGroups", "QueryDisksForKova", "GetConfigInfo",
                                                 "QueryDisksForKova", "GetStorageInfo"));
}

TEST_F(SlowHost, RefusesMoreThanMayWait) {
  std::vector<std::unique_ptr<Asked>> waiting;
  for (int i = 0; i < 4; ++i) {
    waiting.push_back(std::make_unique<Asked>(_router, Get("/api/v1/disks")));
  }
  const HttpAnswer refused = Asked(_router, Get("/api/v1/config")).Answer();
  EXPECT_EQ(refused.status, 503u);
  EXPECT_GT(refused.retryAfterSeconds, 0);
  EXPECT_THAT(refused.body, HasSubstr("4 queries waiting"));
  const HttpAnswer soap = Asked(_router, Soap("GetConfigInfo")).Answer();
  EXPECT_EQ(soap.status, 500u) << "as every SOAP fault";
  EXPECT_THAT(soap.body, HasSubstr("4 queries waiting"));
}

TEST_F(SlowHost, AQueryThatFailsAfterItsWaitIsStillAnswered) {
  Asked json(_router, Get("/api/v1/config"));
  Asked soap(_router, Soap("GetConfigInfo"));
  _isBroken = true;
  LetGo();
  EXPECT_EQ(json.Answer().status, 500u);
  const HttpAnswer fault = soap.Answer();
  EXPECT_EQ(fault.status, 500u);
  EXPECT_THAT(fault.body, AllOf(HasSubstr("SystemError"), HasSubstr("the kernel broke")));
}

TEST_F(SlowHost, IsSeenInTheMetrics) {
  Asked disks(_router, Get("/api/v1/disks"));
  EXPECT_THAT(
      Asked(_router, Get("/metrics")).Answer().body,
      AllOf(HasSubstr("\nkova_agent_queries_running 1\n"), HasSubstr("\nkova_agent_queries_waiting 1\n")));
}

}  // namespace
}  // namespace Agentd
