// The filter over the kernel's records that queries, planning and validation share.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "kova/agentd/include/KovaRecords.h"
#include "tessa/Logger.h"

namespace Kovasvc {

// What to filter by. The values below are where every user starts from.
struct DiskQueryLimit {
  bool byState = false;
  HostCtl::Kova::DiskState state = HostCtl::Kova::DiskState::Eligible;
  bool byReason = false;
  HostCtl::Kova::DiskReason reason = HostCtl::Kova::DiskReason::None;
  bool fifthFlag = true;  // carried along; no filter reads it
};

// Disks that the service could use, whatever speaks against them beside that.
inline constexpr DiskQueryLimit eligibleDisks = {.byState = true,
                                                 .state = HostCtl::Kova::DiskState::Eligible,
                                                 .byReason = false,
                                                 .reason = HostCtl::Kova::DiskReason::None,
                                                 .fifthFlag = false};

// Appends copies of the records that pass, in the order of the records. No names: every name passes; a
// name that matches nothing is passed over. A kernel exception while a record is appended ends the walk with
// a warning.
void LimitQueryDisksForKova(Tessa::Service::Logger& logger, const std::vector<std::string>& names,
                            const DiskQueryLimit& limit,
                            const std::vector<HostCtl::Kova::DiskResult>& records,
                            std::vector<HostCtl::Kova::DiskResult>& passed);

// The records' names, by reference, in order.
std::vector<std::string_view> NamesOfRecords(const std::vector<HostCtl::Kova::DiskResult>& records);

}  // namespace Kovasvc
