// What the attributes of a device tell the judge of disks; neither what is mounted nor what stands on it.
//
// Threads: any; nothing is kept.
#pragma once

#include <string>

#include "otxctl/disks/DiskFacts.h"
#include "otxctl/linux/BlockDevices.h"
#include "otxctl/linux/SysfsReader.h"

namespace OtxCtl::Linux {

// Of a disk or a multipath device. Of the latter, what its paths tell: their identity if all agree, the worst
// of their connections. Canonical name, signatures, table, mounts and holders are left open.
Disks::DiskFacts FactsOf(const SysfsReader& reader, const BlockDevices& devices, const BlockDevice& device);

// What a disk is called on its machine. A multipath device has the name that device-mapper knows it by,
// unless that is the name of another device, too.
std::string KernelNameOf(const BlockDevices& devices, const BlockDevice& device);

// Whether reading from it comes to an end: who reads from a device that is blocked or suspended waits with
// it.
bool IsReadable(const Disks::DiskFacts& facts);

}  // namespace OtxCtl::Linux
