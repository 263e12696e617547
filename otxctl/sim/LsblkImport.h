// A host description from what `lsblk --json -O -b` says of a machine.
//
// Only whole disks are taken over: no partitions, no mapped, loop, memory or optical devices, none of size 0.
// A disk that someone uses (a partition, a file system, a holder, a mount) counts as having partitions, so
// that it is never offered; a read-only disk gets the verdict "ineligible" without a reason.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "otxctl/sim/HostDescription.h"

namespace OtxCtl::Sim {

struct LsblkImportOptions {
  std::string hostName = "imported";
  std::int64_t minimumDiskBytes = std::int64_t{1} << 30;
};

// Throws HostDescriptionError that begins with the path (`blockdevices[3].size: ...`). Names and other texts
// of devices are cleaned, not refused; canonical names come out unique.
HostDescription ImportLsblk(std::string_view lsblkJson, const LsblkImportOptions& options = {});

}  // namespace OtxCtl::Sim
