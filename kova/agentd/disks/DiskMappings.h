// What several operations do with disk groups of the management API.
//
// Threads: any. Reading a disk without a canonical name, a null disk or a null group throws
// Tessa::NotInitializedException.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "nox/Fwd.h"
#include "orbis/DataArray.h"
#include "tessa/Logger.h"
#include "tessa/Ref.h"

namespace Kovasvc {

// The disk's canonical name.
const std::string& NameOf(const Nox::Host::ScsiDisk* disk);
// Whether it is a flash disk.
bool IsSsd(const Nox::Host::ScsiDisk* disk);
// The group itself, for reading; a null one ends here.
const Nox::Kova::Host::DiskMapping& Existing(const Nox::Kova::Host::DiskMapping* mapping);
// The canonical name of the group's cache disk.
const std::string& SsdNameOf(const Nox::Kova::Host::DiskMapping* mapping);
// The canonical names of the group's capacity disks, in order.
std::vector<std::string> CapacityNamesOf(const Nox::Kova::Host::DiskMapping* mapping);
// The canonical name, or "<unset>", for messages.
std::string NameForLog(const Nox::Host::ScsiDisk* disk);
// The canonical names of the disks, in order. A null array has none.
std::vector<std::string> NamesOf(const Orbis::DataArray<Nox::Host::ScsiDisk>* disks);
// The names, separated by ", ".
std::string JoinNames(const std::vector<std::string>& names);

// Appends the canonical names of the group's disks, the cache disk's first; empty ones are left out. The
// names stay the disks'.
void AppendDeviceNames(const Nox::Kova::Host::DiskMapping* mapping, std::vector<std::string_view>& names);

// Appends the same names, copied, and sorts the whole list by bytes. Duplicates are kept.
void DiskMappingToDeviceNames(const Tessa::Ref<Nox::Kova::Host::DiskMapping>& mapping,
                              std::vector<std::string>& names);

// One verbose line per group. The names are read whatever the level.
void LogDiskMappings(Tessa::Service::Logger& logger,
                     const Orbis::DataArray<Nox::Kova::Host::DiskMapping>* mappings);
// The same for one group.
void LogOneDiskMapping(Tessa::Service::Logger& logger,
                       const Tessa::Ref<Nox::Kova::Host::DiskMapping>& mapping);

// Appends the disk of each result, in order.
void AppendDisks(const Orbis::DataArray<Nox::Kova::Host::DiskResult>& results,
                 Orbis::DataArray<Nox::Host::ScsiDisk>& disks);
// Appends each group, in order. A null array has none.
void AppendMappings(const Orbis::DataArray<Nox::Kova::Host::DiskMapping>* more,
                    Orbis::DataArray<Nox::Kova::Host::DiskMapping>& mappings);

}  // namespace Kovasvc
