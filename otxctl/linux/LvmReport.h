// What the volume manager reports of physical and logical volumes.
//
// Pure: texts in, values out. Values are cleaned.
#pragma once

#include <cstdint>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace OtxCtl::Linux {

struct PhysicalVolume {
  std::string deviceNumber;  // "8:0"; empty: the device has left the host
  // Its group has been changed while it was away: its volumes are not used until it is taken back.
  bool isLeftBehind = false;
  std::string groupName;  // empty: in no volume group
  std::string groupUuid;
  std::int64_t extents = 0;
  std::vector<std::string> tags;
  std::vector<std::string> groupTags;
};

struct LogicalVolume {
  std::string groupUuid;
  std::string name;
  std::string path;  // "/dev/group/name"
  std::int64_t bytes = 0;
  std::vector<std::string> tags;
  std::string kind;  // "linear", "cache"
  bool isActive = false;
  bool isOpen = false;          // somebody uses it: a file system that is mounted, another program
  std::string cacheMode;        // "writethrough"; empty: not cached
  std::int64_t usedBlocks = 0;  // of the cache; 0 unless active
  std::int64_t cacheBlocks = 0;
};

// A report that is none, with what is wrong.
class BadReport : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// The columns that the functions below read, as the commands take them.
inline constexpr const char* physicalVolumeColumns =
    "pv_name,pv_major,pv_minor,pv_missing,pv_pe_count,pv_tags,vg_name,vg_uuid,vg_tags";
inline constexpr const char* logicalVolumeColumns =
    "vg_uuid,lv_name,lv_path,lv_size,lv_tags,segtype,lv_active,lv_device_open,cache_mode,cache_used_blocks,"
    "cache_total_blocks";

// Of the standard output of `pvs` and `lvs` with --reportformat json; lines of words before and behind the
// report are passed over. Throws BadReport, also if a column is missing. A logical volume of several segments
// is told once.
std::vector<PhysicalVolume> ReadPhysicalVolumes(std::string_view report);
std::vector<LogicalVolume> ReadLogicalVolumes(std::string_view report);

}  // namespace OtxCtl::Linux
