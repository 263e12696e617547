// The SOAP address of the agent: messages in, messages and faults out.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "agentd/routes/RequestReader.h"
#include "agentd/routes/Routes.h"
#include "agentd/tasks/TaskQueue.h"
#include "agentd/testing/FakeApi.h"
#include "agentd/testing/RunningServer.h"
#include "host/Build.h"
#include "nox/Faults.h"
#include "nox/Operations.h"

namespace Agentd {
namespace {

using Tessa::MakeRef;
using testing::AllOf;
using testing::ElementsAre;
using Testing::FakeApi;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::StartsWith;

using DiskResults = Orbis::DataArray<Nox::Kova::Host::DiskResult>;
using MapResults = Orbis::DataArray<Nox::Kova::Host::DiskMapResult>;

std::string Message(const std::string& body) {
  return "<e:Envelope xmlns:e='http://schemas.xmlsoap.org/soap/envelope/' "
         "xmlns:i='http://www.w3.org/2001/XMLSchema-instance'><e:Body>" +
         body + "</e:Body></e:Envelope>";
}

// The fields that a disk always has, then these.
std::string Disk(const std::string& element, const std::string& name) {
  return "<" + element + "><deviceName/><deviceType/><uuid/><canonicalName>" + name +
         "</canonicalName><lunType/><capacity><blockSize>512</blockSize><block>1</block></capacity>"
         "<ssd>true</ssd></" +
         element + ">";
}

class SoapEndpoint : public testing::Test {
 protected:
  ~SoapEndpoint() override { _tasks.Finish(); }

  HttpAnswer Serve(const HttpRequest& request) const {
    return Testing::AnswerOf([this](const HttpRequest& served,
                                    const HttpResponder& responder) { _router.Serve(served, responder); },
                             request);
  }
  HttpAnswer Post(const std::string& text, const std::string& action = "") const {
    return Serve({"POST", "/soap", "text/xml; charset=utf-8", text, action});
  }
  // The operation of that name, with these parameters.
  HttpAnswer Ask(const std::string& operation, const std::string& parameters = "") const {
    return Post(Message("<" + operation + " xmlns='urn:nox'>" + parameters + "</" + operation + ">"));
  }

