#include "agentd/routes/SoapAnswer.h"

#include <string>

#include "host/FaultWords.h"
#include "host/Refusal.h"
#include "nox/Faults.h"
#include "nox/OperationTable.h"
#include "orbis/Envelope.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/WrittenSoap.h"

namespace Agentd {
namespace {

using Nox::OperationDescriptor;
using Orbis::MethodFault;
using Tessa::MakeRef;
using Tessa::Ref;

HttpAnswer Xml(unsigned status) {
  HttpAnswer http;
  http.status = status;
  http.contentType = "text/xml; charset=utf-8";
  return http;
}

// The operation's response object. Throws Tessa::TypeMismatchException for a result of another type than the
// operation's.
Ref<Orbis::DataObject> ResponseOf(const OperationDescriptor& operation, const Host::Answer& answer,
                                  std::string_view task) {
  const Ref<Orbis::Any> made = operation.response.create();
  auto& response = static_cast<Orbis::DataObject&>(*made);
  if (answer.result && operation.result != nullptr) {
    operation.response.FindField("result")->assign(response, Ref<Orbis::Any>(answer.result.Get()));
  }
  operation.response.FindField("fault")->assign(response, answer.fault);
  if (!task.empty()) {
    *static_cast<std::string*>(operation.response.FindField("task")->write(response)) = task;
  }
  return Ref<Orbis::DataObject>(&response);
}

// Whose the fault is: the host's, or the request's.
const char* CodeOf(const MethodFault& fault) {
  const bool server = dynamic_cast<const Orbis::Fault::SystemError*>(&fault) != nullptr ||
                      dynamic_cast<const Nox::Fault::Busy*>(&fault) != nullptr;
  return server ? "Server" : "Client";
}

// For whoever reads the fault's text alone: what its kind means and what it carries; of a request that is
// wrong, the message that says where.
std::string TextOf(const MethodFault& fault) {
  const auto messages = fault.GetFaultMessage();
  if (dynamic_cast<const Orbis::Fault::InvalidArgument*>(&fault) != nullptr && !messages->IsEmpty() &&
      (*messages)[0]->HasMessage()) {
    return fault.GetType().name + ": " + (*messages)[0]->GetMessage();
  }
  return fault.GetType().name + ": " + Host::Explain(fault);
}

HttpAnswer TypedFault(const MethodFault& fault, std::string_view task = {}) {
  HttpAnswer http = Xml(500);
  const std::string_view name = task.empty() ? "" : "task";
  Orbis::AppendSoapFault(CodeOf(fault), TextOf(fault), {&fault, name, task}, http.body);
  return http;
}

// `task`: the id of the change; empty for a query.
HttpAnswer Respond(const OperationDescriptor& operation, const Host::Answer& answer, std::string_view task) {
  if (Host::IsFaultAlone(answer)) {
    return TypedFault(*answer.fault, task);
  }
  HttpAnswer http = Xml(200);
  const Ref<Orbis::DataObject> response = ResponseOf(operation, answer, task);
  Orbis::AppendSoapMessage(response->GetType().name, *response, http.body);
  return http;
}

// From the text of the result, if that is all there is to say and it is a list as the plug-in writes it.
bool AppendAsItIs(const OperationDescriptor& operation, const Host::Answer& answer, std::string& out) {
  const bool isList = operation.result != nullptr && operation.result->kind == Orbis::TypeKind::ObjectArray;
  return isList && !answer.fault && answer.result.GetText() != nullptr &&
         Orbis::AppendMessageOfSoap(operation.response.name, "result", *operation.result,
                                    *answer.result.GetText(), out);
}

}  // namespace

HttpAnswer ToSoap(const OperationDescriptor& operation, const Host::Answer& answer) {
  HttpAnswer http = Xml(200);
  return AppendAsItIs(operation, answer, http.body) ? http : Respond(operation, answer, {});
}

HttpAnswer ToSoap(const Task& ended) {
  return Respond(*Nox::FindOperation(ended.operation), ended.answer, ended.id);
}

HttpAnswer ToSoapFault(const Host::Answer& answer) {
  return TypedFault(*answer.fault);
}

HttpAnswer ToSoap(const Orbis::ParseException& refused) {
  if (const auto* const envelope = dynamic_cast<const Orbis::EnvelopeException*>(&refused)) {
    return SoapFault(envelope->GetCode(), refused.what());
  }
  const auto fault = MakeRef<Orbis::Fault::InvalidArgument>(refused.GetPath());
  Host::Explain(*fault, Host::invalidArgumentKey, refused.what());
  return TypedFault(*fault);
}

HttpAnswer SoapFault(std::string_view code, std::string_view text) {
  HttpAnswer http = Xml(500);
  Orbis::AppendSoapFault(code, text, {}, http.body);
  return http;
}

const Encoding& SoapEncoding() {
  static constexpr Encoding encoding = {
      .answer = [](const OperationDescriptor& operation,
                   const Host::Answer& answer) { return ToSoap(operation, answer); },
      .ended = [](const Task& task) { return ToSoap(task); },
      .takenOn = [](const Task& task) { return Respond(*Nox::FindOperation(task.operation), {}, task.id); },
      .fault = &ToSoapFault,
  };
  return encoding;
}

}  // namespace Agentd
