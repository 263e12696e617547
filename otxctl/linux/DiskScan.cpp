#include "otxctl/linux/DiskScan.h"

#include <algorithm>
#include <cstddef>
#include <unordered_map>
#include <utility>

#include "otxctl/disks/DiskNames.h"
#include "otxctl/linux/BlockDevices.h"
#include "otxctl/linux/DeviceFacts.h"
#include "otxctl/linux/DeviceKind.h"
#include "otxctl/linux/DevicePlace.h"
#include "otxctl/linux/DeviceStack.h"
#include "otxctl/linux/MountTable.h"
#include "otxctl/linux/NaturalOrder.h"
#include "otxctl/linux/SysfsReader.h"

namespace OtxCtl::Linux {
namespace {

using Disks::DiskFacts;
using Disks::Fact;
using Texts = std::vector<std::string>;

// Devices in folders of their own have names with slashes, which the kernel's tree cannot have.
std::string NodeOf(const SystemPaths& paths, const BlockDevice& device) {
  std::string name = device.name;
  std::replace(name.begin(), name.end(), '!', '/');
  return paths.dev + "/" + name;
}

ProbeResult NotProbed(const std::string& why) {
  return {Fact<Texts>::Unknown(why), Fact<std::string>::Unknown(why), Fact<bool>::Unknown(why)};
}

class Scan {
 public:
  Scan(const SystemPaths& paths, DiskProbe& probe)
      : _paths(paths), _probe(probe), _reader(paths.sys), _devices(_reader) {}

  DiskScan Run() && {
    _scan.whyIncomplete = _devices.WhyIncomplete();
    for (const BlockDevices::Unreadable& unread : _devices.NotRead()) {
      _scan.leftOut.push_back({unread.name, unread.why});
    }
    FindDisks();
    ProbeAll();
    AddUse();
    DropThoseGone();
    NameAll();
    for (Candidate& candidate : _candidates) {
      _scan.disks.push_back(std::move(candidate.disk));
    }
    return std::move(_scan);
  }

 private:
  struct Candidate {
    const BlockDevice* device;
    ScannedDisk disk;
    ProbeResult found = {};
    std::string whyGone = {};
  };

  void FindDisks();
  void ProbeAll();
  void ProbeOne(Candidate& candidate);
  void AddUse();
  void AddHolders(const DeviceStack& stack, const Candidate& candidate, DiskFacts& facts) const;
  void AddUseOfPaths(const DeviceStack& stack, const BlockDevice& map, DiskFacts& facts) const;
  void DropThoseGone();
  void NameAll();

