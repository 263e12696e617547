// How disk groups are dealt out, as plain values: no lock, no logger, no kernel.
//
// Threads: any. Candidates, entries and capacity disks are named by their positions.
#pragma once

#include <cstddef>
#include <vector>

namespace Kovasvc::Planning {

inline constexpr std::size_t mostGroups = 5;         // per host, those that exist included
inline constexpr std::size_t mostCapacityDisks = 7;  // per group

// Which part each candidate plays.
struct Roles {
  std::vector<std::size_t> ssds;      // may head a group, in order
  std::vector<std::size_t> dropped;   // flash disks beyond the limit of groups
  std::vector<std::size_t> capacity;  // in order
};

// Takes flash disks in order as long as their groups and the existing ones are not too many.
Roles AssignRoles(const std::vector<bool>& candidateIsSsd, std::size_t existingGroups);

// A group that the kernel already has, as far as planning asks.
struct ExistingGroup {
  bool allFlash = false;
  bool heldBack = false;  // the kernel does not want it to be extended
};

// Which of the groups may be given more disks: those of the wanted kind that are not held back, in order.
std::vector<std::size_t> ExtendableGroups(const std::vector<ExistingGroup>& groups, bool allFlash);

// Which capacity disk goes to which entry.
struct Deal {
  struct Share {
    std::size_t entry;
    std::vector<std::size_t> disks;
  };
  std::vector<Share> shares;  // entries that received a disk, in the order of their first ones
  bool groupsFull = false;    // a disk was left over because every entry has all it may have
};

// Deals so many disks to entries that begin with `counts` disks each: every disk to the first of those that
// have the fewest. Ends when even they are full. No entries: nothing is dealt.
Deal DealCapacityDisks(std::vector<std::size_t> counts, std::size_t disks);

// Whether a plan came out empty because of a limit. Disks left over beside a planned group do not count.
bool IsLimitReached(const Roles& roles, const Deal& deal);

}  // namespace Kovasvc::Planning
