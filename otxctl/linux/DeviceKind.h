// Which block devices are disks, and what the others are called.
//
// Threads: any; nothing is kept.
#pragma once

#include <string>

#include "otxctl/linux/BlockDevices.h"
#include "otxctl/linux/SysfsReader.h"

namespace OtxCtl::Linux {

// A device-mapper device that joins several paths to one disk.
bool IsMultipathMap(const BlockDevice& device);

// A device-mapper device for a partition of another one, made where the kernel makes none itself.
bool IsMappedPartition(const BlockDevice& device);

// Why a whole device is no disk, or nobody can tell whether it is; empty for disks and multipath devices.
std::string WhyLeftOut(const SysfsReader& reader, const BlockDevice& device);

// For people who look for what holds a disk: "vg0-data (LVM)", "md0 (RAID)", "bcache0".
std::string InWords(const BlockDevice& device);

}  // namespace OtxCtl::Linux
