// The texts that a replayed request hands to its hook.
#pragma once

#include "kovactl/replay/ReplayRequest.h"

namespace Kovactl {

// Adds one SOAP text for each disk or group of the request to the hook's arguments. A disk given by name is
// the one of that name in the inventory of this moment, or else a disk that has only its name.
void AddTexts(ReplayRequest& request);

}  // namespace Kovactl
