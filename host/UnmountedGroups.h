// Disk groups that the kernel has but that are not in use. The plug-in's storage info knows nothing of them.
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

// In order of creation. Throws what the provider throws.
std::vector<HostCtl::Kova::DiskMapping> UnmountedGroups(HostCtl::Kova::KovaInfo& kernel);

// Appends the groups to `diskMapInfo` as not mounted, unless it has one of that cache disk already. Disks are
// the inventory's; one that it lacks has only its name, one that has left the host is stood in for.
void AppendUnmounted(const std::vector<HostCtl::Kova::DiskMapping>& groups, const KnownDisks& known,
                     Nox::Kova::Host::ConfigInfo::StorageInfo& info);

}  // namespace Host
