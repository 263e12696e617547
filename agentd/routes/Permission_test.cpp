// Which role each route takes, and what a client without it is told.

#include "agentd/routes/Permission.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "agentd/routes/Routes.h"
#include "agentd/tasks/TaskQueue.h"
#include "agentd/testing/FakeApi.h"
#include "agentd/testing/RunningServer.h"

namespace Agentd {
namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

std::string Envelope(const std::string& body) {
  return "<e:Envelope xmlns:e='http://schemas.xmlsoap.org/soap/envelope/'><e:Body>" + body +
         "</e:Body></e:Envelope>";
}

class Permission : public testing::Test {
 protected:
  ~Permission() override { _tasks.Finish(); }

  HttpAnswer Serve(HttpRole role, const HttpRequest& request) const {
    return Testing::AnswerOf(
        [this](const HttpRequest& asked, const HttpResponder& responder) { _router.Serve(asked, responder); },
        request, role);
  }
  HttpAnswer Get(HttpRole role, const std::string& target) const {
    return Serve(role, {"GET", target, "", ""});
  }
  HttpAnswer Post(HttpRole role, const std::string& target, const std::string& body = "{}") const {
    return Serve(role, {"POST", target, "application/json", body});
  }
  HttpAnswer Soap(HttpRole role, const std::string& body) const {
    return Serve(role, {"POST", "/soap", "text/xml", Envelope(body)});
  }

  Testing::FakeApi _api;
  TaskQueue _tasks;
  const Router _router{_api, _tasks};
};

TEST_F(Permission, HealthTakesNoRole) {
  EXPECT_EQ(Get(HttpRole::None, "/healthz").status, 200u);
}

TEST_F(Permission, EveryReportTakesTheRoleRead) {
  _api.description = "{}";
  for (const char* target :
       {"/api/v1/disks", "/api/v1/groups", "/api/v1/config", "/api/v1/tasks", "/api/v1/tasks/x",
        "/api/v1/openapi.json", "/api/v1/host", "/soap?wsdl", "/soap?xsd=nox.xsd"}) {
    EXPECT_EQ(Get(HttpRole::None, target).status, 403u) << target;
    EXPECT_NE(Get(HttpRole::Read, target).status, 403u) << target;
  }
}

TEST_F(Permission, EveryOperationTakesTheRoleThatItsKindTakes) {
  for (const Nox::OperationDescriptor& operation : Nox::Operations()) {
    const std::string target = "/api/v1/" + std::string(operation.name);
    EXPECT_EQ(Post(HttpRole::None, target).status, 403u) << target;
    EXPECT_EQ(Post(HttpRole::Read, target).status == 403u, operation.changes) << target;
    EXPECT_NE(Post(HttpRole::Change, target).status, 403u) << target;
  }
}

TEST_F(Permission, TheHostsDescriptionIsReadAndChangedByRole) {
  EXPECT_EQ(Post(HttpRole::Read, "/api/v1/host").status, 403u);
  EXPECT_EQ(Post(HttpRole::Change, "/api/v1/host").status, 200u);
}

TEST_F(Permission, ARefusalNamesTheRoleAndCallsNothing) {
  const HttpAnswer answer = Post(HttpRole::Read, "/api/v1/RemoveDisk", R"({"disk": "naa.1"})");
  EXPECT_EQ(answer.status, 403u);
  EXPECT_EQ(answer.contentType, "application/json");
  EXPECT_THAT(answer.body, AllOf(HasSubstr(R"("@type":"NotPermitted")"), HasSubstr(R"("role":"change")"),
                                 HasSubstr("a test has the role 'read'")));
  EXPECT_THAT(Get(HttpRole::None, "/api/v1/disks").body, HasSubstr(R"("role":"read")"));
  EXPECT_THAT(Post(HttpRole::None, "/api/v1/RemoveDisk").body, HasSubstr(R"("role":"change")"));
  EXPECT_THAT(_api.Asked(), IsEmpty());
  EXPECT_THAT(_tasks.List(), IsEmpty());
}

TEST_F(Permission, ASoapClientIsToldByATypedFault) {
  const HttpAnswer change = Soap(HttpRole::Read, "<AddAllEligibleDisks xmlns='urn:nox'/>");
  EXPECT_EQ(change.status, 500u) << "as SOAP wants it";
  EXPECT_THAT(change.body, AllOf(HasSubstr("<faultcode>soapenv:Client</faultcode>"),
                                 HasSubstr("xsi:type=\"NotPermitted\""), HasSubstr("<role>change</role>")));
  const HttpAnswer query = Soap(HttpRole::None, "<GetStorageInfo xmlns='urn:nox'/>");
  EXPECT_THAT(query.body, HasSubstr("<role>read</role>"));
  EXPECT_THAT(_api.Asked(), IsEmpty());
  EXPECT_THAT(Soap(HttpRole::Read, "<GetStorageInfo xmlns='urn:nox'/>").body, Not(HasSubstr("NotPermitted")));
}

TEST_F(Permission, APageInABrowserChangesNothingWhateverTheRole) {
  HttpRequest request{"POST", "/api/v1/AddAllEligibleDisks", "application/json", "{}"};
  request.hasOrigin = true;
  const HttpAnswer refused = Serve(HttpRole::Change, request);
  EXPECT_EQ(refused.status, 403u);
  EXPECT_THAT(refused.body, HasSubstr("Origin"));
  request = {"POST", "/soap", "text/xml", Envelope("<AddAllEligibleDisks xmlns='urn:nox'/>")};
  request.hasOrigin = true;
  EXPECT_THAT(Serve(HttpRole::Change, request).body, HasSubstr("NotPermitted"));
  EXPECT_THAT(_api.Asked(), IsEmpty());
  request = {"GET", "/api/v1/disks", "", ""};
  request.hasOrigin = true;
  EXPECT_NE(Serve(HttpRole::Read, request).status, 403u) << "it may look";
}

// What stands in a header may come from somebody who wants it to be read as something else.
TEST_F(Permission, NothingOfAHeaderIsEchoedUnescaped) {
  const std::string nasty = "<i>\"'\x1b\r\n";
  std::vector<HttpRequest> requests;
  requests.push_back({"GET", "/api/v1/disks?%3Ci%3E%22%27%1b%0d%0a=1", "", ""});
  requests.push_back({"GET", "/api/v1/groups?" + nasty, "", ""});
  requests.push_back({"GET", "/" + nasty, "", ""});
  requests.push_back({"GET", "/api/v1/tasks/" + nasty, "", ""});
  requests.push_back({"GET", "/soap?" + nasty, "", ""});
  requests.push_back({nasty, "/healthz", "", ""});
  requests.push_back({"POST", "/api/v1/AddDisks", nasty, "{}"});
  requests.push_back({"POST", "/soap", nasty, "{}"});
  requests.push_back({"POST", "/soap", "text/xml", Envelope("<GetStorageInfo xmlns='urn:nox'/>"), nasty});
  for (const HttpRequest& request : requests) {
    const HttpAnswer answer = Serve(HttpRole::Change, request);
    EXPECT_GE(answer.status, 400u) << request.target;
    EXPECT_THAT(answer.body, AllOf(Not(HasSubstr("<i>")), Not(HasSubstr("\x1b")), Not(HasSubstr("\r")),
                                   Not(HasSubstr("\"'"))))
        << request.target;
  }
}

}  // namespace
}  // namespace Agentd
