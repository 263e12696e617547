// What the agent answers a SOAP client.
//
// Threads: any.
#pragma once

#include <string_view>

#include "agentd/http/HttpTypes.h"
#include "agentd/routes/Dispatch.h"
#include "agentd/tasks/Task.h"
#include "host/Answer.h"

namespace Orbis {
class ParseException;
}

namespace Agentd {

// To a query: the operation's response, with the result and, beside it, the fault; or a SOAP fault with the
// typed fault as its detail, when there is a fault and no result, or an empty list.
HttpAnswer ToSoap(const Nox::OperationDescriptor& operation, const Host::Answer& answer);

// The same of a change that has ended, with the id of its task: in the response, or in the fault's detail.
HttpAnswer ToSoap(const Task& ended);

// A SOAP fault with the answer's fault as its detail.
HttpAnswer ToSoapFault(const Host::Answer& answer);

// All of this, for requests that are dispatched. A change that nobody waits for is answered with the id of
// its task alone.
const Encoding& SoapEncoding();

// A SOAP fault for a message that was refused. What is wrong with a parameter is an InvalidArgument that
// names it; what is wrong with the envelope has no detail.
HttpAnswer ToSoap(const Orbis::ParseException& refused);

// A SOAP fault without a detail.
HttpAnswer SoapFault(std::string_view code, std::string_view text);

}  // namespace Agentd
