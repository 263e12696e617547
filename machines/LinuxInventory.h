// The inventory of a Linux machine, as objects of the management API.
#pragma once

#include "nox/Fwd.h"
#include "tessa/Ref.h"

namespace OtxCtl::Linux {
struct LinuxSnapshot;
}

namespace Machines {

// Its disks, each with what keeps it from being used. What is no disk of the machine is not listed.
Tessa::Ref<Nox::Host::StorageDeviceInfo> DescribeInventory(const OtxCtl::Linux::LinuxSnapshot& seen);

}  // namespace Machines
