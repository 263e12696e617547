// What stands on a disk: holders, partitions, and what is mounted on any of them.
//
// Threads: any. Keeps references to the devices and the mounts.
#pragma once

#include <string>
#include <vector>

#include "otxctl/disks/Fact.h"
#include "otxctl/linux/BlockDevices.h"
#include "otxctl/linux/MountTable.h"

namespace OtxCtl::Linux {

class DeviceStack {
 public:
  using Texts = std::vector<std::string>;

  DeviceStack(const BlockDevices& devices, const MountTable& mounts);

  // In words, of the device itself; neither the multipath device that it is a path of nor partitions of its
  // own that device-mapper made. Of very many, some and the number of the others.
  Disks::Fact<Texts> HoldersOf(const BlockDevice& device) const;

  // "/data" of the device itself, "/boot (sda1)" of what stands on it, however high.
  Disks::Fact<Texts> MountsOn(const BlockDevice& device) const;

  // Whether something stands on it that has claimed it, by what is known: then it is no wonder that it is
  // busy.
  bool IsClaimed(const BlockDevice& device) const;

 private:
  std::vector<const BlockDevice*> DirectlyOn(const BlockDevice& device) const;

  const BlockDevices& _devices;
  const MountTable& _mounts;
};

// Of which the device is a path; none.
const BlockDevice* MultipathMapOf(const BlockDevices& devices, const BlockDevice& device);

// That the kernel or device-mapper made.
Disks::Fact<std::int32_t> CountPartitions(const BlockDevices& devices, const BlockDevice& device);

}  // namespace OtxCtl::Linux
