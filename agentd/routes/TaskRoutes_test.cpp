// Requests that change disks: each a task, answered when it is done or at once.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <future>
#include <memory>

#include "agentd/routes/Routes.h"
#include "agentd/tasks/TaskQueue.h"
#include "agentd/testing/FakeApi.h"
#include "agentd/testing/RunningServer.h"
#include "host/Gate.h"
#include "machines/SimulatedMachine.h"
#include "nox/Faults.h"
#include "nox/Kova.h"
#include "orbis/Soap.h"
#include "orbis/json/JsonText.h"

namespace Agentd {
namespace {

using testing::AllOf;
using testing::ElementsAre;
using Testing::FakeApi;
using Testing::Gate;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::StartsWith;

class TaskRoutes : public testing::Test {
 protected:
  ~TaskRoutes() override { _tasks.Finish(); }

  HttpDeferringHandler Handler() const {
    return [this](const HttpRequest& request, const HttpResponder& responder) {
      _router.Serve(request, responder);
    };
  }
  HttpAnswer Get(const std::string& target) const {
    return Testing::AnswerOf(Handler(), {"GET", target, "", ""});
  }
  HttpAnswer Post(const std::string& operation, const std::string& body) const {
    return Testing::AnswerOf(Handler(), {"POST", "/api/v1/" + operation, "application/json", body});
  }
  // Hands the request over without waiting for an answer.
  void Start(const std::string& operation, const std::string& body) const {
    _router.Serve(Testing::By(HttpRole::Change, {"POST", "/api/v1/" + operation, "application/json", body}),
                  HttpResponder([](const HttpAnswer&) {}));
  }
  // The worker stays in the first operation until the gate is opened.
  void HoldTheWorker() {
    _api.onChange = [this] { _gate.Enter(); };
    Start("AddAllEligibleDisks", "{}");
    _gate.WaitUntilEntered();
  }

  static std::string MemberOf(const HttpAnswer& answer, const char* name) {
    const Orbis::Json::Value root = Orbis::Json::Parse(answer.body, Orbis::Limits::OwnOutput());
    const Orbis::Json::Value* const member = root.Find(name);
    return member == nullptr ? "(none)" : member->text;
  }

