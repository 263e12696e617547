#include "otxctl/linux/GroupFormat.h"

#include <fcntl.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>

#include "otxctl/TaskScope.h"
#include "otxctl/linux/FileDescriptor.h"
#include "otxctl/linux/GroupNames.h"
#include "otxctl/linux/GroupTags.h"

namespace OtxCtl::Linux {
namespace {

using Texts = std::vector<std::string>;

std::string Tag(std::string_view key, const std::string& value) {
  return std::string(key) + value;
}

std::string Microseconds() {
  const auto now = std::chrono::system_clock::now().time_since_epoch();
  return std::to_string(std::chrono::duration_cast<std::chrono::microseconds>(now).count());
}

std::string_view KindOf(const std::vector<const ScannedDisk*>& capacityDisks) {
  const bool isAllFlash = std::all_of(capacityDisks.begin(), capacityDisks.end(),
                                      [](const ScannedDisk* disk) { return disk->facts.isFlash.Is(true); });
  return isAllFlash ? Tags::allFlash : Tags::hybrid;
}

void Report(std::size_t done, std::size_t all, const std::string& step) {
  if (const TaskScope* const task = TaskScope::Current()) {
    task->ReportProgress(static_cast<int>(done * 100 / all), step);
  }
}

// Runs `undo`, and hands on what had failed; if that fails too, both.
template <typename Undo>
[[noreturn]] void UndoAfter(const CommandFailed& failed, Undo undo) {
  try {
    undo();
  } catch (const CommandFailed& second) {
    throw NotUndone(std::string(failed.what()) +
                    "; and what was begun could not be undone: " + second.what());
  }
  throw failed;
}

// Which of the device files the command says that it has made a member of.
Texts MadeOf(const Texts& nodes, const CommandResult& result) {
  Texts made;
  for (const std::string& node : nodes) {
    if (result.output.find("Physical volume \"" + node + "\" successfully created") != std::string::npos) {
      made.push_back(node);
    }
  }
  return made;
}

}  // namespace

void FlushBlockDevice(const std::string& path) {
  const FileDescriptor file(Uninterrupted([&] { return open(path.c_str(), O_RDONLY | O_CLOEXEC); }));
  if (!file.IsOpen() || fsync(file.Get()) != 0) {
    throw CommandFailed(path + " cannot be written out: " + std::strerror(errno));
  }
}

void GroupFormat::Make(const std::string& machineId, const ScannedDisk& cacheDisk,
                       const Disks& capacityDisks) {
  const std::string uuid = NewUuid();
  _group = VolumeGroupName(uuid);
  _cacheNode = cacheDisk.deviceNode;
  _nodes = {_cacheNode};
  Join(capacityDisks, 0);
  Report(0, 1, "making the volume group");
  const std::string creating = Tag(Tags::state, std::string(Tags::creating));
  CreateGroup({std::string(Tags::marker), Tag(Tags::group, uuid), Tag(Tags::machine, machineId), creating,
               Tag(Tags::created, Microseconds()), Tag(Tags::kind, std::string(KindOf(capacityDisks)))});
  try {
    _manager.TagMember(_nodes, _cacheNode,
                       {Tag(Tags::disk, NewUuid()), Tag(Tags::role, std::string(Tags::cache))});
    TagCapacityDisks();
    const auto& bytes = cacheDisk.facts.bytes;
    CreateVolumes(_manager.CountExtents(_nodes, _cacheNode, bytes.IsKnown() ? bytes.Get() : 0));
    _manager.ChangeTags(_nodes, _group, {creating}, {Tag(Tags::state, std::string(Tags::ready))});
  } catch (const CommandFailed& failed) {
    UndoAfter(failed, [this] { UndoGroup(); });
  }
}

void GroupFormat::Extend(const DiskGroup& group, const Disks& capacityDisks) {
  _group = group.volumeGroup;
  _cacheNode = group.cache.deviceNode;
  _nodes = {_cacheNode};
  std::int64_t nextPlace = 0;
  for (const GroupMember& member : group.capacity) {
    nextPlace = std::max(nextPlace, member.place + 1);
    if (!member.deviceNode.empty()) {
      _nodes.push_back(member.deviceNode);
    }
  }
  Join(capacityDisks, nextPlace);
  Report(0, 1, "extending the volume group");
  AddMembers();
  try {
    TagCapacityDisks();
    CreateVolumes(group.cache.extents);
  } catch (const CommandFailed& failed) {
    UndoAfter(failed, [this] { UndoMembers(); });
  }
}

void GroupFormat::Join(const Disks& capacityDisks, std::int64_t firstPlace) {
  for (const ScannedDisk* disk : capacityDisks) {
    _joining.push_back({disk, NewUuid(), firstPlace++});
    _nodes.push_back(disk->deviceNode);
  }
}

void GroupFormat::CreateGroup(const Texts& tags) {
  try {
    _manager.CreateGroup(_nodes, _group, tags);
  } catch (const CommandRefused& refused) {
    UndoAfter(refused, [&] {
      if (const Texts made = MadeOf(_nodes, refused.GetResult()); !made.empty()) {
        _manager.ClearMembers(made);
      }
    });
  } catch (const CommandFailed& failed) {  // nobody knows how far it came
    throw NotUndone(failed.what());
  }
}

void GroupFormat::AddMembers() {
  Texts added;
  for (const Joining& joining : _joining) {
    added.push_back(joining.disk->deviceNode);
  }
  try {
    _manager.AddMembers(_nodes, _group, added);
  } catch (const CommandRefused& refused) {
    UndoAfter(refused, [&] {
      if (const Texts made = MadeOf(added, refused.GetResult()); !made.empty()) {
        _manager.ClearMembers(made);
      }
    });
  } catch (const CommandFailed& failed) {
    throw NotUndone(failed.what());
  }
}

void GroupFormat::TagCapacityDisks() {
  for (const Joining& joining : _joining) {
    _manager.TagMember(_nodes, joining.disk->deviceNode,
                       {Tag(Tags::disk, joining.uuid), Tag(Tags::role, std::string(Tags::capacity)),
                        Tag(Tags::place, std::to_string(joining.place))});
  }
}

// What the cache writes about itself must lie on its disk before anybody relies on it.
void GroupFormat::CreateVolumes(std::int64_t cacheExtents) {
  const std::int64_t slice = cacheExtents / slicesOfCache * extentBytes;
  for (const Joining& joining : _joining) {
    Report(_volumes + 1, _joining.size() + 2,
           "disk " + joining.disk->facts.canonicalName + ": " + std::to_string(_volumes + 1) + " of " +
               std::to_string(_joining.size()));
    ++_volumes;
    const std::string name = DataVolumeName(joining.uuid);
    _manager.CreateVolume(_nodes, _group,
                          {name, joining.disk->deviceNode, _cacheNode, slice, Tag(Tags::disk, joining.uuid)});
    if (!_manager.IsDryRun()) {
      _flush("/dev/" + _group + "/" + name);
    }
  }
  Report(_joining.size() + 1, _joining.size() + 2, "finishing");
}

void GroupFormat::UndoGroup() {
  _manager.RemoveGroup(_nodes, _group);
  _manager.ClearMembers(_nodes);
}

void GroupFormat::UndoMembers() {
  for (std::size_t i = 0; i < _volumes; ++i) {
    for (const std::string& volume : {DataVolumeName(_joining[i].uuid), CacheVolumeName(_joining[i].uuid)}) {
      _manager.RemoveVolumeIfThere(_nodes, _group, volume);
    }
  }
  Texts added;
  for (const Joining& joining : _joining) {
    _manager.RemoveMember(_nodes, _group, joining.disk->deviceNode);
    added.push_back(joining.disk->deviceNode);
  }
  _manager.ClearMembers(added);
}

}  // namespace OtxCtl::Linux
