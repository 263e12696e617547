// What an addition of disks comes to, and why disks are left over, as plain values.
//
// Takes the decisions of the operations that add disks, in their order, for programs that explain a plan:
// all-flash groups first, from the flash disks that the kernel offers, then hybrid groups from what is left;
// an addition of named disks also mounts the groups that they head already. Threads: any. Disks and groups
// are named by their positions.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "kova/agentd/planning/pure/GroupPlan.h"

namespace Kovasvc::Planning {

// A disk of the request, as the kernel sees it.
struct OfferedDisk {
  std::string_view name = {};  // canonical name, by which it is told from the others
  bool eligible = false;
  bool isSsd = false;
  bool capacityFlash = false;                       // a flash disk that is meant for capacity
  bool unmounted = false;                           // the kernel says that its group is not mounted
  std::optional<std::size_t> group = std::nullopt;  // of the host, to which it belongs
};

struct AddPlan {
  enum class Way { Made, Extended, Mounted };
  struct Group {
    Way way;
    std::size_t cache;  // of a group that is made a disk, otherwise a group of the host
    bool allFlash;
    std::vector<std::size_t> capacity;  // disks
  };
  // Whether nothing is made because of a limit. An addition of named disks says so, by its all-flash limit if
  // that is one of them.
  bool StopsAtLimit() const { return groups.empty() && (allFlashLimit || hybridLimit); }

  std::vector<Group> groups;                      // in the order in which they are made
  std::vector<std::optional<LeftOver>> leftOver;  // per disk; nothing for one that is used
  // The name by which the request is refused because it repeats a disk. It makes no groups then, and what is
  // left over would be left over without the repeat.
  std::optional<std::string> repeated;
  bool allFlashLimit = false;  // a limit left nothing to plan from the flash disks
  bool hybridLimit = false;    // a limit left nothing to plan from the others
};

// An addition of every disk that the kernel offers. `disks` stand in the kernel's order, each once.
AddPlan PlanAddition(const std::vector<OfferedDisk>& disks, const std::vector<HostGroup>& groups);

// An addition of named disks. `disks` are those of them that the kernel knows, in its order, each once;
// `names` are as the request has them.
AddPlan PlanNamedAddition(const std::vector<OfferedDisk>& disks, const std::vector<HostGroup>& groups,
                          const std::vector<std::string_view>& names);

// Which name a request is refused by because it repeats one; nothing when it does not. Only neighbours count:
// a disk that is named twice with another between them passes. The name told is names[k], k being the count
// of names without repeats; it need not be a repeated one.
std::optional<std::size_t> FindRepeatedNeighbour(const std::vector<std::string_view>& names);

}  // namespace Kovasvc::Planning
