// The model's kernel: what its calls change and what they refuse.

#include <algorithm>

#include "otxctl/sim/KovaUuid.h"
#include "tests/integration/HostModel.h"

namespace Integration {

using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskState;
using OtxCtl::Sim::HostDisk;
using OtxCtl::Sim::HostGroup;
using Names = std::vector<std::string>;

namespace {

constexpr std::size_t mostCapacityDisks = 7;
const KernelRefusal refused = {std::string("SystemError: ") + kernelWords};
const KernelRefusal claimsOnItsOwn = {std::string("KovaDiskFault ") + kernelWords};

bool Contains(const Names& names, const std::string& name) {
  return std::find(names.begin(), names.end(), name) != names.end();
}
}  // namespace

// ---- reading

void HostModel::Refresh() {
  if (_isKnown) {
    return;
  }
  const bool fails = IsInjected("RefreshKovaInfo") || IsInjected("QueryDisks");
  _records = fails ? Records() : KernelRecords();
  _isKnown = !fails;
}

HostModel::Records HostModel::KernelRecords() const {
  Records records;
  for (const HostDisk& disk : _host.disks) {
    records.push_back(RecordOf(disk));
  }
  return records;
}

HostCtl::Kova::DiskResult HostModel::RecordOf(const Disk& disk) const {
  HostCtl::Kova::DiskResult record;
  record.name = disk.absent ? "" : disk.name;
  record.kovaUuid = disk.kovaUuid;
  record.isSsd = disk.ssd;
  record.isPdl = disk.absent;
  record.capacityFlash = disk.capacityFlash;
  const HostGroup* const group = GroupOf(disk.name);
  record.state = DiskState::Ineligible;
  if (disk.verdict) {
    record.state = static_cast<DiskState>(disk.verdict->state);
    record.reason = static_cast<DiskReason>(disk.verdict->reason);
  } else if (group != nullptr && group->mounted) {
    record.state = DiskState::InUse;
  } else if (disk.absent && group == nullptr) {
    record.reason = DiskReason::None;
  } else if (disk.partitions > 0) {
    record.reason = DiskReason::HasPartitions;
  } else if (disk.transport == "usb") {
    record.reason = DiskReason::Usb;
  } else if (group != nullptr) {
    record.reason = DiskReason::GroupNotMounted;
  } else {
    record.state = DiskState::Eligible;
  }
  return record;
}

bool HostModel::IsInjected(const std::string& operation) {
  const int call = ++_calls[operation];
  return _fault && _fault->operation == operation && _fault->call == call;
}

void HostModel::Enter(const std::string& operation) {
  if (IsInjected(operation)) {
    throw KernelRefusal{_fault->exception.FaultText("injected", "offender")};
  }
}

// ---- changing

void HostModel::Format(const NamedGroup& named) {
  Enter("FormatDiskMapping");
  HostGroup* const headed = GroupOf(named.ssd);
  Names members = named.capacity;
  members.insert(members.begin(), named.ssd);
  for (const std::string& name : members) {
    const HostDisk* const disk = FindPresent(name);
    const HostGroup* const group = GroupOf(name);
    const bool extends = name == named.ssd && group != nullptr && group->ssd == name && group->mounted;
    if (disk == nullptr || (group != nullptr && !extends)) {
      throw refused;
    }
    if (disk->partitions > 0) {
      throw KernelRefusal{"DiskHasPartitions " + name};
    }
  }
  if ((headed == nullptr ? 0 : headed->capacity.size()) + named.capacity.size() > mostCapacityDisks) {
    throw refused;
  }
  HostGroup group = headed == nullptr ? HostGroup() : *headed;
  if (headed == nullptr) {
    group.ssd = named.ssd;
    group.allFlash =
        std::all_of(named.capacity.begin(), named.capacity.end(),
                    [this](const std::string& name) { return Find(name)->ssd || Find(name)->capacityFlash; });
  } else {
    members.erase(members.begin());
  }
  group.capacity.insert(group.capacity.end(), named.capacity.begin(), named.capacity.end());
  for (const std::string& name : members) {
    Find(name)->kovaUuid = OtxCtl::Sim::KovaUuidOf(_host.name, name);
    Find(name)->formatVersion = group.formatVersion;
  }
  if (headed == nullptr) {
    _host.groups.push_back(group);
  } else {
    *headed = group;
  }
}

void HostModel::Restamp(const std::string& ssd) {
  Enter("RestampDiskMapping");
  if (FindPresent(ssd) == nullptr || GroupOf(ssd) == nullptr || GroupOf(ssd)->ssd != ssd) {
    throw refused;
  }
}

void HostModel::Mount(const std::string& ssd) {
  Enter("MountDiskMapping");
  GroupOf(ssd)->mounted = true;
}

void HostModel::RestampByUuid(const std::string& uuid) {
  Enter("RestampDiskMappingByUuid");
  for (const HostGroup& group : _host.groups) {
    if (!uuid.empty() && Find(group.ssd)->kovaUuid == uuid) {
      return;
    }
  }
  throw refused;
}

void HostModel::RemoveHeadedGroup(const std::string& ssd) {
  Enter("RemoveDiskMapping");
  if (_host.autoMode) {
    throw claimsOnItsOwn;
  }
  EraseGroup(*GroupOf(ssd));
}

void HostModel::TakeOut(const std::string& disk) {
  Enter("RemoveDisk");
  if (_host.autoMode) {
    throw claimsOnItsOwn;
  }
  if (FindPresent(disk) == nullptr || GroupOf(disk) == nullptr) {
    throw refused;
  }
  TakeOutMember(*Find(disk), disk);
}

void HostModel::TakeOutByUuid(const std::string& uuid) {
  Enter("RemoveDiskByUuid");
  for (HostDisk& disk : _host.disks) {
    if (disk.absent && !uuid.empty() && disk.kovaUuid == uuid) {
      return TakeOutMember(disk, uuid);
    }
  }
  throw refused;
}

void HostModel::TakeOutMember(Disk& disk, const std::string& named) {
  HostGroup* const group = GroupOf(disk.name);
  if (group != nullptr && group->ssd == disk.name) {
    return EraseGroup(*group);
  }
  if (group != nullptr) {
    if (group->capacity.size() == 1) {
      throw KernelRefusal{"DiskIsLastRemainingNonSSD " + named};
    }
    std::erase(group->capacity, disk.name);
  }
  disk.kovaUuid.clear();
  disk.formatVersion = 0;
}

void HostModel::EraseGroup(Group& group) {
  Names members = group.capacity;
  members.push_back(group.ssd);
  for (const std::string& name : members) {
    Find(name)->kovaUuid.clear();
    Find(name)->formatVersion = 0;
  }
  std::erase_if(_host.groups, [&](const HostGroup& one) { return one.ssd == members.back(); });
}

// Among the mounted groups, as requests name their disks. A group without its cache disk is never found.
bool HostModel::Exists(const NamedGroup& named) {
  if (named.capacity.empty() || IsInjected("GetDiskMappings")) {
    return false;
  }
  return std::any_of(_host.groups.begin(), _host.groups.end(), [&](const HostGroup& group) {
    return group.mounted && !Find(group.ssd)->absent && group.ssd == named.ssd &&
           group.capacity.size() == named.capacity.size() &&
           std::all_of(group.capacity.begin(), group.capacity.end(),
                       [&](const std::string& disk) { return Contains(named.capacity, RequestName(disk)); });
  });
}

// ---- looking up

HostDisk* HostModel::Find(const std::string& name) {
  return const_cast<HostDisk*>(std::as_const(*this).Find(name));
}
const HostDisk* HostModel::Find(const std::string& name) const {
  for (const HostDisk& disk : _host.disks) {
    if (disk.name == name) {
      return &disk;
    }
  }
  return nullptr;
}
HostDisk* HostModel::FindPresent(const std::string& name) {
  HostDisk* const disk = Find(name);
  return disk != nullptr && !disk->absent ? disk : nullptr;
}
bool HostModel::IsListed(const std::string& name) const {
  const HostDisk* const disk = Find(name);
  return disk != nullptr && disk->inInventory && !disk->absent;
}
HostGroup* HostModel::GroupOf(const std::string& disk) {
  return const_cast<HostGroup*>(std::as_const(*this).GroupOf(disk));
}
const HostGroup* HostModel::GroupOf(const std::string& disk) const {
  for (const HostGroup& group : _host.groups) {
    if (group.ssd == disk || Contains(group.capacity, disk)) {
      return &group;
    }
  }
  return nullptr;
}

}  // namespace Integration
