#include "kova/agentd/planning/pure/AddPlan.h"

#include <algorithm>
#include <cassert>
#include <unordered_set>
#include <utility>

namespace Kovasvc::Planning {
namespace {

using Disks = std::vector<OfferedDisk>;
using Groups = std::vector<HostGroup>;
using Names = std::unordered_set<std::string_view>;
using Way = AddPlan::Way;

// Plans one kind of groups from these disks, of which `candidates` tells the same, and adds it to the whole.
// Whether a limit left nothing to plan.
bool PlanKind(const std::vector<std::size_t>& positions, const std::vector<Candidate>& candidates,
              bool allFlash, const Groups& groups, AddPlan& plan) {
  const GroupPlan kind = PlanGroups(candidates, groups, allFlash);
  for (std::size_t i = 0; i < positions.size(); ++i) {
    plan.leftOver[positions[i]] = kind.leftOver[i];
  }
  for (const GroupPlan::Group& planned : kind.groups) {
    AddPlan::Group group{.way = planned.isNew ? Way::Made : Way::Extended,
                         .cache = planned.isNew ? positions[planned.cache] : planned.cache,
                         .allFlash = allFlash,
                         .capacity = {}};
    for (const std::size_t disk : planned.capacity) {
      group.capacity.push_back(positions[disk]);
    }
    plan.groups.push_back(std::move(group));
  }
  return kind.limitReached;
}

// Plans all-flash groups and says which disks they take from hybrid planning: every flash disk that is meant
// for capacity, also when a limit leaves it out of the plan, and the cache disks of planned groups.
Names PlanAllFlash(const Disks& disks, const Groups& groups, AddPlan& plan) {
  std::vector<std::size_t> flash;
  std::vector<Candidate> candidates;
  Names taken;
  for (std::size_t position = 0; position < disks.size(); ++position) {
    const OfferedDisk& disk = disks[position];
    if (disk.eligible && IsFlash(disk.isSsd, disk.capacityFlash)) {
      flash.push_back(position);
      candidates.push_back({.isCache = !disk.capacityFlash});
    }
    if (disk.eligible && disk.capacityFlash) {
      taken.insert(disk.name);
    }
  }
  plan.allFlashLimit = PlanKind(flash, candidates, true, groups, plan);
  for (const AddPlan::Group& group : plan.groups) {
    taken.insert(group.way == Way::Made ? disks[group.cache].name : groups[group.cache].cacheDisk);
  }
  return taken;
}

void PlanHybrid(const Disks& disks, const Names& taken, const Groups& groups, AddPlan& plan) {
  std::vector<std::size_t> rest;
  std::vector<Candidate> candidates;
  for (std::size_t disk = 0; disk < disks.size(); ++disk) {
    if (disks[disk].eligible && !taken.contains(disks[disk].name)) {
      rest.push_back(disk);
      candidates.push_back({.isCache = disks[disk].isSsd});
    }
  }
  plan.hybridLimit = PlanKind(rest, candidates, false, groups, plan);
}

// Adds the groups that are not mounted and whose cache disks are among the disks.
void PlanMounts(const Disks& disks, const Groups& groups, AddPlan& plan) {
  const auto heads = [](const OfferedDisk& disk, const HostGroup& group) {
    return disk.isSsd && disk.unmounted && disk.name == group.cacheDisk;
  };
  for (std::size_t position = 0; position < groups.size(); ++position) {
    const HostGroup& group = groups[position];
    if (std::none_of(disks.begin(), disks.end(),
                     [&](const OfferedDisk& disk) { return heads(disk, group); })) {
      continue;
    }
    AddPlan::Group mounted{
        .way = Way::Mounted, .cache = position, .allFlash = group.allFlash, .capacity = {}};
    for (std::size_t disk = 0; disk < disks.size(); ++disk) {
      if (disks[disk].group != position) {
        continue;
      }
      plan.leftOver[disk] = std::nullopt;
      if (!heads(disks[disk], group)) {
        mounted.capacity.push_back(disk);
      }
    }
    plan.groups.push_back(std::move(mounted));
  }
}

// `names`: of a request for named disks; null of one for all.
AddPlan Plan(const Disks& disks, const Groups& groups, const std::vector<std::string_view>* names) {
  assert(std::all_of(disks.begin(), disks.end(),
                     [&](const OfferedDisk& disk) { return !disk.group || *disk.group < groups.size(); }));
  AddPlan plan;
  plan.leftOver.assign(disks.size(), LeftOver::NotEligible);
  const Names taken = PlanAllFlash(disks, groups, plan);
  const std::vector<AddPlan::Group> allFlash = std::exchange(plan.groups, {});
  PlanHybrid(disks, taken, groups, plan);
  if (names != nullptr) {
    PlanMounts(disks, groups, plan);
  }
  plan.groups.insert(plan.groups.end(), allFlash.begin(), allFlash.end());
  if (names == nullptr) {
    return plan;
  }
  std::vector<std::string_view> remaining = *names;
  std::erase_if(remaining, [&](std::string_view name) { return taken.contains(name); });
  if (const auto repeated = FindRepeatedNeighbour(remaining)) {
    plan.repeated = remaining[*repeated];
    plan.groups.clear();
  }
  return plan;
}

}  // namespace

AddPlan PlanAddition(const Disks& disks, const Groups& groups) {
  return Plan(disks, groups, nullptr);
}

AddPlan PlanNamedAddition(const Disks& disks, const Groups& groups,
                          const std::vector<std::string_view>& names) {
  return Plan(disks, groups, &names);
}

std::optional<std::size_t> FindRepeatedNeighbour(const std::vector<std::string_view>& names) {
  std::size_t withoutRepeats = 0;
  for (std::size_t i = 0; i < names.size(); ++i) {
    withoutRepeats += i == 0 || names[i] != names[i - 1] ? 1 : 0;
  }
  return withoutRepeats == names.size() ? std::nullopt : std::optional(withoutRepeats);
}

}  // namespace Kovasvc::Planning