  FakeApi _api;
  TaskQueue _tasks{{.waiting = 2, .remembered = 10}};
  const Router _router{_api, _tasks};
};

TEST_F(SoapEndpoint, CallsEveryOperationWithItsParameters) {
  const std::string mapping = "s>" + Disk("ssd", "naa.1") + Disk("nonSsd", "naa.2") + "</mapping";
  const std::string removal =
      "<passThrough>p</passThrough><optionText>o</optionText><optionFirst>1</optionFirst>"
      "<optionSecond>2</optionSecond>";
  Ask("QueryDisksForKova", "<names>a</names><names>b</names>");
  Ask("GetStorageInfo");
  Ask("GetDiskGroups");
  Ask("GetConfigInfo");
  Ask("AddDisks", Disk("disks", "naa.1") + Disk("disks", "naa.2"));
  Ask("AddAllEligibleDisks");
  Ask("InitializeDisks", "<mapping" + mapping + "s>");
  Ask("UnmountDiskMapping", "<mapping" + mapping + "s>");
  Ask("RemoveDisk", "<disk>naa.1</disk>" + removal);
  Ask("RemoveDiskMapping",
      "<mapping>" + Disk("ssd", "naa.1") + Disk("nonSsd", "naa.2") + "</mapping>" + removal);
  Ask("ClaimUnmountedDiskgroup");
  EXPECT_THAT(
      _api.Asked(),
      ElementsAre("QueryDisksForKova a b", "GetStorageInfo", "GetDiskGroups", "GetConfigInfo",
                  "AddDisks naa.1! naa.2!", "AddAllEligibleDisks", "InitializeDisks naa.1! < naa.2! >",
                  "UnmountDiskMapping naa.1! < naa.2! >", "RemoveDisk naa.1 p o 1 2",
                  "RemoveDiskMapping naa.1! < naa.2! > p o 1 2", "ClaimUnmountedDiskgroup"));
}

TEST_F(SoapEndpoint, TakesADiskThatHasNothingButItsName) {
  const auto named = [](const std::string& element, const std::string& name) {
    return "<" + element + "><canonicalName>" + name + "</canonicalName></" + element + ">";
  };
  const std::string group = named("nonSsd", "naa.2") + named("ssd", "naa.1");
  Ask("AddDisks", named("disks", "naa.1"));
  Ask("RemoveDiskMapping", "<mapping>" + group + "</mapping>");
  EXPECT_THAT(_api.Asked(), ElementsAre("AddDisks naa.1?", "RemoveDiskMapping naa.1? < naa.2? >   0 0"));
}

TEST_F(SoapEndpoint, TakesParametersInAnyOrderAndNilForAbsent) {
  Ask("RemoveDisk",
      "<optionSecond>2</optionSecond><passThrough "
      "i:nil='true'/><optionText>o</optionText><disk>naa.1</disk>");
  Post(Message("<GetConfigInfo xmlns='urn:nox' i:nil='true'/>"));
  EXPECT_THAT(_api.Asked(), ElementsAre("RemoveDisk naa.1  o 0 2", "GetConfigInfo"));
}

TEST_F(SoapEndpoint, EveryChangeTakesALabel) {
  for (const Nox::OperationDescriptor& operation : Nox::Operations()) {
    if (operation.changes) {
      const std::string disk = operation.name == "RemoveDisk" ? "<disk>naa.1</disk>" : "";
      const std::string group = "<mapping>" + Disk("ssd", "naa.1") + "</mapping>";
      const std::string mapping = operation.name == "RemoveDiskMapping" ? group : "";
      Ask(std::string(operation.name),
          disk + mapping + "<label>of " + std::string(operation.name) + "</label>");
      EXPECT_EQ(_tasks.List().back().label, "of " + std::string(operation.name));
    }
  }
}

TEST_F(SoapEndpoint, AChangeThatNobodyWaitsForIsAnsweredByItsTaskAlone) {
  _api.answer.result = MakeRef<MapResults>();
  const HttpAnswer answer = Ask("AddAllEligibleDisks", "<wait>false</wait>");
  EXPECT_EQ(answer.status, 200u);
  EXPECT_THAT(answer.body,
              AllOf(HasSubstr("<AddAllEligibleDisksResponse"),
                    HasSubstr("<task>" + _tasks.List().back().id + "</task>"), Not(HasSubstr("<result"))));
}

TEST_F(SoapEndpoint, TellsTheAgentsTasks) {
  Ask("RemoveDisk", "<disk>naa.1</disk><label>mine</label>");
  const std::string id = _tasks.List().back().id;
  const std::string all = Ask("GetTasks").body;
  EXPECT_THAT(all, AllOf(HasSubstr("<id>" + id + "</id>"), HasSubstr("<label>mine</label>"),
                         HasSubstr("<operation>RemoveDisk</operation>"), HasSubstr("<state>done</state>")));
  EXPECT_THAT(Ask("GetTask", "<id>" + id + "</id>").body, HasSubstr("<id>" + id + "</id>"));
  EXPECT_THAT(Ask("GetTask", "<id>no</id>").body,
              AllOf(HasSubstr("InvalidArgument"), HasSubstr("no task of that id")));
  EXPECT_THAT(_api.Asked(), ElementsAre("RemoveDisk naa.1   0 0")) << "the host is not asked about tasks";
}

TEST_F(SoapEndpoint, AResultOfTheHostThatCannotBeReadIsTheHostsMistake) {
  _api.answer.result = Host::Result::OfText("<object");
  EXPECT_THAT(Ask("GetConfigInfo").body, AllOf(HasSubstr("SystemError"), HasSubstr(":Server<")));
}

TEST_F(SoapEndpoint, TheAnswerToAChangeTellsItsTask) {
  const auto lastTask = [this] { return "<task xmlns=\"urn:nox\">" + _tasks.List().back().id + "</task>"; };
  const std::string done = Ask("AddAllEligibleDisks").body;
  EXPECT_THAT(done, HasSubstr("<task>" + _tasks.List().back().id + "</task></AddAllEligibleDisksResponse>"));
  EXPECT_THAT(Ask("GetConfigInfo").body, Not(HasSubstr("<task")));
  _api.answer.fault = MakeRef<Nox::Fault::InsufficientDisks>();
  const std::string failed = Ask("AddAllEligibleDisks").body;
  EXPECT_THAT(failed, HasSubstr("</fault>" + lastTask() + "</detail>"));
}

TEST_F(SoapEndpoint, AFaultSaysInWordsWhatIsWrongWithWhat) {
  _api.answer.fault = MakeRef<Nox::Fault::DiskHasPartitions>("naa.1");
  EXPECT_THAT(
      Ask("AddAllEligibleDisks").body,
      HasSubstr(
          "<faultstring>DiskHasPartitions: holds partitions or is in use by others: naa.1</faultstring>"));
  _api.answer.fault = MakeRef<Nox::Fault::InsufficientDisks>();
  EXPECT_THAT(Ask("AddAllEligibleDisks").body,
              HasSubstr("<faultstring>InsufficientDisks: too few disks for a disk group</faultstring>"));
}

TEST_F(SoapEndpoint, LeavesOutParametersThatWereLeftOut) {
  Ask("QueryDisksForKova");
  Ask("AddDisks");
  Ask("InitializeDisks");
  Ask("RemoveDisk", "<disk>naa.1</disk>");
  EXPECT_THAT(_api.Asked(),
              ElementsAre("QueryDisksForKova", "AddDisks", "InitializeDisks", "RemoveDisk naa.1   0 0"));
}

TEST_F(SoapEndpoint, AChangeIsATaskOfTheClientsLabel) {
  Ask("AddAllEligibleDisks", "<label>rack 3</label>");
  ASSERT_EQ(_tasks.List().size(), 1u);
  EXPECT_EQ(_tasks.List()[0].operation, "AddAllEligibleDisks");
  EXPECT_EQ(_tasks.List()[0].label, "rack 3");
  EXPECT_THAT(Ask("AddAllEligibleDisks", "<label>" + std::string(longestLabel + 1, 'x') + "</label>").body,
              HasSubstr("more than 256 bytes"));
  for (const char* control : {"&#10;", "\x7f", "&#x85;"}) {
    EXPECT_THAT(Ask("AddAllEligibleDisks", "<label>a" + std::string(control) + "b</label>").body,
                HasSubstr("no control characters"));
  }
}

TEST_F(SoapEndpoint, AnswersWithTheResult) {
  const auto disks = MakeRef<DiskResults>();
  disks->Append(MakeRef<Nox::Kova::Host::DiskResult>());
  _api.answer.result = disks;
  const HttpAnswer answer = Ask("QueryDisksForKova");
  EXPECT_EQ(answer.status, 200u);
  EXPECT_EQ(answer.contentType, "text/xml; charset=utf-8");
  EXPECT_THAT(answer.body, AllOf(HasSubstr("<soapenv:Body><QueryDisksForKovaResponse xmlns=\"urn:nox\">"
                                           "<result><disk>"),
                                 Not(HasSubstr("<fault"))));
}

TEST_F(SoapEndpoint, AnswersWithResultAndFault) {
  const auto groups = MakeRef<MapResults>();
  groups->Append(MakeRef<Nox::Kova::Host::DiskMapResult>());
  _api.answer = {.result = groups, .fault = MakeRef<Nox::Fault::DiskHasPartitions>("naa.1")};
  const HttpAnswer answer = Ask("AddAllEligibleDisks");
  EXPECT_EQ(answer.status, 200u);
  EXPECT_THAT(answer.body,
              AllOf(HasSubstr("<AddAllEligibleDisksResponse xmlns=\"urn:nox\"><result>"),
                    HasSubstr("<fault xsi:type=\"DiskHasPartitions\"><device>naa.1</device></fault><task>")));
}

TEST_F(SoapEndpoint, AnswersWithNothingWhenThereIsNothingToSay) {
  EXPECT_THAT(Ask("RemoveDisk", "<disk>naa.1</disk>").body,
              HasSubstr("<RemoveDiskResponse xmlns=\"urn:nox\"><task>"));
}

TEST_F(SoapEndpoint, AFaultAloneIsATypedSoapFault) {
  _api.answer.fault = MakeRef<Nox::Fault::DiskHasPartitions>("naa.1");
  for (const bool emptyList : {false, true}) {
    _api.answer.result = nullptr;
    if (emptyList) {
      _api.answer.result = MakeRef<MapResults>();
    }
    const HttpAnswer answer = Ask("AddAllEligibleDisks");
    EXPECT_EQ(answer.status, 500u);
    EXPECT_EQ(answer.contentType, "text/xml; charset=utf-8");
    EXPECT_THAT(answer.body,
                AllOf(HasSubstr("<faultcode>soapenv:Client</faultcode>"),
                      HasSubstr("<detail><fault xmlns=\"urn:nox\" xsi:type=\"DiskHasPartitions\">"
                                "<device>naa.1</device></fault>")));
  }
}

TEST_F(SoapEndpoint, AFaultOfTheHostIsTheServers) {
  _api.answer = Host::FailedWith("broken");
  EXPECT_THAT(Ask("GetStorageInfo").body, AllOf(HasSubstr("<faultcode>soapenv:Server</faultcode>"),
                                                HasSubstr("<reason>broken</reason>")));
}

TEST_F(SoapEndpoint, AResultThatIsOfAnotherTypeIsTheHostsMistake) {
  _api.answer.result = MakeRef<MapResults>();
  EXPECT_THAT(Ask("QueryDisksForKova").body, HasSubstr("xsi:type=\"SystemError\""));
}

TEST_F(SoapEndpoint, AWrongParameterIsAFaultThatNamesIt) {
  const HttpAnswer answer = Ask("RemoveDisk", "<disk>naa.1</disk><optionFirst>x</optionFirst>");
  EXPECT_EQ(answer.status, 500u);
  EXPECT_THAT(answer.body,
              AllOf(HasSubstr("xsi:type=\"InvalidArgument\""),
                    HasSubstr("<faultstring>InvalidArgument: /Envelope/Body/RemoveDisk/optionFirst"),
                    HasSubstr("<faultcode>soapenv:Client</faultcode>")));
  EXPECT_THAT(_api.Asked(), IsEmpty());
}

TEST_F(SoapEndpoint, AWrongEnvelopeIsAFaultWithoutADetail) {
  EXPECT_THAT(Post("<x/>").body,
              AllOf(HasSubstr("<faultcode>soapenv:Client</faultcode>"), Not(HasSubstr("<detail>"))));
  EXPECT_THAT(Post("<e:Envelope xmlns:e='http://www.w3.org/2003/05/soap-envelope'/>").body,
              HasSubstr("<faultcode>soapenv:VersionMismatch</faultcode>"));
  EXPECT_THAT(Ask("FormatEverything").body, HasSubstr("there is no operation 'FormatEverything'"));
  EXPECT_THAT(_api.Asked(), IsEmpty());
}

TEST_F(SoapEndpoint, TheActionMustBeThatOfTheBody) {
  const std::string text = Message("<GetStorageInfo xmlns='urn:nox'/>");
  for (const char* action : {"", "\"\"", "urn:nox#GetStorageInfo", "\"urn:nox#GetStorageInfo\""}) {
    EXPECT_EQ(Post(text, action).status, 200u) << action;
  }
  const HttpAnswer refused = Post(text, "\"urn:nox#RemoveDisk\"");
  EXPECT_EQ(refused.status, 500u);
  EXPECT_THAT(refused.body, HasSubstr("SOAPAction"));
}

TEST_F(SoapEndpoint, ABodyThatIsNoXmlIsNotRead) {
  EXPECT_EQ(Serve({"POST", "/soap", "application/x-www-form-urlencoded", "a=b"}).status, 415u);
  EXPECT_EQ(Serve({"PUT", "/soap", "text/xml", ""}).status, 405u);
}

TEST_F(SoapEndpoint, DescribesItself) {
  const HttpAnswer wsdl = Serve({"GET", "/soap?wsdl", "", ""});
  EXPECT_EQ(wsdl.status, 200u);
  EXPECT_EQ(wsdl.contentType, "text/xml; charset=utf-8");
  EXPECT_THAT(wsdl.body,
              AllOf(StartsWith("<?xml"), Not(HasSubstr("schemaLocation")),
                    HasSubstr(" Served by agentd " + Host::VersionLine() + ".</wsdl:documentation>")));
  const HttpAnswer xsd = Serve({"GET", "/soap?xsd=nox.xsd", "", ""});
  EXPECT_EQ(xsd.status, 200u);
  EXPECT_THAT(xsd.body, HasSubstr("targetNamespace=\"urn:nox\""));
  for (const char* target : {"/soap", "/soap?xsd=other", "/soap?wsdl&x=1", "/soap?wsdl=1"}) {
    EXPECT_EQ(Serve({"GET", target, "", ""}).status, 404u) << target;
  }
}

TEST_F(SoapEndpoint, IsWhereTheClientHasFoundIt) {
  const auto addressFor = [this](const std::string& scheme, const std::string& authority) {
    const std::string text = Serve({.method = "GET",
                                    .target = "/soap?wsdl",
                                    .contentType = "",
                                    .body = "",
                                    .scheme = scheme,
                                    .authority = authority})
                                 .body;
    const std::string before = "<soap:address location=\"";
    const std::size_t begin = text.find(before) + before.size();
    return text.substr(begin, text.find('"', begin) - begin);
  };
  EXPECT_EQ(addressFor("http", "127.0.0.1:8080"), "http://127.0.0.1:8080/soap");
  EXPECT_EQ(addressFor("https", "kova.example"), "https://kova.example/soap");
  EXPECT_EQ(addressFor("http", "[::1]:80"), "http://[::1]:80/soap");
  EXPECT_EQ(addressFor("http", ""), "http://localhost/soap") << "over a socket file, by a client of old";
}

TEST_F(SoapEndpoint, IsBusyWhenTooManyChangesWait) {
  _tasks.Close();
  EXPECT_THAT(Ask("AddAllEligibleDisks").body,
              AllOf(HasSubstr("xsi:type=\"Busy\""), HasSubstr("<faultcode>soapenv:Server</faultcode>")));
}

TEST_F(SoapEndpoint, RefusesTooLargeAGroupBeforeItWaits) {
  std::string mapping = Disk("ssd", "naa.1");
  for (int i = 0; i <= 1000; ++i) {
    mapping += Disk("nonSsd", "naa.2");
  }
  const HttpAnswer answer = Ask("UnmountDiskMapping", "<mappings>" + mapping + "</mappings>");
  EXPECT_THAT(answer.body, AllOf(HasSubstr("InvalidArgument"), HasSubstr("mappings[0].nonSsd")));
  EXPECT_THAT(_tasks.List(), IsEmpty());
  EXPECT_THAT(_api.Asked(), IsEmpty());
}

}  // namespace
}  // namespace Agentd
