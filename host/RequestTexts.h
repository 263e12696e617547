// Requests as the texts that the plug-in reads.
//
// The plug-in ends the process over a text that it cannot read. So each text is read again here, by the same
// reader, and must come out with the disks that went in; otherwise the request is refused by an
// InvalidArgument that names the disk or the group, as it is when all texts together are too large.
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
