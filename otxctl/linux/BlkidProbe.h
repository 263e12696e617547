// The probe of real disks: opens the device's node and reads what stands there.
//
// Threads: any, several at a time; nothing is kept. Opens each disk twice, never for writing: once to see
// whether anybody else has claimed it, which is let go at once, and once to read.
#pragma once

#include <string>

#include "otxctl/linux/DiskProbe.h"

namespace OtxCtl::Linux {

class BlkidProbe : public DiskProbe {
 public:
  ProbeResult Probe(const std::string& node, const std::string& number) override;
};

// Whether a signature or a partition table stands on the device of this path. True if nobody can tell.
bool HoldsData(const std::string& path);

}  // namespace OtxCtl::Linux
