// The texts that a replayed request hands to its hook.
#pragma once

#include <string>
#include <vector>

#include "kovactl/replay/ReplayRequest.h"

namespace Kovactl {

// Those of a raw request as they are; else one SOAP text for each disk or mapping. A disk given by name is
// the one of that name in the inventory of this moment, or else a disk that has only its name.
std::vector<std::string> HookTexts(const ReplayRequest& request);

}  // namespace Kovactl
