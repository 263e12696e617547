// A provider that writes down every call to another one, and fails or waits on demand.
//
// It owns the provider that it stands before and shares the recorder (CallRecorder.h). Safe from any thread
// if the other provider is.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "kova/agentd/include/KovaInfo.h"
#include "otxctl/fault/CallRecorder.h"

namespace OtxCtl::Fault {

class RecordingProvider final : public HostCtl::Kova::KovaInfo {
 public:
  RecordingProvider(std::unique_ptr<HostCtl::Kova::KovaInfo> target, std::shared_ptr<CallRecorder> recorder);

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
  // Records the call, carries it out and records how it ended. Defined in the source, its only user.
  template <typename Call>
  auto Record(std::string_view operation, nlohmann::json arguments, Call call);

  const std::unique_ptr<HostCtl::Kova::KovaInfo> _target;
  const std::shared_ptr<CallRecorder> _recorder;
};

}  // namespace OtxCtl::Fault
