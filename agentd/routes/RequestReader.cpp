#include "agentd/routes/RequestReader.h"

#include <string>

#include "orbis/Envelope.h"
#include "orbis/Json.h"
#include "orbis/Namespaces.h"
#include "orbis/ParseException.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/json/JsonText.h"
#include "tessa/text/Escape.h"

namespace Agentd {
namespace {

using Nox::OperationDescriptor;
using Orbis::EnvelopeException;
using Orbis::FieldDescriptor;
using Orbis::Presence;
using Orbis::Json::Kind;
using Orbis::Json::Value;

// A key of the client's, in a place: '' for one without a letter.
std::string Named(std::string_view key) {
  return key.empty() ? "''" : Tessa::Escape(key);
}

std::string ParametersOf(const OperationDescriptor& operation) {
  std::string names;
  for (const FieldDescriptor* field : operation.request.fields) {
    names += (names.empty() ? "" : ", ") + std::string(field->name);
  }
  return names.empty() ? "no parameters" : names;
}

// A list that changes something is never left out; one that only asks may be.
bool IsRequired(const OperationDescriptor& operation, const FieldDescriptor& parameter) {
  return parameter.presence == Presence::Required ||
         (parameter.presence == Presence::List && operation.changes);
}

void CheckParameters(const OperationDescriptor& operation, const Value& root) {
  for (const auto& [key, value] : root.members) {
    if (operation.request.FindField(key) == nullptr) {
      throw Orbis::ParseException(
          Named(key), value.line,
          "unknown parameter; " + std::string(operation.name) + " takes " + ParametersOf(operation));
    }
  }
  for (const FieldDescriptor* field : operation.request.fields) {
    if (IsRequired(operation, *field) && root.Find(field->name) == nullptr) {
      throw Orbis::ParseException(std::string(field->name), root.line, "is missing");
    }
  }
}

// What a label may be, whichever way it comes. 0: the line is not known.
void CheckLabel(const Orbis::DataObject& request, int line) {
  const auto* const change = dynamic_cast<const Nox::Operation::Change*>(&request);
  if (change == nullptr || !change->HasLabel()) {
    return;
  }
  if (change->GetLabel().size() > longestLabel) {
    throw Orbis::ParseException("label", line,
                                "a label of more than " + std::to_string(longestLabel) + " bytes");
  }
  if (!Tessa::IsPrintable(change->GetLabel())) {
    throw Orbis::ParseException("label", line, "a label has no control characters");
  }
}

RequestRef AsRequest(const Tessa::Ref<Orbis::Any>& read, int line) {
  RequestRef request(static_cast<Orbis::DataObject*>(read.Get()));
  CheckLabel(*request, line);
  return request;
}

std::string_view Unquoted(std::string_view text) {
  const bool quoted = text.size() >= 2 && text.front() == '"' && text.back() == '"';
  return quoted ? text.substr(1, text.size() - 2) : text;
}

void CheckAction(std::string_view action, std::string_view name) {
  const std::string_view wanted = Unquoted(action);
  if (!wanted.empty() && wanted != std::string(Orbis::apiNamespace) + "#" + std::string(name)) {
    throw EnvelopeException(
        "Client", "SOAPAction", 0,
        "the header does not name the operation of the body, '" + std::string(name) + "'");
  }
}

}  // namespace

RequestRef ReadJsonRequest(const OperationDescriptor& operation, std::string_view body) {
  const Value root = Orbis::Json::Parse(body, Orbis::Limits::Untrusted());
  if (root.kind != Kind::Object) {
    throw Orbis::ParseException("(root)", root.line,
                                "wanted an object, found " + Orbis::Json::Describe(root));
  }
  CheckParameters(operation, root);
  const Orbis::JsonRules rules{.missing = Orbis::Missing::InRequest, .named = &Orbis::ObjectOfKey};
  const Value* const label = root.Find("label");
  return AsRequest(Orbis::ReadJson(root, &operation.request, {}, rules), label == nullptr ? 0 : label->line);
}

SoapRequest ReadSoapRequest(std::string_view body, std::string_view action) {
  const Orbis::SoapMessage message(body, Orbis::Limits::Untrusted());
  const OperationDescriptor* const operation = Nox::FindOperation(message.GetName());
  if (operation == nullptr) {
    throw EnvelopeException("Client", "/Envelope/Body", 0,
                            "there is no operation '" + std::string(Tessa::Excerpt(message.GetName())) + "'");
  }
  CheckAction(action, operation->name);
  return {operation, AsRequest(message.Read(operation->request), 0)};
}

}  // namespace Agentd
