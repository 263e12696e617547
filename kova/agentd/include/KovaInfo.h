// The kernel provider: the one object through which the plug-in reads and changes disks.
//
// This is its manual, for who calls it and for who writes another one. Every provider keeps it: the contract
// suite (otxctl/contract) proves it of each.
//
// Threads: every operation may be called from several threads at once; a provider guards its own state. The
// plug-in calls changing operations one at a time, queries at any time. A query sees the host as it is before
// a change or after it, never in between. All providers of one host show the same disks, and to delete one
// changes nothing.
//
// Ownership: outputs belong to the caller. Vectors given as outputs are appended to, and what they held
// stays.
//
// Errors: every operation reports failure by throwing HostCtl::Lib::HostCtlException or a subclass, and
// nothing else; none by a return value. A refusal that concerns one disk is a KovaStorageException, or the
// subclass that is named below, and GetDiskName() is what the caller called the disk. A changing operation
// that throws has changed nothing that can be seen: records, groups and their order are as they were.
//
// Names: a name may hold anything, for it may come from a client: nothing, 64 KiB, zero bytes, bytes that are
// not UTF-8, what a shell or a file system would take for more than a name. It means the disk of exactly that
// device name; if there is none, a query finds nothing and any other operation refuses it. A disk that has
// left the host has no device name any more: it is meant by its UUID, where an operation takes one, and a
// query finds all of them by the empty name.
//
// Operations that take a request's tag, options or a text to pass through hand them on; whatever they hold,
// the same is done.
#pragma once

#include <string>
#include <vector>

#include "kova/agentd/include/Api.h"
#include "kova/agentd/include/KovaNetwork.h"
#include "kova/agentd/include/KovaRecords.h"

namespace HostCtl::Kova {

class HOSTCTL_API KovaInfo {
 public:
  virtual ~KovaInfo();

  // One record per disk of the host, in the kernel's order; or, unless `names` is empty, per disk whose
  // device name is among them, once and still in the kernel's order. Names of no disk are passed over. The
  // meaning of `flag` is the kernel's.
  //
  // A free disk is eligible and has no identity. A member of a mounted group is in use; of any other group it
  // is ineligible with GroupNotMounted, and keeps its identity. Of several reasons against a disk the one of
  // the lowest number is told. A disk that has left keeps its place and its UUID, has no name, and isPdl is
  // set.
  virtual void QueryDisks(const std::vector<std::string>& names, std::vector<DiskResult>& results,
                          bool flag) = 0;

  // The disk groups of the host in order of creation; those that are not mounted only if asked for, and then
  // with thirdFlag set. Capacity disks stand in the order in which they joined. A disk that has left has its
  // UUID and no name.
  virtual void GetDiskMappings(std::vector<DiskMapping>& mappings, bool withUnmounted) = 0;

  // Makes one mounted disk group of the cache disk and the capacity disks; or, if `ssd` heads a mounted
  // group, extends that by the capacity disks, in their order, behind those that it has. Whoever joins is in
  // use, has a UUID of its own and the group's format version. A new group is all-flash if every capacity
  // disk is a flash disk, tagged for capacity or not.
  //
  // The disks are looked at one by one, the cache disk first; the first that will not do is named:
  //   KovaStorageException        unknown or absent; named before; in a group, mounted or not, whatever its
  //                               place, but for the head of the group to be extended
  //   KovaExceptionHasPartition   free, but with partitions
  // Then a HostCtlException refuses a group without capacity disks, or with more than seven, those counted
  // that it has already. Other reasons why a disk is not eligible are for the caller to mind.
  virtual void FormatDiskMapping(const std::string& ssd, const std::vector<std::string>& capacityDisks,
                                 const FormatContext& context) = 0;

  // Rewrites the identity stamps of the group that `ssd` heads, mounted or not; `capacityDisks` are its own.
  // Nothing of it shows in records and groups, and it is not mounted by it. Refuses an `ssd` that heads no
  // group by a KovaStorageException.
  virtual void RestampDiskMapping(const std::string& ssd, const std::vector<std::string>& capacityDisks) = 0;

  // Brings a restamped group back into use, as it was. A mounted group stays as it is. Refuses an `ssd` that
  // heads no group by a KovaStorageException. The meaning of `flag` is the kernel's.
  virtual void MountDiskMapping(const std::string& ssd, bool flag) = 0;

  // As RestampDiskMapping, for a group whose cache disk has left the host, meant by that disk's UUID. Refuses
  // a UUID that no group's cache disk has, and an empty one, by a KovaStorageException; it stands for the
  // name.
  virtual void RestampDiskMappingByUuid(const std::string& kovaUuid) = 0;

  // Takes one disk out of its group, mounted or not; for a cache disk, its whole group goes. What is taken
  // out is free again, without identity, and may be used anew.
  //
  //   KovaExceptionRemoveDiskAutoModeEnabled   the host claims disks on its own; looked at first
  //   KovaStorageException                     unknown, absent, or in no group
  //   KovaExceptionLastRemainingHDD            the last capacity disk of its group
  virtual void RemoveDisk(const std::string& disk, const std::string& passThrough,
                          const RemovalOptions& options) = 0;

  // Takes the whole group that `ssd` heads out of the service, mounted or not; its disks are then free again,
  // and the other groups keep their order.
  //
  //   KovaExceptionRemoveMappingAutoModeEnabled   the host claims disks on its own; looked at first
  //   KovaStorageException                        `ssd` heads no group
  virtual void RemoveDiskMapping(const std::string& ssd, const std::string& passThrough,
                                 const RemovalOptions& options) = 0;

  // Takes the group that `ssd` heads out of use without erasing it; its disks keep their identity. A group
  // that is not mounted stays as it is. Refuses an `ssd` that heads no group by a KovaStorageException.
  virtual void UnmountDiskMapping(const std::string& ssd) = 0;

  // As RemoveDisk, for a disk that has permanently left the host, and whether or not the host claims disks on
  // its own.
  //
  //   KovaStorageException            no absent disk has this UUID; it stands for the name
  //   KovaExceptionLastRemainingHDD   the last capacity disk of its group
  virtual void RemoveDiskByUuid(const std::string& kovaUuid, const std::string& passThrough) = 0;

  // Whether the service claims disks on its own. While it does, none can be removed that is there.
  virtual bool IsAutoModeEnabled() = 0;

  // The interfaces that carry traffic of the service, none included; each with addresses of either family.
  // The caller frees the records with OtxCtl::Util::DeleteVector.
  virtual std::vector<KovaOtxNicConfig*> GetKovaOtxNicConfigs() = 0;

  // Whether the host is a member of a cluster, and its identities, empty for one that is not. Whatever `info`
  // held is gone.
  virtual void GetClusterInfoDetailed(KovaClusterInfoDetailed& info) = 0;

  // Empty when the host belongs to no fault domain.
  virtual std::string GetFaultDomainName() = 0;

  // Mounts every group that is not mounted; to find none is no error.
  virtual void ClaimUnmountedDiskgroups() = 0;

  // Brings the provider's view of disks and cluster up to date. What nobody has changed is as before.
  virtual void RefreshKovaInfo() = 0;
};

}  // namespace HostCtl::Kova
