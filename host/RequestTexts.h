// Requests as the texts that the plug-in reads.
//
// The plug-in ends the process over a text that it cannot read, so what goes into one must come out again: a
// name that XML cannot hold, a text larger than the plug-in's reader takes, and texts too large together are
// refused by an InvalidArgument that names the disk or the group.
//
// Threads: any.
#pragma once

#include <string>

#include "host/ManagementApi.h"
#include "kova/agentd/include/KovaHooks.h"

namespace Host {

inline constexpr std::size_t mostTextBytes = 256u << 20;  // of one request

// One text for each. No disk may be null, nor without a canonical name: the gate has seen to it.
Kovasvc::Texts ToTexts(const DiskList& disks, std::size_t mostBytes = mostTextBytes);
Kovasvc::Texts ToTexts(const MappingList& mappings, std::size_t mostBytes = mostTextBytes);
std::string ToText(const Nox::Kova::Host::DiskMapping& mapping, std::size_t mostBytes = mostTextBytes);

}  // namespace Host
