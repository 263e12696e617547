// The plan of disk groups of one kind, hybrid or all-flash, as plain values: no lock, no logger, no kernel.
//
// Whoever makes groups and whoever explains them take their plan from here. Threads: any. Candidates, and the
// groups of the host, are named by their positions.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace Kovasvc::Planning {

inline constexpr std::size_t mostGroups = 5;         // per host, those that exist included
inline constexpr std::size_t mostCapacityDisks = 7;  // per group

// Whether a disk of these kernel flags is a flash disk at all, for cache or for capacity. The kernel says
// which are meant for capacity; size plays no part.
bool IsFlash(bool isSsd, bool capacityFlash);

// A disk that groups are planned from.
struct Candidate {
  bool isCache = false;        // otherwise it is for capacity
  const void* disk = nullptr;  // equal for one disk that is there twice, or null; only compared
};

// A group that the host has, mounted or not.
struct HostGroup {
  bool allFlash = false;
  bool heldBack = false;  // the kernel does not want it to be extended
  std::size_t capacityDisks = 0;
  std::string_view cacheDisk = {};  // canonical name
  bool cacheListed = false;  // the inventory knows its cache disk; read only of groups that may be extended
};

// Why a disk is in no group.
enum class LeftOver {
  NotEligible,     // the kernel does not offer it
  NoCacheDisk,     // a capacity disk without a flash disk or a group to go to
  NoCapacityDisk,  // a cache disk without capacity disks
  GroupsFull,      // every group has all the capacity disks it may have
  TooManyGroups,   // the host has, or gets, all the groups it may have
};

// The reason in words: "every group has 7 capacity disks".
std::string Describe(LeftOver reason);

struct GroupPlan {
  struct Group {
    bool isNew;
    std::size_t cache;                  // of a new group a candidate, otherwise a group of the host
    std::vector<std::size_t> capacity;  // candidates, in order
  };
  std::vector<Group> groups;                      // in the order of their first capacity disks
  std::vector<std::optional<LeftOver>> leftOver;  // per candidate; nothing for one that is used
  // Whether the plan came out empty because of a limit. Disks left over beside a planned group do not count.
  bool limitReached = false;
};

// Whether planning turns to the groups of the host because none of the candidates may head a new one.
bool ExtendsHostGroups(const std::vector<Candidate>& candidates, const std::vector<HostGroup>& hostGroups);

// Which of the host's groups may be given more disks: those of the wanted kind that are not held back, in
// order.
std::vector<std::size_t> ExtendableGroups(const std::vector<HostGroup>& hostGroups, bool allFlash);

// New groups round the first cache disks among the candidates, as many as the host may still have; without
// any, more disks for the host's groups of that kind. Each capacity disk in its order goes to the group that
// has the fewest.
GroupPlan PlanGroups(const std::vector<Candidate>& candidates, const std::vector<HostGroup>& hostGroups,
                     bool allFlash);

// ---- the steps of that

// Which part each candidate plays.
struct Roles {
  std::vector<std::size_t> heads;     // cache disks that may head a group, in order
  std::vector<std::size_t> dropped;   // cache disks beyond the limit of groups
  std::vector<std::size_t> capacity;  // in order
};

// Takes cache disks in order as long as their groups and the existing ones are not too many.
Roles AssignRoles(const std::vector<Candidate>& candidates, std::size_t existingGroups);

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

}  // namespace Kovasvc::Planning
