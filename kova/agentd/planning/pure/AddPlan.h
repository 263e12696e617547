// What an addition of disks comes to, and why disks are left over, as plain values.
//
// Takes the same decisions in the same order as the operations that add disks, for programs that explain a
// plan: all-flash groups first, from the flash disks that the kernel offers, then hybrid groups from what is
// left. Threads: any. Disks and groups are named by their positions.
#pragma once

#include <cstddef>
#include <optional>
#include <vector>

#include "kova/agentd/planning/pure/HybridPlan.h"

namespace Kovasvc::Planning {

// A disk of the request, as the kernel sees it.
struct OfferedDisk {
  bool eligible = false;
  bool isSsd = false;
  bool capacityFlash = false;  // a flash disk that is meant for capacity
};

// A group that the host has, mounted or not.
struct HostGroup {
  ExistingGroup group;
  std::size_t capacityDisks = 0;
  bool cacheListed = true;  // the inventory knows its cache disk
};

enum class LeftOver {
  NotEligible,     // the kernel does not offer it
  NoCacheDisk,     // a capacity disk without a flash disk or a group to go to
  NoCapacityDisk,  // a cache disk without capacity disks
  GroupsFull,      // every group has all the capacity disks it may have
  TooManyGroups,   // the host has, or gets, all the groups it may have
};

// The reason in words: "every group has 7 capacity disks".
const char* Describe(LeftOver reason);

struct AddPlan {
  struct Group {
    bool isNew = true;
    std::size_t cache = 0;  // of a new group a disk, otherwise a group of the host
    bool allFlash = false;
    std::vector<std::size_t> capacity;  // disks
  };
  std::vector<Group> groups;                      // in the order in which they are made
  std::vector<std::optional<LeftOver>> leftOver;  // per disk; nothing for one that is used
};

// `disks` stand in the kernel's order, each once.
AddPlan PlanAddition(const std::vector<OfferedDisk>& disks, const std::vector<HostGroup>& groups);

}  // namespace Kovasvc::Planning
