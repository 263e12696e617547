// What the volume manager reports of physical and logical volumes.
//
// Pure: texts in, values out. Values are cleaned.
#pragma once

#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace OtxCtl::Linux {

struct PhysicalVolume {
  std::string deviceNumber;  // "8:0"; empty: the device has left the host
  std::string groupName;     // empty: in no volume group
  std::string groupUuid;
  std::vector<std::string> tags;
  std::vector<std::string> groupTags;
};

struct LogicalVolume {
  std::string groupUuid;
  bool isActive = false;
};

// A report that is none, with what is wrong.
class BadReport : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// The columns that the functions below read, as the commands take them.
inline constexpr const char* physicalVolumeColumns =
    "pv_name,pv_major,pv_minor,pv_missing,pv_tags,vg_name,vg_uuid,vg_tags";
inline constexpr const char* logicalVolumeColumns = "vg_uuid,lv_name,lv_active";

// Of the standard output of `pvs` and `lvs` with --reportformat json; lines of words before and behind the
// report are passed over. Throws BadReport, also if a column is missing.
std::vector<PhysicalVolume> ReadPhysicalVolumes(std::string_view report);
std::vector<LogicalVolume> ReadLogicalVolumes(std::string_view report);

}  // namespace OtxCtl::Linux
