// The data volumes of disk groups, put into what the agent answers about the groups.
//
// Pure: values in, values out.
#pragma once

#include <vector>

#include "host/Machine.h"
#include "nox/Kova.h"

namespace Host {

// Adds each volume to the group that has its capacity disk, in the order of the group's disks. Volumes of
// other disks are passed over; a group without any stays as it is.
void AddDataVolumes(const std::vector<DataVolume>& volumes, Nox::Kova::Host::ConfigInfo::StorageInfo& info);

}  // namespace Host
