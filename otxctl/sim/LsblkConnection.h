// How a disk of a capture is attached. Part of LsblkImport.
#pragma once

#include "otxctl/disks/DiskFacts.h"
#include "otxctl/sim/LsblkDevice.h"

namespace OtxCtl::Sim {

// Only what is seen to hang on a bus of the machine is taken for attached to it.
Disks::Fact<Disks::Connection> ConnectionOf(const LsblkDevice& device);

// The kernel shows nothing below it but itself: a loop, a RAM disk, a network device without a bus.
bool IsVirtual(const LsblkDevice& device);

}  // namespace OtxCtl::Sim
