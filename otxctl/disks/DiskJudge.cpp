#include "otxctl/disks/DiskJudge.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <string_view>
#include <unordered_map>

#include "otxctl/disks/DiskTwins.h"

namespace OtxCtl::Disks {
namespace {

using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskState;

// What speaks against one disk.
class Findings {
 public:
  // Of the same reason: in the order in which they were found. Said twice counts once.
  void Add(DiskReason reason, std::string words) {
    const bool isNew = std::none_of(_all.begin(), _all.end(),
                                    [&](const Finding& finding) { return finding.words == words; });
    if (isNew) {
      _all.push_back({reason, std::move(words)});
    }
  }

  template <typename Value>
  bool IsKnown(const Fact<Value>& fact) {
    if (!fact.IsKnown()) {
      Add(DiskReason::HasForeignPartitions, "nobody knows: " + fact.WhyUnknown());
    }
    return fact.IsKnown();
  }

  DiskVerdict Verdict() && {
    if (_all.empty()) {
      return {DiskState::Eligible, DiskReason::None, {}};
    }
    std::stable_sort(_all.begin(), _all.end(),
                     [](const Finding& one, const Finding& other) { return one.reason < other.reason; });
    DiskVerdict verdict{DiskState::Ineligible, _all.front().reason, {}};
    for (const Finding& finding : _all) {
      verdict.detail += (verdict.detail.empty() ? "" : ", ") + finding.words;
    }
    return verdict;
  }

