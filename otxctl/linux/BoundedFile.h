// Reads a whole file that nobody vouches for: not past a limit, and without waiting.
//
// Threads: any; nothing is kept.
#pragma once

#include <cstddef>
#include <optional>
#include <string>

#include "otxctl/disks/Fact.h"

namespace OtxCtl::Linux {

// A driver may refuse to read an attribute because the device has no such thing (EINVAL, ENXIO, ENODATA,
// EOPNOTSUPP).
enum class Refusal { IsFailure, MeansNone };

// The bytes of the file; none if there is no such file. Unknown, with path and reason: anything else, a file
// of more than `most` bytes included.
Disks::Fact<std::optional<std::string>> ReadWhole(const std::string& path, std::size_t most,
                                                  Refusal refusal = Refusal::IsFailure);

// "/sys/block/sda/size: Permission denied", fit to be shown.
std::string CannotRead(const std::string& path, int error);

}  // namespace OtxCtl::Linux
