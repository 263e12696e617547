// What became of each disk group of a request, printed.
#pragma once

#include <iosfwd>
#include <string>

#include "host/Answer.h"
#include "nox/Kova.h"
#include "orbis/DataArray.h"

namespace Kovactl {

using GroupResults = Orbis::DataArray<Nox::Kova::Host::DiskMapResult>;

// A block per group: its outcome (`participle`, or "failed"), its disks, their states and what is wrong with
// them; then a line that counts. An empty list prints nothing.
void PrintGroupResults(const GroupResults& results, const std::string& participle, std::ostream& out);

// Explains what failed: each group's own fault, and the overall one unless it only repeats or sums them up.
// The same advice is given once.
void PrintGroupFaults(const GroupResults* results, const Orbis::MethodFault* overall, std::ostream& err);

}  // namespace Kovactl
