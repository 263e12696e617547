// What a disk says of itself: names, serial number, kind.
//
// Threads: any; nothing is kept.
#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "otxctl/disks/DiskFacts.h"
#include "otxctl/linux/BlockDevices.h"
#include "otxctl/linux/SysfsReader.h"

namespace OtxCtl::Linux {

// Of a whole device that is no device-mapper device. Unknown if any part of it could not be read: two disks
// must not be taken for different ones since one of them was not heard.
Disks::Fact<Disks::DiskIdentity> IdentityOf(const SysfsReader& reader, const BlockDevice& device);

// The kernel's word for how the device does: "running", "live"; empty for kinds that have none.
Disks::Fact<std::string> StateOf(const SysfsReader& reader, const BlockDevice& device);

// Why this is no disk: an optical drive, a tape. Empty for a disk. Unknown: nobody can tell.
Disks::Fact<std::string> WhyNoDisk(const SysfsReader& reader, const BlockDevice& device);

// The serial number from page 80 of a SCSI disk's vital product data, cleaned; nothing if the page is not
// whole, or another one.
std::optional<std::string> ParseSerialPage(std::string_view page);

}  // namespace OtxCtl::Linux
