#include "agentd/routes/SoapEndpoint.h"

#include <string>
#include <utility>

#include "agentd/http/HttpTarget.h"
#include "agentd/routes/JsonAnswers.h"
#include "agentd/routes/Permission.h"
#include "agentd/routes/SoapAnswer.h"
#include "agentd/routes/SoapRequest.h"
#include "agentd/tasks/QueryQueue.h"
#include "agentd/tasks/TaskQueue.h"
#include "host/Build.h"
#include "nox/Documents.h"
#include "orbis/ParseException.h"

namespace Agentd {
namespace {

constexpr std::string_view schemaFile = "nox.xsd";

// What `make` makes, or what its exception comes to: an answer that cannot be made is the host's mistake, and
// still an answer.
template <class Make>
HttpAnswer Made(const Make& make) {
  try {
    return make();
  } catch (const Orbis::ParseException& refused) {
    return ToSoap(refused);
  } catch (const Orbis::MethodFault::Exception& refused) {
    return ToSoap("", Host::Answer{.result = nullptr, .fault = refused.GetFault()});
  } catch (const std::exception& mistake) {
    return ToSoap("", Host::FailedWith(mistake.what()));
  }
}

// Where the client reaches this service: as it has just done. Who asked no host came by a socket file, and
// knows how.
std::string AddressFor(const HttpRequest& request) {
  return request.scheme + "://" + (request.authority.empty() ? "localhost" : request.authority) + "/soap";
}

void Submit(const SoapService& service, SoapRequest& read, const HttpResponder& responder) {
  const std::size_t bytes = WeightOf(read.arguments);
  service.tasks.Submit(
      std::string(read.operation->name), read.label,
      [&api = service.api, &operation = *read.operation, arguments = std::move(read.arguments)] {
        return operation.call(api, arguments);
      },
      [responder](const Task& ended) { responder.Answer(Made([&ended] { return ToSoap(ended); })); }, bytes);
}

void Ask(const SoapService& service, SoapRequest& read, const HttpResponder& responder) {
  auto answer = [&api = service.api, &operation = *read.operation, arguments = std::move(read.arguments)] {
    return operation.callWritten != nullptr ? ToSoap(operation.name, operation.callWritten(api, arguments))
                                            : ToSoap(operation.name, operation.call(api, arguments));
  };
  service.queries.Run([answer = std::move(answer), responder] {
    HttpAnswer made = Made(answer);
    const Host::Outcome outcome = OutcomeOf(made);
    responder.Answer(std::move(made));
    return outcome;
  });
}

}  // namespace

void ServeSoap(const SoapService& service, const HttpRequest& request, const HttpResponder& responder) {
  try {
    SoapRequest read = ReadSoapRequest(request.body, request.soapAction);
    const Operation& operation = *read.operation;
    if (const auto refusal = RefusalOf(request, operation.changes ? HttpRole::Change : HttpRole::Read)) {
      responder.Answer(ToSoap("", *refusal));
      return;
    }
    Bound(read.arguments);
    if (operation.changes) {
      Submit(service, read, responder);
    } else {
      Ask(service, read, responder);
    }
  } catch (...) {
    responder.Answer(Made([]() -> HttpAnswer { throw; }));  // that exception again
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
