// Hosts of any size for benchmarks.
#pragma once

#include <string>

#include "nox/Fwd.h"
#include "orbis/DataArray.h"
#include "otxctl/sim/HostDescription.h"
#include "tessa/Ref.h"

namespace Bench {

// A name as real disks have it: 20 characters.
std::string DiskName(int index);

// A host of so many disks: one flash disk in eight, one disk in sixteen with partitions.
OtxCtl::Sim::HostDescription HostWithDisks(int count);

// The inventory's disks of such a host.
Tessa::Ref<Orbis::DataArray<Nox::Host::ScsiDisk>> DisksOf(const OtxCtl::Sim::HostDescription& host);

}  // namespace Bench
