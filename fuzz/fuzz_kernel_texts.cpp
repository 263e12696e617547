// Any bytes, read as every text in which a Linux kernel tells of disks: tables of mounts and swap areas,
// events, a disk's page of its serial number. The first byte chooses which.

#include <cstdint>
#include <cstdlib>
#include <string_view>

#include "otxctl/linux/DeviceIdentity.h"
#include "otxctl/linux/MountInfo.h"
#include "otxctl/linux/Uevents.h"
#include "tessa/text/Escape.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  if (size == 0) {
    return 0;
  }
  const std::string_view text(reinterpret_cast<const char*>(data) + 1, size - 1);
  switch (data[0] % 4) {
    case 0:
      OtxCtl::Linux::ParseMountInfo(text);
      break;
    case 1:
      OtxCtl::Linux::ParseSwaps(text);
      break;
    case 2:
      OtxCtl::Linux::IsDiskEvent(text);
      break;
    default:
      if (const auto serial = OtxCtl::Linux::ParseSerialPage(text); serial && !Tessa::IsPrintable(*serial)) {
        std::abort();
      }
  }
  return 0;
}
