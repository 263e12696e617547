// A host description from what `lsblk --json -O -b` says of a machine.
//
// Only whole disks are taken over, and multipath devices for the disks behind them. What is known of each
// goes to the judge of disks (otxctl/disks), as on a machine of its own; a disk that it does not find free is
// described so that it never is offered, with the words why.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "otxctl/sim/HostDescription.h"

namespace OtxCtl::Sim {

struct LsblkImportOptions {
  std::string hostName = "imported";
  std::int64_t minimumDiskBytes = std::int64_t{1} << 30;
};

// A device of the capture that is no disk of the host, and why.
struct LeftOutDevice {
  std::string name;
  std::string why;
};

struct LsblkImport {
  HostDescription host;
  std::vector<std::string> kernelNames;  // of the host's disks, in their order
  std::vector<LeftOutDevice> leftOut;
};

// Throws HostDescriptionError that begins with the path (`blockdevices[3].size: ...`) for what is no such
// capture, or one that does not tell enough to say what is free: a column is missing, it shows devices
// without those they stand on, or lsblk could not see. Names and other texts of devices are cleaned, not
// refused; canonical names come out unique.
LsblkImport ImportLsblk(std::string_view lsblkJson, const LsblkImportOptions& options = {});

}  // namespace OtxCtl::Sim
