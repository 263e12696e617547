// What API objects say, in words for people.
#pragma once

#include <cstdint>
#include <string>

#include "nox/Fwd.h"
#include "orbis/Types.h"

namespace Kovactl {

// "flash", "hard disk", or "unknown".
std::string KindOf(const Nox::Host::ScsiDisk& disk);

// "931.5 GiB"; "-" for a disk without a size.
std::string SizeOf(const Nox::Host::ScsiDisk& disk);

// Bytes in the largest unit of 1024 that leaves at least 1 of it, with one digit behind the point:
// "64.0 MiB", "512 B".
std::string HumanSize(std::uint64_t bytes);

// "in use", "eligible", "ineligible".
std::string StateOf(const Nox::Kova::Host::DiskResult& result);

// Why a disk cannot be used; empty when it can, or already is.
std::string ReasonOf(const Nox::Kova::Host::DiskResult& result);

// What went wrong, in one line: the words for the fault's kind, then its messages.
std::string Explain(const Orbis::MethodFault& fault);

}  // namespace Kovactl
