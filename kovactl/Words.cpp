#include "kovactl/Words.h"

#include <algorithm>
#include <array>
#include <cstdio>

#include "host/FaultWords.h"
#include "nox/Kova.h"

namespace Kovactl {
namespace {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskResult;

bool HasOperationalState(const ScsiDisk& disk, const char* state) {
  const auto& states = disk.GetOperationalState();
  return states && std::count(states->Items().begin(), states->Items().end(), state) != 0;
}

}  // namespace

std::string NameOf(const ScsiDisk& disk) {
  return disk.HasCanonicalName() ? disk.GetCanonicalName() : "";
}

bool HasLeft(const ScsiDisk& disk) {
  return HasOperationalState(disk, ScsiDisk::STATE_ERROR);
}

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
  const bool isIneligible = result.GetState() == DiskResult::STATE_INELIGIBLE;
  if (isIneligible && result.GetDisk() && result.GetDisk()->HasDetail()) {
    return result.GetDisk()->GetDetail();
  }
  if (result.GetError()) {
    return Host::WordsFor(*result.GetError());
  }
  if (result.GetDisk() && HasLeft(*result.GetDisk())) {
    return "has left the host";
  }
  if (!isIneligible) {
    return "";
  }
  return result.GetDisk() && HasOperationalState(*result.GetDisk(), ScsiDisk::STATE_OFF)
             ? "its disk group is not mounted"
             : "the kernel gives no reason";
}

}  // namespace Kovactl
