// How a simulated host names the disks that it formats.
#pragma once

#include <string>
#include <string_view>

namespace OtxCtl::Sim {

// The UUID of a disk: version 5 (name-based) in the URL namespace, of "kova:HOST/DISK", in lower case. The
// same host and disk always yield the same one.
std::string KovaUuidOf(std::string_view host, std::string_view disk);

}  // namespace OtxCtl::Sim
