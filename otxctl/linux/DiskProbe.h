// Looks at what stands on a disk. An interface, so that tests need no disks.
#pragma once

#include <string>
#include <vector>

#include "otxctl/disks/Fact.h"

namespace OtxCtl::Linux {

struct ProbeResult {
  Disks::Fact<std::vector<std::string>> signatures;  // in words: "ext4 file system \"DATA\""
  Disks::Fact<std::string> partitionTable;           // its kind; empty: none
  Disks::Fact<bool> isBusy;                          // somebody has it open for himself
  bool isGone = false;                               // no such device any more
  bool hasNoMedium = false;
};

class DiskProbe {
 public:
  virtual ~DiskProbe() = default;

  // `node` leads to the disk, "/dev/sda"; `number` is the device number that it must have, "8:0". Only reads.
  virtual ProbeResult Probe(const std::string& node, const std::string& number) = 0;
};

}  // namespace OtxCtl::Linux
