// What the kernel shows of each block device, read in one pass.
//
// Plain records: nothing is decided here. A fact that could not be read is unknown and names its path; what
// every block device has and this one has not is unknown as well.
//
// Threads: any, one at a time per object. Owns its records; ByName and the others point into it.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "otxctl/disks/Fact.h"
#include "otxctl/linux/SysfsReader.h"

namespace OtxCtl::Linux {

// A device on the way from a block device up to the root of all devices.
struct Ancestor {
  std::string path;       // "/devices/pci0000:00/0000:00:05.0"
  std::string subsystem;  // "pci"
};

// What a device-mapper device says of itself.
struct Mapping {
  Disks::Fact<std::string> name;
  Disks::Fact<std::string> uuid;  // begins with who made it: "LVM-", "mpath-"
  Disks::Fact<bool> isSuspended;
};

struct BlockDevice {
  std::string name;                   // in sysfs: "sda", "cciss!c0d0"
  std::string path;                   // "/devices/.../block/sda"
  std::string parent;                 // the disk of a partition; empty for a whole device
  Disks::Fact<std::string> number;    // "8:0"
  Disks::Fact<std::string> sequence;  // another one for each disk ever seen; empty from old kernels
  Disks::Fact<std::int64_t> bytes;
  Disks::Fact<bool> isReadOnly;
  Disks::Fact<bool> isRemovable;
  Disks::Fact<bool> isHidden;
  Disks::Fact<bool> isRotational;
  Disks::Fact<std::string> zones;  // empty from old kernels
  Disks::Fact<std::int64_t> blockSize;
  Disks::Fact<std::vector<std::string>> holders;
  Disks::Fact<std::vector<std::string>> slaves;
  std::optional<Mapping> mapping;
  bool isRaid = false;
  // The device that the block device belongs to; empty: it belongs to none.
  Disks::Fact<std::string> device;
  // From the block device to the root; those without a subsystem are left out.
  Disks::Fact<std::vector<Ancestor>> chain;

  bool IsWhole() const noexcept { return parent.empty(); }
  bool IsVirtual() const noexcept { return path.compare(0, 17, "/devices/virtual/") == 0; }
};

class BlockDevices {
 public:
  explicit BlockDevices(const SysfsReader& reader);

  // Whole devices and partitions, in the order of people: sda, sdb, ..., sdz, sdaa.
  const std::vector<BlockDevice>& All() const noexcept { return _all; }
  // Set if nobody knows which there are: then none is told.
  const std::string& WhyIncomplete() const noexcept { return _whyIncomplete; }
  // Names that no device was read for, and why not.
  struct Unreadable {
    std::string name;
    std::string why;
  };
  const std::vector<Unreadable>& NotRead() const noexcept { return _notRead; }

  const BlockDevice* ByName(const std::string& name) const;
  const BlockDevice* ByNumber(const std::string& number) const;
  // By the name that device-mapper knows it by.
  const BlockDevice* ByMapping(const std::string& name) const;
  const std::vector<const BlockDevice*>& PartitionsOf(const BlockDevice& disk) const;
  // Whether one of the names that no device was read for may be a partition of this disk.
  bool HasUnreadPartitions(const BlockDevice& disk) const;

 private:
  void Read(const SysfsReader& reader, const std::string& name);
  Disks::Fact<std::vector<Ancestor>> ReadChain(const SysfsReader& reader, const std::string& path);
  void Index();

  std::vector<BlockDevice> _all;
  std::vector<Unreadable> _notRead;
  std::string _whyIncomplete;
  std::unordered_map<std::string, Disks::Fact<std::string>>
      _subsystems;  // by path: disks share their ancestors
  std::unordered_map<std::string, const BlockDevice*> _byName;
  std::unordered_map<std::string, const BlockDevice*> _byNumber;
  std::unordered_map<std::string, const BlockDevice*> _byMapping;
  std::unordered_map<std::string, std::vector<const BlockDevice*>> _partitions;
  std::unordered_set<std::string> _withUnread;
};

// Why this is no longer the device it was: gone, or another one under the same name. Empty: it still is.
std::string WhyGone(const SysfsReader& reader, const BlockDevice& device);

}  // namespace OtxCtl::Linux
