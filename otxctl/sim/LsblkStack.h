// Which devices of a capture stand on which, however many there are. Part of LsblkImport.
//
// Keeps a reference to the devices. Every question takes time in proportion to what stands directly on a
// device, and what is told of it is bounded: one thing is enough to rule a disk out.
#pragma once

#include <cstdint>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "otxctl/sim/LsblkDevice.h"

namespace OtxCtl::Sim {

bool IsPartition(const LsblkDevice& device);
bool IsMultipath(const LsblkDevice& device);

class LsblkStack {
 public:
  explicit LsblkStack(const std::vector<LsblkDevice>& devices);

  const LsblkDevice* Find(const std::string& kernelName) const;
  const std::vector<const LsblkDevice*>& On(const LsblkDevice& device) const;
  std::int32_t PartitionsOn(const LsblkDevice& device) const;
  // "vg-root (lvm)"; neither partitions nor multipath devices. Of very many, some and the number of others.
  std::vector<std::string> HoldersOf(const LsblkDevice& device) const;
  // Of the device itself, and of what stands on it: "/boot (sda1)".
  std::vector<std::string> MountsOn(const LsblkDevice& device) const;
  // The first that stands on itself, by others or at once; null: all stand on ground in the end.
  const LsblkDevice* FindInCircle() const;
  // What a multipath device is told by: its name, unless another device is called so.
  const std::string& MapName(const LsblkDevice& map) const;

 private:
  const std::vector<LsblkDevice>& _devices;
  std::unordered_map<std::string, const LsblkDevice*> _byKernelName;
  std::unordered_map<std::string, std::size_t> _called;  // devices of a name, of either kind
  std::unordered_map<std::string, std::vector<const LsblkDevice*>> _standOn;
};

}  // namespace OtxCtl::Sim
