// The kernel provider: the one object through which the plug-in reads and changes disks.
//
// Threads: every operation may be called from several threads at once; a provider guards its own
// state. The plug-in calls changing operations one at a time, queries at any time.
// Ownership: outputs belong to the caller. Vectors given as outputs are appended to.
// Errors: every operation reports failure by throwing HostCtl::Lib::HostCtlException or a subclass,
// and nothing else; none by a return value. A changing operation that throws has changed nothing.
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

  // One record per disk of the host, in the kernel's order, or per disk whose device name is among
  // `names` unless that is empty. The meaning of `flag` is the kernel's.
  virtual void QueryDisks(const std::vector<std::string>& names, std::vector<DiskResult>& results,
                          bool flag) = 0;

  // The disk groups of the host in order of creation; those that are not mounted only if asked for.
  virtual void GetDiskMappings(std::vector<DiskMapping>& mappings, bool withUnmounted) = 0;

  // Makes one disk group of the cache disk and the capacity disks, or extends the one `ssd` heads.
  virtual void FormatDiskMapping(const std::string& ssd, const std::vector<std::string>& capacityDisks,
                                 const FormatContext& context) = 0;

  // Rewrites the identity stamps of an existing group. Does not mount it.
  virtual void RestampDiskMapping(const std::string& ssd, const std::vector<std::string>& capacityDisks) = 0;

  // Brings a restamped group back into use. The meaning of `flag` is the kernel's.
  virtual void MountDiskMapping(const std::string& ssd, bool flag) = 0;

  // As RestampDiskMapping, for a group whose cache disk has left the host.
  virtual void RestampDiskMappingByUuid(const std::string& kovaUuid) = 0;

  // Takes one disk out of the service; for a cache disk, its whole group.
  virtual void RemoveDisk(const std::string& disk, const std::string& passThrough,
                          const RemovalOptions& options) = 0;

  // Takes the whole group that `ssd` heads out of the service.
  virtual void RemoveDiskMapping(const std::string& ssd, const std::string& passThrough,
                                 const RemovalOptions& options) = 0;

  // Takes a group out of use without erasing it.
  virtual void UnmountDiskMapping(const std::string& ssd) = 0;

  // Removes a disk that has permanently left the host.
  virtual void RemoveDiskByUuid(const std::string& kovaUuid, const std::string& passThrough) = 0;

  // Whether the service claims disks on its own.
  virtual bool IsAutoModeEnabled() = 0;

  // The interfaces that carry traffic of the service. The caller frees the records with
  // OtxCtl::Util::DeleteVector.
  virtual std::vector<KovaOtxNicConfig*> GetKovaOtxNicConfigs() = 0;

  virtual void GetClusterInfoDetailed(KovaClusterInfoDetailed& info) = 0;

  // Empty when the host belongs to no fault domain.
  virtual std::string GetFaultDomainName() = 0;

  // Mounts every group that is present but not mounted.
  virtual void ClaimUnmountedDiskgroups() = 0;

  // Brings the provider's view of disks and cluster up to date.
  virtual void RefreshKovaInfo() = 0;
};

}  // namespace HostCtl::Kova
