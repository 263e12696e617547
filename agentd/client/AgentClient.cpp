#include "agentd/client/AgentClient.h"

#include <stdexcept>
#include <utility>

#include "host/HostError.h"
#include "orbis/FaultText.h"
#include "orbis/Json.h"
#include "orbis/ParseException.h"
#include "orbis/TypeDescriptor.h"
#include "tessa/text/Escape.h"

namespace Agentd {

using Host::Answer;
namespace {

constexpr std::string_view jsonType = "application/json";
constexpr std::string_view folder = "/api/v1/";
constexpr unsigned takenOn = 202;           // by a change that nobody waits for
constexpr std::size_t longestShown = 1024;  // bytes of an answer that is not understood

constexpr std::chrono::milliseconds queryPatience = std::chrono::minutes(10);
// A kernel may format for long, and to give up would not stop it.
constexpr std::chrono::milliseconds changePatience = std::chrono::hours(24);

constexpr const Orbis::TypeDescriptor* noResult = nullptr;

// The agent is of another kind: it lacks the operation, or takes it in another form.
bool IsUnserved(unsigned status) {
  return status == 404 || status == 405 || status == 415;
}

std::string InALine(const Answer& answer) {
  if (!answer.fault) {
    return "it gives no reason";
  }
  for (const Orbis::LocalizableMessage* message : *answer.fault->GetFaultMessage()) {
    if (message->HasMessage()) {
      return message->GetMessage();
    }
  }
  return Orbis::FaultText(*answer.fault);
}

}  // namespace

RefusedByAgent::RefusedByAgent(Tessa::Ref<Orbis::MethodFault> fault)
    : std::runtime_error(InALine({.result = nullptr, .fault = fault})), _fault(std::move(fault)) {}

AgentClient::AgentClient(const std::string& url, TlsClientFiles files)
    : _address(ParseAgentAddress(url)), _files(std::move(files)) {}

Answer AgentClient::Query(const Nox::Operation::Query& request) const {
  return Ask(request, queryPatience);
}

Answer AgentClient::Change(Nox::Operation::Change&& request) const {
  return Ask(request, changePatience);
}

std::string AgentClient::DescribeHost() const {
  try {
    return Get("host");
  } catch (const RefusedByAgent& refused) {
    if (dynamic_cast<const Orbis::Fault::InvalidArgument*>(&refused.GetFault()) == nullptr) {
      throw;
    }
    throw Host::HostError(refused.what());
  }
}

Answer AgentClient::ChangeHost(const std::string& change) const {
  return Post("host", change, noResult, changePatience);
}

std::string AgentClient::Tasks() const {
  return Get("tasks");
}

std::string AgentClient::Task(const std::string& id) const {
  return Get("tasks/" + id);
}

Answer AgentClient::Ask(const Orbis::DataObject& request, std::chrono::milliseconds patience) const {
  const Nox::OperationDescriptor& operation = Nox::OperationOf(request);
  std::string body;
  Orbis::WriteJsonFields(request, body);
  return Post(operation.name, body, operation.result, patience);
}

Answer AgentClient::Post(std::string_view operation, const std::string& body,
                         const Orbis::TypeDescriptor* resultType, std::chrono::milliseconds patience) const {
  const HttpAnswer http =
      Exchange(_address, {"POST", std::string(folder) + std::string(operation), std::string(jsonType), body},
               patience, _files);
  RequireJson(http);
  if (http.status == takenOn) {
    return {};
  }
  const Answer answer = Read(http, resultType);
  if (IsUnserved(http.status)) {
    throw ConnectionError("the agent on " + _address.Name() + " answered with status " +
                          std::to_string(http.status) + ": " + InALine(answer));
  }
  return answer;
}

Answer AgentClient::Read(const HttpAnswer& http, const Orbis::TypeDescriptor* resultType) const {
  try {
    return Host::ReadJsonAnswer(http.body, resultType);
  } catch (const Orbis::ParseException& refused) {
    throw AnswerError("the answer of the agent on " + _address.Name() + " cannot be read: " + refused.what());
  }
}

std::string AgentClient::Get(const std::string& target) const {
  HttpAnswer http = Exchange(_address, {"GET", std::string(folder) + target, "", ""}, queryPatience, _files);
  RequireJson(http);
  if (http.status == 200) {
    return std::move(http.body);
  }
  const Answer answer = Read(http, noResult);
  if (!answer.fault) {
    throw ConnectionError("the agent on " + _address.Name() + " answered with status " +
                          std::to_string(http.status) + " and without a reason");
  }
  throw RefusedByAgent(answer.fault);
}

void AgentClient::RequireJson(const HttpAnswer& http) const {
  if (http.contentType != jsonType) {
    throw AnswerError("the agent on " + _address.Name() + " answered with status " +
                      std::to_string(http.status) + ": " +
                      std::string(Tessa::Excerpt(http.body, longestShown)));
  }
}

}  // namespace Agentd
