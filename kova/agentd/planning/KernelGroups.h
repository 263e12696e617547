// The kernel's disk groups, as planning asks for them.
#pragma once

#include <vector>

#include "kova/agentd/include/KovaRecords.h"
#include "tessa/Logger.h"

namespace HostCtl::Kova {
class KovaInfo;
}

namespace Kovasvc {

// Mounted and unmounted ones, in the kernel's order; a failing kernel is a warning and none. Threads: any.
std::vector<HostCtl::Kova::DiskMapping> KernelGroupsOrNone(Tessa::Service::Logger& logger,
                                                           HostCtl::Kova::KovaInfo& provider);

}  // namespace Kovasvc
