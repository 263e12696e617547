// Makes disk groups and extends them, step by step; what fails is undone.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "otxctl/linux/DiskGroups.h"
#include "otxctl/linux/VolumeManager.h"

namespace OtxCtl::Linux {

// What was begun could not be undone; the text says why, and why it had to be.
class NotUndone : public CommandFailed {
 public:
  using CommandFailed::CommandFailed;
};

// Makes sure that what was written to the device of this path lies on its disks. Throws CommandFailed.
using FlushDevice = std::function<void(const std::string& path)>;
void FlushBlockDevice(const std::string& path);

// For one group, once.
class GroupFormat {
 public:
  using Disks = std::vector<const ScannedDisk*>;

  GroupFormat(VolumeManager& manager, FlushDevice flush) : _manager(manager), _flush(std::move(flush)) {}

  // Throw CommandFailed when nothing of the group, or of its extension, is left; NotUndone if something is.
  // Progress is told to the thread's task.
  void Make(const std::string& machineId, const ScannedDisk& cacheDisk, const Disks& capacityDisks);
  void Extend(const DiskGroup& group, const Disks& capacityDisks);

 private:
  struct Joining {
    const ScannedDisk* disk;
    std::string uuid;
    std::int64_t place;
  };

  void Join(const Disks& capacityDisks, std::int64_t firstPlace);
  void CreateGroup(const std::vector<std::string>& tags);
  void AddMembers();
  void TagCapacityDisks();
  void CreateVolumes(std::int64_t cacheExtents);
  void UndoGroup();
  void UndoMembers();

  VolumeManager& _manager;
  const FlushDevice _flush;
  std::string _group;
  std::string _cacheNode;
  std::vector<std::string> _nodes;  // of all disks concerned
  std::vector<Joining> _joining;
  std::size_t _volumes = 0;  // that were begun
};

}  // namespace OtxCtl::Linux
