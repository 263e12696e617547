// Plans disk groups from a set of disks: new ones round flash disks, or more disks for the groups there are.

#include <cassert>
#include <string_view>
#include <utility>

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/disks/DiskInventory.h"
#include "kova/agentd/disks/DiskMappings.h"
#include "kova/agentd/disks/NameList.h"
#include "kova/agentd/include/KovaInfo.h"
#include "kova/agentd/planning/KernelGroups.h"
#include "kova/agentd/planning/pure/GroupPlan.h"
#include "kova/agentd/util/KovaUtil.h"
#include "nox/Kova.h"

namespace Kovasvc {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;
using Orbis::DataArray;
using Tessa::MakeRef;
using Tessa::Ref;
using GroupRecord = HostCtl::Kova::DiskMapping;

namespace {

// Lets go of the object's lock for as long as it lives, if the calling thread holds it.
class Unlocked {
 public:
  explicit Unlocked(Tessa::System::LockableObject& object) : _object(object), _wasLocked(object.IsLocked()) {
    if (_wasLocked) {
      _object.Unlock();
    }
  }
  ~Unlocked() {
    if (_wasLocked) {
      _object.Lock();
    }
  }
  Unlocked(const Unlocked&) = delete;
  Unlocked& operator=(const Unlocked&) = delete;

 private:
  Tessa::System::LockableObject& _object;
  bool _wasLocked;
};

std::vector<Planning::Candidate> CandidatesOf(const DataArray<ScsiDisk>& disks) {
  std::vector<Planning::Candidate> candidates;
  candidates.reserve(disks.Size());
  for (const ScsiDisk* disk : disks) {
    candidates.push_back({.isCache = IsSsd(disk), .disk = disk});
  }
  return candidates;
}

// The names stay the kernel's groups'.
std::vector<Planning::HostGroup> HostGroupsOf(const std::vector<GroupRecord>& kernelGroups) {
  std::vector<Planning::HostGroup> groups;
  groups.reserve(kernelGroups.size());
  for (const GroupRecord& group : kernelGroups) {
    groups.push_back({.allFlash = group.allFlash,
                      .heldBack = group.thirdFlag,
                      .capacityDisks = group.capacityDisks.size(),
                      .cacheDisk = group.ssd.deviceName});
  }
  return groups;
}

// The inventory's cache disks of the groups that may be extended, each in its group's place; null for others.
// The groups are told which of them are listed.
std::vector<Ref<ScsiDisk>> FindCacheDisks(const Ref<DataArray<ScsiDisk>>& disks, bool allFlash,
                                          std::vector<Planning::HostGroup>& groups) {
  std::vector<std::string_view> names;
  names.reserve(groups.size());
  for (const Planning::HostGroup& group : groups) {
    names.push_back(group.cacheDisk);
  }
  NameList wanted(std::move(names));
  const DiskInventory inventory(disks, wanted);
  std::vector<Ref<ScsiDisk>> cacheDisks(groups.size());
  for (const std::size_t position : Planning::ExtendableGroups(groups, allFlash)) {
    GetScsiDiskFromArray(groups[position].cacheDisk, inventory, cacheDisks[position]);
    groups[position].cacheListed = cacheDisks[position] != nullptr;
  }
  return cacheDisks;
}

Ref<DataArray<DiskMapping>> ToMappings(const std::vector<Planning::GroupPlan::Group>& groups,
                                       const DataArray<ScsiDisk>& candidates,
                                       const std::vector<Ref<ScsiDisk>>& cacheDisks) {
  const auto mappings = MakeRef<DataArray<DiskMapping>>();
  for (const Planning::GroupPlan::Group& group : groups) {
    const auto disks = MakeRef<DataArray<ScsiDisk>>();
    for (const std::size_t disk : group.capacity) {
      disks->Append(candidates[disk]);
    }
    assert(group.isNew || (group.cache < cacheDisks.size() && cacheDisks[group.cache]));
    const auto mapping = MakeRef<DiskMapping>();
    mapping->SetSsd(group.isNew ? Ref<ScsiDisk>(candidates[group.cache]) : cacheDisks[group.cache]);
    mapping->SetNonSsd(disks);
    mappings->Append(mapping);
  }
  return mappings;
}

}  // namespace

void KovaManagerImpl::ComputeDiskMappings(DataArray<ScsiDisk>* candidates, bool allFlash,
                                          Ref<DataArray<DiskMapping>>& mappings, bool& limitReached) {
  const std::vector<GroupRecord> kernelGroups = KernelGroupsOrNone(*_logger, *_provider);
  const auto noDisks = MakeRef<DataArray<ScsiDisk>>();
  const DataArray<ScsiDisk>& disks = candidates != nullptr ? *candidates : *noDisks;
  const std::vector<Planning::Candidate> plannedFrom = CandidatesOf(disks);
  std::vector<Planning::HostGroup> hostGroups = HostGroupsOf(kernelGroups);
  std::vector<Ref<ScsiDisk>> cacheDisks;
  if (Planning::ExtendsHostGroups(plannedFrom, hostGroups)) {
    const Unlocked unlocked(*this);
    if (const Ref<DataArray<ScsiDisk>> inventory = Util::InventoryOrNone(*_logger)) {
      cacheDisks = FindCacheDisks(inventory, allFlash, hostGroups);
    }
  }
  const Planning::GroupPlan plan = Planning::PlanGroups(plannedFrom, hostGroups, allFlash);
  mappings = ToMappings(plan.groups, disks, cacheDisks);
  limitReached = plan.limitReached;
}

}  // namespace Kovasvc
