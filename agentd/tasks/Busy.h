// The refusal of a request for which there is no room at the moment.
#pragma once

#include <string>

#include "nox/Fwd.h"
#include "tessa/Ref.h"

namespace Agentd {

// A fault that names the reason, and says when to ask again.
Tessa::Ref<Nox::Fault::Busy> TooBusy(const char* key, const std::string& reason);

}  // namespace Agentd
