// Which flash disks all-flash planning takes, as plain values.
//
// The kernel says which flash disks are meant for capacity; size plays no part. Threads: any.
#pragma once

#include <cstddef>
#include <vector>

namespace Kovasvc::Planning {

// Whether a disk of these kernel flags is a flash disk at all, for cache or for capacity.
bool IsFlash(bool isSsd, bool capacityFlash);

// Which of the flash disks, told apart by whether they may be cache disks, are taken from hybrid planning
// before a group is planned: every one that is meant for capacity, also when a limit leaves it out of the
// plan. A cache disk is taken only when it heads a planned group, so that the others stay available.
std::vector<std::size_t> TakenForCapacity(const std::vector<bool>& flashIsCache);

}  // namespace Kovasvc::Planning
