// Plans disk groups from a set of disks: new ones round flash disks, or more disks for the groups there are.

#include <algorithm>
#include <string_view>
#include <utility>

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/disks/DiskInventory.h"
#include "kova/agentd/disks/DiskMappings.h"
#include "kova/agentd/disks/NameList.h"
#include "kova/agentd/include/KovaInfo.h"
#include "kova/agentd/planning/KernelGroups.h"
#include "kova/agentd/planning/pure/HybridPlan.h"
#include "kova/agentd/util/KovaUtil.h"
#include "nox/Kova.h"

namespace Kovasvc {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;
using Orbis::DataArray;
using Tessa::MakeRef;
using Tessa::Ref;

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

// Flash disks that take capacity disks, and how many each already has.
struct Tally {
  std::vector<Ref<ScsiDisk>> ssds;
  std::vector<std::size_t> counts;
};

// The kernel's groups that may be extended and whose cache disk is in the inventory.
Tally ExtendableGroups(const std::vector<HostCtl::Kova::DiskMapping>& groups, bool allFlash,
                       const Ref<DataArray<ScsiDisk>>& disks) {
  std::vector<Planning::ExistingGroup> existing;
  std::vector<std::string_view> ssdNames;
  existing.reserve(groups.size());
  ssdNames.reserve(groups.size());
  for (const HostCtl::Kova::DiskMapping& group : groups) {
    existing.push_back({.allFlash = group.allFlash, .heldBack = group.thirdFlag});
    ssdNames.push_back(group.ssd.deviceName);
  }
  NameList wanted(std::move(ssdNames));
  const DiskInventory inventory(disks, wanted);
  Tally tally;
  for (const std::size_t position : Planning::ExtendableGroups(existing, allFlash)) {
    const HostCtl::Kova::DiskMapping& group = groups[position];
    Ref<ScsiDisk> ssd;
    GetScsiDiskFromArray(group.ssd.deviceName, inventory, ssd);
    if (ssd) {
      tally.ssds.push_back(ssd);
      tally.counts.push_back(group.capacityDisks.size());
    }
  }
  return tally;
}

// A cache disk and the positions of the capacity disks that it was dealt, in order.
struct PlannedGroup {
  Ref<ScsiDisk> ssd;
  std::vector<std::size_t> disks;
};

// A cache disk that entered the tally twice heads one group, not two.
std::vector<PlannedGroup> GroupsOf(const Planning::Deal& deal, const Tally& tally) {
  std::vector<PlannedGroup> groups;
  for (const Planning::Deal::Share& share : deal.shares) {
    const Ref<ScsiDisk>& ssd = tally.ssds[share.entry];
    const auto known = std::find_if(groups.begin(), groups.end(),
                                    [&](const PlannedGroup& group) { return group.ssd == ssd; });
    if (known == groups.end()) {
      groups.push_back({ssd, share.disks});
    } else {
      known->disks.insert(known->disks.end(), share.disks.begin(), share.disks.end());
      std::sort(known->disks.begin(), known->disks.end());
    }
  }
  return groups;
}

Ref<DataArray<DiskMapping>> ToMappings(const std::vector<PlannedGroup>& groups,
                                       const DataArray<ScsiDisk>& candidates,
                                       const std::vector<std::size_t>& capacity) {
  const auto mappings = MakeRef<DataArray<DiskMapping>>();
  for (const PlannedGroup& group : groups) {
    const auto disks = MakeRef<DataArray<ScsiDisk>>();
    for (const std::size_t disk : group.disks) {
      disks->Append(candidates[capacity[disk]]);
    }
    const auto mapping = MakeRef<DiskMapping>();
    mapping->SetSsd(group.ssd);
    mapping->SetNonSsd(disks);
    mappings->Append(mapping);
  }
  return mappings;
}

}  // namespace

void KovaManagerImpl::ComputeDiskMappings(DataArray<ScsiDisk>* candidates, bool allFlash,
                                          Ref<DataArray<DiskMapping>>& mappings, bool& limitReached) {
  const std::vector<HostCtl::Kova::DiskMapping> kernelGroups = KernelGroupsOrNone(*_logger, *_provider);
  const auto noCandidates = MakeRef<DataArray<ScsiDisk>>();
  const DataArray<ScsiDisk>& disks = candidates != nullptr ? *candidates : *noCandidates;
  std::vector<bool> candidateIsSsd;
  candidateIsSsd.reserve(disks.Size());
  for (const ScsiDisk* disk : disks) {
    candidateIsSsd.push_back(IsSsd(disk));
  }
  const Planning::Roles roles = Planning::AssignRoles(candidateIsSsd, kernelGroups.size());

  Tally tally;
  for (const std::size_t ssd : roles.ssds) {
    tally.ssds.emplace_back(disks[ssd]);
    tally.counts.push_back(0);
  }
  if (tally.ssds.empty() && !kernelGroups.empty()) {
    const Unlocked unlocked(*this);
    if (const Ref<DataArray<ScsiDisk>> inventory = Util::InventoryOrNone(*_logger)) {
      tally = ExtendableGroups(kernelGroups, allFlash, inventory);
    }
  }
  const Planning::Deal deal = Planning::DealCapacityDisks(tally.counts, roles.capacity.size());
  mappings = ToMappings(GroupsOf(deal, tally), disks, roles.capacity);
  limitReached = Planning::IsLimitReached(roles, deal);
}

}  // namespace Kovasvc
