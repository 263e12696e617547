// Which disks of a request cannot be used, and why: beside a fault that says only that there are too few.
//
// Threads: any.
#pragma once

#include "host/Answer.h"

namespace Host {

// Adds a message for people to the fault: the disks of the answer to a query that are not eligible, each with
// the reason, as far as they fit into a sentence. Nothing when there are none.
void NameUnusableDisks(const Answer& queried, Orbis::MethodFault& fault);

}  // namespace Host
