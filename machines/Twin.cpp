#include "machines/Twin.h"

#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "host/KnownDisks.h"
#include "nox/Host.h"
#include "orbis/Types.h"
#include "otxctl/disks/DiskNames.h"
#include "otxctl/sim/SimRules.h"

namespace Machines {
namespace {

using HostCtl::Kova::DiskName;
using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskResult;
using Nox::Host::ScsiDisk;
using Nox::Host::ScsiLun;
using OtxCtl::Sim::HostDescription;
using OtxCtl::Sim::HostDisk;
using OtxCtl::Sim::HostGroup;
using OtxCtl::Sim::HostVerdict;

OtxCtl::Sim::DurableName ToDurableName(const Nox::Host::DurableName& name) {
  return {.authority = name.GetAuthority(), .identifier = name.GetIdentifier()};
}

void SetIdentity(HostDisk& disk, const ScsiDisk& listed) {
  disk.displayName = listed.HasDisplayName() ? listed.GetDisplayName() : "";
  disk.vendor = listed.HasVendor() ? listed.GetVendor() : "";
  disk.model = listed.HasModel() ? listed.GetModel() : "";
  disk.serial = listed.HasSerialNumber() ? listed.GetSerialNumber() : "";
  if (listed.GetDurableName()) {
    disk.durableName = ToDurableName(*listed.GetDurableName());
  }
  if (listed.GetAlternateName()) {
    for (const Nox::Host::DurableName* name : *listed.GetAlternateName()) {
      disk.alternateName.push_back(ToDurableName(*name));
    }
  }
  if (listed.GetStandardInquiry()) {
    disk.standardInquiry = listed.GetStandardInquiry()->GetValue();
  }
}

// A disk as the inventory lists it; what the kernel makes of it is not known yet.
HostDisk ToDisk(const ScsiDisk& listed) {
  HostDisk disk;
  disk.name = listed.GetCanonicalName();
  disk.ssd = listed.HasSsd() && listed.GetSsd();
  disk.blockSize = listed.GetCapacity()->GetBlockSize();
  disk.bytes = listed.GetCapacity()->GetBlock() * disk.blockSize;
  disk.local = !listed.HasLocal() || listed.GetLocal();
  if (listed.HasTransport()) {
    disk.transport = listed.GetTransport();
  }
  disk.detail = listed.HasDetail() ? listed.GetDetail() : "";
  SetIdentity(disk, listed);
  return disk;
}

// What the kernel says of a disk. It refuses to format one with partitions, so these are not a mere verdict.
void SetRecord(HostDisk& disk, const DiskResult& record) {
  disk.ssd = record.isSsd;
  disk.capacityFlash = record.capacityFlash;
  disk.kovaUuid = record.kovaUuid;
  disk.formatVersion = record.formatVersion;
  disk.partitions = record.reason == DiskReason::HasPartitions ? 1 : 0;
}

// A disk of the inventory, a record of the kernel, or both of one disk.
struct Entry {
  const ScsiDisk* listed = nullptr;
  const DiskResult* record = nullptr;
};

using Listed = std::vector<const ScsiDisk*>;

// The disks of the inventory, each name once; its other units become such of the twin.
Listed ListedDisks(const Nox::Host::StorageDeviceInfo& inventory, HostDescription& twin) {
  Listed disks;
  std::unordered_set<std::string_view> names;
  if (!inventory.GetScsiLun()) {
    return disks;
  }
  for (const ScsiLun* unit : *inventory.GetScsiLun()) {
    const auto* const disk = dynamic_cast<const ScsiDisk*>(unit);
    if (disk == nullptr) {
      twin.otherLuns.push_back(unit == nullptr ? std::nullopt : std::optional(unit->GetLunType()));
    } else if (disk->HasCanonicalName() && names.insert(disk->GetCanonicalName()).second) {
      disks.push_back(disk);
    }
  }
  return disks;
}

// One list in two orders. Where these disagree, the kernel's counts.
std::vector<Entry> Merge(const Listed& listed, const std::vector<DiskResult>& records) {
  std::unordered_map<std::string_view, std::size_t> placeOf;
  for (std::size_t place = 0; place < listed.size(); ++place) {
    placeOf.emplace(listed[place]->GetCanonicalName(), place);
  }
  std::unordered_set<std::string_view> recorded;
  for (const DiskResult& record : records) {
    recorded.insert(record.name);
  }
  std::vector<Entry> entries;
  std::size_t passed = 0;  // of the list, so far
  const auto passOver = [&](std::size_t end) {
    for (; passed < end; ++passed) {
      if (recorded.count(listed[passed]->GetCanonicalName()) == 0) {
        entries.push_back({.listed = listed[passed]});
      }
    }
  };
  for (const DiskResult& record : records) {
    const auto place = placeOf.find(record.name);
    if (place != placeOf.end()) {
      passOver(place->second);
    }
    entries.push_back(
        {.listed = place == placeOf.end() ? nullptr : listed[place->second], .record = &record});
  }
  passOver(listed.size());
  return entries;
}

// A disk that has left has no name yet.
HostDisk ToDisk(const Entry& entry) {
  HostDisk disk = entry.listed == nullptr ? HostDisk() : ToDisk(*entry.listed);
  disk.inInventory = entry.listed != nullptr;
  disk.inKernel = entry.record != nullptr;
  if (entry.record != nullptr) {
    disk.name = entry.record->name;
    disk.absent = disk.name.empty();
    SetRecord(disk, *entry.record);
  }
  return disk;
}

// The disks of a twin, found as the members of a group are named.
class MemberDisks {
 public:
  explicit MemberDisks(HostDescription& twin) : _disks(twin.disks) {
    for (std::size_t index = 0; index < _disks.size(); ++index) {
      (_disks[index].absent ? _absent : _present).emplace(KeyOf(_disks[index]), index);
    }
  }

