// The host's disk groups, as commands look into them.
#pragma once

#include <string>
#include <vector>

#include "host/ManagementApi.h"
#include "nox/Kova.h"
#include "nox/Operations.h"

namespace Kovactl {

using StorageInfo = Nox::Kova::Host::ConfigInfo::StorageInfo;
using GroupList = Orbis::DataArray<Nox::Kova::Host::DiskMapInfo>;

// The groups of the host, mounted or not, as they were when it was asked.
class DiskGroups {
 public:
  // Of a host that could not tell, there are none, and the fault says why.
  explicit DiskGroups(const Host::Answer& answer);
  static DiskGroups Of(const Host::ManagementApi& host) {
    return DiskGroups(host.Query(Nox::Operation::GetDiskGroups()));
  }

  const Tessa::Ref<Orbis::MethodFault>& Fault() const noexcept { return _fault; }
  // Null when the host could not tell.
  const StorageInfo* Info() const noexcept { return _info.Get(); }
  const GroupList& All() const noexcept { return *_groups; }
  // The group of that cache disk, or null.
  const Nox::Kova::Host::DiskMapInfo* Find(const std::string& cacheDisk) const;
  // The same, for a group that somebody named; throws BadInput, which says so, when there is none.
  const Nox::Kova::Host::DiskMapInfo& Require(const std::string& cacheDisk) const;

 private:
  Tessa::Ref<StorageInfo> _info;
  Tessa::Ref<GroupList> _groups;
  Tessa::Ref<Orbis::MethodFault> _fault;
};

// Canonical names: the cache disk, then the capacity disks.
std::vector<std::string> DisksOf(const Nox::Kova::Host::DiskMapping& group);

// The canonical name of the cache disk; empty where it is unknown.
std::string CacheDiskOf(const Nox::Kova::Host::DiskMapping& group);

}  // namespace Kovactl
