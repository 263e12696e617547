// What the plug-in holds of this machine: a thin face that can be deleted while the host lives on.
//
// Without something to change the groups by, it only reads: what would change a disk is refused.
#pragma once

#include <memory>

#include "kova/agentd/include/KovaInfo.h"
#include "otxctl/linux/GroupChanges.h"
#include "otxctl/linux/LinuxHost.h"

namespace OtxCtl::Linux {

class LinuxProvider final : public HostCtl::Kova::KovaInfo {
 public:
  explicit LinuxProvider(std::shared_ptr<LinuxHost> host, std::shared_ptr<GroupChanges> changes = nullptr)
      : _host(std::move(host)), _changes(std::move(changes)) {}

  void QueryDisks(const std::vector<std::string>& names, std::vector<HostCtl::Kova::DiskResult>& results,
                  bool flag) override;
  void GetDiskMappings(std::vector<HostCtl::Kova::DiskMapping>& mappings, bool withUnmounted) override;
  void FormatDiskMapping(const std::string& ssd, const std::vector<std::string>& capacityDisks,
                         const HostCtl::Kova::FormatContext& context) override;
  void RestampDiskMapping(const std::string& ssd, const std::vector<std::string>& capacityDisks) override;
  void MountDiskMapping(const std::string& ssd, bool flag) override;
  void RestampDiskMappingByUuid(const std::string& kovaUuid) override;
  void RemoveDisk(const std::string& disk, const std::string& passThrough,
                  const HostCtl::Kova::RemovalOptions& options) override;
  void RemoveDiskMapping(const std::string& ssd, const std::string& passThrough,
                         const HostCtl::Kova::RemovalOptions& options) override;
  void UnmountDiskMapping(const std::string& ssd) override;
  void RemoveDiskByUuid(const std::string& kovaUuid, const std::string& passThrough) override;
  bool IsAutoModeEnabled() override;
  std::vector<HostCtl::Kova::KovaOtxNicConfig*> GetKovaOtxNicConfigs() override;
  void GetClusterInfoDetailed(HostCtl::Kova::KovaClusterInfoDetailed& info) override;
  std::string GetFaultDomainName() override;
  void ClaimUnmountedDiskgroups() override;
  void RefreshKovaInfo() override;

 private:
  GroupChanges& Changes() const;

  const std::shared_ptr<LinuxHost> _host;
  const std::shared_ptr<GroupChanges> _changes;
};

}  // namespace OtxCtl::Linux
