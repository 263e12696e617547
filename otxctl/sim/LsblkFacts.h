// What a capture of lsblk tells about each disk of its machine, as facts for the judge. Part of LsblkImport.
#pragma once

#include <string>
#include <vector>

#include "otxctl/disks/DiskFacts.h"
#include "otxctl/sim/LsblkDevice.h"
#include "otxctl/sim/LsblkImport.h"

namespace OtxCtl::Sim {

struct CapturedDisk {
  const LsblkDevice* device = nullptr;
  Disks::DiskFacts facts;
};

struct CapturedDisks {
  std::vector<CapturedDisk> disks;  // multipath devices among them, in the place of their first path
  std::vector<LeftOutDevice> leftOut;
};

// Throws HostDescriptionError for a capture that shows a machine in parts, or that lsblk made where it could
// not see what is on the disks. The disks refer to `devices`.
CapturedDisks DisksOfCapture(const std::vector<LsblkDevice>& devices);

// Throws HostDescriptionError if the capture shows partitions, members and the like on its disks, but nothing
// that stands on any of them: who looked so briefly does not know what is free.
void CheckThatHoldersAreShown(const std::vector<LsblkDevice>& devices);

}  // namespace OtxCtl::Sim
