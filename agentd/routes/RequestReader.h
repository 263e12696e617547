// The body of a request, read as the request object of its operation.
//
//   {"disks": ["naa.1", {"canonicalName": "naa.2", "ssd": true}], "label": "rack 3", "wait": false}
//
// In JSON a disk is a text, its canonical name, or an object whose missing fields have defaults. Bounded and
// strict: unknown, missing, doubled and mistyped parameters are refused by an Orbis::ParseException that
// names the place and the line.
//
// Threads: any.
#pragma once

#include <string_view>

#include "nox/OperationTable.h"
#include "tessa/Ref.h"

namespace Agentd {

inline constexpr std::size_t longestLabel = 256;  // bytes

using RequestRef = Tessa::Ref<Orbis::DataObject>;

// An object of the operation's request type.
RequestRef ReadJsonRequest(const Nox::OperationDescriptor& operation, std::string_view body);

struct SoapRequest {
  const Nox::OperationDescriptor* operation;
  RequestRef request;
};

// The same of a SOAP message. `action` is the value of the SOAPAction header; empty or an empty text in
// quotes says nothing, any other must name the operation of the body. Throws Orbis::EnvelopeException for
// what is wrong with the message.
SoapRequest ReadSoapRequest(std::string_view body, std::string_view action);

}  // namespace Agentd