  const SystemPaths& _paths;
  DiskProbe& _probe;
  const SysfsReader _reader;
  const BlockDevices _devices;
  std::vector<Candidate> _candidates;
  DiskScan _scan;
};

void Scan::FindDisks() {
  for (const BlockDevice& device : _devices.All()) {
    if (!device.IsWhole()) {
      if (_devices.ByName(device.parent) == nullptr) {
        _scan.leftOut.push_back({device.name, "a partition of no disk"});
      }
      continue;
    }
    const std::string why = WhyLeftOut(_reader, device);
    if (!why.empty()) {
      _scan.leftOut.push_back({device.name, why});
      continue;
    }
    ScannedDisk disk;
    disk.facts = FactsOf(_reader, _devices, device);
    disk.deviceNode = NodeOf(_paths, device);
    disk.deviceNumber = device.number.Get();
    disk.blockSize = static_cast<std::int32_t>(device.blockSize.IsKnown() ? device.blockSize.Get() : 0);
    _candidates.push_back({&device, std::move(disk)});
  }
}

// A path is not read: where another path is the preferred one, that fails, or moves the disk over. It leads
// to the disk that was read by the multipath device.
void Scan::ProbeAll() {
  std::unordered_map<const BlockDevice*, const Candidate*> maps;
  for (Candidate& candidate : _candidates) {
    if (IsMultipathMap(*candidate.device)) {
      ProbeOne(candidate);
      maps.emplace(candidate.device, &candidate);
    }
  }
  for (Candidate& candidate : _candidates) {
    if (IsMultipathMap(*candidate.device)) {
      continue;
    }
    const BlockDevice* const map = MultipathMapOf(_devices, *candidate.device);
    if (map == nullptr) {
      ProbeOne(candidate);
      continue;
    }
    const auto found = maps.find(map);
    candidate.found =
        found == maps.end() ? NotProbed("what stands on " + InWords(*map)) : found->second->found;
    candidate.found.isBusy = false;  // by nobody but the multipath device
    candidate.found.isGone = false;
    candidate.found.hasNoMedium = false;
  }
}

void Scan::ProbeOne(Candidate& candidate) {
  const DiskFacts& facts = candidate.disk.facts;
  candidate.found =
      IsReadable(facts)
          ? _probe.Probe(candidate.disk.deviceNode, candidate.disk.deviceNumber)
          : NotProbed("what stands on " + facts.kernelName + ", which is not running and not read");
  if (candidate.found.isGone) {
    candidate.whyGone = "went away";
  } else if (candidate.found.hasNoMedium) {
    candidate.whyGone = "without a medium";
  }
}

// Mounts are read last: what is mounted while disks are looked at is seen.
void Scan::AddUse() {
  const MountTable mounts(_paths, _devices);
  const DeviceStack stack(_devices, mounts);
  for (Candidate& candidate : _candidates) {
    DiskFacts& facts = candidate.disk.facts;
    facts.signatures = candidate.found.signatures;
    facts.partitionTable = candidate.found.partitionTable;
    facts.mounts = stack.MountsOn(*candidate.device);
    AddHolders(stack, candidate, facts);
    if (IsMultipathMap(*candidate.device)) {
      AddUseOfPaths(stack, *candidate.device, facts);
    }
  }
}

// Device-mapper lets its devices share what is below them: one may use a path past the multipath device.
void Scan::AddUseOfPaths(const DeviceStack& stack, const BlockDevice& map, DiskFacts& facts) const {
  if (!map.slaves.IsKnown()) {
    return;  // then nobody knows what it leads to either
  }
  for (const std::string& name : map.slaves.Get()) {
    const BlockDevice* const path = _devices.ByName(name);
    if (path == nullptr || !facts.holders.IsKnown()) {
      continue;
    }
    const Fact<Texts> ofPath = stack.HoldersOf(*path);
    if (!ofPath.IsKnown()) {
      facts.holders = ofPath;
      continue;
    }
    Texts all = facts.holders.Get();
    for (const std::string& holder : ofPath.Get()) {
      if (std::find(all.begin(), all.end(), holder) == all.end()) {
        all.push_back(holder);
      }
    }
    facts.holders = std::move(all);
  }
}

void Scan::AddHolders(const DeviceStack& stack, const Candidate& candidate, DiskFacts& facts) const {
  facts.holders = stack.HoldersOf(*candidate.device);
  const Fact<bool>& isBusy = candidate.found.isBusy;
  if (!facts.holders.IsKnown()) {
    return;
  }
  if (!isBusy.IsKnown()) {
    facts.holders = Fact<Texts>::Unknown(isBusy.WhyUnknown());
    return;
  }
  if (isBusy.Get() && !stack.IsClaimed(*candidate.device)) {
    Texts holders = facts.holders.Get();
    holders.push_back("another program");
    facts.holders = std::move(holders);
  }
}

void Scan::DropThoseGone() {
  std::vector<Candidate> present;
  present.reserve(_candidates.size());
  for (Candidate& candidate : _candidates) {
    const std::string why =
        candidate.whyGone.empty() ? WhyGone(_reader, *candidate.device) : candidate.whyGone;
    if (why.empty()) {
      present.push_back(std::move(candidate));
    } else {
      _scan.leftOut.push_back({candidate.device->name, why});
    }
  }
  _candidates = std::move(present);
}

// Multipath devices first: theirs is the name of the disk, and not their paths'.
void Scan::NameAll() {
  Disks::UniqueNames names;
  std::unordered_map<std::string, int> owners;  // paths aside
  const auto isMap = [](const Candidate& candidate) { return IsMultipathMap(*candidate.device); };
  std::stable_partition(_candidates.begin(), _candidates.end(), isMap);
  for (Candidate& candidate : _candidates) {
    DiskFacts& facts = candidate.disk.facts;
    const bool isKnown = facts.identity.IsKnown();
    const Disks::DiskIdentity identity = isKnown ? facts.identity.Get() : Disks::DiskIdentity();
    const std::string name = Disks::CanonicalName(identity, PlaceOf(_reader, *candidate.device));
    facts.canonicalName = names.Take(name);
    candidate.disk.displayName = Disks::DisplayName(identity, facts.kernelName);
    candidate.disk.hasStableName = facts.canonicalName == name && name.compare(0, 5, "path.") != 0;
    owners[name] += facts.multipathMap.Is({}) ? 1 : 0;
  }
  for (Candidate& candidate : _candidates) {
    candidate.disk.hasStableName =
        candidate.disk.hasStableName && owners[candidate.disk.facts.canonicalName] == 1;
  }
  std::sort(_candidates.begin(), _candidates.end(), [](const Candidate& one, const Candidate& other) {
    return IsNaturallyBefore(one.disk.facts.kernelName, other.disk.facts.kernelName);
  });
}

}  // namespace

DiskScan ScanDisks(const SystemPaths& paths, DiskProbe& probe) {
  return Scan(paths, probe).Run();
}

}  // namespace OtxCtl::Linux
