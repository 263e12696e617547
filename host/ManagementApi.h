// What can be asked of a host, as programs call it: objects in, objects out.
//
// One interface for the host of this very process (KovaService) and for an agent's (Agentd::AgentClient), so
// that a command is written once. Every request passes the gate on its way to the plug-in. Disks may be given
// by canonical name alone: one that the inventory knows is replaced by the inventory's object.
//
// Threads: any. The caller waits for the answer. Errors: what the host says is in the answer; only
// an agent that cannot be reached is an exception (Agentd::ConnectionError).
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "host/Answer.h"
#include "nox/Fwd.h"
#include "orbis/DataArray.h"

namespace Host {

using DiskList = Orbis::DataArray<Nox::Host::ScsiDisk>;
using MappingList = Orbis::DataArray<Nox::Kova::Host::DiskMapping>;

// Handed to the kernel as it is; its meaning is the kernel's alone.
struct RemovalArguments {
  std::string passThrough;
  std::string optionText;
  std::int32_t optionFirst = 0;
  std::int32_t optionSecond = 0;
};

class ManagementApi {
 public:
  virtual ~ManagementApi() = default;

  // No names: every disk. The result is a list of KovaHostDiskResult.
  virtual Answer QueryDisksForKova(const std::vector<std::string>& names) const = 0;
  // The same, with the list as the plug-in wrote it.
  virtual WrittenAnswer QueryDisksWritten(const std::vector<std::string>& names) const {
    return Written(QueryDisksForKova(names));
  }
  // The mounted disk groups: a KovaHostConfigInfoStorageInfo.
  virtual Answer GetStorageInfo() const = 0;
  // The same, and behind them in `diskMapInfo` the other groups that the kernel has: those not mounted.
  virtual Answer GetDiskGroups() const = 0;
  // Cluster, network and fault domain: a KovaHostConfigInfo.
  virtual Answer GetConfigInfo() const = 0;

  // Plans disk groups from the disks and makes them. The results of these four are lists of
  // KovaHostDiskMapResult, one per group; a fault beside them tells what failed in all.
  virtual Answer AddDisks(const DiskList& disks) const = 0;
  // The same with every disk that is eligible. Neither result nor fault: there was nothing to do.
  virtual Answer AddAllEligibleDisks() const = 0;
  // Makes exactly these groups.
  virtual Answer InitializeDisks(const MappingList& mappings) const = 0;
  virtual Answer UnmountDiskMapping(const MappingList& mappings) const = 0;

  // No result; a fault when it failed.
  virtual Answer RemoveDisk(const std::string& disk, const RemovalArguments& arguments) const = 0;
  virtual Answer RemoveDiskMapping(const Nox::Kova::Host::DiskMapping& mapping,
                                   const RemovalArguments& arguments) const = 0;
  // Neither, also when it failed: then only the host's log tells.
  virtual Answer ClaimUnmountedDiskgroup() const = 0;

  // Simulated hosts only. The host's description, as a file would hold it.
  virtual std::string DescribeHost() const = 0;
  // Changes it: {"set": {key: value, ..}, "disk": {"name": .., key: value, ..}}, either may be missing. No
  // result; an InvalidArgument fault when the changed host would not be accepted as a file.
  virtual Answer ChangeHost(const std::string& change) const = 0;
};

}  // namespace Host
