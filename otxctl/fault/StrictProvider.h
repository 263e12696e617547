// A provider that throws what providers may throw, whatever another one does.
//
// The plug-in ends the process over any exception that is not the kernel library's. So a program that must
// live on stands this before its provider: any other exception becomes a HostCtlException with its text.
// Safe from any thread if the other provider is. It owns that provider.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "kova/agentd/include/KovaInfo.h"

namespace OtxCtl::Fault {

class StrictProvider : public HostCtl::Kova::KovaInfo {
 public:
  explicit StrictProvider(std::unique_ptr<HostCtl::Kova::KovaInfo> target);

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
  const std::unique_ptr<HostCtl::Kova::KovaInfo> _target;
};

}  // namespace OtxCtl::Fault
