// Texts in which the kernel tells of devices that come, go and change.
//
// Pure: bytes in, values out.
#pragma once

#include <string_view>

namespace OtxCtl::Linux {

// Whether the message tells of a block device that was added, removed or changed; of whatever cannot be told
// from that it is true as well: to look once too often costs little. The bytes are those of one datagram.
bool IsDiskEvent(std::string_view message);

}  // namespace OtxCtl::Linux
