#include "agentd/client/AgentClient.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>

#include "agentd/http/HttpClient.h"
#include "agentd/routes/Routes.h"
#include "agentd/tasks/TaskQueue.h"
#include "agentd/testing/FakeApi.h"
#include "agentd/testing/FakeService.h"
#include "agentd/testing/RunningServer.h"
#include "host/HostError.h"
#include "host/testing/Requests.h"
#include "nox/Faults.h"
#include "nox/Kova.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/Types.h"

namespace Agentd {
namespace {

namespace Op = Nox::Operation;
using Host::Testing::Names;
using Nox::Kova::Host::DiskResult;
using testing::AllOf;
using testing::ElementsAre;
using Testing::FakeHooks;
using testing::HasSubstr;
using Testing::RunningServer;

HttpDeferringHandler Serving(const Host::ManagementApi& api, TaskQueue& tasks) {
  return
      [router = std::make_shared<const Router>(api, tasks)](
          const HttpRequest& request, const HttpResponder& responder) { router->Serve(request, responder); };
}

std::string WhyNot(const HttpAnswer& answer) {
  RunningServer server([&answer](const HttpRequest&) { return answer; });
  try {
    AgentClient("unix:" + server.Path()).Query(Op::QueryDisksForKova());
    return "there was an answer";
  } catch (const ConnectionError& error) {
    EXPECT_THAT(error.what(), HasSubstr(server.Path()));
    return error.what();
  }
}

TEST(AgentClient, AsksAnAgentAsAProgramAsksTheServiceItself) {
  const Host::KovaService service = Testing::AFakeService();
  FakeHooks::AnswerWithDisk("naa.1");
  FakeHooks::AnswerWithFault(Orbis::Fault::SystemError("half of it failed"));
  TaskQueue tasks;
  RunningServer server(Serving(service, tasks));
  const Host::Answer answer = AgentClient("unix:" + server.Path())
                                  .Query(Op::QueryDisksForKova(Names({"naa.1", "t10.\"quoted\" \\ ß"})));
  EXPECT_THAT(FakeHooks::names, ElementsAre("naa.1", "t10.\"quoted\" \\ ß"));
  const auto& disks = dynamic_cast<const Orbis::DataArray<DiskResult>&>(*answer.result);
  ASSERT_EQ(disks.Size(), 1u);
  EXPECT_EQ(disks[0]->GetDisk()->GetCanonicalName(), "naa.1");
  EXPECT_EQ(dynamic_cast<const Orbis::Fault::SystemError&>(*answer.fault).GetReason(), "half of it failed");
}

TEST(AgentClient, AsksForGroupsAndConfiguration) {
  using Nox::Kova::Host::ConfigInfo;
  const Host::KovaService service = Testing::AFakeService();
  TaskQueue tasks;
  RunningServer server(Serving(service, tasks));
  const AgentClient client("unix:" + server.Path());
  ConfigInfo::StorageInfo storage;
  storage.SetAutoClaim(true);
  Orbis::SerializeObjectToSoap(storage, nullptr, FakeHooks::resultText);
  EXPECT_TRUE(dynamic_cast<const ConfigInfo::StorageInfo&>(*client.Query(Op::GetStorageInfo()).result)
                  .GetAutoClaim());
  FakeHooks::Reset();
  ConfigInfo config;
  config.SetEnabled(true);
  Orbis::SerializeObjectToSoap(config, nullptr, FakeHooks::resultText);
  EXPECT_TRUE(dynamic_cast<const ConfigInfo&>(*client.Query(Op::GetConfigInfo()).result).GetEnabled());
}

TEST(AgentClient, HandsEveryOperationOnAsItWasCalled) {
  using namespace Host::Testing;
  const Testing::FakeApi api;
  TaskQueue tasks;
  RunningServer server(Serving(api, tasks));
  const AgentClient client("unix:" + server.Path());
  const auto mapping = MappingOf("naa.1", {"naa.2", "naa.3"});
  const RemovalOptions arguments{"p", "o \"\\", -2147483647 - 1, 2147483647};
  client.Query(Op::GetDiskGroups());
  client.Change(Op::AddDisks(Disks({ADisk("naa.1"), ADisk("naa.2", true), ADisk("naa.3", false)})));
  client.Change(Op::AddAllEligibleDisks());
  client.Change(Op::InitializeDisks(Mappings({mapping, MappingOf("naa.4", {})})));
  client.Change(Op::UnmountDiskMapping(Mappings({mapping})));
  client.Change(WithOptions(Op::RemoveDisk("naa.1"), arguments));
  client.Change(WithOptions(Op::RemoveDiskMapping(mapping), arguments));
  client.Change(Op::ClaimUnmountedDiskgroup());
  client.ChangeHost(R"({"set": {}})");
  EXPECT_THAT(api.Asked(),
              ElementsAre("GetDiskGroups", "AddDisks naa.1? naa.2! naa.3", "AddAllEligibleDisks",
                          "InitializeDisks naa.1? < naa.2? naa.3? > naa.4? < >",
                          "UnmountDiskMapping naa.1? < naa.2? naa.3? >",
                          "RemoveDisk naa.1 p o \"\\ -2147483648 2147483647",
                          "RemoveDiskMapping naa.1? < naa.2? naa.3? > p o \"\\ -2147483648 2147483647",
                          "ClaimUnmountedDiskgroup", R"(ChangeHost {"set": {}})"));
}

TEST(AgentClient, GivesWhatAChangeCameTo) {
  using Nox::Kova::Host::DiskMapResult;
  Testing::FakeApi api;
  const auto results = Tessa::MakeRef<Orbis::DataArray<DiskMapResult>>();
  results->Append(Tessa::MakeRef<DiskMapResult>());
  api.answer.result = results;
  api.answer.fault = Tessa::MakeRef<Nox::Fault::DiskHasPartitions>("naa.1");
  TaskQueue tasks;
  RunningServer server(Serving(api, tasks));
  const AgentClient client("unix:" + server.Path());
  const Host::Testing::MappingRef mapping = Host::Testing::MappingOf("naa.1", {});
  const auto mappings = Host::Testing::Mappings({mapping});
  for (const Host::Answer& answer :
       {client.Change(Op::AddDisks(Host::Testing::DisksNamed({"naa.1"}))),
        client.Change(Op::AddAllEligibleDisks()), client.Change(Op::InitializeDisks(mappings)),
        client.Change(Op::UnmountDiskMapping(mappings))}) {
    EXPECT_EQ(dynamic_cast<const Orbis::DataArray<DiskMapResult>&>(*answer.result).Size(), 1u);
    EXPECT_EQ(dynamic_cast<const Nox::Fault::DiskHasPartitions&>(*answer.fault).GetDevice(), "naa.1");
  }
}

TEST(AgentClient, GivesNeitherResultNorFaultAsThat) {
  const Testing::FakeApi api;
  TaskQueue tasks;
  RunningServer server(Serving(api, tasks));
  const AgentClient client("unix:" + server.Path());
  for (const Host::Answer& answer :
       {client.Change(Op::AddAllEligibleDisks()), client.Change(Op::RemoveDisk("naa.1")),
        client.Change(Op::RemoveDiskMapping(Host::Testing::MappingOf("naa.1", {}))),
        client.Change(Op::ClaimUnmountedDiskgroup()), client.ChangeHost("{}")}) {
    EXPECT_FALSE(answer.result);
    EXPECT_FALSE(answer.fault);
  }
}

TEST(AgentClient, GivesBusyAsAFault) {
  const Testing::FakeApi api;
  TaskQueue tasks;
  tasks.Close();
  RunningServer server(Serving(api, tasks));
  const Host::Answer answer = AgentClient("unix:" + server.Path()).Change(Op::AddAllEligibleDisks());
  EXPECT_NE(dynamic_cast<const Nox::Fault::Busy*>(answer.fault.Get()), nullptr);
}

TEST(AgentClient, FetchesTasksAndTheHostsDescriptionAsTheyAre) {
  Testing::FakeApi api;
  api.description = "{\"name\": \"a\"}\n";
  TaskQueue tasks;
  RunningServer server(Serving(api, tasks));
  const AgentClient client("unix:" + server.Path());
  EXPECT_EQ(client.DescribeHost(), api.description);
  EXPECT_EQ(client.Tasks(), "{\"tasks\":[]}\n");
  client.Change(Op::AddAllEligibleDisks());
  EXPECT_THAT(client.Tasks(), HasSubstr("AddAllEligibleDisks"));
  EXPECT_THAT(client.Task(tasks.List().at(0).id), HasSubstr("\"result\":null"));
  api.description.clear();
  EXPECT_THROW(client.DescribeHost(), Host::HostError);
}

TEST(AgentClient, ThrowsTheFaultThatComesInThePlaceOfAText) {
  const Testing::FakeApi api;
  TaskQueue tasks;
  RunningServer server(Serving(api, tasks));
  try {
    AgentClient("unix:" + server.Path()).Task("task-1");
    FAIL() << "there is no such task";
  } catch (const RefusedByAgent& refused) {
    EXPECT_NE(dynamic_cast<const Orbis::Fault::InvalidArgument*>(&refused.GetFault()), nullptr);
    EXPECT_THAT(refused.what(), HasSubstr("no task of that id"));
  }
}

TEST(AgentClient, TellsAnAgentThatLacksAnOperationFromAHostThatRefusesIt) {
  const std::string body = R"({"result":null,"fault":{"@type":"InvalidArgument","faultMessage":)"
                           R"([{"key":"k","message":"nothing is served here"}]}})";
  for (const unsigned status : {404u, 405u, 415u}) {
    EXPECT_THAT(WhyNot({status, "application/json", body}),
                AllOf(HasSubstr(std::to_string(status)), HasSubstr("nothing is served here")));
  }
  RunningServer server([&body](const HttpRequest&) { return HttpAnswer{409, "application/json", body}; });
  EXPECT_TRUE(AgentClient("unix:" + server.Path()).Query(Op::QueryDisksForKova()).fault);
}

TEST(AgentClient, GivesAFaultWhateverItsStatus) {
  Testing::FakeApi api;
  TaskQueue tasks;
  RunningServer server(Serving(api, tasks));
  const AgentClient client("unix:" + server.Path());
  const std::vector<Tessa::Ref<Orbis::MethodFault>> faults = {
      Tessa::MakeRef<Nox::Fault::InsufficientDisks>("naa.1"), Tessa::MakeRef<Nox::Fault::DuplicateDisks>(),
      Tessa::MakeRef<Nox::Fault::HostChanged>(), Tessa::MakeRef<Nox::Fault::NotPermitted>(),
      Tessa::MakeRef<Orbis::Fault::SystemError>("no")};
  for (const auto& fault : faults) {
    api.answer = {.result = Tessa::MakeRef<Orbis::DataArray<Nox::Kova::Host::DiskMapResult>>(),
                  .fault = fault};
    const Host::Answer answer = client.Change(Op::AddAllEligibleDisks());
    EXPECT_EQ(&answer.fault->GetType(), &fault->GetType());
    EXPECT_TRUE(answer.result);
  }
}

TEST(AgentClient, GivesAFaultOfTheAgentAsAFault) {
  const Host::KovaService service = Testing::AFakeService();
  TaskQueue tasks;
  RunningServer server(Serving(service, tasks));
  const Host::Answer answer = AgentClient("unix:" + server.Path()).Query(Op::QueryDisksForKova(Names({""})));
  EXPECT_FALSE(answer.result);
  EXPECT_EQ(dynamic_cast<const Orbis::Fault::InvalidArgument&>(*answer.fault).GetArgument(), "names[0]");
}

TEST(AgentClient, SaysThatNobodyAnswers) {
  const std::string path = Testing::FreshSocketPath();
  try {
    AgentClient("unix:" + path).Query(Op::QueryDisksForKova());
    FAIL() << "somebody answered";
  } catch (const ConnectionError& error) {
    EXPECT_THAT(error.what(), HasSubstr(path));
  }
}

TEST(AgentClient, ShowsStatusAndTextOfAnAnswerThatIsNoJson) {
  EXPECT_THAT(WhyNot({404, "text/plain", "nothing is served here\n"}),
              AllOf(HasSubstr("404"), HasSubstr("nothing is served here")));
}

TEST(AgentClient, CutsALongAnswerThatIsNoJson) {
  EXPECT_LT(WhyNot({502, "text/html", std::string(100'000, 'x')}).size(), 2'000u);
}

TEST(AgentClient, RefusesAJsonAnswerThatIsBroken) {
  for (const char* body :
       {"", "{", "[]", R"({"result":null})", R"({"result":[{"@type":"No"}],"fault":null})"}) {
    EXPECT_THAT(WhyNot({200, "application/json", body}), HasSubstr("cannot be read")) << body;
  }
}

TEST(AgentClient, TakesOnlyTheAddressOfASocket) {
  for (const char* url : {"", "unix:", "tcp:localhost:80", "/run/kova/agentd.sock", "UNIX:/a"}) {
    EXPECT_THROW(AgentClient client(url), std::invalid_argument) << url;
  }
}

}  // namespace
}  // namespace Agentd
