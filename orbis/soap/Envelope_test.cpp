#include "orbis/Envelope.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "orbis/Soap.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/Types.h"

namespace Orbis {
namespace {

using Tessa::MakeRef;
using testing::HasSubstr;

std::string Enveloped(const std::string& body, const std::string& header = "") {
  return "<e:Envelope xmlns:e='http://schemas.xmlsoap.org/soap/envelope/'>" + header + "<e:Body>" + body +
         "</e:Body></e:Envelope>";
}

const std::string aMessage =
    "<n:LocalizableMessage xmlns:n='urn:nox'><n:key>k</n:key></n:LocalizableMessage>";

// The fault code and the reason that a text is refused with.
std::string Refusal(const std::string& text) {
  try {
    const SoapMessage message(text, Limits::Untrusted());
    return "accepted";
  } catch (const EnvelopeException& refused) {
    return std::string(refused.GetCode()) + ": " + refused.GetReason();
  } catch (const ParseException& refused) {
    return refused.GetReason();
  }
}

TEST(SoapMessage, GivesTheNameAndTheObjectInTheBody) {
  const SoapMessage message(Enveloped(aMessage), Limits::Untrusted());
  EXPECT_EQ(message.GetName(), "LocalizableMessage");
  const auto read = message.Read(LocalizableMessage::StaticType());
  EXPECT_EQ(dynamic_cast<LocalizableMessage&>(*read).GetKey(), "k");
}

TEST(SoapMessage, ResolvesTypesByPrefixesOfTheEnvelope) {
  const SoapMessage message(
      "<Envelope xmlns='http://schemas.xmlsoap.org/soap/envelope/' xmlns:a='urn:nox' "
      "xmlns:i='http://www.w3.org/2001/XMLSchema-instance' xmlns:s='http://www.w3.org/2001/XMLSchema'><Body>"
      "<a:KeyAnyValue><a:key>k</a:key><a:value i:type='s:int'>3</a:value></a:KeyAnyValue></Body></Envelope>",
      Limits::Untrusted());
  const auto read = message.Read(KeyAnyValue::StaticType());
  EXPECT_EQ(read->ToString(), "(KeyAnyValue) {key = \"k\", value = 3}");
}

TEST(SoapMessage, RefusesWhatTheTypeDoesNotHave) {
  const SoapMessage message(Enveloped("<Other xmlns='urn:nox'><more/></Other>"), Limits::Untrusted());
  EXPECT_THROW(message.Read(LocalizableMessage::StaticType()), ParseException);
}

TEST(SoapMessage, PassesOverHeadersAndTheirAttributes) {
  EXPECT_EQ(Refusal(Enveloped(aMessage,
                              "<e:Header><t:x xmlns:t='urn:t' t:id='1' e:mustUnderstand='0'>v</t:x>"
                              "</e:Header>")),
            "accepted");
}

TEST(SoapMessage, RefusesAHeaderThatMustBeUnderstood) {
  for (const char* yes : {"1", "true"}) {
    EXPECT_THAT(Refusal(Enveloped(aMessage, "<e:Header><t:x xmlns:t='urn:t' e:mustUnderstand='" +
                                                std::string(yes) + "'/></e:Header>")),
                HasSubstr("MustUnderstand: "));
  }
}

TEST(SoapMessage, LeavesHeadersForOthersToThem) {
  const auto refusalOf = [](const std::string& actor) {
    return Refusal(Enveloped(aMessage, "<e:Header><t:x xmlns:t='urn:t' e:mustUnderstand='1' e:actor='" +
                                           actor + "'/></e:Header>"));
  };
  EXPECT_EQ(refusalOf("urn:a-proxy"), "accepted");
  EXPECT_THAT(refusalOf(""), HasSubstr("MustUnderstand: "));
  EXPECT_THAT(refusalOf("http://schemas.xmlsoap.org/soap/actor/next"), HasSubstr("MustUnderstand: "));
}

TEST(SoapMessage, RefusesAttributesOfDataButNotOfTheEnvelope) {
  EXPECT_EQ(Refusal("<e:Envelope xmlns:e='http://schemas.xmlsoap.org/soap/envelope/' e:encodingStyle=''>"
                    "<e:Body id='b'>" +
                    aMessage + "</e:Body></e:Envelope>"),
            "accepted");
  EXPECT_THAT(Refusal(Enveloped("<x xmlns='urn:nox' id='1'/>")), HasSubstr("attribute \"id\""));
}

TEST(SoapMessage, RefusesEveryOtherEnvelope) {
  EXPECT_THAT(Refusal("<x/>"), HasSubstr("Client: the root element"));
  EXPECT_THAT(Refusal("<e:Envelope xmlns:e='http://www.w3.org/2003/05/soap-envelope'/>"),
              HasSubstr("VersionMismatch: "));
  EXPECT_THAT(Refusal("<e:Envelope xmlns:e='http://schemas.xmlsoap.org/soap/envelope/'/>"),
              HasSubstr("Client: the Body is missing"));
  EXPECT_THAT(Refusal("<e:Envelope xmlns:e='http://schemas.xmlsoap.org/soap/envelope/'><Body/></e:Envelope>"),
              HasSubstr("Client: the Body is missing"));
  EXPECT_THAT(Refusal(Enveloped("")), HasSubstr("Client: the Body is empty"));
  EXPECT_THAT(Refusal(Enveloped(aMessage + aMessage)), HasSubstr("Client: the Body must hold one"));
  EXPECT_THAT(Refusal(Enveloped("<x/>")), HasSubstr("Client: the request must be of namespace 'urn:nox'"));
  EXPECT_THAT(Refusal("<e:Envelope xmlns:e='http://schemas.xmlsoap.org/soap/envelope/'><e:Body>" + aMessage +
                      "</e:Body><e:Body/></e:Envelope>"),
              HasSubstr("Client: nothing may follow"));
  EXPECT_THAT(Refusal(Enveloped(aMessage, "<e:Header/><e:Header/>")),
              HasSubstr("Client: the Body is missing"));
  EXPECT_THAT(Refusal(Enveloped("text" + aMessage)), HasSubstr("text"));
  EXPECT_NE(Refusal(""), "accepted");
}

TEST(SoapMessage, IsReadAsItWasWritten) {
  const auto written = MakeRef<LocalizableMessage>();
  written->SetKey("a & <b>");
  std::string text = "before ";
  AppendSoapMessage("Anything", *written, text);
  ASSERT_EQ(text.substr(0, 7), "before ");
  const SoapMessage message(text.substr(7), Limits::Untrusted());
  EXPECT_EQ(message.GetName(), "Anything");
  EXPECT_EQ(message.Read(LocalizableMessage::StaticType())->ToString(), written->ToString());
}

TEST(AppendSoapMessage, LeavesTheTextAloneWhenItThrows) {
  const auto broken = MakeRef<KeyAnyValue>();
  broken->SetValue(nullptr);
  std::string text = "before";
  EXPECT_THROW(AppendSoapMessage("x", *broken, text), Tessa::NotInitializedException);
  EXPECT_EQ(text, "before");
}

TEST(AppendSoapFault, NamesTheTypeOfTheDetail) {
  const auto fault = MakeRef<Fault::SystemError>("it broke");
  std::string text;
  AppendSoapFault("Server", "a <b>", {.fault = fault.Get()}, text);
  EXPECT_THAT(text, HasSubstr("<soapenv:Fault><faultcode>soapenv:Server</faultcode><faultstring>a &lt;b&gt;"
                              "</faultstring><detail><fault xmlns=\"urn:nox\" xsi:type=\"SystemError\">"
                              "<reason>it broke</reason></fault></detail></soapenv:Fault>"));
}

TEST(AppendSoapFault, HasNoDetailWithoutAFault) {
  std::string text;
  AppendSoapFault("Client", "no", {}, text);
  EXPECT_THAT(text, HasSubstr("<faultstring>no</faultstring></soapenv:Fault>"));
}

TEST(AppendSoapFault, HasRoomForMoreThanTheFault) {
  std::string text;
  AppendSoapFault("Client", "no", {.fault = nullptr, .name = "task", .text = "a<b"}, text);
  EXPECT_THAT(text, HasSubstr("<detail><task xmlns=\"urn:nox\">a&lt;b</task></detail></soapenv:Fault>"));
}

}  // namespace
}  // namespace Orbis
