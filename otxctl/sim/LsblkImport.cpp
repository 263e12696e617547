#include "otxctl/sim/LsblkImport.h"

#include <algorithm>
#include <limits>
#include <optional>
#include <utility>

#include "otxctl/disks/DiskJudge.h"
#include "otxctl/disks/DiskNames.h"
#include "otxctl/sim/LsblkDevice.h"
#include "otxctl/sim/LsblkFacts.h"
#include "otxctl/sim/SimRules.h"

namespace OtxCtl::Sim {
namespace {

using Disks::Attachment;
using Disks::DiskFacts;
using Disks::DiskIdentity;
using Disks::DiskVerdict;
using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskState;

constexpr std::int32_t usualBlockSize = 512;

std::int32_t BlockSizeOf(const LsblkDevice& device) {
  const std::int64_t size = device.blockSize.value_or(0);
  const bool isUsable = size > 0 && size <= std::numeric_limits<std::int32_t>::max();
  return isUsable ? static_cast<std::int32_t>(size) : usualBlockSize;
}

DiskIdentity IdentityOf(const DiskFacts& facts) {
  return facts.identity.IsKnown() ? facts.identity.Get() : DiskIdentity();
}

std::optional<std::string> TransportOf(const DiskFacts& facts, const LsblkDevice& device) {
  const std::string transport =
      facts.connection.IsKnown() ? facts.connection.Get().transport : device.transport;
  return transport.empty() ? std::nullopt : std::optional(transport);
}

bool IsLocal(const DiskFacts& facts) {
  return facts.connection.IsKnown() && facts.connection.Get().attachment != Attachment::Remote;
}

// A description has one number for all that keeps a disk from being formatted because somebody else uses it.
std::int32_t PartitionsOf(const DiskFacts& facts, const DiskVerdict& verdict) {
  const std::int32_t partitions = facts.partitions.IsKnown() ? facts.partitions.Get() : 0;
  return std::max<std::int32_t>(partitions, verdict.reason == DiskReason::HasPartitions ? 1 : 0);
}

HostDisk ToHostDisk(const CapturedDisk& captured, const DiskVerdict& verdict) {
  const DiskFacts& facts = captured.facts;
  const DiskIdentity identity = IdentityOf(facts);
  HostDisk disk;
  disk.name = facts.canonicalName;
  disk.ssd = facts.isFlash.Is(true);
  disk.bytes = facts.bytes.IsKnown() ? facts.bytes.Get() : 0;
  disk.blockSize = BlockSizeOf(*captured.device);
  disk.transport = TransportOf(facts, *captured.device);
  disk.local = IsLocal(facts);
  disk.partitions = PartitionsOf(facts, verdict);
  disk.vendor = identity.vendor;
  disk.model = identity.model;
  disk.serial = identity.serial;
  disk.displayName = Disks::DisplayName(identity, facts.kernelName);
  disk.detail = verdict.detail;
  return disk;
}

// What the simulated kernel would not make of the disk by itself.
void SetVerdict(const HostDescription& host, const DiskVerdict& verdict, HostDisk& disk) {
  const HostVerdict wanted{static_cast<std::int32_t>(verdict.state),
                           static_cast<std::int32_t>(verdict.reason)};
  if (VerdictOn(host, disk, nullptr) != wanted) {
    disk.verdict = wanted;
  }
}

std::vector<DiskFacts> NamedFacts(CapturedDisks& captured) {
  Disks::UniqueNames names;
  std::vector<DiskFacts> facts;
  facts.reserve(captured.disks.size());
  for (CapturedDisk& disk : captured.disks) {
    // A path is called what its disk is called: it is the same one.
    const std::string name = Disks::CanonicalName(IdentityOf(disk.facts), disk.facts.kernelName);
    disk.facts.canonicalName = disk.facts.multipathMap.Get().empty() ? names.Take(name) : name;
    facts.push_back(disk.facts);
  }
  return facts;
}

}  // namespace

LsblkImport ImportLsblk(std::string_view lsblkJson, const LsblkImportOptions& options) {
  const std::vector<LsblkDevice> devices = ReadLsblk(lsblkJson);
  CapturedDisks captured = DisksOfCapture(devices);
  const std::vector<DiskVerdict> verdicts =
      Disks::JudgeDisks(NamedFacts(captured), {options.minimumDiskBytes});
  const bool isAnyFree = std::any_of(verdicts.begin(), verdicts.end(), [](const DiskVerdict& verdict) {
    return verdict.state == DiskState::Eligible;
  });
  if (isAnyFree) {
    CheckThatHoldersAreShown(devices);
  }
  LsblkImport import;
  import.host.name = options.hostName;
  import.host.minimumDiskBytes = options.minimumDiskBytes;
  import.leftOut = std::move(captured.leftOut);
  for (std::size_t index = 0; index < verdicts.size(); ++index) {
    const CapturedDisk& disk = captured.disks[index];
    if (!disk.facts.multipathMap.Get().empty()) {
      import.leftOut.push_back({disk.facts.kernelName, verdicts[index].detail});
      continue;
    }
    import.host.disks.push_back(ToHostDisk(disk, verdicts[index]));
    SetVerdict(import.host, verdicts[index], import.host.disks.back());
    import.kernelNames.push_back(disk.facts.kernelName);
  }
  CheckHostDescription(import.host);
  return import;
}

}  // namespace OtxCtl::Sim
