#include "otxctl/linux/GroupChanges.h"

#include <chrono>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/linux/GroupChoice.h"
#include "otxctl/linux/GroupNames.h"
#include "otxctl/linux/GroupTags.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Linux {

using HostCtl::Lib::HostCtlException;
using HostCtl::Lib::KovaStorageException;

namespace {

using Texts = std::vector<std::string>;
using DiskList = std::vector<const ScannedDisk*>;

[[noreturn]] void Fail(const std::string& what, const std::string& why) {
  throw HostCtlException(what + ": " + Tessa::Sanitize(why), why);
}

// What the volume manager could not do is told as a failure of `what`.
template <typename Change>
void AsFailureOf(const std::string& what, Change change) {
  try {
    change();
  } catch (const std::runtime_error& failed) {
    Fail(what, failed.what());
  }
}

std::string Tag(std::string_view key, std::string_view value) {
  return std::string(key) + std::string(value);
}

std::string InWords(const DiskGroup& group) {
  return "disk group " + group.uuid;
}

Texts NamesOf(const DiskList& disks) {
  Texts names;
  for (const ScannedDisk* disk : disks) {
    names.push_back(disk->facts.canonicalName);
  }
  return names;
}

}  // namespace

GroupChanges::GroupChanges(std::shared_ptr<LinuxHost> host, ChangeTools tools)
    : _host(std::move(host)),
      _tools(std::move(tools)),
      _manager(*_tools.commands, _host->GetOptions().volumeManager, _tools.log, _tools.dryRun),
      _record(_manager.IsDryRun() ? "" : _host->GetOptions().stateFolder),
      _hostLock(_manager.IsDryRun() ? "" : _tools.lockFile) {}

void GroupChanges::KeepOthersOut() {
  AsFailureOf("the disks of this host cannot be changed", [this] { _hostLock.Take(); });
}

void GroupChanges::CheckTools() const {
  const std::string& program = _host->GetOptions().volumeManager;
  if (!_manager.IsDryRun() && !_tools.commands->Has(program)) {
    throw HostCtlException("the disks of this host cannot be changed: " + program +
                           " is not there; it comes with the package lvm2");
  }
}

GroupChanges::Change::Change(GroupChanges& changes)
    : guard(changes._changing),
      host(*changes._host),
      seen((changes.CheckTools(), changes.KeepOthersOut(), host.LookAgain())) {}

// Nobody may go by what was seen before.
GroupChanges::Change::~Change() {
  host.Forget();
}

GroupChanges::Locks GroupChanges::LockDisks(const DiskList& disks, bool mustBeFree) {
  Locks locks;
  for (const ScannedDisk* disk : disks) {
    locks.push_back(_tools.locks->Lock(*disk, mustBeFree));
    if (mustBeFree) {
      CheckStillFree(*disk);
    }
  }
  return locks;
}

// With the lock on it, and so at the last moment.
void GroupChanges::CheckStillFree(const ScannedDisk& disk) {
  const ProbeResult now = _host->Probe(disk);
  const bool isEmpty = now.signatures.IsKnown() && now.signatures.Get().empty() &&
                       now.partitionTable.IsKnown() && now.partitionTable.Get().empty();
  if (!isEmpty || now.isGone || now.hasNoMedium) {
    const std::string& name = disk.facts.canonicalName;
    throw KovaStorageException(
        "disk " + name + " cannot be used: something stands on it since it was looked at", name);
  }
}

void GroupChanges::CheckLocks(const DiskList& disks, const Locks& locks) const {
  for (std::size_t i = 0; i < locks.size(); ++i) {
    if (const std::string why = locks[i]->WhyNotTheSame(); !why.empty()) {
      const std::string& name = disks[i]->facts.canonicalName;
      throw KovaStorageException("disk " + name + " went away while it was changed: " + why, name);
    }
  }
}

void GroupChanges::Recorded(const Names& disks, const std::string& what,
                            const std::function<void()>& change) {
  try {
    _record.Add(disks);
    try {
      change();
    } catch (const NotUndone&) {
      throw;
    } catch (...) {
      _record.Remove(disks);
      throw;
    }
    _record.Remove(disks);
  } catch (const std::runtime_error& failed) {
    Fail(what, failed.what());
  }
}

void GroupChanges::Format(const std::string& ssd, const Names& capacityDisks) {
  const Change change(*this);
  const Snapshot& seen = change.seen;
  const DiskGroup* const extended = FindMountedGroup(*seen, ssd);
  const FormatChoice choice = ChooseDisks(*seen, ssd, capacityDisks, extended);
  DiskList joining = choice.capacityDisks;
  if (extended == nullptr) {
    joining.insert(joining.begin(), choice.cacheDisk);
  }
  const Locks locks = LockDisks(joining, true);
  Recorded(NamesOf(joining), "the disk group cannot be made", [&] {
    GroupFormat format(_manager, _tools.flush);
    if (extended == nullptr) {
      format.Make(_host->GetOptions().machineId, *choice.cacheDisk, choice.capacityDisks);
    } else {
      format.Extend(*extended, choice.capacityDisks);
    }
  });
  CheckLocks(joining, locks);
  CheckGroupIsThere(ssd);
}

