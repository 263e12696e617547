// What the kernel of a simulated host makes of its disks and groups: rules on plain values, no lock, no
// fault, no file.
//
// A changing function either throws an exception of HostCtl::Lib, having changed nothing, or changes the host
// and says whether anything is different now. Texts of its exceptions begin with "simulated kernel: ".
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "kova/agentd/include/KovaRecords.h"
#include "otxctl/sim/HostDescription.h"

namespace OtxCtl::Sim {

constexpr std::size_t mostCapacityDisks = 7;  // of one group
constexpr std::uint8_t newGroupFormatVersion = 3;

// What the kernel says of a disk: its verdict if it has one, otherwise derived. `group` is the disk's group,
// or null.
HostVerdict VerdictOn(const HostDescription& host, const HostDisk& disk, const HostGroup* group);

// A host with the indexes that keep every rule fast on hosts of many disks.
class SimRules {
 public:
  // The description must be one that ParseHostDescription would accept.
  explicit SimRules(HostDescription host);

  const HostDescription& Host() const noexcept { return _host; }

  void QueryDisks(const std::vector<std::string>& names,
                  std::vector<HostCtl::Kova::DiskResult>& results) const;
  void GetDiskMappings(std::vector<HostCtl::Kova::DiskMapping>& mappings, bool withUnmounted) const;

  bool FormatDiskMapping(const std::string& ssd, const std::vector<std::string>& capacityDisks);
  bool RestampDiskMapping(const std::string& ssd) const;
  bool RestampDiskMappingByUuid(const std::string& kovaUuid) const;
  bool MountDiskMapping(const std::string& ssd);
  bool UnmountDiskMapping(const std::string& ssd);
  bool ClaimUnmountedDiskgroups();
  bool RemoveDisk(const std::string& disk);
  bool RemoveDiskMapping(const std::string& ssd);
  bool RemoveDiskByUuid(const std::string& kovaUuid);

 private:
  using Index = std::size_t;
  struct Members {
    Index ssd = 0;
    std::vector<Index> capacity;  // in the group's order
  };

  // The disk that the kernel knows by this name; a disk that has left has no name any more.
  std::optional<Index> FindDisk(const std::string& name) const;
  // The group whose cache disk the kernel knows by this name.
  std::optional<Index> FindGroupOfSsd(const std::string& ssd) const;
  Index GroupOfSsd(const std::string& ssd) const;  // throws where there is none
  const HostGroup* GroupOfDisk(Index disk) const;
  HostDisk& DiskOf(const std::string& name);
  const HostDisk& DiskOf(const std::string& name) const;

  void CheckFormat(const std::string& ssd, const std::vector<std::string>& capacityDisks) const;
  void CheckRoom(std::size_t present, std::size_t added) const;
  bool IsAllFlash(const std::vector<std::string>& capacityDisks) const;
  bool SetMounted(Index group, bool mounted);
  // `named` is what the caller called the disk, for the exception.
  bool TakeOut(Index disk, const std::string& named);
  void RemoveGroup(Index group);
  void IndexGroups();
  void IndexGroup(Index group);

  HostDescription _host;
  std::unordered_map<std::string, Index> _diskOfName;
  std::vector<std::optional<Index>> _groupOfDisk;
  std::vector<Members> _membersOfGroup;
};

}  // namespace OtxCtl::Sim
