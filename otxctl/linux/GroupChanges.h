// Everything that changes the disk groups of a real machine: the changing half of the kernel provider.
//
// Each change looks at the machine anew, judges what it finds, and only then begins. What is refused has
// changed nothing; what fails on the way is undone as far as it can be, and the exception says what is left.
//
// Threads: any; one change at a time. Errors: HostCtl::Lib::HostCtlException and its subclasses, as
// KovaInfo.h says of each operation.
#pragma once

#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "kova/agentd/include/KovaRecords.h"
#include "otxctl/linux/BlkidProbe.h"
#include "otxctl/linux/ChangeRecord.h"
#include "otxctl/linux/DiskLocks.h"
#include "otxctl/linux/GroupFormat.h"
#include "otxctl/linux/HostLock.h"
#include "otxctl/linux/LinuxHost.h"
#include "otxctl/linux/VolumeManager.h"

namespace OtxCtl::Linux {

// What changes are made with.
struct ChangeTools {
  std::unique_ptr<Commands> commands;
  std::unique_ptr<DiskLocks> locks;
  std::string lockFile;  // of the host (HostLock.h); empty: no other program is expected
  VolumeManager::Log log = [](const std::string&) {};
  // Given the commands in place of running them: nothing is changed.
  VolumeManager::DryRun dryRun = {};
  FlushDevice flush = &FlushBlockDevice;
  // Whether something stands on the device of this path; if nobody can tell, it does.
  std::function<bool(const std::string& path)> holdsData = &HoldsData;
};

class GroupChanges {
 public:
  using Names = std::vector<std::string>;

  GroupChanges(std::shared_ptr<LinuxHost> host, ChangeTools tools);

  // Keeps other programs from changing this host's disks as long as the object lives. Every change does, from
  // the first on.
  void KeepOthersOut();

  void Format(const std::string& ssd, const Names& capacityDisks);
  void Restamp(const std::string& ssd);
  void RestampByUuid(const std::string& kovaUuid);
  void Mount(const std::string& ssd);
  void Unmount(const std::string& ssd);
  // Groups that cannot be mounted since their cache disk has left the host are passed over.
  void Claim();
  // Also cleans up what an unfinished change has left on the disk, and on those that are bound up with it.
  void RemoveDisk(const std::string& disk, const HostCtl::Kova::RemovalOptions& options);
  void RemoveGroup(const std::string& ssd, const HostCtl::Kova::RemovalOptions& options);
  void RemoveByUuid(const std::string& kovaUuid);

 private:
  using Snapshot = std::shared_ptr<const LinuxSnapshot>;
  using Locks = std::vector<std::unique_ptr<DiskLock>>;

  void CheckTools() const;

  // One at a time, from the first look to the last.
  struct Change {
    explicit Change(GroupChanges& changes);
    ~Change();
    Change(const Change&) = delete;
    Change& operator=(const Change&) = delete;

    const std::lock_guard<std::mutex> guard;
    LinuxHost& host;
    const Snapshot seen;
  };

  Locks LockDisks(const std::vector<const ScannedDisk*>& disks, bool mustBeFree);
  void CheckStillFree(const ScannedDisk& disk);
  void CheckLocks(const std::vector<const ScannedDisk*>& disks, const Locks& locks) const;
  // Runs `change` with a record of these disks until it has ended, done or undone.
  void Recorded(const Names& disks, const std::string& what, const std::function<void()>& change);
  void CheckGroupIsThere(const std::string& ssd);

  void MountGroup(const DiskGroup& group);
  void RestampGroup(const DiskGroup& group);
  void RemoveMember(const LinuxSnapshot& seen, const DiskGroup& group, const GroupMember& member);
  void DissolveGroup(const LinuxSnapshot& seen, const DiskGroup& group);
  void RemoveAbsentMember(const DiskGroup& group, const GroupMember& member);
  void RemoveAbsentCache(const LinuxSnapshot& seen, const DiskGroup& group);
  void CleanUp(const LinuxSnapshot& seen, const Unfinished& unfinished);

  const std::shared_ptr<LinuxHost> _host;
  const ChangeTools _tools;
  VolumeManager _manager;
  const ChangeRecord _record;
  HostLock _hostLock;
  std::mutex _changing;
};

}  // namespace OtxCtl::Linux
