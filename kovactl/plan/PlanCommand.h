// kovactl plan: what a change would do, shown before anybody makes it.
#pragma once

#include <iosfwd>
#include <string>

#include "kovactl/Change.h"
#include "kovactl/ExitStatus.h"
#include "kovactl/plan/Plan.h"

namespace Kovactl {

// Makes the change on a host that may be spoiled, a simulated copy in memory, and compares. Throws BadInput
// as the change does, and for an answer that cannot be a simulated host's.
Plan MakePlan(const Host::ManagementApi& copy, Change& change);

struct PlanOptions {
  std::string generation;  // of the host that the copy is of: the plan is good for no other one
  std::string output = "table";
  bool allDisks = false;  // in a table, whether disks that are left over are named; JSON always names them
};

// The same, printed. Fault when the host would answer with one.
ExitStatus RunPlan(const Host::ManagementApi& copy, Change& change, const PlanOptions& options,
                   std::ostream& out, std::ostream& err);

}  // namespace Kovactl
