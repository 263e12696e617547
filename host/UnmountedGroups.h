// Disk groups that the kernel has but that the plug-in's storage info does not list: those that are not
// mounted, and those that came between the two questions.
//
// Threads: any, as far as the provider goes.
#pragma once

#include <vector>

#include "kova/agentd/include/KovaRecords.h"
#include "nox/Kova.h"

namespace HostCtl::Kova {
class KovaInfo;
}

namespace Host {

class KnownDisks;

struct KernelGroup {
  HostCtl::Kova::DiskMapping disks;
  bool mounted = false;
};

// Every group of the kernel, in order of creation. Throws what the provider throws.
std::vector<KernelGroup> GroupsOf(HostCtl::Kova::KovaInfo& kernel);

// Appends to `diskMapInfo` the groups that it does not list already; it is older than they are. Groups are
// told apart by their cache disk and, where several cache disks have left without a UUID or with the same, by
// their other disks. Disks are the inventory's; one that it lacks has only its name, one that has left the
// host is stood in for.
void AppendUnlisted(const std::vector<KernelGroup>& groups, const KnownDisks& known,
                    Nox::Kova::Host::ConfigInfo::StorageInfo& info);

}  // namespace Host
