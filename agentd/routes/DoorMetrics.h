// How things stand at the doors of the server, for monitoring.
#pragma once

#include <string>

#include "agentd/http/HttpLoad.h"

namespace Agentd {

// In the text format of Prometheus, version 0.0.4: connections by listener, refusals by cause, and the memory
// of bodies.
std::string DescribeDoors(const HttpLoad& load);

}  // namespace Agentd
