// How disks and disk groups are taken out of the service.

#include <algorithm>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/TaskScope.h"
#include "otxctl/linux/GroupChanges.h"
#include "otxctl/linux/GroupChoice.h"
#include "otxctl/linux/GroupTags.h"

namespace OtxCtl::Linux {

using HostCtl::Lib::HostCtlException;

namespace {

using Texts = std::vector<std::string>;
using DiskList = std::vector<const ScannedDisk*>;

void Report(int percent, const std::string& step) {
  if (const TaskScope* const task = TaskScope::Current()) {
    task->ReportProgress(percent, step);
  }
}

std::string State(std::string_view state) {
  return std::string(Tags::state) + std::string(state);
}

DiskList DisksOf(const LinuxSnapshot& seen, const GroupChanges::Names& names) {
  DiskList disks;
  for (const ScannedDisk& disk : seen.disks) {
    if (std::find(names.begin(), names.end(), disk.facts.canonicalName) != names.end()) {
      disks.push_back(&disk);
    }
  }
  return disks;
}

// From here on there is no way back: what fails leaves something that can be cleaned up later.
template <typename Steps>
void Finish(Steps steps) {
  try {
    steps();
  } catch (const CommandFailed& failed) {
    throw NotUndone(std::string("it is not finished, and can be cleaned up by removing the disk: ") +
                    failed.what());
  }
}

void CheckOnlyOurs(const DiskGroup& group) {
  if (!group.foreignVolumes.empty()) {
    throw HostCtlException("disk group " + group.uuid + " cannot be removed: it holds the volume " +
                           group.volumeGroup + "/" + group.foreignVolumes.front() +
                           ", which somebody else has made");
  }
}

}  // namespace

// The volume goes first: from then on the disk is no member, and what is left can be cleaned up.
void GroupChanges::RemoveMember(const LinuxSnapshot& seen, const DiskGroup& group,
                                const GroupMember& member) {
  const std::string what = "disk " + member.canonicalName + " cannot be removed";
  CheckNotOpen(member, what);
  const DiskList disks = DisksOf(seen, {member.canonicalName});
  const Locks locks = LockDisks(disks, false);
  const Texts nodes = NodesOf(group);
  Recorded({member.canonicalName}, what, [&] {
    if (member.isLeftBehind) {
      _manager.TakeBack(nodes, group.volumeGroup, member.deviceNode);
    }
    Report(10, "disk " + member.canonicalName + ": removing its volume");
    _manager.RemoveVolume(nodes, group.volumeGroup, member.volume.name);
    Report(60, "disk " + member.canonicalName + ": leaving the volume group");
    Finish([&] {
      _manager.RemoveMember(nodes, group.volumeGroup, member.deviceNode);
      _manager.ClearMembers({member.deviceNode});
    });
  });
  CheckLocks(disks, locks);
}

void GroupChanges::DissolveGroup(const LinuxSnapshot& seen, const DiskGroup& group) {
  const std::string what = "disk group " + group.uuid + " cannot be removed";
  CheckOnlyOurs(group);
  CheckNotOpen(group, what);
  const Names names = PresentDisksOf(group);
  const DiskList disks = DisksOf(seen, names);
  const Locks locks = LockDisks(disks, false);
  const Texts nodes = NodesOf(group);
  Recorded(names, what, [&] {
    for (const std::string& node : NodesLeftBehind(group)) {
      _manager.TakeBack(nodes, group.volumeGroup, node);
    }
    Report(10, "removing the volume group");
    _manager.ChangeTags(nodes, group.volumeGroup, {State(Tags::ready)}, {State(Tags::removing)});
    try {
      _manager.RemoveGroup(nodes, group.volumeGroup);
    } catch (const CommandRefused&) {  // what is left of it is a disk group
      _manager.ChangeTags(nodes, group.volumeGroup, {State(Tags::removing)}, {State(Tags::ready)});
      throw;
    }
    Report(80, "clearing its disks");
    Finish([&] { _manager.ClearMembers(nodes); });
  });
  CheckLocks(disks, locks);
}

// Only what lay on this disk is lost with it.
void GroupChanges::RemoveAbsentMember(const DiskGroup& group, const GroupMember& member) {
  const std::string what = "the disk " + member.kovaUuid + ", which has left, cannot be removed";
  CheckNotOpen(member, what);
  const Texts nodes = NodesOf(group);
  try {
    _manager.RemoveVolume(nodes, group.volumeGroup, member.volume.name);
    _manager.ForgetMissing(nodes, group.volumeGroup);
  } catch (const CommandFailed& failed) {
    throw HostCtlException(what + ": " + failed.what());
  }
}

// The caches only hold copies of what lies on the capacity disks, so the volumes are whole without them, and
// stay so until it is known that they hold nothing. If one does hold something, the volume group is left to
// who knows what it is: it is no disk group any more, and none of its disks is free.
void GroupChanges::RemoveAbsentCache(const LinuxSnapshot& seen, const DiskGroup& group) {
  const std::string what = "the cache disk " + group.cache.kovaUuid + ", which has left, cannot be removed";
  CheckOnlyOurs(group);
  CheckNotOpen(group, what);
  const Names names = PresentDisksOf(group);
  const DiskList disks = DisksOf(seen, names);
  const Locks locks = LockDisks(disks, false);
  const Texts nodes = NodesOf(group);
  const auto holdsData = [&](const GroupMember& member) {
    return !member.canonicalName.empty() && _tools.holdsData(member.volume.path);
  };
  Recorded(names, what, [&] {
    for (const std::string& node : NodesLeftBehind(group)) {
      _manager.TakeBack(nodes, group.volumeGroup, node);
    }
    _manager.Deactivate(nodes, group.volumeGroup);
    for (const GroupMember& member : group.capacity) {
      if (!member.canonicalName.empty() && member.volume.isCached) {
        _manager.SplitCache(nodes, group.volumeGroup, member.volume.name);
      }
    }
    Finish([&] {
      _manager.ForgetMissingAndTheirVolumes(nodes, group.volumeGroup);
      _manager.Activate(nodes, group.volumeGroup);
      const bool isKept = std::any_of(group.capacity.begin(), group.capacity.end(), holdsData);
      const std::string_view next = isKept ? Tags::released : Tags::removing;
      _manager.ChangeTags(nodes, group.volumeGroup, {State(Tags::ready)}, {State(next)});
      if (isKept) {
        _manager.Deactivate(nodes, group.volumeGroup);
        return;
      }
      _manager.RemoveGroup(nodes, group.volumeGroup);
      _manager.ClearMembers(nodes);
    });
  });
  CheckLocks(disks, locks);
}

void GroupChanges::CleanUp(const LinuxSnapshot& seen, const Unfinished& unfinished) {
  const DiskList disks = DisksOf(seen, unfinished.disks);
  const Locks locks = LockDisks(disks, false);
  Recorded(unfinished.disks, "what an unfinished change has left cannot be cleaned up", [&] {
    Finish([&] {
      if (unfinished.isWholeGroup) {
        _manager.RemoveGroup(unfinished.deviceNodes, unfinished.volumeGroup);
      } else if (!unfinished.volumeGroup.empty()) {
        const Texts nodes = NodesOfVolumeGroup(seen, unfinished);
        for (const std::string& volume : unfinished.volumes) {
          _manager.RemoveVolumeIfThere(nodes, unfinished.volumeGroup, volume);
        }
        _manager.RemoveMember(nodes, unfinished.volumeGroup, unfinished.deviceNodes.front());
      }
      _manager.ClearMembers(unfinished.deviceNodes);
    });
  });
  CheckLocks(disks, locks);
}

}  // namespace OtxCtl::Linux
