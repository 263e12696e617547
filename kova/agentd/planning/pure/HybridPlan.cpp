#include "kova/agentd/planning/pure/HybridPlan.h"

#include <algorithm>

namespace Kovasvc::Planning {

Roles AssignRoles(const std::vector<bool>& candidateIsSsd, std::size_t existingGroups) {
  Roles roles;
  for (std::size_t i = 0; i < candidateIsSsd.size(); ++i) {
    if (!candidateIsSsd[i]) {
      roles.capacity.push_back(i);
    } else if (roles.ssds.size() + existingGroups < mostGroups) {
      roles.ssds.push_back(i);
    } else {
      roles.dropped.push_back(i);
    }
  }
  return roles;
}

std::vector<std::size_t> ExtendableGroups(const std::vector<ExistingGroup>& groups, bool allFlash) {
  std::vector<std::size_t> extendable;
  for (std::size_t i = 0; i < groups.size(); ++i) {
    if (groups[i].allFlash == allFlash && !groups[i].heldBack) {
      extendable.push_back(i);
    }
  }
  return extendable;
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
    deal.shares[shareOf[entry]].disks.push_back(disk);
  }
  return deal;
}

bool IsLimitReached(const Roles& roles, const Deal& deal) {
  if (roles.capacity.empty() || !deal.shares.empty()) {
    return false;
  }
  return !roles.dropped.empty() || deal.groupsFull;
}

}  // namespace Kovasvc::Planning