  // Where it stands. A disk that nobody has told of comes behind the others; of several that have left with
  // one UUID, each is found once.
  std::size_t Take(const DiskName& name) {
    auto& named = name.deviceName.empty() ? _absent : _present;
    const auto found = named.find(name.deviceName.empty() ? name.kovaUuid : name.deviceName);
    if (found == named.end()) {
      return Add(name);
    }
    const std::size_t index = found->second;
    if (name.deviceName.empty()) {
      named.erase(found);
    }
    return index;
  }

 private:
  static const std::string& KeyOf(const HostDisk& disk) { return disk.absent ? disk.kovaUuid : disk.name; }

  std::size_t Add(const DiskName& name) {
    HostDisk& disk = _disks.emplace_back();
    disk.name = name.deviceName;
    disk.kovaUuid = name.kovaUuid;
    disk.absent = name.deviceName.empty();
    disk.inInventory = false;
    disk.inKernel = false;
    return _disks.size() - 1;
  }

  std::vector<HostDisk>& _disks;
  std::multimap<std::string, std::size_t> _present;  // by name
  std::multimap<std::string, std::size_t> _absent;   // by KOVA UUID, in the order of the host
};

// The members of a group, by their places among the disks: the cache disk first.
using Members = std::vector<std::size_t>;

std::vector<Members> FindMembers(const std::vector<Host::KernelGroup>& groups, HostDescription& twin) {
  MemberDisks disks(twin);
  std::vector<Members> members;
  for (const Host::KernelGroup& group : groups) {
    Members& places = members.emplace_back(Members{disks.Take(group.disks.ssd)});
    for (const DiskName& name : group.disks.capacityDisks) {
      places.push_back(disks.Take(name));
    }
    // What only the inventory knows has its identity from its group.
    for (std::size_t i = 0; i < places.size(); ++i) {
      const DiskName& name = i == 0 ? group.disks.ssd : group.disks.capacityDisks[i - 1];
      HostDisk& disk = twin.disks[places[i]];
      disk.kovaUuid = disk.inKernel ? disk.kovaUuid : name.kovaUuid;
    }
  }
  return members;
}

// Names that no other disk has, for those that have left.
void NameAbsentDisks(HostDescription& twin) {
  OtxCtl::Disks::UniqueNames names;
  for (const HostDisk& disk : twin.disks) {
    if (!disk.absent) {
      names.Take(disk.name);
    }
  }
  for (HostDisk& disk : twin.disks) {
    if (disk.absent) {
      disk.name = names.Take(Host::AbsentName(disk.kovaUuid));
    }
  }
}

void AddGroups(const std::vector<Host::KernelGroup>& groups, const std::vector<Members>& members,
               HostDescription& twin) {
  for (std::size_t i = 0; i < groups.size(); ++i) {
    const HostCtl::Kova::DiskMapping& told = groups[i].disks;
    HostGroup& group = twin.groups.emplace_back();
    group.ssd = twin.disks[members[i].front()].name;
    for (std::size_t place = 1; place < members[i].size(); ++place) {
      group.capacity.push_back(twin.disks[members[i][place]].name);
    }
    group.allFlash = told.allFlash;
    group.mounted = groups[i].mounted;
    group.formatVersion = told.formatVersion;
    group.busy = told.thirdFlag && group.mounted;
  }
}

// Where the twin's kernel would judge otherwise, it is told the verdict.
void PinVerdicts(const std::vector<Entry>& entries, const std::vector<Members>& members,
                 HostDescription& twin) {
  std::vector<const HostGroup*> groupOf(twin.disks.size());
  for (std::size_t i = 0; i < members.size(); ++i) {
    for (const std::size_t place : members[i]) {
      groupOf[place] = &twin.groups[i];
    }
  }
  for (std::size_t place = 0; place < entries.size(); ++place) {
    if (const DiskResult* const record = entries[place].record) {
      const HostVerdict told{.state = static_cast<std::int32_t>(record->state),
                             .reason = static_cast<std::int32_t>(record->reason)};
      HostDisk& disk = twin.disks[place];
      if (OtxCtl::Sim::VerdictOn(twin, disk, groupOf[place]) != told) {
        disk.verdict = told;
      }
    }
  }
}

void SetConfiguration(const Host::HostState& state, HostDescription& twin) {
  twin.autoMode = state.autoMode;
  twin.cluster = {.enabled = state.cluster.enabled,
                  .clusterUuid = state.cluster.clusterUuid,
                  .nodeUuid = state.cluster.nodeUuid};
  twin.faultDomain = state.faultDomain;
  for (const OtxCtl::Provider::NicGroups& nic : state.nics) {
    twin.networks.push_back({.interface = nic.interface,
                             .masterMulticastGroup = nic.masterGroup,
                             .agentMulticastGroup = nic.agentGroup});
  }
}

}  // namespace

HostDescription DescribeTwin(const Host::HostState& state) {
  HostDescription twin;
  Listed listed;
  if (state.inventory) {
    listed = ListedDisks(*state.inventory, twin);
  } else {
    twin.storageSystem = OtxCtl::Sim::StorageSystem::Missing;
  }
  const std::vector<Entry> entries = Merge(listed, state.disks);
  for (const Entry& entry : entries) {
    twin.disks.push_back(ToDisk(entry));
  }
  const std::vector<Members> members = FindMembers(state.groups, twin);
  NameAbsentDisks(twin);
  AddGroups(state.groups, members, twin);
  PinVerdicts(entries, members, twin);
  SetConfiguration(state, twin);
  return twin;
}

}  // namespace Machines
