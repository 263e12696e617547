// SOAP 1.1 messages, document/literal: one object in the body of an envelope.
//
//   <e:Envelope xmlns:e=".."><e:Header>..</e:Header><e:Body><AddDisks xmlns="urn:nox">..</AddDisks></e:Body>
//   </e:Envelope>
//
// Threads: any; a message may be read by several once it is made.
#pragma once

#include <memory>
#include <string>
#include <string_view>

#include "orbis/Any.h"
#include "orbis/Limits.h"
#include "orbis/ParseException.h"

namespace Orbis {

class DataObject;
class MethodFault;

// A message that is refused for its envelope, not for what is in it.
class TESSA_API EnvelopeException : public ParseException {
 public:
  // `code`: the fault code that SOAP has for it, "VersionMismatch", "MustUnderstand" or "Client".
  EnvelopeException(const char* code, std::string path, int line, const std::string& reason);
  EnvelopeException(const EnvelopeException&);
  ~EnvelopeException() override;

  const char* GetCode() const noexcept { return _code; }

 private:
  const char* _code;
};

// A request from outside.
class TESSA_API SoapMessage {
 public:
  // Throws EnvelopeException, or ParseException for a text that is no XML of ours. Headers are passed over,
  // but for those that must be understood and are addressed to whoever gets the message.
  SoapMessage(std::string_view text, const Limits& limits);
  ~SoapMessage();
  SoapMessage(const SoapMessage&) = delete;
  SoapMessage& operator=(const SoapMessage&) = delete;

  // The name of the one element in the body, which is of the API's namespace. Lives as long as the message.
  std::string_view GetName() const noexcept;

  // That element as an object of the type, read as generously as requests are: elements stand in any order,
  // those that only answers must have may be missing, and xsi:nil means absent. Throws ParseException.
  Ref<Any> Read(const TypeDescriptor& type) const;

 private:
  struct Store;
  std::unique_ptr<Store> _store;
};

// Appends a message with the object in its body, as the element of that name. Throws as SerializeObjectToSoap
// does, and leaves `out` as it was.
TESSA_API void AppendSoapMessage(std::string_view name, const DataObject& content, std::string& out);

// What stands in a fault beside its text.
struct SoapDetail {
  const MethodFault* fault = nullptr;  // the typed fault; null: none
  std::string_view name = {};          // of a further element, behind it; empty: none
  std::string_view text = {};          // what that element holds
};

// Appends a message that is a fault. `code` is "Client", "Server" or an EnvelopeException's. Never fails on
// texts.
TESSA_API void AppendSoapFault(std::string_view code, std::string_view text, const SoapDetail& detail,
                               std::string& out);

}  // namespace Orbis
