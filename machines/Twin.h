// A simulated host that answers like another one, made from nothing but that one's answers.
#pragma once

#include "host/HostState.h"
#include "otxctl/sim/HostDescription.h"

namespace Machines {

// Its kernel records, disk groups, configuration and inventory are those of `state`, in the same order;
// beyond that, the words "for people" of a disk that is listed. What no simulated host can have is left out:
// how the host calls a device, and flags of a record that no simulated kernel sets.
//
// A free disk is judged as it was, now and after changes: what the facts that are known would not say is
// pinned to it as its verdict. A member is judged anew when its group changes.
//
// Pure. A state that contradicts itself, with a disk in two groups, gives a description that is refused.
OtxCtl::Sim::HostDescription DescribeTwin(const Host::HostState& state);

}  // namespace Machines
