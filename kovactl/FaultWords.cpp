#include "kovactl/FaultWords.h"

#include <algorithm>
#include <array>
#include <string_view>

#include "nox/Faults.h"
#include "orbis/Any.h"
#include "orbis/TypeDescriptor.h"

namespace Kovactl {
namespace {

using Orbis::LocalizableMessage;
using Orbis::MethodFault;

// A fault by its type's name, or a message by its key.
struct Row {
  std::string_view name;
  std::string_view words;
  std::string_view advice;
};

constexpr std::array<Row, 15> faults = {{
    {"DiskHasPartitions", "holds partitions or is in use by others",
     "Look at the disk with `lsblk` on the host; if nothing on it is needed, delete its partitions and try "
     "again."},
    {"DiskIsUSB", "attached by USB", "Disks on USB are never used: leave it out."},
    {"DiskIsNonLocal", "not local: other hosts can reach it",
     "Only disks that no other host can reach are used: leave it out."},
    {"DiskTooSmall", "too small", "Leave it out, or put a larger one in its place."},
    {"DiskIsLastRemainingNonSSD", "last capacity disk of its group",
     "Remove the whole group with `kovactl remove-group CACHE-DISK`, or add another capacity disk first."},
    {"DuplicateDisks", "a disk is named twice", "Name each disk once."},
    {"InsufficientDisks", "too few disks for a disk group",
     "A group needs a cache disk and a capacity disk. `kovactl disks` shows which disks are eligible, "
     "`kovactl plan` what would become of them."},
    {"KovaIncompatibleDiskMapping", "the disk group is of a format that this host does not know",
     "Use the group on a host that knows its format, or remove it."},
    {"KovaDiskFault", "the storage service refused the disk",
     "If the host claims disks on its own (`kovactl groups` tells), nothing can be removed until it no "
     "longer "
     "does. Otherwise look at the disk with `kovactl disks`."},
    {"KovaFault", "the storage service refused", ""},
    {"InvalidArgument", "the request does not fit the host",
     "See what the host has with `kovactl disks` and `kovactl groups`."},
    {"SystemError", "something in the host failed",
     "See how the host is now with `kovactl disks` and `kovactl groups`; its log may tell more."},
    {"NotPermitted", "the caller's role does not allow this", "Ask somebody with the role that it needs."},
    {"Busy", "the host is busy", "Try again later."},
    {"HostChanged", "the host has changed since it was looked at", "Look at it again, then decide again."},
}};

constexpr std::array<Row, 3> messages = {{
    {"nox.agentd.kovaDiskOperation.allFlashExceed",
     "every all-flash disk group is full, or the host has as many disk groups as it may have",
     "`kovactl groups` shows them; make room first by removing a disk or a group."},
    {"nox.agentd.kovaDiskOperation.hybridExceed",
     "every hybrid disk group is full, or the host has as many disk groups as it may have",
     "`kovactl groups` shows them; make room first by removing a disk or a group."},
    {"nox.agentd.kovaDiskOperation.diskMappingNotFound", "the host has no such disk group mounted",
     "`kovactl groups` shows what it has; `kovactl claim` mounts groups that are not."},
}};

template <std::size_t count>
const Row* Find(const std::array<Row, count>& rows, std::string_view name) {
  const auto row =
      std::find_if(rows.begin(), rows.end(), [name](const Row& one) { return one.name == name; });
  return row == rows.end() ? nullptr : &*row;
}

// What a message carries, for keys that have words but no text of their own.
std::string ArgumentsOf(const LocalizableMessage& message) {
  std::string text;
  if (message.GetArg()) {
    for (const Orbis::KeyAnyValue* argument : *message.GetArg()) {
      if (const auto* value = dynamic_cast<const Orbis::Boxed<std::string>*>(argument->GetValue().Get())) {
        text += (text.empty() ? " (" : "; ") + value->GetValue();
      }
    }
  }
  return text.empty() ? text : text + ")";
}

std::string TextOf(const LocalizableMessage& message) {
  if (message.HasMessage()) {
    return message.GetMessage();
  }
  const Row* const row = Find(messages, message.GetKey());
  return (row != nullptr ? std::string(row->words) : message.GetKey()) + ArgumentsOf(message);
}

// What the fault names or says beside its kind and its messages.
std::string DetailOf(const MethodFault& fault) {
  if (const auto* systemError = dynamic_cast<const Orbis::Fault::SystemError*>(&fault)) {
    return systemError->GetReason();
  }
  if (const auto* diskFault = dynamic_cast<const Nox::Fault::KovaDiskFault*>(&fault)) {
    return diskFault->HasDevice() ? diskFault->GetDevice() : "";
  }
  if (const auto* notPermitted = dynamic_cast<const Nox::Fault::NotPermitted*>(&fault)) {
    return notPermitted->GetRole();
  }
  return "";
}

}  // namespace

std::string WordsFor(const MethodFault& fault) {
  const Row* const row = Find(faults, fault.GetType().name);
  return row != nullptr ? std::string(row->words) : fault.GetType().name;
}

std::string Explain(const MethodFault& fault) {
  std::string text = WordsFor(fault);
  if (const std::string detail = DetailOf(fault); !detail.empty()) {
    text += ": " + detail;
  }
  for (const LocalizableMessage* message : *fault.GetFaultMessage()) {
    text += "; " + TextOf(*message);
  }
  return text;
}

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
