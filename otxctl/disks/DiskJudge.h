// Which disks KOVA may use, from what is known about them.
//
// The one place that decides it, whatever machine the facts come from. Pure: values in, values out.
//
// What is not known is not free: a disk is eligible only if every fact is known and none speaks against it.
// So whatever becomes unknown, and whatever trace of use is found in addition, never makes a disk eligible.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "kova/agentd/include/KovaRecords.h"
#include "otxctl/disks/DiskFacts.h"

namespace OtxCtl::Disks {

struct DiskVerdict {
  HostCtl::Kova::DiskState state = HostCtl::Kova::DiskState::Ineligible;
  HostCtl::Kova::DiskReason reason = HostCtl::Kova::DiskReason::None;
  // Everything that was found against it, in words for people; empty for a disk that is eligible or in use.
  std::string detail;

  friend bool operator==(const DiskVerdict&, const DiskVerdict&) = default;
};

struct DiskLimits {
  std::int64_t minimumBytes = 0;
};

// One verdict per disk, in the order of `disks`: all disks of one host, for each also judges its neighbours.
// Of several reasons the one of the lowest number is told; what is no foreign data, but keeps a disk from
// being trusted with ours (read-only, removable, unknown, ...), has the reason HasForeignPartitions. Takes
// time in proportion to the number of disks.
std::vector<DiskVerdict> JudgeDisks(const std::vector<DiskFacts>& disks, const DiskLimits& limits);

}  // namespace OtxCtl::Disks
