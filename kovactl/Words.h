// What disks say, in words for people.
#pragma once

#include <cstdint>
#include <string>

#include "nox/Fwd.h"

namespace Kovactl {

// The canonical name; empty for a disk without one.
std::string NameOf(const Nox::Host::ScsiDisk& disk);

// Whether the device is gone; only what the kernel remembers of it is left.
bool HasLeft(const Nox::Host::ScsiDisk& disk);

// "flash", "hard disk", or "unknown".
std::string KindOf(const Nox::Host::ScsiDisk& disk);

// "931.5 GiB"; "-" for a disk without a size.
std::string SizeOf(const Nox::Host::ScsiDisk& disk);

// Bytes in the largest unit of 1024 that leaves at least 1 of it, with one digit behind the point:
// "64.0 MiB", "512 B".
std::string HumanSize(std::uint64_t bytes);

// "in use", "eligible", "ineligible".
std::string StateOf(const Nox::Kova::Host::DiskResult& result);

// Why a disk cannot be used: what was found on it, if the host says so, else its fault or state; empty when
// it can be, or already is.
std::string ReasonOf(const Nox::Kova::Host::DiskResult& result);

}  // namespace Kovactl