// What the volume manager says it has done is looked at, before anybody is told that it is so.
void GroupChanges::CheckGroupIsThere(const std::string& ssd) {
  if (_manager.IsDryRun()) {
    return;
  }
  const Snapshot seen = _host->LookAgain();
  if (FindMountedGroup(*seen, ssd) == nullptr) {
    Fail("the disk group was made", "but it is not mounted; it is told by its disks what it is now");
  }
}

void GroupChanges::Restamp(const std::string& ssd) {
  const Change change(*this);
  const Snapshot& seen = change.seen;
  RestampGroup(GroupOfCacheDisk(*seen, ssd));
}

void GroupChanges::RestampByUuid(const std::string& kovaUuid) {
  const Change change(*this);
  const Snapshot& seen = change.seen;
  RestampGroup(GroupOfCacheUuid(*seen, kovaUuid));
}

void GroupChanges::RestampGroup(const DiskGroup& group) {
  AsFailureOf(InWords(group) + " cannot be given another identity", [&] {
    _manager.ChangeTags(NodesOf(group), group.volumeGroup, {Tag(Tags::group, group.uuid)},
                        {Tag(Tags::group, NewUuid())});
  });
}

void GroupChanges::Mount(const std::string& ssd) {
  const Change change(*this);
  const Snapshot& seen = change.seen;
  MountGroup(GroupOfCacheDisk(*seen, ssd));
}

// Volumes that are active on disks that went away are let go first.
void GroupChanges::MountGroup(const DiskGroup& group) {
  if (group.isMounted) {
    return;
  }
  const std::string what = InWords(group) + " cannot be mounted";
  if (group.HasLeft()) {
    Fail(what, "its cache disk has left the host");
  }
  CheckNotOpen(group, what);
  const Texts nodes = NodesOf(group);
  AsFailureOf(what, [&] {
    for (const std::string& node : NodesLeftBehind(group)) {
      _manager.TakeBack(nodes, group.volumeGroup, node);
    }
    if (HasActiveVolume(group)) {
      _manager.Deactivate(nodes, group.volumeGroup);
    }
    _manager.Activate(nodes, group.volumeGroup);
  });
}

void GroupChanges::Unmount(const std::string& ssd) {
  const Change change(*this);
  const Snapshot& seen = change.seen;
  const DiskGroup& group = GroupOfCacheDisk(*seen, ssd);
  if (!group.isMounted) {
    return;
  }
  const std::string what = InWords(group) + " cannot be unmounted";
  CheckNotOpen(group, what);
  const Texts nodes = NodesOf(group);
  try {
    _manager.Deactivate(nodes, group.volumeGroup);
  } catch (const CommandFailed& failed) {
    AsFailureOf(what + ": " + failed.what() + "; and it is mounted in part",
                [&] { _manager.Activate(nodes, group.volumeGroup); });
    Fail(what, failed.what());
  }
}

void GroupChanges::Claim() {
  const Change change(*this);
  const Snapshot& seen = change.seen;
  std::string failures;
  for (const DiskGroup& group : seen->groups) {
    if (group.HasLeft() && !group.isMounted) {
      _tools.log(InWords(group) + " is not mounted: its cache disk has left the host");
      continue;
    }
    try {
      MountGroup(group);
    } catch (const HostCtlException& failed) {
      failures += (failures.empty() ? "" : "; ") + failed.Describe();
    }
  }
  if (!failures.empty()) {
    throw HostCtlException(failures);
  }
}

void GroupChanges::RemoveDisk(const std::string& disk, const HostCtl::Kova::RemovalOptions& options) {
  const auto asked = std::chrono::steady_clock::now();
  const Change change(*this);
  const Snapshot& seen = change.seen;
  CheckDiskMayBeRemoved(*seen, disk, options, asked);
  if (const Unfinished* const unfinished = FindUnfinished(*seen, disk)) {
    CleanUp(*seen, *unfinished);
    return;
  }
  const DiskGroup& group = GroupOfMember(*seen, disk);
  if (group.cache.canonicalName == disk) {
    DissolveGroup(*seen, group);
  } else {
    RemoveMember(*seen, group, CapacityDiskToRemove(group, disk));
  }
}

void GroupChanges::RemoveGroup(const std::string& ssd, const HostCtl::Kova::RemovalOptions& options) {
  const auto asked = std::chrono::steady_clock::now();
  const Change change(*this);
  const Snapshot& seen = change.seen;
  CheckGroupMayBeRemoved(*seen, ssd, options, asked);
  DissolveGroup(*seen, GroupOfCacheDisk(*seen, ssd));
}

void GroupChanges::RemoveByUuid(const std::string& kovaUuid) {
  const Change change(*this);
  const Snapshot& seen = change.seen;
  const AbsentMember absent = FindAbsentMember(*seen, kovaUuid);
  if (absent.isCache) {
    RemoveAbsentCache(*seen, *absent.group);
  } else {
    RemoveAbsentMember(*absent.group, *absent.member);
  }
}

}  // namespace OtxCtl::Linux
