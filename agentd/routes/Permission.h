// Whether a client may do what it asks for.
//
// Threads: any.
#pragma once

#include <optional>

#include "agentd/http/HttpTypes.h"
#include "host/Answer.h"

namespace Agentd {

// Nothing when the client may do what takes that role. Otherwise an answer that is only a NotPermitted fault
// naming the role. A change that a page in a browser asks for is never permitted: whoever sits before it did
// not ask for it. Every refusal is logged, with who was refused.
std::optional<Host::Answer> RefusalOf(const HttpRequest& request, HttpRole role);

}  // namespace Agentd
