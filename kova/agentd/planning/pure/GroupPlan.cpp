#include "kova/agentd/planning/pure/GroupPlan.h"

#include <algorithm>
#include <cassert>
#include <utility>

namespace Kovasvc::Planning {
namespace {

using Positions = std::vector<std::size_t>;

// Where capacity disks can go: to new groups round candidates, or to groups of the host.
struct Heads {
  bool areNew;
  Positions positions;
  Positions counts;  // capacity disks that each has already
};

Heads NewHeads(const Roles& roles) {
  return {true, roles.heads, Positions(roles.heads.size(), 0)};
}

Heads HostHeads(const std::vector<HostGroup>& hostGroups, bool allFlash) {
  Heads heads = {false, {}, {}};
  for (const std::size_t position : ExtendableGroups(hostGroups, allFlash)) {
    if (hostGroups[position].cacheListed) {
      heads.positions.push_back(position);
      heads.counts.push_back(hostGroups[position].capacityDisks);
    }
  }
  return heads;
}

// A cache disk that is there twice heads one group, not two.
template <class IsSameCacheDisk>
std::vector<GroupPlan::Group> GroupsOf(const Deal& deal, const Heads& heads, const Positions& capacity,
                                       IsSameCacheDisk isSameCacheDisk) {
  std::vector<GroupPlan::Group> groups;
  for (const Deal::Share& share : deal.shares) {
    const std::size_t cache = heads.positions[share.entry];
    auto group = std::find_if(groups.begin(), groups.end(), [&](const GroupPlan::Group& known) {
      return isSameCacheDisk(known.cache, cache);
    });
    const bool isKnown = group != groups.end();
    if (!isKnown) {
      group = groups.insert(groups.end(), {heads.areNew, cache, {}});
    }
    for (const std::size_t dealt : share.disks) {
      group->capacity.push_back(capacity[dealt]);
    }
    if (isKnown) {
      std::sort(group->capacity.begin(), group->capacity.end());
    }
  }
  return groups;
}

// Why a capacity disk is left that could not be dealt.
LeftOver NotDealt(const Roles& roles, const Deal& deal) {
  if (deal.groupsFull) {
    return LeftOver::GroupsFull;
  }
  return roles.dropped.empty() ? LeftOver::NoCacheDisk : LeftOver::TooManyGroups;
}

std::vector<std::optional<LeftOver>> LeftOversOf(const Roles& roles, const Heads& heads, const Deal& deal) {
  std::vector<std::optional<LeftOver>> leftOver(roles.heads.size() + roles.dropped.size() +
                                                roles.capacity.size());
  for (const std::size_t dropped : roles.dropped) {
    leftOver[dropped] = LeftOver::TooManyGroups;
  }
  for (const std::size_t head : roles.heads) {
    leftOver[head] = LeftOver::NoCapacityDisk;
  }
  for (const std::size_t disk : roles.capacity) {
    leftOver[disk] = NotDealt(roles, deal);
  }
  for (const Deal::Share& share : deal.shares) {
    for (const std::size_t dealt : share.disks) {
      assert(leftOver[roles.capacity[dealt]]);  // each is dealt once
      leftOver[roles.capacity[dealt]] = std::nullopt;
    }
    if (heads.areNew) {
      assert(leftOver[heads.positions[share.entry]]);  // each has one share
      leftOver[heads.positions[share.entry]] = std::nullopt;
    }
  }
  return leftOver;
}

}  // namespace

std::string Describe(LeftOver reason) {
  switch (reason) {
    case LeftOver::NotEligible:
      return "not eligible";
    case LeftOver::NoCacheDisk:
      return "no flash disk is free to be its cache, and no group of its kind can grow";
    case LeftOver::NoCapacityDisk:
      return "no capacity disk is left for it to be the cache of";
    case LeftOver::GroupsFull:
      return "every group has " + std::to_string(mostCapacityDisks) + " capacity disks";
    case LeftOver::TooManyGroups:
      return "a host has at most " + std::to_string(mostGroups) + " groups";
  }
  return "";
}

bool IsFlash(bool isSsd, bool capacityFlash) {
  return isSsd || capacityFlash;
}

bool ExtendsHostGroups(const std::vector<Candidate>& candidates, const std::vector<HostGroup>& hostGroups) {
  const auto isCache = [](const Candidate& candidate) { return candidate.isCache; };
  return !hostGroups.empty() &&
         (hostGroups.size() >= mostGroups || std::none_of(candidates.begin(), candidates.end(), isCache));
}

std::vector<std::size_t> ExtendableGroups(const std::vector<HostGroup>& hostGroups, bool allFlash) {
  std::vector<std::size_t> extendable;
  for (std::size_t i = 0; i < hostGroups.size(); ++i) {
    if (hostGroups[i].allFlash == allFlash && !hostGroups[i].heldBack) {
      extendable.push_back(i);
    }
  }
  return extendable;
}

GroupPlan PlanGroups(const std::vector<Candidate>& candidates, const std::vector<HostGroup>& hostGroups,
                     bool allFlash) {
  const Roles roles = AssignRoles(candidates, hostGroups.size());
  const bool extends = ExtendsHostGroups(candidates, hostGroups);
  const Heads heads = extends ? HostHeads(hostGroups, allFlash) : NewHeads(roles);
  const Deal deal = DealCapacityDisks(heads.counts, roles.capacity.size());
  GroupPlan plan;
  plan.groups = GroupsOf(deal, heads, roles.capacity, [&](std::size_t one, std::size_t other) {
    return extends ? hostGroups[one].cacheDisk == hostGroups[other].cacheDisk
                   : candidates[one].disk != nullptr && candidates[one].disk == candidates[other].disk;
  });
  plan.leftOver = LeftOversOf(roles, heads, deal);
  plan.limitReached =
      plan.groups.empty() && !roles.capacity.empty() && NotDealt(roles, deal) != LeftOver::NoCacheDisk;
  return plan;
}

Roles AssignRoles(const std::vector<Candidate>& candidates, std::size_t existingGroups) {
  Roles roles;
  for (std::size_t i = 0; i < candidates.size(); ++i) {
    if (!candidates[i].isCache) {
      roles.capacity.push_back(i);
    } else if (roles.heads.size() + existingGroups < mostGroups) {
      roles.heads.push_back(i);
    } else {
      roles.dropped.push_back(i);
    }
  }
  assert(roles.heads.size() + roles.dropped.size() + roles.capacity.size() == candidates.size());
  return roles;
}

Deal DealCapacityDisks(std::vector<std::size_t> counts, std::size_t disks) {
  constexpr std::size_t none = static_cast<std::size_t>(-1);
  Deal deal;
  std::vector<std::size_t> shareOf(counts.size(), none);
  for (std::size_t disk = 0; disk < disks && !counts.empty(); ++disk) {
    const auto fewest = std::min_element(counts.begin(), counts.end());  // the first of equals
    if (*fewest >= mostCapacityDisks) {
      deal.groupsFull = true;
      break;
    }
    ++*fewest;
    const auto entry = static_cast<std::size_t>(fewest - counts.begin());
    if (shareOf[entry] == none) {
      shareOf[entry] = deal.shares.size();
      deal.shares.push_back({entry, {}});
    }
    assert(deal.shares[shareOf[entry]].entry == entry);
    deal.shares[shareOf[entry]].disks.push_back(disk);
  }
  return deal;
}

}  // namespace Kovasvc::Planning
