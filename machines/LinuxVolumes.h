// The data volumes of this machine's disk groups.
#pragma once

#include <vector>

#include "host/Machine.h"

namespace OtxCtl::Linux {
struct LinuxSnapshot;
}

namespace Machines {

// Of each capacity disk that has one, in the order of the groups. Pure.
std::vector<Host::DataVolume> DescribeVolumes(const OtxCtl::Linux::LinuxSnapshot& seen);

}  // namespace Machines
