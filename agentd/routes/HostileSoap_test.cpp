// Hostile and broken messages, as anyone on the network may send them: each is answered with a SOAP fault
// that says what is wrong, and reaches no operation.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "agentd/routes/Routes.h"
#include "agentd/tasks/TaskQueue.h"
#include "agentd/testing/FakeApi.h"
#include "agentd/testing/RunningServer.h"

namespace Agentd {
namespace {

using namespace std::string_literals;
using testing::AllOf;
using Testing::FakeApi;
using testing::HasSubstr;
using testing::IsEmpty;

const std::string open =
    "<e:Envelope xmlns:e='http://schemas.xmlsoap.org/soap/envelope/' "
    "xmlns:i='http://www.w3.org/2001/XMLSchema-instance' xmlns:s='http://www.w3.org/2001/XMLSchema'><e:Body>";
const std::string close = "</e:Body></e:Envelope>";

std::string Repeated(const std::string& piece, int times) {
  std::string text;
  text.reserve(piece.size() * static_cast<std::size_t>(times));
  for (int i = 0; i < times; ++i) {
    text += piece;
  }
  return text;
}

// An envelope that declares so many more namespaces.
std::string ManyNamespaces(int count) {
  std::string text = "<e:Envelope xmlns:e='http://schemas.xmlsoap.org/soap/envelope/'";
  for (int i = 0; i < count; ++i) {
    text += " xmlns:p" + std::to_string(i) + "='u'";
  }
  return text + "/>";
}

std::string Query(const std::string& content) {
  return open + "<QueryDisksForKova xmlns='urn:nox'>" + content + "</QueryDisksForKova>" + close;
}
std::string Named(const std::string& name) {
  return Query("<names>" + name + "</names>");
}
std::string Removal(const std::string& rest) {
  return open + "<RemoveDisk xmlns='urn:nox'><disk>d</disk>" + rest + "</RemoveDisk>" + close;
}
std::string Addition(const std::string& disk) {
  return open + "<AddDisks xmlns='urn:nox'>" + disk + "</AddDisks>" + close;
}
const std::string diskFields =
    "<deviceName/><deviceType/><uuid/><lunType/><capacity><blockSize>1</blockSize><block>1</block></"
    "capacity>";

struct Hostile {
  std::string name;
  std::string text;
  std::string told;  // among others
};

std::ostream& operator<<(std::ostream& out, const Hostile& hostile) {
  return out << hostile.name;
}

class HostileSoap : public testing::TestWithParam<Hostile> {
 protected:
  ~HostileSoap() override { _tasks.Finish(); }

  HttpAnswer Post(const std::string& text) const {
    return Testing::AnswerOf([this](const HttpRequest& request,
                                    const HttpResponder& responder) { _router.Serve(request, responder); },
                             {"POST", "/soap", "text/xml", text});
  }

