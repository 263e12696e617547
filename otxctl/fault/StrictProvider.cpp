#include "otxctl/fault/StrictProvider.h"

#include <exception>
#include <utility>

#include "kova/agentd/include/HostCtlException.h"

namespace OtxCtl::Fault {
namespace {

using HostCtl::Lib::HostCtlException;

template <class Call>
auto Strictly(Call call) {
  try {
    return call();
  } catch (const HostCtlException&) {
    throw;
  } catch (const std::exception& exception) {
    throw HostCtlException(exception.what());
  } catch (...) {
    throw HostCtlException("the provider failed without saying why");
  }
}

}  // namespace

StrictProvider::StrictProvider(std::unique_ptr<HostCtl::Kova::KovaInfo> target)
    : _target(std::move(target)) {}

void StrictProvider::QueryDisks(const std::vector<std::string>& names,
                                std::vector<HostCtl::Kova::DiskResult>& results, bool flag) {
  Strictly([&] { _target->QueryDisks(names, results, flag); });
}
void StrictProvider::GetDiskMappings(std::vector<HostCtl::Kova::DiskMapping>& mappings, bool withUnmounted) {
  Strictly([&] { _target->GetDiskMappings(mappings, withUnmounted); });
}
void StrictProvider::FormatDiskMapping(const std::string& ssd, const std::vector<std::string>& capacityDisks,
                                       const HostCtl::Kova::FormatContext& context) {
  Strictly([&] { _target->FormatDiskMapping(ssd, capacityDisks, context); });
}
void StrictProvider::RestampDiskMapping(const std::string& ssd,
                                        const std::vector<std::string>& capacityDisks) {
  Strictly([&] { _target->RestampDiskMapping(ssd, capacityDisks); });
}
void StrictProvider::MountDiskMapping(const std::string& ssd, bool flag) {
  Strictly([&] { _target->MountDiskMapping(ssd, flag); });
}
void StrictProvider::RestampDiskMappingByUuid(const std::string& kovaUuid) {
  Strictly([&] { _target->RestampDiskMappingByUuid(kovaUuid); });
}
void StrictProvider::RemoveDisk(const std::string& disk, const std::string& passThrough,
                                const HostCtl::Kova::RemovalOptions& options) {
  Strictly([&] { _target->RemoveDisk(disk, passThrough, options); });
}
void StrictProvider::RemoveDiskMapping(const std::string& ssd, const std::string& passThrough,
                                       const HostCtl::Kova::RemovalOptions& options) {
  Strictly([&] { _target->RemoveDiskMapping(ssd, passThrough, options); });
}
void StrictProvider::UnmountDiskMapping(const std::string& ssd) {
  Strictly([&] { _target->UnmountDiskMapping(ssd); });
}
void StrictProvider::RemoveDiskByUuid(const std::string& kovaUuid, const std::string& passThrough) {
  Strictly([&] { _target->RemoveDiskByUuid(kovaUuid, passThrough); });
}
bool StrictProvider::IsAutoModeEnabled() {
  return Strictly([&] { return _target->IsAutoModeEnabled(); });
}
std::vector<HostCtl::Kova::KovaOtxNicConfig*> StrictProvider::GetKovaOtxNicConfigs() {
  return Strictly([&] { return _target->GetKovaOtxNicConfigs(); });
}
void StrictProvider::GetClusterInfoDetailed(HostCtl::Kova::KovaClusterInfoDetailed& info) {
  Strictly([&] { _target->GetClusterInfoDetailed(info); });
}
std::string StrictProvider::GetFaultDomainName() {
  return Strictly([&] { return _target->GetFaultDomainName(); });
}
void StrictProvider::ClaimUnmountedDiskgroups() {
  Strictly([&] { _target->ClaimUnmountedDiskgroups(); });
}
void StrictProvider::RefreshKovaInfo() {
  Strictly([&] { _target->RefreshKovaInfo(); });
}

}  // namespace OtxCtl::Fault
