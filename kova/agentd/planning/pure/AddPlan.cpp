#include "kova/agentd/planning/pure/AddPlan.h"

#include "kova/agentd/planning/pure/AllFlashPlan.h"

namespace Kovasvc::Planning {
namespace {

using Positions = std::vector<std::size_t>;

// Where capacity disks can go: a new group round a disk, or a group of the host.
struct Entry {
  bool isNew;
  std::size_t cache;
};

struct Entries {
  std::vector<Entry> heads;
  Positions counts;  // capacity disks that each has already
};

Entries NewGroups(const Positions& candidates, const Roles& roles) {
  Entries entries;
  for (const std::size_t ssd : roles.ssds) {
    entries.heads.push_back({true, candidates[ssd]});
    entries.counts.push_back(0);
  }
  return entries;
}

Entries HostGroups(const std::vector<HostGroup>& groups, bool allFlash) {
  std::vector<ExistingGroup> existing;
  existing.reserve(groups.size());
  for (const HostGroup& group : groups) {
    existing.push_back(group.group);
  }
  Entries entries;
  for (const std::size_t position : ExtendableGroups(existing, allFlash)) {
    if (groups[position].cacheListed) {
      entries.heads.push_back({false, position});
      entries.counts.push_back(groups[position].capacityDisks);
    }
  }
  return entries;
}

// Plans one kind of groups from the candidates, positions of disks; `isCache` tells them apart.
void PlanKind(const Positions& candidates, const std::vector<bool>& isCache, bool allFlash,
              const std::vector<HostGroup>& groups, AddPlan& plan) {
  const Roles roles = AssignRoles(isCache, groups.size());
  const Entries entries = roles.ssds.empty() ? HostGroups(groups, allFlash) : NewGroups(candidates, roles);
  const Deal deal = DealCapacityDisks(entries.counts, roles.capacity.size());

  for (const std::size_t dropped : roles.dropped) {
    plan.leftOver[candidates[dropped]] = LeftOver::TooManyGroups;
  }
  for (const std::size_t ssd : roles.ssds) {
    plan.leftOver[candidates[ssd]] = LeftOver::NoCapacityDisk;
  }
  LeftOver notDealt = LeftOver::NoCacheDisk;
  if (deal.groupsFull) {
    notDealt = LeftOver::GroupsFull;
  } else if (!roles.dropped.empty()) {
    notDealt = LeftOver::TooManyGroups;
  }
  for (const std::size_t disk : roles.capacity) {
    plan.leftOver[candidates[disk]] = notDealt;
  }
  for (const Deal::Share& share : deal.shares) {
    const Entry& head = entries.heads[share.entry];
    AddPlan::Group group{.isNew = head.isNew, .cache = head.cache, .allFlash = allFlash, .capacity = {}};
    for (const std::size_t dealt : share.disks) {
      group.capacity.push_back(candidates[roles.capacity[dealt]]);
      plan.leftOver[group.capacity.back()] = std::nullopt;
    }
    if (head.isNew) {
      plan.leftOver[head.cache] = std::nullopt;
    }
    plan.groups.push_back(std::move(group));
  }
}

// Plans all-flash groups and says which disks they take from hybrid planning.
std::vector<bool> PlanAllFlash(const std::vector<OfferedDisk>& disks, const std::vector<HostGroup>& groups,
                               AddPlan& plan) {
  Positions flash;
  std::vector<bool> isCache;
  for (std::size_t disk = 0; disk < disks.size(); ++disk) {
    if (disks[disk].eligible && IsFlash(disks[disk].isSsd, disks[disk].capacityFlash)) {
      flash.push_back(disk);
      isCache.push_back(!disks[disk].capacityFlash);
    }
  }
  std::vector<bool> taken(disks.size(), false);
  if (flash.empty()) {
    return taken;
  }
  PlanKind(flash, isCache, true, groups, plan);
  for (const std::size_t position : TakenForCapacity(isCache)) {
    taken[flash[position]] = true;
  }
  for (const AddPlan::Group& group : plan.groups) {
    if (group.isNew) {
      taken[group.cache] = true;
    }
  }
  return taken;
}

}  // namespace

const char* Describe(LeftOver reason) {
  switch (reason) {
    case LeftOver::NotEligible:
      return "not eligible";
    case LeftOver::NoCacheDisk:
      return "no flash disk is free to be its cache, and no group of its kind can grow";
    case LeftOver::NoCapacityDisk:
      return "no capacity disk is left for it to be the cache of";
    case LeftOver::GroupsFull:
      return "every group has 7 capacity disks";
    case LeftOver::TooManyGroups:
      return "a host has at most 5 groups";
  }
  return "";
}

AddPlan PlanAddition(const std::vector<OfferedDisk>& disks, const std::vector<HostGroup>& groups) {
  AddPlan plan;
  plan.leftOver.assign(disks.size(), LeftOver::NotEligible);
  const std::vector<bool> taken = PlanAllFlash(disks, groups, plan);
  std::vector<AddPlan::Group> allFlash = std::move(plan.groups);
  plan.groups.clear();

  Positions candidates;
  std::vector<bool> isCache;
  for (std::size_t disk = 0; disk < disks.size(); ++disk) {
    if (disks[disk].eligible && !taken[disk]) {
      candidates.push_back(disk);
      isCache.push_back(disks[disk].isSsd);
    }
  }
  PlanKind(candidates, isCache, false, groups, plan);
  plan.groups.insert(plan.groups.end(), allFlash.begin(), allFlash.end());
  return plan;
}

}  // namespace Kovasvc::Planning
