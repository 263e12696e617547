// A SOAP message, read as the arguments of an operation.
//
// Threads: any.
#pragma once

#include <string>
#include <string_view>

#include "agentd/routes/Operations.h"

namespace Agentd {

struct SoapRequest {
  const Operation* operation;
  Arguments arguments;
  std::string label;  // the client's own name for a request that changes disks
};

// Bounded and strict. `action` is the value of the SOAPAction header; empty or an empty text in quotes says
// nothing, any other must name the operation of the body. Throws Orbis::EnvelopeException for what is wrong
// with the message, Orbis::ParseException for what is wrong with its parameters; both name place and line.
SoapRequest ReadSoapRequest(std::string_view body, std::string_view action);

}  // namespace Agentd
