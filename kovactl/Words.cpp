#include "kovactl/Words.h"

#include <algorithm>
#include <array>
#include <cstdio>

#include "nox/Faults.h"
#include "nox/Kova.h"
#include "orbis/TypeDescriptor.h"

namespace Kovactl {
namespace {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskResult;
using Orbis::MethodFault;

struct FaultWords {
  std::string_view type;
  std::string_view words;
};
constexpr std::array<FaultWords, 15> faultWords = {{
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
    {"Busy", "the host is busy; try again later"},
    {"HostChanged", "the host has changed since it was looked at"},
}};

std::string WordsFor(const MethodFault& fault) {
  const std::string& type = fault.GetType().name;
  for (const FaultWords& row : faultWords) {
    if (row.type == type) {
      return std::string(row.words);
    }
  }
  return type;
}

bool HasOperationalState(const ScsiDisk& disk, const char* state) {
  const auto& states = disk.GetOperationalState();
  return states && std::count(states->Items().begin(), states->Items().end(), state) != 0;
}

}  // namespace

std::string KindOf(const ScsiDisk& disk) {
  if (!disk.HasSsd()) {
    return "unknown";
  }
  return disk.GetSsd() ? "flash" : "hard disk";
}

std::string SizeOf(const ScsiDisk& disk) {
  const auto& capacity = disk.GetCapacity();
  if (!capacity || capacity->GetBlock() <= 0 || capacity->GetBlockSize() <= 0) {
    return "-";
  }
  return HumanSize(static_cast<std::uint64_t>(capacity->GetBlock()) *
                   static_cast<std::uint64_t>(capacity->GetBlockSize()));
}

std::string HumanSize(std::uint64_t bytes) {
  constexpr std::array<const char*, 7> units = {"B", "KiB", "MiB", "GiB", "TiB", "PiB", "EiB"};
  double amount = static_cast<double>(bytes);
  std::size_t unit = 0;
  // 1023.95 would be printed as 1024.0, so it already belongs to the next unit.
  while (amount >= 1023.95 && unit + 1 < units.size()) {
    amount /= 1024;
    ++unit;
  }
  char text[32];
  std::snprintf(text, sizeof text, unit == 0 ? "%.0f %s" : "%.1f %s", amount, units[unit]);
  return text;
}

std::string StateOf(const DiskResult& result) {
  return result.GetState() == DiskResult::STATE_INUSE ? "in use" : result.GetState();
}

std::string ReasonOf(const DiskResult& result) {
  if (result.GetError()) {
    return WordsFor(*result.GetError());
  }
  if (result.GetDisk() && HasOperationalState(*result.GetDisk(), ScsiDisk::STATE_ERROR)) {
    return "has left the host";
  }
  if (result.GetState() != DiskResult::STATE_INELIGIBLE) {
    return "";
  }
  return result.GetDisk() && HasOperationalState(*result.GetDisk(), ScsiDisk::STATE_OFF)
             ? "its disk group is not mounted"
             : "the kernel gives no reason";
}

std::string Explain(const MethodFault& fault) {
  std::string text = WordsFor(fault);
  if (const auto* systemError = dynamic_cast<const Orbis::Fault::SystemError*>(&fault)) {
    text += ": " + systemError->GetReason();
  }
  const auto* diskFault = dynamic_cast<const Nox::Fault::KovaDiskFault*>(&fault);
  if (diskFault != nullptr && diskFault->HasDevice()) {
    text += ": " + diskFault->GetDevice();
  }
  for (const Orbis::LocalizableMessage* message : *fault.GetFaultMessage()) {
    text += "; " + (message->HasMessage() ? message->GetMessage() : message->GetKey());
  }
  return text;
}

}  // namespace Kovactl
