#include "agentd/routes/Routes.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "agentd/tasks/TaskQueue.h"
#include "agentd/testing/FakeService.h"
#include "agentd/testing/RunningServer.h"
#include "host/Build.h"
#include "orbis/Types.h"

namespace Agentd {
namespace {

using testing::AllOf;
using testing::ElementsAre;
using Testing::FakeHooks;
using testing::HasSubstr;
using testing::IsEmpty;

class Routes : public testing::Test {
 protected:
  HttpAnswer Send(const HttpRequest& request) const {
    return Testing::AnswerOf(
        [this](const HttpRequest& asked, const HttpResponder& responder) { _router.Serve(asked, responder); },
        request);
  }
  HttpAnswer Get(const std::string& target) const { return Send({"GET", target, "", ""}); }
  HttpAnswer Post(const std::string& target, const std::string& body,
                  const std::string& type = "application/json") const {
    return Send({"POST", target, type, body});
  }
  HttpAnswer Query(const std::string& body) const { return Post("/api/v1/QueryDisksForKova", body); }

  const Host::KovaService _service = Testing::AFakeService();
  TaskQueue _tasks;
  const Router _router{_service, _tasks};
};

TEST_F(Routes, HealthIsOkAndTellsTheVersionToThoseWhoMayRead) {
  const HttpAnswer answer = Get("/healthz");
  EXPECT_EQ(answer.status, 200u);
  EXPECT_EQ(answer.contentType, "text/plain; charset=utf-8");
  EXPECT_EQ(answer.body, "ok\nagentd " + Host::VersionLine() + "\n");
  const auto handler = [this](const HttpRequest& asked, const HttpResponder& responder) {
    _router.Serve(asked, responder);
  };
  EXPECT_EQ(Testing::AnswerOf(handler, {"GET", "/healthz", "", ""}, HttpRole::None).body, "ok\n");
  EXPECT_EQ(FakeHooks::calls, 0);
}

TEST_F(Routes, DisksAreAnsweredAsJson) {
  FakeHooks::AnswerWithDisk("naa.1");
  const HttpAnswer answer = Get("/api/v1/disks");
  EXPECT_EQ(answer.status, 200u);
  EXPECT_EQ(answer.contentType, "application/json");
  EXPECT_THAT(answer.body,
              AllOf(testing::StartsWith(R"({"result":[{"@type":"KovaHostDiskResult")"),
                    HasSubstr(R"("canonicalName":"naa.1")"), testing::EndsWith("\"fault\":null}\n")));
  EXPECT_THAT(FakeHooks::names, IsEmpty());
}

constexpr const char* soapQuery =
    "<e:Envelope xmlns:e='http://schemas.xmlsoap.org/soap/envelope/'><e:Body>"
    "<QueryDisksForKova xmlns='urn:nox'/></e:Body></e:Envelope>";

TEST_F(Routes, DisksAreAnsweredTheSameWhoeverWroteTheirText) {
  FakeHooks::AnswerWithDisk("naa.1 & <2>");
  const std::string json = Get("/api/v1/disks").body;
  const std::string soap = Post("/soap", soapQuery, "text/xml").body;
  EXPECT_THAT(json, HasSubstr("naa.1 & <2>"));
  EXPECT_THAT(soap, AllOf(HasSubstr("<result><disk>"), HasSubstr("naa.1 &amp; &lt;2&gt;")));
  FakeHooks::resultText.insert(FakeHooks::resultText.find("<item>"), "<!-- by hand -->\n");
  EXPECT_EQ(Get("/api/v1/disks").body, json);
  EXPECT_EQ(Query("{}").body, json);
  EXPECT_EQ(Post("/soap", soapQuery, "text/xml").body, soap);
}

TEST_F(Routes, DisksInATextThatCannotBeReadAreASystemError) {
  FakeHooks::resultText = "<object";
  for (const HttpAnswer& answer : {Get("/api/v1/disks"), Query("{}"), Post("/soap", soapQuery, "text/xml")}) {
    EXPECT_EQ(answer.status, 500u);
    EXPECT_THAT(answer.body, HasSubstr("SystemError"));
  }
}

TEST_F(Routes, DisksAreChosenByNamesInTheTarget) {
  FakeHooks::AnswerWithDisk("naa.1");
  EXPECT_EQ(Get("/api/v1/disks?names=naa.1&names=t10.A%20B+C").status, 200u);
  EXPECT_THAT(FakeHooks::names, ElementsAre("naa.1", "t10.A B+C"));
}

TEST_F(Routes, DisksAreChosenByNamesInTheBody) {
  FakeHooks::AnswerWithDisk("naa.1");
  EXPECT_EQ(Query(R"({"names": ["naa.1", "naa.2"]})").status, 200u);
  EXPECT_THAT(FakeHooks::names, ElementsAre("naa.1", "naa.2"));
  EXPECT_EQ(Query("{}").status, 200u);
  EXPECT_THAT(FakeHooks::names, IsEmpty());
}

TEST_F(Routes, GroupsAndConfigurationAreAnsweredByBothTheirRoutes) {
  Orbis::SerializeObjectToSoap(*Tessa::MakeRef<Nox::Kova::Host::ConfigInfo>(), nullptr,
                               FakeHooks::resultText);
  const HttpAnswer answers[] = {Get("/api/v1/groups"), Post("/api/v1/GetDiskGroups", "{}"),
                                Post("/api/v1/GetStorageInfo", "{}"), Get("/api/v1/config"),
                                Post("/api/v1/GetConfigInfo", "{}")};
  for (const HttpAnswer& answer : answers) {
    EXPECT_EQ(answer.status, 200u);
    EXPECT_EQ(answer.body, "{\"result\":{\"@type\":\"KovaHostConfigInfo\"},\"fault\":null}\n");
  }
  EXPECT_EQ(FakeHooks::calls, 5);
}

TEST_F(Routes, AReportThatHoldsNothingIsAFault) {
  const HttpAnswer answer = Get("/api/v1/groups");
  EXPECT_EQ(answer.status, 500u);
  EXPECT_THAT(answer.body, HasSubstr("disk groups of the host could not be read"));
  EXPECT_THAT(Get("/api/v1/config").body, HasSubstr("configuration of the host could not be read"));
}

TEST_F(Routes, AReportTakesNoParameters) {
  for (const HttpAnswer& answer :
       {Get("/api/v1/groups?names=a"), Get("/api/v1/config?names=a"),
        Post("/api/v1/GetStorageInfo", "{\"names\":[]}"), Post("/api/v1/GetConfigInfo", "{\"names\":[]}")}) {
    EXPECT_EQ(answer.status, 400u);
    EXPECT_THAT(answer.body, HasSubstr("names"));
  }
  EXPECT_EQ(Post("/api/v1/GetStorageInfo", "[]").status, 400u);
  EXPECT_EQ(FakeHooks::calls, 0);
}

TEST_F(Routes, AnUnknownParameterIsRefusedByName) {
  const HttpAnswer inTarget = Get("/api/v1/disks?name=naa.1");
  EXPECT_EQ(inTarget.status, 400u);
  EXPECT_THAT(inTarget.body, HasSubstr("'name'"));
  const HttpAnswer inBody = Query(R"({"name": []})");
  EXPECT_EQ(inBody.status, 400u);
  EXPECT_THAT(inBody.body, HasSubstr("name"));
  EXPECT_THAT(Get("/api/v1/disks?a%1b%0ab=1").body, HasSubstr(R"('a\\x1b\\x0ab')"));
  EXPECT_THAT(Query(R"({"a\u001bb": []})").body, HasSubstr(R"(a\\x1bb, line 1: unknown parameter)"));
  EXPECT_EQ(FakeHooks::calls, 0);
}

TEST_F(Routes, ARefusedRequestIs400WithTheFault) {
  const HttpAnswer answer = Query(R"({"names": [""]})");
  EXPECT_EQ(answer.status, 400u);
  EXPECT_EQ(answer.contentType, "application/json");
  EXPECT_THAT(answer.body, AllOf(HasSubstr(R"("result":null)"), HasSubstr(R"("@type":"InvalidArgument")"),
                                 HasSubstr(R"("argument":"names[0]")")));
  EXPECT_EQ(FakeHooks::calls, 0);
}

TEST_F(Routes, AFaultOfTheHostIs500WithTheFault) {
  const HttpAnswer answer = Get("/api/v1/disks");
  EXPECT_EQ(answer.status, 500u);
  EXPECT_EQ(answer.contentType, "application/json");
  EXPECT_THAT(answer.body, HasSubstr(R"("@type":"SystemError")"));
}

TEST_F(Routes, AResultBesideAFaultIs200) {
  FakeHooks::AnswerWithDisk("naa.1");
  FakeHooks::AnswerWithFault(Orbis::Fault::SystemError("half of it failed"));
  const HttpAnswer answer = Get("/api/v1/disks");
  EXPECT_EQ(answer.status, 200u);
  EXPECT_THAT(answer.body, AllOf(HasSubstr("naa.1"), HasSubstr("half of it failed")));
}

TEST_F(Routes, AnUnknownPathIs404AndAnotherMethod405) {
  EXPECT_EQ(Get("/").status, 404u);
  EXPECT_EQ(Get("/api/v1/disks/").status, 404u);
  EXPECT_EQ(Get("/api/v1/querydisksforkova").status, 404u);
  EXPECT_EQ(Get("/api/v1/QueryDisksForKova").status, 405u);
  EXPECT_EQ(Post("/healthz", "{}").status, 405u);
  EXPECT_EQ(Send({"DELETE", "/api/v1/disks", "", ""}).status, 405u);
  EXPECT_EQ(Get("/api/v1/AddDisks").status, 405u);
  EXPECT_EQ(Post("/api/v1/tasks", "{}").status, 405u);
  EXPECT_EQ(Post("/api/v1/", "{}").status, 404u);
  EXPECT_EQ(Post("/api/v1/NoSuchOperation", "{}").status, 404u);
  EXPECT_EQ(Get("/api/v1/tasks/").status, 404u);
  EXPECT_EQ(FakeHooks::calls, 0);
}

TEST_F(Routes, ARefusedMethodTellsWhichAreServed) {
  EXPECT_EQ(Post("/healthz", "{}").allow, "GET, HEAD");
  EXPECT_EQ(Get("/api/v1/AddDisks").allow, "POST");
  EXPECT_EQ(Send({"DELETE", "/api/v1/host", "", ""}).allow, "GET, HEAD, POST");
  EXPECT_EQ(Send({"PUT", "/soap", "", ""}).allow, "GET, HEAD, POST");
  EXPECT_EQ(Get("/nowhere").allow, "");
}

TEST_F(Routes, HeadIsAnsweredAsGetIs) {
  FakeHooks::AnswerWithDisk("naa.1");
  for (const char* target :
       {"/healthz", "/api/v1/disks", "/api/v1/tasks", "/soap?wsdl", "/api/v1/openapi.json"}) {
    const HttpAnswer head = Send({"HEAD", target, "", ""});
    EXPECT_EQ(head.status, 200u) << target;
    EXPECT_EQ(head.body, Get(target).body) << "the server drops it";
  }
  EXPECT_EQ(Send({"HEAD", "/api/v1/AddDisks", "", ""}).status, 405u);
}

TEST_F(Routes, AnEscapedPathIsTheSamePath) {
  EXPECT_EQ(Get("/%68ealthz").status, 200u);
}

TEST_F(Routes, ABrokenEscapeIs400) {
  EXPECT_EQ(Get("/api/v1/disks?names=%4").status, 400u);
  EXPECT_EQ(Get("/%").status, 400u);
}

TEST_F(Routes, ABodyMustBeJsonByItsType) {
  FakeHooks::AnswerWithDisk("naa.1");
  const std::string path = "/api/v1/QueryDisksForKova";
  EXPECT_EQ(Post(path, "{}", "application/x-www-form-urlencoded").status, 415u);
  EXPECT_EQ(Post(path, "{}", "").status, 415u);
  EXPECT_EQ(Post(path, "{}", "text/plain").status, 415u);
  EXPECT_EQ(Post(path, "{}", "application/jsonp").status, 415u);
  EXPECT_EQ(FakeHooks::calls, 0);
  EXPECT_EQ(Post(path, "{}", "application/json; charset=utf-8").status, 200u);
  EXPECT_EQ(Post(path, "{}", "Application/JSON ;x").status, 200u);
}

struct Broken {
  std::string body;
  std::string told;
};

class BrokenBody : public Routes, public testing::WithParamInterface<Broken> {};

TEST_P(BrokenBody, Is400AndSaysWhere) {
  const HttpAnswer answer = Query(GetParam().body);
  EXPECT_EQ(answer.status, 400u);
  EXPECT_THAT(answer.body, HasSubstr(GetParam().told));
  EXPECT_EQ(FakeHooks::calls, 0);
}

INSTANTIATE_TEST_SUITE_P(
    Bodies, BrokenBody,
    testing::Values(Broken{"", ""}, Broken{"{", ""}, Broken{"[]", "an object"}, Broken{"null", "an object"},
                    Broken{R"({"names": null})", "names"}, Broken{R"({"names": "naa.1"})", "names"},
                    Broken{R"({"names": ["a", 1]})", "names[1]"},
                    Broken{R"({"names": [], "names": []})", "names"}, Broken{R"({"names": []} {})", ""},
                    Broken{"{\"names\": [\"\xff\"]}", ""}, Broken{R"({"names": ["\ud800"]})", ""}));

TEST_F(Routes, AJsonTextBeyondItsLimitsIs400) {
  const std::string deep = "{\"names\": " + std::string(100, '[') + std::string(100, ']') + "}";
  EXPECT_EQ(Query(deep).status, 400u);
  std::string many = "{\"names\": [\"a\"";
  for (int i = 0; i < 600'000; ++i) {
    many += ",\"a\"";
  }
  EXPECT_EQ(Query(many + "]}").status, 400u);
  EXPECT_EQ(Query("{\"names\": [\"" + std::string(std::size_t{2} << 20, 'a') + "\"]}").status, 400u);
  EXPECT_EQ(FakeHooks::calls, 0);
}

}  // namespace
}  // namespace Agentd
