// The inventory of a simulated host, as objects of the management API.
#pragma once

#include "nox/Fwd.h"
#include "tessa/Ref.h"

namespace OtxCtl::Sim {
struct HostDescription;
}

namespace Machines {

// What the agent lists there: the disks that have not left the host, then its other logical units.
Tessa::Ref<Nox::Host::StorageDeviceInfo> DescribeInventory(const OtxCtl::Sim::HostDescription& host);

}  // namespace Machines
