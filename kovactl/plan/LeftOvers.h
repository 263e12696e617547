// Disks that were offered for disk groups and are in none, and why.
#pragma once

#include <iosfwd>
#include <set>
#include <string>
#include <vector>

#include "host/ManagementApi.h"
#include "kovactl/plan/Plan.h"
#include "otxctl/sim/HostDescription.h"

namespace Kovactl {

// Goes through the offered disks (none named: every disk of the host that no mounted group has) except those
// in `placed`. `before` is the host to which they were offered; `host` tells why a disk is not eligible. A
// disk that the host does not know is passed over: its answer tells of it.
std::vector<LeftOverDisk> FindLeftOvers(const Host::ManagementApi& host,
                                        const OtxCtl::Sim::HostDescription& before,
                                        const std::vector<std::string>& offered,
                                        const std::set<std::string>& placed);

// The same for a host on which nothing was changed; nothing for one that cannot be looked at.
std::vector<LeftOverDisk> ExplainLeftOvers(const Host::ManagementApi& host,
                                           const std::vector<std::string>& offered);

// How many have each reason, the most frequent first; nothing for an empty list.
void PrintLeftOverCounts(const std::vector<LeftOverDisk>& disks, std::ostream& out);

// Each with its reason; nothing for an empty list.
void PrintLeftOverNames(const std::vector<LeftOverDisk>& disks, std::ostream& out);

}  // namespace Kovactl