  FakeApi _api;
  Gate _gate;
  TaskQueue _tasks{{.waiting = 2, .remembered = 10}};
  const Router _router{_api, _tasks};
};

TEST_F(TaskRoutes, AChangeIsAnsweredWhenItIsDoneWithTheIdOfItsTask) {
  const HttpAnswer answer = Post("RemoveDisk", R"({"disk": "naa.1", "passThrough": "p"})");
  EXPECT_EQ(answer.status, 200u);
  EXPECT_EQ(answer.contentType, "application/json");
  const std::string id = _tasks.List().at(0).id;
  EXPECT_EQ(answer.body, "{\"task\":\"" + id + "\",\"result\":null,\"fault\":null}\n");
  EXPECT_THAT(_api.Asked(), ElementsAre("RemoveDisk naa.1 p  0 0"));
}

TEST_F(TaskRoutes, AChangeCarriesResultAndFaultOfTheHost) {
  _api.answer.result = Tessa::MakeRef<Orbis::TextList>(std::vector<std::string>{"a"});
  _api.answer.fault = Tessa::MakeRef<Orbis::Fault::SystemError>("half of it failed");
  const HttpAnswer answer = Post("AddAllEligibleDisks", "{}");
  EXPECT_EQ(answer.status, 200u);
  EXPECT_THAT(answer.body, AllOf(HasSubstr(R"("result":["a"],"fault":{"@type":"SystemError")"),
                                 HasSubstr("half of it failed")));
}

TEST_F(TaskRoutes, AFaultAloneHasItsStatus) {
  _api.answer = Host::FailedWith("no");
  EXPECT_EQ(Post("AddAllEligibleDisks", "{}").status, 500u);
  _api.answer.fault = Tessa::MakeRef<Orbis::Fault::InvalidArgument>("disks[0]");
  EXPECT_EQ(Post("AddDisks", R"({"disks": []})").status, 400u);
  _api.answer.fault = Tessa::MakeRef<Nox::Fault::NotPermitted>();
  EXPECT_EQ(Post("ClaimUnmountedDiskgroup", "{}").status, 403u);
  _api.answer.fault = Tessa::MakeRef<Nox::Fault::DiskHasPartitions>("naa.1");
  EXPECT_EQ(Post("AddDisks", R"({"disks": []})").status, 409u);
}

TEST_F(TaskRoutes, AChangeThatFailedAsAWholeIsNoSuccessThoughItHasAList) {
  _api.answer.result = Tessa::MakeRef<Orbis::DataArray<Nox::Kova::Host::DiskMapResult>>();
  _api.answer.fault = Tessa::MakeRef<Nox::Fault::InsufficientDisks>();
  EXPECT_EQ(Post("AddDisks", R"({"disks": []})").status, 409u);
  EXPECT_EQ(_tasks.List().at(0).state, TaskState::Failed);
}

TEST_F(TaskRoutes, AResultThatCannotBeReadIsTheHostsMistake) {
  _api.answer.result = Host::Result::OfText("<object");
  for (const char* operation : {"AddAllEligibleDisks", "GetConfigInfo"}) {
    const HttpAnswer answer = Post(operation, "{}");
    EXPECT_EQ(answer.status, 500u) << operation;
    EXPECT_THAT(answer.body, HasSubstr(R"("@type":"SystemError")")) << operation;
  }
  EXPECT_EQ(_tasks.List().at(0).state, TaskState::Failed);
}

TEST_F(TaskRoutes, ATaskIsAlsoAskedForAsAnOperation) {
  Post("RemoveDisk", R"({"disk": "naa.1", "label": "mine"})");
  const std::string id = _tasks.List().at(0).id;
  EXPECT_THAT(Post("GetTasks", "{}").body,
              AllOf(HasSubstr("{\"@type\":\"Task\",\"id\":\"" + id + "\""), HasSubstr(R"("label":"mine")")));
  EXPECT_THAT(Post("GetTask", "{\"id\": \"" + id + "\"}").body, HasSubstr(R"("operation":"RemoveDisk")"));
  const HttpAnswer unknown = Post("GetTask", R"({"id": "no"})");
  EXPECT_EQ(unknown.status, 400u);
  EXPECT_THAT(unknown.body, AllOf(HasSubstr(R"("argument":"id")"), HasSubstr("no task of that id")));
}

TEST_F(TaskRoutes, ATaskKeepsTheTextOfItsResultAlone) {
  std::string text;
  Orbis::SerializeObjectToSoap(Orbis::DataArray<Nox::Kova::Host::DiskMapResult>(), nullptr, text);
  _api.answer.result = Host::Result::OfText(text);
  EXPECT_THAT(Post("AddAllEligibleDisks", "{}").body, HasSubstr("\"result\":[]"));
  EXPECT_EQ(*_tasks.List().at(0).answer.result.GetText(), text);
}

TEST(TaskRoutesOfARouterThatIsGone, AreStillCarriedOut) {
  FakeApi api;
  Gate gate;
  api.onChange = [&gate] { gate.Enter(); };
  TaskQueue tasks;
  {
    const Router router(api, tasks);
    const HttpRequest request{.method = "POST",
                              .target = "/api/v1/RemoveDisk",
                              .contentType = "application/json",
                              .body = R"({"disk": "naa.1", "wait": false})",
                              .peer = {.role = HttpRole::Change}};
    for (int i = 0; i < 2; ++i) {
      router.Serve(request, HttpResponder([](const HttpAnswer&) {}));
    }
    gate.WaitUntilEntered();  // the first runs, the second waits
  }
  gate.Open();
  std::promise<void> done;
  tasks.Submit(
      "Last", "", [] { return Host::Answer(); }, [&done](const Task&) { done.set_value(); });
  done.get_future().wait();
  EXPECT_THAT(api.Asked(), ElementsAre("RemoveDisk naa.1   0 0", "RemoveDisk naa.1   0 0"));
}

TEST_F(TaskRoutes, AQueryIsNoTask) {
  EXPECT_EQ(Post("QueryDisksForKova", "{}").status, 200u);
  EXPECT_EQ(Get("/api/v1/groups").status, 200u);
  EXPECT_THAT(_tasks.List(), IsEmpty());
  EXPECT_THAT(_api.Asked(), ElementsAre("QueryDisksForKova", "GetDiskGroups"));
}

TEST_F(TaskRoutes, ARequestThatCannotBeReadIsNoTask) {
  const HttpAnswer answer = Post("AddDisks", R"({"disk": []})");
  EXPECT_EQ(answer.status, 400u);
  EXPECT_THAT(answer.body, HasSubstr("AddDisks takes disks, label, wait"));
  EXPECT_THAT(_tasks.List(), IsEmpty());
}

TEST_F(TaskRoutes, AClientThatDoesNotWaitIsToldTheTask) {
  _api.answer = Host::FailedWith("no luck");
  HoldTheWorker();
  const HttpAnswer answer = Post("RemoveDisk", R"({"disk": "naa.1", "wait": false, "label": "mine"})");
  EXPECT_EQ(answer.status, 202u);
  EXPECT_EQ(MemberOf(answer, "state"), "waiting");
  EXPECT_EQ(MemberOf(answer, "label"), "mine");
  EXPECT_EQ(MemberOf(answer, "operation"), "RemoveDisk");
  const std::string id = MemberOf(answer, "id");
  _gate.Open();
  Post("ClaimUnmountedDiskgroup", "{}");  // behind it
  const HttpAnswer task = Get("/api/v1/tasks/" + id);
  EXPECT_EQ(task.status, 200u);
  EXPECT_EQ(MemberOf(task, "state"), "failed");
  EXPECT_THAT(task.body, AllOf(HasSubstr("\"result\":null"), HasSubstr("no luck")));
}

TEST_F(TaskRoutes, QueriesAreAnsweredWhileAChangeRuns) {
  HoldTheWorker();
  EXPECT_EQ(Get("/api/v1/disks").status, 200u);
  EXPECT_THAT(Get("/api/v1/tasks").body, HasSubstr("\"state\":\"running\""));
  _gate.Open();
}

TEST_F(TaskRoutes, AChangeBeyondTheLimitIsBusyAndSaysWhenToComeBack) {
  HoldTheWorker();
  Start("AddAllEligibleDisks", "{}");
  Start("AddAllEligibleDisks", "{}");
  for (const char* body : {"{}", R"({"wait": false})"}) {
    const HttpAnswer answer = Post("AddAllEligibleDisks", body);
    EXPECT_EQ(answer.status, 503u);
    EXPECT_GT(answer.retryAfterSeconds, 0);
    EXPECT_THAT(answer.body, AllOf(StartsWith(R"({"result":null,"fault":{"@type":"Busy")"),
                                   HasSubstr("2 changes waiting")));
  }
  EXPECT_EQ(Post("QueryDisksForKova", "{}").status, 200u) << "queries are still answered";
  _gate.Open();
}

TEST_F(TaskRoutes, AChangeThatWaitsWhenTheAgentStopsIsBusy) {
  HoldTheWorker();
  std::promise<HttpAnswer> answered;
  _router.Serve(Testing::By(HttpRole::Change,
                            {"POST", "/api/v1/RemoveDisk", "application/json", R"({"disk": "naa.1"})"}),
                HttpResponder([&answered](HttpAnswer answer) { answered.set_value(std::move(answer)); }));
  _tasks.Close();
  const HttpAnswer answer = answered.get_future().get();
  EXPECT_EQ(answer.status, 503u);
  EXPECT_THAT(answer.body, HasSubstr("stopping"));
  EXPECT_EQ(Post("RemoveDisk", R"({"disk": "naa.1"})").status, 503u);
  _gate.Open();
}

TEST_F(TaskRoutes, TasksAreListedWithoutTheirResults) {
  EXPECT_EQ(Get("/api/v1/tasks").body, "{\"tasks\":[]}\n");
  _api.answer.result = Tessa::MakeRef<Orbis::TextList>(std::vector<std::string>{"long"});
  Post("AddAllEligibleDisks", R"({"label": "one"})");
  Post("ClaimUnmountedDiskgroup", R"({"label": "two"})");
  const HttpAnswer list = Get("/api/v1/tasks");
  EXPECT_THAT(list.body, AllOf(HasSubstr("\"one\""), HasSubstr("\"two\""), testing::Not(HasSubstr("long"))));
  EXPECT_THAT(Get("/api/v1/tasks/" + _tasks.List().at(0).id).body, HasSubstr("long"));
  EXPECT_EQ(Get("/api/v1/tasks?label=one").status, 400u);
}

TEST_F(TaskRoutes, ATaskThatNobodyKnowsIs404) {
  EXPECT_EQ(Get("/api/v1/tasks/task-1").status, 404u);
}

TEST_F(TaskRoutes, TheHostIsDescribedAndChanged) {
  _api.description = "{\"name\": \"a\"}\n";
  const HttpAnswer described = Get("/api/v1/host");
  EXPECT_EQ(described.status, 200u);
  EXPECT_EQ(described.body, _api.description);
  EXPECT_EQ(Post("host", R"({"set": {}})").status, 200u);
  EXPECT_THAT(_api.Asked(), ElementsAre(R"(ChangeHost {"set": {}})"));
  EXPECT_EQ(_tasks.List().at(0).operation, "ChangeHost");
}

TEST_F(TaskRoutes, AHostThatIsNotSimulatedHasNoDescription) {
  const HttpAnswer answer = Get("/api/v1/host");
  EXPECT_EQ(answer.status, 404u);
  EXPECT_THAT(answer.body, HasSubstr("no simulated host"));
}

TEST_F(TaskRoutes, TooLargeAGroupOrTooLongANameIsRefusedBeforeItWaits) {
  std::string disks = "\"f\"";
  for (int i = 0; i < 1000; ++i) {
    disks += ",\"f\"";
  }
  const HttpAnswer large =
      Post("UnmountDiskMapping", R"({"wait": false, "mappings": [{"ssd": "f", "nonSsd": [)" + disks + "]}]}");
  EXPECT_EQ(large.status, 400u);
  EXPECT_THAT(large.body, AllOf(HasSubstr("InvalidArgument"), HasSubstr("mappings[0].nonSsd")));
  const HttpAnswer longName = Post("AddDisks", R"({"disks": [")" + std::string(1025, 'n') + "\"]}");
  EXPECT_EQ(longName.status, 400u);
  EXPECT_THAT(longName.body, HasSubstr("disks[0]"));
  EXPECT_THAT(_tasks.List(), IsEmpty());
  EXPECT_THAT(_api.Asked(), IsEmpty());
}

TEST_F(TaskRoutes, AChangeOfTheHostThatIsNoneIsNoTask) {
  const Machines::SimulatedMachine machine(Machines::MachineOptions{});
  _api.checkChange = [&machine](std::string_view change) { Host::Gate::CheckHostChange(machine, change); };
  for (const char* body : {"", "{", "[]", R"({"set": 1})", R"({"disk": {}})", R"({"colour": {}})"}) {
    EXPECT_EQ(Post("host", body).status, 400u) << body;
  }
  EXPECT_THAT(_tasks.List(), IsEmpty());
  EXPECT_THAT(_api.Asked(), IsEmpty());
}

TEST_F(TaskRoutes, ChangesOfTheHostCountByTheirBytesWhileTheyWait) {
  TaskQueue tasks({.waitingBytes = 1000});
  const Router router(_api, tasks);
  const auto change = [&router](std::size_t bytes) {
    const auto status = std::make_shared<std::atomic<unsigned>>(0);
    router.Serve(Testing::By(HttpRole::Change,
                             {"POST", "/api/v1/host", "application/json", "{}" + std::string(bytes, ' ')}),
                 HttpResponder([status](const HttpAnswer& given) { *status = given.status; }));
    return status->load();
  };
  _api.onChange = [this] { _gate.Enter(); };
  change(1);
  _gate.WaitUntilEntered();
  change(600);
  EXPECT_EQ(change(600), 503u);
  _gate.Open();
  tasks.Finish();
}

}  // namespace
}  // namespace Agentd
