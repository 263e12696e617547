// All disks of a Linux machine, with everything the judge of disks asks of them.
//
// Disks are whole devices that something may hang on: no partitions, no loop, memory or optical devices, none
// without a medium, no RAIDs and no logical volumes, which stand on disks. What is left out is told with the
// reason. A multipath device is a disk of its own; its paths are disks that lead to it.
//
// The kernel's tree is read once, the disks are probed, then the mounts are read. A disk that went away
// meanwhile, or whose name another one took, is left out. Takes time in proportion to the number of devices.
//
// Threads: any; nothing is kept. A probe is asked from the thread of the caller.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "otxctl/disks/DiskFacts.h"
#include "otxctl/linux/DiskProbe.h"
#include "otxctl/linux/SystemPaths.h"

namespace OtxCtl::Linux {

struct ScannedDisk {
  Disks::DiskFacts facts;
  std::string displayName;   // "LAB HDD 4G (sda)"
  std::string deviceNode;    // "/dev/sda"
  std::string deviceNumber;  // "8:0"
  std::int32_t blockSize = 512;
  // The canonical name is the disk's own, and no other disk's: neither that of its place, nor told apart from
  // another one by counting.
  bool hasStableName = false;
};

struct LeftOut {
  std::string kernelName;
  std::string why;
};

struct DiskScan {
  std::vector<ScannedDisk> disks;  // in the order of people: sda, sdz, sdaa
  std::vector<LeftOut> leftOut;
  // Set if the machine could not be looked at: then there may be disks, and none is told.
  std::string whyIncomplete;
};

DiskScan ScanDisks(const SystemPaths& paths, DiskProbe& probe);

}  // namespace OtxCtl::Linux
