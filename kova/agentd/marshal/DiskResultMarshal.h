// The kernel's record of a disk becomes the management API's disk result.
//
// Threads: any; nothing is kept between calls. "out" references are replaced, or left as they were where a
// function says so.
#pragma once

#include <string>
#include <vector>

#include "kova/agentd/disks/DiskCache.h"
#include "kova/agentd/include/KovaRecords.h"
#include "nox/Fwd.h"
#include "orbis/DataArray.h"
#include "tessa/Logger.h"
#include "tessa/Ref.h"

namespace Orbis {
class MethodFault;
}

namespace Kovasvc {

class DiskInventory;
struct DiskQueryLimit;

// The state's text; ineligible for values that nobody knows.
const char* MarshalDiskState(HostCtl::Kova::DiskState state);

// The fault for a reason; `fault` is left as it was for reasons that have none.
void MarshalDiskReason(const std::string& deviceName, HostCtl::Kova::DiskReason reason,
                       Tessa::Ref<Orbis::MethodFault>& fault);

// Takes away what results do not carry: durable name, alternate names, standard inquiry data. (The name is
// misspelt everywhere, and stays findable so.)
void CleanUnusedDiskFileds(Nox::Host::ScsiDisk& disk);

// One record. The disk in the result is a copy of the inventory's, or a stand-in for an absent disk.
// `result` is left as it was when the disk is not in the inventory, or absent without a UUID.
// `queryMode`: a flash disk tagged for the capacity tier keeps its `ssd`; for planning it is no cache disk.
void MarshalHostCtlDiskResult(Tessa::Service::Logger& logger, const HostCtl::Kova::DiskResult& record,
                              const DiskInventory& inventory, Tessa::Ref<Nox::Kova::Host::DiskResult>& result,
                              bool queryMode);

// All records, in order, against the inventory of this moment; those without a disk are left out. Throws
// Orbis::Fault::SystemError::Exception when there is no inventory; `results` is then as it was.
void MarshalHostCtlDiskResults(Tessa::Service::Logger& logger,
                               const std::vector<HostCtl::Kova::DiskResult>& records,
                               Tessa::Ref<Orbis::DataArray<Nox::Kova::Host::DiskResult>>& results,
                               bool queryMode);

// The cached records of these disks, or of all without names, that pass the limit, as above, for planning.
Tessa::Ref<Orbis::DataArray<Nox::Kova::Host::DiskResult>> MarshalCachedDisks(
    Tessa::Service::Logger& logger, const DiskCache::Locked& cache, const std::vector<std::string>& names,
    const DiskQueryLimit& limit);

}  // namespace Kovasvc
