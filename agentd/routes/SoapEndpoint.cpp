#include "agentd/routes/SoapEndpoint.h"

#include <string>
#include <utility>

#include "agentd/http/HttpTarget.h"
#include "agentd/routes/JsonAnswers.h"
#include "agentd/routes/Permission.h"
#include "agentd/routes/SoapAnswer.h"
#include "agentd/routes/SoapRequest.h"
#include "agentd/tasks/TaskQueue.h"
#include "nox/Documents.h"
#include "orbis/ParseException.h"

namespace Agentd {
namespace {

constexpr std::string_view schemaFile = "nox.xsd";

// An answer that cannot be written is the host's mistake, and still an answer.
template <class Answer>
HttpAnswer Written(std::string_view operation, const Answer& answer) {
  try {
    return ToSoap(operation, answer);
  } catch (const std::exception& mistake) {
    return ToSoap(operation, Host::FailedWith(mistake.what()));
  }
}

// The service, with the schema where this server has it.
std::string Wsdl() {
  std::string text(Nox::WsdlText());
  const std::string reference = "schemaLocation=\"" + std::string(schemaFile);
  const std::size_t at = text.find(reference);
  if (at != std::string::npos) {
    text.replace(at, reference.size(), "schemaLocation=\"?xsd=" + std::string(schemaFile));
  }
  return text;
}

}  // namespace

void ServeSoap(const Host::ManagementApi& api, TaskQueue& tasks, const HttpRequest& request,
               const HttpResponder& responder) {
  try {
    SoapRequest read = ReadSoapRequest(request.body, request.soapAction);
    const Operation& operation = *read.operation;
    if (const auto refusal = RefusalOf(request, operation.changes ? HttpRole::Change : HttpRole::Read)) {
      responder.Answer(ToSoap("", *refusal));
      return;
    }
    Bound(read.arguments);
    if (operation.callWritten != nullptr) {
      responder.Answer(Written(operation.name, operation.callWritten(api, read.arguments)));
      return;
    }
    if (!operation.changes) {
      responder.Answer(Written(operation.name, operation.call(api, read.arguments)));
      return;
    }
    const std::size_t bytes = WeightOf(read.arguments);
    tasks.Submit(
        std::string(operation.name), read.label,
        [&api, &operation, arguments = std::move(read.arguments)] { return operation.call(api, arguments); },
        [responder](const Task& ended) { responder.Answer(Written(ended.operation, ended.answer)); }, bytes);
  } catch (const Orbis::ParseException& refused) {
    responder.Answer(ToSoap(refused));
  } catch (const Orbis::MethodFault::Exception& refused) {
    responder.Answer(ToSoap("", Host::Answer{.result = nullptr, .fault = refused.GetFault()}));
  }
}

HttpAnswer DescribeService(const HttpTarget& target) {
  if (target.parameters.size() == 1) {
    const auto& [name, value] = target.parameters.front();
    if (name == "wsdl" && value.empty()) {
      return {200, "text/xml; charset=utf-8", Wsdl()};
    }
    if (name == "xsd" && value == schemaFile) {
      return {200, "text/xml; charset=utf-8", std::string(Nox::XsdText())};
    }
  }
  return PlainText(404, "SOAP messages are POSTed here; GET knows ?wsdl and ?xsd=nox.xsd");
}

}  // namespace Agentd
