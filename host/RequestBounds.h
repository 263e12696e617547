// What a request may be at most while it waits for its turn, and what of it is worth keeping.
//
// Threads: any.
#pragma once

#include <string>

#include "host/ManagementApi.h"

namespace Host {

// The disks with nothing but name and flag: what the gate looks at. Too many of them, or too long a name, are
// refused by an InvalidArgument as the gate does it; whatever else is wrong is left to the gate.
Tessa::Ref<DiskList> Lean(const std::string& property, const DiskList& disks);
Tessa::Ref<MappingList> Lean(const MappingList& mappings);
Tessa::Ref<Nox::Kova::Host::DiskMapping> Lean(const Nox::Kova::Host::DiskMapping& mapping);

// Roughly the bytes that they take in memory.
std::size_t WeightOf(const DiskList& disks);
std::size_t WeightOf(const MappingList& mappings);
std::size_t WeightOf(const Nox::Kova::Host::DiskMapping& mapping);

}  // namespace Host
