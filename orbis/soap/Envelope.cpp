#include "orbis/Envelope.h"

#include <utility>

#include "orbis/DataObject.h"
#include "orbis/GrowingText.h"
#include "orbis/Namespaces.h"
#include "orbis/TypeDescriptor.h"
#include "orbis/Types.h"
#include "orbis/WrittenSoap.h"
#include "orbis/soap/ElementCodec.h"
#include "orbis/soap/WrittenText.h"
#include "orbis/xml/XmlReader.h"
#include "orbis/xml/XmlWriter.h"

namespace Orbis {
namespace {

using Xml::Element;

constexpr const char* client = "Client";

[[noreturn]] void Refuse(const char* code, const Element& element, const std::string& reason) {
  throw EnvelopeException(code, Xml::PathOf(element), element.line, reason);
}

bool IsEnvelopes(const Element* element, std::string_view name) {
  return element != nullptr && element->nameSpace == envelopeNamespace && element->name == name;
}

void CheckHeader(const Element& header) {
  for (const Element* entry = header.firstChild; entry != nullptr; entry = entry->nextSibling) {
    if (entry->mustUnderstand && !entry->forAnother) {
      Refuse("MustUnderstand", *entry, "no header is understood, and this one demands it");
    }
  }
}

// The one element that the envelope is for.
const Element& ContentOf(const Element& root) {
  if (root.name != "Envelope") {
    Refuse(client, root, "the root element must be a SOAP 1.1 Envelope");
  }
  if (root.nameSpace != envelopeNamespace) {
    Refuse("VersionMismatch", root, "the envelope must be of SOAP 1.1: " + std::string(envelopeNamespace));
  }
  const Element* child = root.firstChild;
  if (IsEnvelopes(child, "Header")) {
    CheckHeader(*child);
    child = child->nextSibling;
  }
  if (!IsEnvelopes(child, "Body")) {
    Refuse(client, child == nullptr ? root : *child, "the Body is missing");
  }
  if (child->nextSibling != nullptr) {
    Refuse(client, *child->nextSibling, "nothing may follow the Body");
  }
  const Element* const content = child->firstChild;
  if (content == nullptr) {
    Refuse(client, *child, "the Body is empty; it must hold one request");
  }
  if (content->nextSibling != nullptr) {
    Refuse(client, *content->nextSibling, "the Body must hold one request only");
  }
  if (content->nameSpace != apiNamespace) {
    Refuse(client, *content, "the request must be of namespace '" + std::string(apiNamespace) + "'");
  }
  return *content;
}

// The next item of a list, under another name.
void AppendRenamed(Soap::WrittenText& written, std::string_view name, GrowingText& out) {
  const Soap::WrittenTag item = written.Open();
  if (item.name != "item") {
    throw Soap::Unfamiliar();
  }
  out.Append("<", name);
  if (!item.type.empty()) {
    out.Append(" xsi:type=\"", item.type, "\"");
  }
  out.Append(">", written.TakeContent(), "</", name, ">");
  written.Close(item.name);
}

// The envelope round what `append` writes into the body; all or nothing.
template <class Append>
void AppendEnvelope(std::string& out, Append append) {
  const std::size_t before = out.size();
  try {
    out.append("<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<soapenv:Envelope xmlns:soapenv=\"");
    out.append(envelopeNamespace).append("\" xmlns:xsd=\"").append(schemaNamespace);
    out.append("\" xmlns:xsi=\"").append(instanceNamespace).append("\"><soapenv:Body>");
    append();
    out.append("</soapenv:Body></soapenv:Envelope>\n");
  } catch (...) {
    out.resize(before);
    throw;
  }
}

void AppendDetail(const SoapDetail& detail, std::string& out) {
  if (detail.fault != nullptr) {
    Soap::AppendElement("fault", *detail.fault, &MethodFault::StaticType(), out);
  }
  if (!detail.name.empty()) {
    out.append("<").append(detail.name).append(" xmlns=\"").append(apiNamespace).append("\">");
    Xml::AppendText(out, detail.text);
    out.append("</").append(detail.name).append(">");
  }
}

}  // namespace

EnvelopeException::EnvelopeException(const char* code, std::string path, int line, const std::string& reason)
    : ParseException(std::move(path), line, reason), _code(code) {}
EnvelopeException::EnvelopeException(const EnvelopeException&) = default;
EnvelopeException::~EnvelopeException() = default;

struct SoapMessage::Store {
  Store(std::string_view text, const Limits& limits)
      : document(text, limits, Xml::Attributes::RefuseOnData), content(ContentOf(document.Root())) {}

  Xml::Document document;
  const Element& content;
};

SoapMessage::SoapMessage(std::string_view text, const Limits& limits)
    : _store(std::make_unique<Store>(text, limits)) {}
SoapMessage::~SoapMessage() = default;

std::string_view SoapMessage::GetName() const noexcept {
  return _store->content.name;
}

Ref<Any> SoapMessage::Read(const TypeDescriptor& type) const {
  return Soap::ReadRequestElement(_store->content, type);
}

void AppendSoapMessage(std::string_view name, const DataObject& content, std::string& out) {
  AppendEnvelope(out, [&] { Soap::AppendElement(name, content, &content.GetType(), out); });
}

bool AppendMessageOfSoap(std::string_view name, std::string_view field, const TypeDescriptor& list,
                         std::string_view text, std::string& out) {
  const auto append = [&] {
    Soap::WrittenText written(text);
    if (written.OpenRoot() != list.name) {
      throw Soap::Unfamiliar();
    }
    GrowingText message(out, text.size() + text.size() / 8);  // the new name may be longer than the old
    message.Append("<", name, " xmlns=\"", apiNamespace, "\">");
    while (!written.IsAtEndTag()) {
      AppendRenamed(written, field, message);
    }
    written.CloseRoot();
    message.Append("</", name, ">");
  };
  try {
    AppendEnvelope(out, append);
    return true;
  } catch (const Soap::Unfamiliar&) {
    return false;
  }
}

void AppendSoapFault(std::string_view code, std::string_view text, const SoapDetail& detail,
                     std::string& out) {
  AppendEnvelope(out, [&] {
    out.append("<soapenv:Fault><faultcode>soapenv:").append(code).append("</faultcode><faultstring>");
    Xml::AppendText(out, text);
    out.append("</faultstring>");
    if (detail.fault != nullptr || !detail.name.empty()) {
      out.append("<detail>");
      AppendDetail(detail, out);
      out.append("</detail>");
    }
    out.append("</soapenv:Fault>");
  });
}

}  // namespace Orbis
