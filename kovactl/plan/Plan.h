// What a change would do to a host: values for people and scripts.
#pragma once

#include <string>
#include <vector>

#include "host/Answer.h"
#include "otxctl/sim/HostDescription.h"

namespace Kovactl {

// What would become of one disk group.
struct PlannedGroup {
  enum class Fate { Made, Extended, Reduced, Removed, Unmounted, Mounted, Failed };

  Fate fate;
  std::string ssd;                    // canonical name
  std::vector<std::string> capacity;  // those that come or go; of a group that does either as a whole: all
  bool allFlash = false;              // of a group that fails: not known
  Tessa::Ref<Orbis::MethodFault> fault = nullptr;  // Failed: why
};

// A disk that was offered and would be in no group.
struct LeftOverDisk {
  std::string disk;    // canonical name
  std::string reason;  // one word, for scripts
  std::string text;    // for people
};

struct Plan {
  std::vector<PlannedGroup> groups;
  std::vector<LeftOverDisk> leftOver;
  Host::Answer answer;  // what the host would answer
};

// "made", "extended" and so on.
std::string WordFor(PlannedGroup::Fate fate);

// Finds the groups that differ, those of `before` first, each in its host's order.
std::vector<PlannedGroup> CompareGroups(const OtxCtl::Sim::HostDescription& before,
                                        const OtxCtl::Sim::HostDescription& after);

// The groups for which the answer holds an error.
std::vector<PlannedGroup> FailedGroups(const Host::Answer& answer);

}  // namespace Kovactl
