// Any text: refused with the reader's exception, or read as volumes whose texts are clean.

#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>
#include <vector>

#include "otxctl/linux/DiskGroups.h"
#include "otxctl/linux/LvmReport.h"
#include "tessa/text/Escape.h"

namespace {

using OtxCtl::Linux::BadReport;

void Check(const std::vector<std::string>& texts) {
  for (const std::string& text : texts) {
    if (!Tessa::IsPrintable(text)) {
      std::abort();
    }
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  std::vector<OtxCtl::Linux::LogicalVolume> logical;
  try {
    logical = OtxCtl::Linux::ReadLogicalVolumes(text);
  } catch (const BadReport&) {
    // Then it may be one of physical volumes.
  }
  try {
    const auto physical = OtxCtl::Linux::ReadPhysicalVolumes(text);
    for (const OtxCtl::Linux::PhysicalVolume& volume : physical) {
      Check({volume.deviceNumber, volume.groupName, volume.groupUuid});
      Check(volume.tags);
      Check(volume.groupTags);
    }
    std::vector<OtxCtl::Linux::ScannedDisk> disks(1);
    disks[0].deviceNumber = "8:0";
    OtxCtl::Linux::FindDiskGroups(physical, logical, "m1", {}, disks);
  } catch (const BadReport&) {
    return 0;
  }
  return 0;
}
