// What the plug-in says of a host, in lines that people can compare.
#pragma once

#include <string>

#include "otxctl/sim/HostDescription.h"

namespace Integration {

// Storage info, configuration info, and the groups that would be planned if every eligible disk were added
// (all-flash ones first, then hybrid ones) and every group that is not mounted were found again.
std::string OutcomeOf(const OtxCtl::Sim::HostDescription& host);

}  // namespace Integration
