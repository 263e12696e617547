// Canonical names of disks: what KOVA calls a disk, from what the disk says of itself.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <unordered_map>
#include <unordered_set>

#include "otxctl/disks/DiskFacts.h"

namespace OtxCtl::Disks {

// "naa.5000c50000000201" of "0x5000C50000000201"; what has its kind in front already ("eui.", "nvme.",
// "t10.") is kept but for what has no place in a name. Empty for an empty one.
std::string WorldWideName(std::string_view told);

// The world wide name; else "t10." with vendor, model and serial number; else "path." with `place`, which is
// as stable as the place is: only the first two are the disk's own.
std::string CanonicalName(const DiskIdentity& identity, std::string_view place);

// "LAB HDD 4G (sda)"
std::string DisplayName(const DiskIdentity& identity, std::string_view kernelName);

// Hands out each name once: the second disk of a name gets ".2" behind it, and so on.
class UniqueNames {
 public:
  std::string Take(const std::string& name);

 private:
  std::unordered_set<std::string> _taken;
  std::unordered_map<std::string, std::uint64_t> _count;
};

}  // namespace OtxCtl::Disks
