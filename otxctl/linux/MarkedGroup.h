// A disk group as the marks of its volume group describe it, or why it is none.
//
// Pure. Keeps a reference to the volume group.
#pragma once

#include <set>
#include <string>
#include <vector>

#include "otxctl/linux/DiskGroups.h"
#include "otxctl/linux/VolumeGroups.h"

namespace OtxCtl::Linux {

class MarkedGroup {
 public:
  // `isTwice`: another volume group says that it is the same disk group.
  MarkedGroup(const VolumeGroup& group, const std::string& machineId, bool isTwice);

  bool IsOurs() const noexcept { return _whyNot.empty(); }
  // As a whole: nothing of it is anybody's.
  bool IsUnfinished() const noexcept { return _isUnfinished; }
  // What is said of its members.
  std::string Words() const;
  // Members that are none: they have not fully joined, or not fully left.
  const std::vector<const Member*>& HalfWay() const noexcept { return _halfWay; }
  const DiskGroup& Get() const noexcept { return _group; }

 private:
  void Read();
  void ReadCacheDisk();
  void ReadCapacityDisks();
  void ReadForeignVolumes();
  bool IsWhole(const LogicalVolume& volume) const;
  std::size_t CountDataVolumes() const;
  void AddCapacityDisk(const Member& member, const LogicalVolume& volume);
  void Identify(const std::string& uuid);
  bool IsMounted() const;
  bool IsAllFlash() const;

  const VolumeGroup& _source;
  const std::string _uuid;
  std::string _whyNot;
  bool _isUnfinished = false;
  bool _isStale = false;  // a volume is active on a disk that is no more
  const Member* _cache = nullptr;
  std::set<std::string> _uuids;
  std::vector<const Member*> _halfWay;
  DiskGroup _group;
};

}  // namespace OtxCtl::Linux
