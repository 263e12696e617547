#include "agentd/client/AgentClient.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>

#include "agentd/http/HttpClient.h"
#include "agentd/routes/Routes.h"
#include "agentd/tasks/TaskQueue.h"
#include "agentd/testing/FakeService.h"
#include "agentd/testing/RunningServer.h"
#include "nox/Kova.h"
#include "orbis/Types.h"

namespace Agentd {
namespace {

using Nox::Kova::Host::DiskResult;
using testing::AllOf;
using testing::ElementsAre;
using Testing::FakeHooks;
using testing::HasSubstr;
using Testing::RunningServer;

HttpDeferringHandler Serving(const Host::ManagementApi& api, TaskQueue& tasks) {
  return [router = Router(api, tasks)](const HttpRequest& request, const HttpResponder& responder) {
    router.Serve(request, responder);
  };
}

std::string WhyNot(const HttpAnswer& answer) {
  RunningServer server([&answer](const HttpRequest&) { return answer; });
  try {
    AgentClient("unix:" + server.Path()).QueryDisksForKova({});
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
  const Host::Answer answer =
      AgentClient("unix:" + server.Path()).QueryDisksForKova({"naa.1", "t10.\"quoted\" \\ ß"});
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
  EXPECT_TRUE(dynamic_cast<const ConfigInfo::StorageInfo&>(*client.GetStorageInfo().result).GetAutoClaim());
  FakeHooks::Reset();
  ConfigInfo config;
  config.SetEnabled(true);
  Orbis::SerializeObjectToSoap(config, nullptr, FakeHooks::resultText);
  EXPECT_TRUE(dynamic_cast<const ConfigInfo&>(*client.GetConfigInfo().result).GetEnabled());
}

TEST(AgentClient, GivesAFaultOfTheAgentAsAFault) {
  const Host::KovaService service = Testing::AFakeService();
  TaskQueue tasks;
  RunningServer server(Serving(service, tasks));
  const Host::Answer answer = AgentClient("unix:" + server.Path()).QueryDisksForKova({""});
  EXPECT_FALSE(answer.result);
  EXPECT_EQ(dynamic_cast<const Orbis::Fault::InvalidArgument&>(*answer.fault).GetInvalidProperty(),
            "names[0]");
}

TEST(AgentClient, SaysThatNobodyAnswers) {
  const std::string path = Testing::FreshSocketPath();
  try {
    AgentClient("unix:" + path).QueryDisksForKova({});
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
  for (const char* url : {"", "unix:", "tcp:127.0.0.1:80", "/run/kova/agentd.sock", "UNIX:/a"}) {
    EXPECT_THROW(AgentClient client(url), std::invalid_argument) << url;
  }
}

}  // namespace
}  // namespace Agentd
