#include "agentd/routes/SoapEndpoint.h"

#include <exception>
#include <string>

#include "agentd/http/HttpTarget.h"
#include "agentd/routes/JsonAnswers.h"
#include "agentd/routes/Permission.h"
#include "agentd/routes/RequestReader.h"
#include "agentd/routes/SoapAnswer.h"
#include "host/Build.h"
#include "nox/Documents.h"
#include "orbis/ParseException.h"

namespace Agentd {
namespace {

constexpr std::string_view schemaFile = "nox.xsd";

// Answers for a message that cannot be read, or must not be carried out.
HttpAnswer Refused(const std::exception_ptr& reason) {
  try {
    std::rethrow_exception(reason);
  } catch (const Orbis::ParseException& refused) {
    return ToSoap(refused);
  } catch (const Orbis::MethodFault::Exception& refused) {
    return ToSoapFault({.result = nullptr, .fault = refused.GetFault()});
  } catch (const std::exception& mistake) {
    return ToSoapFault(Host::FailedWith(mistake.what()));
  }
}

// Where the client reaches this service: as it has just done. Who asked no host came by a socket file, and
// knows how.
std::string AddressFor(const HttpRequest& request) {
  return request.scheme + "://" + (request.authority.empty() ? "localhost" : request.authority) + "/soap";
}

}  // namespace

void ServeSoap(const Services& services, const HttpRequest& request, const HttpResponder& responder) {
  try {
    const SoapRequest read = ReadSoapRequest(request.body, request.soapAction);
    if (const auto refusal =
            RefusalOf(request, read.operation->changes ? HttpRole::Change : HttpRole::Read)) {
      responder.Answer(ToSoapFault(*refusal));
      return;
    }
    Dispatch(services, *read.operation, read.request, SoapEncoding(), responder);
  } catch (...) {
    responder.Answer(Refused(std::current_exception()));
  }
}

HttpAnswer DescribeService(const HttpRequest& request, const HttpTarget& target) {
  if (target.parameters.size() == 1) {
    const auto& [name, value] = target.parameters.front();
    if (name == "wsdl" && value.empty()) {
      return {200, "text/xml; charset=utf-8",
              Nox::WsdlText(AddressFor(request), " Served by agentd " + Host::VersionLine() + ".")};
    }
    if (name == "xsd" && value == schemaFile) {
      return {200, "text/xml; charset=utf-8", std::string(Nox::XsdText())};
    }
  }
  return PlainText(404, "SOAP messages are POSTed here; GET knows ?wsdl and ?xsd=nox.xsd");
}

}  // namespace Agentd
