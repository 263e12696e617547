// What a disk hangs on, from the devices between it and the root of all devices.
//
// By what is known to be hardware, never by what is known not to be: there are more ways to make a disk
// without hardware, or with somebody else's, than anybody can list. Whatever fits no rule is unknown.
//
// Threads: any; nothing is kept.
#pragma once

#include "otxctl/disks/DiskFacts.h"
#include "otxctl/linux/BlockDevices.h"
#include "otxctl/linux/SysfsReader.h"

namespace OtxCtl::Linux {

// Of a whole device that is no device-mapper device.
Disks::Fact<Disks::Connection> ConnectionOf(const SysfsReader& reader, const BlockDevice& device);

// Whether it may be pulled out while the machine runs: by the bus it is on, or since the firmware says so of
// a device in between.
Disks::Fact<bool> IsHotPlug(const SysfsReader& reader, const BlockDevice& device);

}  // namespace OtxCtl::Linux
