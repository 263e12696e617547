#include "otxctl/sim/SimProvider.h"

#include <utility>

namespace OtxCtl::Sim {

using HostCtl::Kova::DiskMapping;
using HostCtl::Kova::DiskResult;
using HostCtl::Kova::FormatContext;
using HostCtl::Kova::KovaClusterInfoDetailed;
using HostCtl::Kova::KovaOtxNicConfig;
using HostCtl::Kova::RemovalOptions;

SimProvider::SimProvider(std::shared_ptr<SimHost> host) : _host(std::move(host)) {}

void SimProvider::QueryDisks(const std::vector<std::string>& names, std::vector<DiskResult>& results,
                             bool flag) {
  _host->QueryDisks(names, results, flag);
}

void SimProvider::GetDiskMappings(std::vector<DiskMapping>& mappings, bool withUnmounted) {
  _host->GetDiskMappings(mappings, withUnmounted);
}

void SimProvider::FormatDiskMapping(const std::string& ssd, const std::vector<std::string>& capacityDisks,
                                    const FormatContext& context) {
  _host->FormatDiskMapping(ssd, capacityDisks, context);
}

void SimProvider::RestampDiskMapping(const std::string& ssd, const std::vector<std::string>& capacityDisks) {
  _host->RestampDiskMapping(ssd, capacityDisks);
}

void SimProvider::MountDiskMapping(const std::string& ssd, bool flag) {
  _host->MountDiskMapping(ssd, flag);
}

void SimProvider::RestampDiskMappingByUuid(const std::string& kovaUuid) {
  _host->RestampDiskMappingByUuid(kovaUuid);
}

void SimProvider::RemoveDisk(const std::string& disk, const std::string& passThrough,
                             const RemovalOptions& options) {
  _host->RemoveDisk(disk, passThrough, options);
}

void SimProvider::RemoveDiskMapping(const std::string& ssd, const std::string& passThrough,
                                    const RemovalOptions& options) {
  _host->RemoveDiskMapping(ssd, passThrough, options);
}

void SimProvider::UnmountDiskMapping(const std::string& ssd) {
  _host->UnmountDiskMapping(ssd);
}

void SimProvider::RemoveDiskByUuid(const std::string& kovaUuid, const std::string& passThrough) {
  _host->RemoveDiskByUuid(kovaUuid, passThrough);
}

bool SimProvider::IsAutoModeEnabled() {
  return _host->IsAutoModeEnabled();
}

std::vector<KovaOtxNicConfig*> SimProvider::GetKovaOtxNicConfigs() {
  return _host->GetKovaOtxNicConfigs();
}

void SimProvider::GetClusterInfoDetailed(KovaClusterInfoDetailed& info) {
  _host->GetClusterInfoDetailed(info);
}

std::string SimProvider::GetFaultDomainName() {
  return _host->GetFaultDomainName();
}

void SimProvider::ClaimUnmountedDiskgroups() {
  _host->ClaimUnmountedDiskgroups();
}

void SimProvider::RefreshKovaInfo() {
  _host->RefreshKovaInfo();
}

}  // namespace OtxCtl::Sim
