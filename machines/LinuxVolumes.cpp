#include "machines/LinuxVolumes.h"

#include "host/KnownDisks.h"
#include "otxctl/linux/LinuxHost.h"

namespace Machines {

using OtxCtl::Linux::DiskGroup;
using OtxCtl::Linux::GroupMember;

std::vector<Host::DataVolume> DescribeVolumes(const OtxCtl::Linux::LinuxSnapshot& seen) {
  std::vector<Host::DataVolume> volumes;
  for (const DiskGroup& group : seen.groups) {
    for (const GroupMember& member : group.capacity) {
      const bool hasLeft = member.canonicalName.empty();
      if (!member.volume.path.empty()) {
        volumes.push_back({.disk = hasLeft ? Host::AbsentName(member.kovaUuid) : member.canonicalName,
                           .path = member.volume.path,
                           .bytes = member.volume.bytes,
                           .cacheState = member.volume.cacheState});
      }
    }
  }
  return volumes;
}

}  // namespace Machines