  FakeApi _api;
  TaskQueue _tasks;
  const Router _router{_api, _tasks};
};

TEST_P(HostileSoap, IsAFaultThatSaysWhy) {
  const HttpAnswer answer = Post(GetParam().text);
  EXPECT_EQ(answer.status, 500u);
  EXPECT_THAT(answer.body, AllOf(HasSubstr("<faultcode>soapenv:"), HasSubstr(GetParam().told)));
  EXPECT_LT(answer.body.size(), 8192u) << "a fault repeats what it was sent";
  EXPECT_THAT(_api.Asked(), IsEmpty());
}

const auto nameOfRow = [](const auto& row) { return row.param.name; };

INSTANTIATE_TEST_SUITE_P(
    Entities, HostileSoap,
    testing::Values(
        Hostile{"Doctype", "<!DOCTYPE e>" + Named("a"), "DOCTYPE"},
        Hostile{"ExponentialEntity",
                "<!DOCTYPE e [<!ENTITY a 'aaaa'><!ENTITY b '&a;&a;&a;&a;'>]>" + Named("&b;"), "DOCTYPE"},
        Hostile{"ExternalEntity", "<!DOCTYPE e [<!ENTITY a SYSTEM 'file:///etc/passwd'>]>" + Named("&a;"),
                "DOCTYPE"},
        Hostile{"RemoteDoctype", "<!DOCTYPE e SYSTEM 'http://other.example/e.dtd'>" + Named("a"), "DOCTYPE"},
        Hostile{"UndefinedEntity", Named("&a;"), "soapenv:Client"}),
    nameOfRow);

INSTANTIATE_TEST_SUITE_P(
    Sizes, HostileSoap,
    testing::Values(
        Hostile{"Deep", open + Repeated("<a xmlns='urn:nox'>", 200'000), "nested deeper"},
        Hostile{"DeepClosed", open + Repeated("<a>", 100) + Repeated("</a>", 100) + close, "nested deeper"},
        Hostile{"LongText", Named(std::string((1 << 20) + 1, 'x')), "longer than"},
        Hostile{
            "LongAttribute",
            open + "<QueryDisksForKova xmlns='urn:nox' a='" + std::string((1 << 20) + 1, 'x') + "'/>" + close,
            "longer than"},
        Hostile{"LongName", open + "<" + std::string(5 << 20, 'x') + "/>" + close, "a name is too long"},
        Hostile{"ManyItems", Query(Repeated("<names/>", 500'001)), "500000"},
        Hostile{"ManyAttributes", ManyNamespaces(10'000), "attributes"}),
    nameOfRow);

INSTANTIATE_TEST_SUITE_P(
    Bytes, HostileSoap,
    testing::Values(Hostile{"Overlong", Named("\xC0\x80"), "soapenv:Client"},
                    Hostile{"LoneByte", Named("\xFF"), "soapenv:Client"},
                    Hostile{"EncodedSurrogate", Named("\xED\xA0\x80"), "soapenv:Client"},
                    Hostile{"Nul", Named("a\0b"s), "soapenv:Client"},
                    Hostile{"NulReference", Named("&#0;"), "soapenv:Client"},
                    Hostile{"ControlReference", Named("&#x1;"), "soapenv:Client"},
                    Hostile{"Utf16", "\xFE\xFF\0<\0a\0/\0>"s, "soapenv:Client"},
                    Hostile{"Utf7", "<?xml version='1.0' encoding='utf-7'?>" + Named("a"), "soapenv:Client"},
                    Hostile{"Latin1", "<?xml version='1.0' encoding='iso-8859-1'?>" + Named("\xE9"),
                            "soapenv:Client"}),
    nameOfRow);

INSTANTIATE_TEST_SUITE_P(
    Structure, HostileSoap,
    testing::Values(
        Hostile{"Empty", "", "soapenv:Client"}, Hostile{"NoXml", "hello", "soapenv:Client"},
        Hostile{"TwoRoots", Named("a") + "<x/>", "soapenv:Client"},
        Hostile{"TrailingText", Named("a") + "text", "soapenv:Client"},
        Hostile{"Instruction", "<?php x?>" + Named("a"), "instruction"},
        Hostile{"MismatchedTag", open + "<a></b>" + close, "soapenv:Client"},
        Hostile{"UndeclaredPrefix", open + "<a:b/>" + close, "soapenv:Client"},
        Hostile{"DoubledAttribute", open + "<a b='1' b='2'/>" + close, "soapenv:Client"},
        Hostile{"TextBetween", Query("text"), "text"},
        Hostile{"UnknownElement", Query("<more/>"), "InvalidArgument"},
        Hostile{"OtherNamespace", Query("<names xmlns='urn:other'>a</names>"), "InvalidArgument"},
        Hostile{"ElementInText", Query("<names><b/></names>"), "InvalidArgument"},
        Hostile{"CommentInValue", Query("<names>a<!-- -->b</names>"), "InvalidArgument"},
        Hostile{"NilWhereAValueMustBe",
                open + "<RemoveDisk xmlns='urn:nox'><disk i:nil='true'/></RemoveDisk>" + close,
                "xsi:nil is not allowed"},
        Hostile{"NilRequestThatNeedsParameters", open + "<RemoveDisk xmlns='urn:nox' i:nil='true'/>" + close,
                "InvalidArgument"},
        Hostile{"Reference", Query("<names href='#1'/>"), "InvalidArgument"},
        Hostile{"Missing", open + "<RemoveDisk xmlns='urn:nox'/>" + close, "InvalidArgument"},
        Hostile{"Repeated", Removal("<passThrough/><passThrough/>"), "InvalidArgument"},
        Hostile{"TooLarge", Removal("<optionFirst>2147483648</optionFirst>"), "InvalidArgument"},
        Hostile{"NoNumber", Removal("<optionFirst/>"), "InvalidArgument"},
        Hostile{"TypeOfAnotherKind", Addition("<disks i:type='KovaHostDiskMapping'/>"), "InvalidArgument"},
        Hostile{"BaseType", Addition("<disks i:type='HostScsiLun'>" + diskFields + "</disks>"),
                "InvalidArgument"},
        Hostile{"SimpleType", Addition("<disks i:type='s:string'>a</disks>"), "InvalidArgument"},
        Hostile{"UnknownType", Addition("<disks i:type='Nothing'/>"), "InvalidArgument"},
        Hostile{"TypeOfTheRequest", open + "<AddDisks xmlns='urn:nox' i:type='HostScsiDisk'/>" + close,
                "InvalidArgument"},
        Hostile{"MissingField", Addition("<disks><capacity/></disks>"), "InvalidArgument"}),
    nameOfRow);

TEST_F(HostileSoap, AMessageCutOffAnywhereIsAFault) {
  const std::string whole = Removal("<passThrough>p</passThrough>");
  for (std::size_t size = 0; size < whole.size(); ++size) {
    ASSERT_EQ(Post(whole.substr(0, size)).status, 500u) << "cut to " << size << " bytes";
  }
  EXPECT_EQ(Post(whole).status, 200u);
}

TEST_F(HostileSoap, TheNeighboursOfTheBoundsAreAccepted) {
  EXPECT_EQ(Post(Named(std::string(1024, 'x'))).status, 200u);
  EXPECT_THAT(Post(Named(std::string(1 << 20, 'x'))).body, HasSubstr("more than 1024 bytes"));
  EXPECT_EQ(Post(Removal("<optionFirst>2147483647</optionFirst>")).status, 200u);
  EXPECT_EQ(Post(Query(Repeated("<names>a</names>", 100'000))).status, 200u);
  EXPECT_THAT(Post(Query(Repeated("<names/>", 400'000))).body, HasSubstr("more than 100000 names"));
  EXPECT_EQ(Post(Query("<!-- between --><names>a</names>")).status, 200u);
}

}  // namespace
}  // namespace Agentd
