// Where a disk is plugged in, for disks that have nothing else to be told by.
//
// Threads: any; nothing is kept.
#pragma once

#include <string>

#include "otxctl/linux/BlockDevices.h"
#include "otxctl/linux/SysfsReader.h"

namespace OtxCtl::Linux {

// "pci-0000:00:05.0-scsi-0:0:1:0": the same from boot to boot as long as nobody moves the disk. What the
// kernel counts up as it finds things is left out, or counted from the first one of the same controller. The
// kernel's name for a disk without such a place.
std::string PlaceOf(const SysfsReader& reader, const BlockDevice& device);

}  // namespace OtxCtl::Linux
