// Which block devices are mounted, and where; swap areas in use count.
//
// Of this program's view of the file system and of that of the first process, which may differ. If either
// cannot be read, nothing is known of any disk.
//
// Threads: any, once it is made. Owns its texts, which are cleaned.
#pragma once

#include <string>
#include <unordered_map>
#include <vector>

#include "otxctl/disks/Fact.h"
#include "otxctl/linux/BlockDevices.h"
#include "otxctl/linux/MountInfo.h"
#include "otxctl/linux/SystemPaths.h"

namespace OtxCtl::Linux {

class MountTable {
 public:
  using Places = std::vector<std::string>;

  MountTable(const SystemPaths& paths, const BlockDevices& devices);

  // Of the device itself, not of what stands on it: "/data", "[SWAP]". Each place once, and of
  // very many only some.
  Disks::Fact<Places> MountsOf(const BlockDevice& device) const;

 private:
  void ReadMounts(const std::string& path);
  void ReadSwaps(const std::string& path);
  void Add(const MountEntry& entry);
  void AddPlace(const std::string& number, const std::string& place);
  // The block device that the name of a node leads to; none: another kind of thing, or nothing.
  const BlockDevice* Resolve(const std::string& node) const;
  std::vector<const BlockDevice*> ResolveAll(const std::string& source) const;

  SystemPaths _paths;
  const BlockDevices& _devices;
  std::unordered_map<std::string, Places> _places;  // by device number
  std::string _whyUnknown;
};

}  // namespace OtxCtl::Linux
