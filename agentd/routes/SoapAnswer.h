// What the agent answers a SOAP client.
//
// Threads: any.
#pragma once

#include <string_view>

#include "agentd/http/HttpTypes.h"
#include "agentd/tasks/Task.h"
#include "host/Answer.h"

namespace Orbis {
class ParseException;
}

namespace Agentd {

// The operation's response, with the result and, beside it, the fault; or a SOAP fault with the typed fault
// as its detail, when there is a fault and no result, or an empty list.
HttpAnswer ToSoap(std::string_view operation, const Host::Answer& answer);

// The same of a change that has ended, with the id of its task: in the response, or in the fault's detail.
HttpAnswer ToSoap(const Task& ended);

// The same of a query of disks, whose result is still a text.
HttpAnswer ToSoap(std::string_view operation, const Host::WrittenAnswer& answer);

// A SOAP fault for a message that was refused. What is wrong with a parameter is an InvalidArgument that
// names it; what is wrong with the envelope has no detail.
HttpAnswer ToSoap(const Orbis::ParseException& refused);

// A SOAP fault without a detail.
HttpAnswer SoapFault(std::string_view code, std::string_view text);

}  // namespace Agentd