 private:
  struct Finding {
    DiskReason reason;
    std::string words;
  };
  std::vector<Finding> _all;
};

std::string SizeInWords(std::int64_t bytes) {
  constexpr std::array<const char*, 5> units = {" bytes", " KiB", " MiB", " GiB", " TiB"};
  std::size_t unit = 0;
  while (bytes >= 1024 && bytes % 1024 == 0 && unit + 1 < units.size()) {
    bytes /= 1024;
    ++unit;
  }
  return std::to_string(bytes) + units[unit];
}

void JudgeConnection(const DiskFacts& disk, Findings& findings) {
  if (!findings.IsKnown(disk.connection)) {
    return;
  }
  const Connection& connection = disk.connection.Get();
  switch (connection.attachment) {
    case Attachment::Machine:
      break;
    case Attachment::Usb:
      findings.Add(DiskReason::Usb, "attached by USB");
      break;
    case Attachment::FireWire:
      findings.Add(DiskReason::HasForeignPartitions, "attached by FireWire");
      break;
    case Attachment::MemoryCard:
      findings.Add(DiskReason::HasForeignPartitions, "an SD or MMC device");
      break;
    case Attachment::Remote:
      findings.Add(DiskReason::NonLocal,
                   "not local" + (connection.transport.empty() ? "" : ": " + connection.transport));
      break;
    case Attachment::Virtual:
      findings.Add(DiskReason::HasForeignPartitions, "a virtual device");
      break;
  }
}

// A table counts although no partition is shown: the kernel may not have read it, and nobody makes one for
// nothing.
void JudgePartitions(const DiskFacts& disk, Findings& findings) {
  const bool isTableKnown = findings.IsKnown(disk.partitionTable);
  const bool isCountKnown = findings.IsKnown(disk.partitions);
  const std::string table = isTableKnown ? disk.partitionTable.Get() : std::string();
  const std::int32_t count = isCountKnown ? disk.partitions.Get() : 0;
  const std::string partitions =
      count > 0 ? std::to_string(count) + (count == 1 ? " partition" : " partitions") : "";
  if (!table.empty()) {
    findings.Add(DiskReason::HasPartitions,
                 table + " partition table" + (count > 0 ? " with " + partitions : ""));
  } else if (count > 0) {
    findings.Add(DiskReason::HasPartitions, partitions);
  }
}

void JudgeUse(const DiskFacts& disk, Findings& findings) {
  JudgePartitions(disk, findings);
  if (findings.IsKnown(disk.signatures)) {
    for (const std::string& signature : disk.signatures.Get()) {
      findings.Add(DiskReason::HasPartitions, signature);
    }
  }
  if (findings.IsKnown(disk.mounts)) {
    for (const std::string& mount : disk.mounts.Get()) {
      findings.Add(DiskReason::HasPartitions, "mounted at " + mount);
    }
  }
  if (findings.IsKnown(disk.holders)) {
    for (const std::string& holder : disk.holders.Get()) {
      findings.Add(DiskReason::HasPartitions, "held by " + holder);
    }
  }
  if (findings.IsKnown(disk.multipathMap) && !disk.multipathMap.Get().empty()) {
    findings.Add(DiskReason::HasPartitions, "a path of the multipath device " + disk.multipathMap.Get());
  }
}

void JudgeFlag(const Fact<bool>& flag, const char* words, Findings& findings) {
  if (findings.IsKnown(flag) && flag.Get()) {
    findings.Add(DiskReason::HasForeignPartitions, words);
  }
}

void JudgeFitness(const DiskFacts& disk, Findings& findings) {
  findings.IsKnown(disk.isFlash);
  JudgeFlag(disk.isReadOnly, "read-only", findings);
  JudgeFlag(disk.isRemovable, "removable", findings);
  JudgeFlag(disk.isHotPlug, "hot-plug", findings);
  if (findings.IsKnown(disk.state)) {
    const std::string& state = disk.state.Get();
    if (!IsRunning(state)) {
      findings.Add(DiskReason::HasForeignPartitions, "not running: " + state);
    }
  }
  if (findings.IsKnown(disk.zones)) {
    const std::string& zones = disk.zones.Get();
    if (!zones.empty() && zones != "none") {
      findings.Add(DiskReason::HasForeignPartitions, "zoned: " + zones);
    }
  }
}

void JudgeSize(const DiskFacts& disk, const DiskLimits& limits, Findings& findings) {
  if (!findings.IsKnown(disk.bytes)) {
    return;
  }
  const std::int64_t bytes = disk.bytes.Get();
  if (bytes <= 0) {
    findings.Add(DiskReason::TooSmall, "without a medium");
  } else if (bytes < limits.minimumBytes) {
    findings.Add(DiskReason::TooSmall,
                 SizeInWords(bytes) + ", smaller than " + SizeInWords(limits.minimumBytes));
  }
}

void JudgeIdentity(const DiskFacts& disk, const std::string& twins, Findings& findings) {
  if (findings.IsKnown(disk.identity)) {
    const DiskIdentity& identity = disk.identity.Get();
    if (identity.worldWideName.empty() && identity.serial.empty()) {
      findings.Add(DiskReason::HasForeignPartitions,
                   "nobody knows: it has neither a world wide name nor a serial number to be told by");
    }
  }
  if (!twins.empty()) {
    findings.Add(DiskReason::HasForeignPartitions, twins);
  }
}

DiskVerdict Judge(const DiskFacts& disk, const std::string& twins, const DiskLimits& limits) {
  if (disk.membership == Membership::Mounted) {
    return {DiskState::InUse, DiskReason::None, {}};
  }
  if (disk.membership == Membership::Unmounted) {
    return {DiskState::Ineligible, DiskReason::GroupNotMounted,
            "member of disk group " + disk.group + ", which is not mounted"};
  }
  Findings findings;
  JudgeUse(disk, findings);
  JudgeConnection(disk, findings);
  JudgeFitness(disk, findings);
  JudgeIdentity(disk, twins, findings);
  JudgeSize(disk, limits, findings);
  return std::move(findings).Verdict();
}

}  // namespace

bool IsRunning(const std::string& state) {
  return state.empty() || state == "running" || state == "live";
}

std::vector<DiskVerdict> JudgeDisks(const std::vector<DiskFacts>& disks, const DiskLimits& limits) {
  const DiskTwins twins(disks);
  std::vector<DiskVerdict> verdicts;
  verdicts.reserve(disks.size());
  for (std::size_t index = 0; index < disks.size(); ++index) {
    verdicts.push_back(Judge(disks[index], twins.WordsFor(index), limits));
  }
  return verdicts;
}

}  // namespace OtxCtl::Disks
