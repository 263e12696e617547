// The operations of the management API on the host of this process.
//
// Every request passes the gate; only what is let in reaches the plug-in's hooks. An exception that leaves a
// hook is answered as a SystemError. Where an operation takes a request tag, that is the id of the calling
// thread's task (OtxCtl::TaskScope), or empty.
//
// Threads: queries from any; changing operations from one thread at a time, so that the host is still what
// the gate saw when the plug-in works on it. The caller's thread does the work.
#pragma once

#include <string>
#include <vector>

#include "host/ManagementApi.h"
#include "host/PluginLoader.h"

namespace OtxCtl::Sim {
class SimHost;
}

namespace Host {

class KnownDisks;

class KovaService final : public ManagementApi {
 public:
  // The hooks must be those of an initialised plug-in. `simulated` is the host behind its provider, if that
  // is a simulated one, and outlives the service; DescribeHost and ChangeHost throw HostError without it.
  explicit KovaService(const PluginHooks& hooks, OtxCtl::Sim::SimHost* simulated = nullptr)
      : _hooks(hooks), _simulated(simulated) {}

  Answer QueryDisksForKova(const std::vector<std::string>& names) const override;
  WrittenAnswer QueryDisksWritten(const std::vector<std::string>& names) const override;
  Answer GetStorageInfo() const override;
  Answer GetDiskGroups() const override;
  Answer GetConfigInfo() const override;
  Answer AddDisks(const DiskList& disks) const override;
  Answer AddAllEligibleDisks() const override;
  Answer InitializeDisks(const MappingList& mappings) const override;
  Answer UnmountDiskMapping(const MappingList& mappings) const override;
  Answer RemoveDisk(const std::string& disk, const RemovalArguments& arguments) const override;
  Answer RemoveDiskMapping(const Nox::Kova::Host::DiskMapping& mapping,
                           const RemovalArguments& arguments) const override;
  Answer ClaimUnmountedDiskgroup() const override;
  std::string DescribeHost() const override;
  Answer ChangeHost(const std::string& change) const override;

 private:
  OtxCtl::Sim::SimHost& SimulatedHost() const;

  PluginHooks _hooks;
  OtxCtl::Sim::SimHost* _simulated;
};

}  // namespace Host
