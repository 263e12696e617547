#include "kovactl/FaultAdvice.h"

#include <algorithm>
#include <array>
#include <string_view>

#include "nox/Faults.h"
#include "orbis/TypeDescriptor.h"

namespace Kovactl {
namespace {

using Orbis::LocalizableMessage;
using Orbis::MethodFault;

// About a fault by its type's name, or a message by its key.
struct Row {
  std::string_view name;
  std::string_view advice;
};

constexpr std::array<Row, 14> faults = {{
    {"DiskHasPartitions",
     "Look at the disk with `lsblk` on the host; if nothing on it is needed, delete its partitions and try "
     "again."},
    {"DiskIsUSB", "Disks on USB are never used: leave it out."},
    {"DiskIsNonLocal", "Only disks that no other host can reach are used: leave it out."},
    {"DiskTooSmall", "Leave it out, or put a larger one in its place."},
    {"DiskIsLastRemainingNonSSD",
     "Remove the whole group with `kovactl remove-group CACHE-DISK`, or add another capacity disk first."},
    {"DuplicateDisks", "Name each disk once."},
    {"InsufficientDisks",
     "A group needs a cache disk and a capacity disk. `kovactl disks` shows which disks are eligible, "
     "`kovactl plan` what would become of them."},
    {"KovaIncompatibleDiskMapping", "Use the group on a host that knows its format, or remove it."},
    {"KovaDiskFault",
     "If the host claims disks on its own (`kovactl groups` tells), nothing can be removed until it no "
     "longer does. Otherwise look at the disk with `kovactl disks`."},
    {"InvalidArgument", "See what the host has with `kovactl disks` and `kovactl groups`."},
    {"SystemError",
     "See how the host is now with `kovactl disks` and `kovactl groups`; its log may tell more."},
    {"NotPermitted", "Ask somebody with the role that it needs."},
    {"Busy", "Try again later."},
    {"HostChanged", "Look at it again, then decide again."},
}};

constexpr std::array<Row, 3> messages = {{
    {"nox.agentd.kovaDiskOperation.allFlashExceed",
     "`kovactl groups` shows them; make room first by removing a disk or a group."},
    {"nox.agentd.kovaDiskOperation.hybridExceed",
     "`kovactl groups` shows them; make room first by removing a disk or a group."},
    {"nox.agentd.kovaDiskOperation.diskMappingNotFound",
     "`kovactl groups` shows what it has; `kovactl claim` mounts groups that are not."},
}};

template <std::size_t count>
const Row* Find(const std::array<Row, count>& rows, std::string_view name) {
  const auto row =
      std::find_if(rows.begin(), rows.end(), [name](const Row& one) { return one.name == name; });
  return row == rows.end() ? nullptr : &*row;
}

}  // namespace

std::string Advise(const MethodFault& fault) {
  for (const LocalizableMessage* message : *fault.GetFaultMessage()) {
    if (const Row* const row = Find(messages, message->GetKey())) {
      return std::string(row->advice);
    }
  }
  const auto* const busy = dynamic_cast<const Nox::Fault::Busy*>(&fault);
  if (busy != nullptr && busy->GetRetryAfterSeconds() > 0) {
    return "Try again in " + std::to_string(busy->GetRetryAfterSeconds()) + " s.";
  }
  const Row* const row = Find(faults, fault.GetType().name);
  return row != nullptr ? std::string(row->advice) : "";
}

}  // namespace Kovactl
