#include "host/FaultWords.h"

#include <algorithm>
#include <array>
#include <string_view>

#include "nox/Faults.h"
#include "orbis/Any.h"
#include "orbis/TypeDescriptor.h"

namespace Host {
namespace {

using Orbis::LocalizableMessage;
using Orbis::MethodFault;

// A fault by its type's name, or a message by its key.
struct Row {
  std::string_view name;
  std::string_view words;
};

constexpr std::array<Row, 15> faults = {{
    {"DiskHasPartitions", "holds partitions or is in use by others"},
    {"DiskIsUSB", "attached by USB"},
    {"DiskIsNonLocal", "not local: other hosts can reach it"},
    {"DiskTooSmall", "too small"},
    {"DiskIsLastRemainingNonSSD", "last capacity disk of its group"},
    {"DuplicateDisks", "a disk is named twice"},
    {"InsufficientDisks", "too few disks for a disk group"},
    {"KovaIncompatibleDiskMapping", "the disk group is of a format that this host does not know"},
    {"KovaDiskFault", "the storage service refused the disk"},
    {"KovaFault", "the storage service refused"},
    {"InvalidArgument", "the request does not fit the host"},
    {"SystemError", "something in the host failed"},
    {"NotPermitted", "the caller's role does not allow this"},
    {"Busy", "the host is busy"},
    {"HostChanged", "the host has changed since it was looked at"},
}};

constexpr std::array<Row, 3> messages = {{
    {"nox.agentd.kovaDiskOperation.allFlashExceed",
     "every all-flash disk group is full, or the host has as many disk groups as it may have"},
    {"nox.agentd.kovaDiskOperation.hybridExceed",
     "every hybrid disk group is full, or the host has as many disk groups as it may have"},
    {"nox.agentd.kovaDiskOperation.diskMappingNotFound", "the host has no such disk group mounted"},
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
  if (const auto* changed = dynamic_cast<const Nox::Fault::HostChanged*>(&fault)) {
    return changed->GetExpected().empty() ? "" : changed->GetExpected() + ", now " + changed->GetActual();
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

}  // namespace Host
