#include "otxctl/provider/ForwardingProvider.h"

#include <utility>

#include "otxctl/provider/OperationNames.h"

namespace OtxCtl::Provider {
namespace {

using HostCtl::Kova::DiskMapping;
using HostCtl::Kova::DiskResult;
using HostCtl::Kova::FormatContext;
using HostCtl::Kova::KovaClusterInfoDetailed;
using HostCtl::Kova::KovaOtxNicConfig;
using HostCtl::Kova::RemovalOptions;

// A name that the table lacks does not compile.
consteval std::string_view Named(std::string_view operation) {
  return IsOperationName(operation) ? operation : throw "operationNames has no such operation";
}

}  // namespace

ForwardingProvider::ForwardingProvider(std::shared_ptr<HostCtl::Kova::KovaInfo> target)
    : _target(std::move(target)) {}

void ForwardingProvider::AroundCall(const ProviderCall&, const Forward& forward) {
  forward();
}

template <class Call>
void ForwardingProvider::Pass(std::string_view operation, std::initializer_list<Input> inputs,
                              const Call& call) {
  AroundCall({operation, {inputs.begin(), inputs.size()}}, [this, &call] {
    if (_target != nullptr) {
      call();
    }
  });
}

void ForwardingProvider::QueryDisks(const std::vector<std::string>& names, std::vector<DiskResult>& results,
                                    bool flag) {
  Pass(Named("QueryDisks"), {names, flag}, [&] { _target->QueryDisks(names, results, flag); });
}

void ForwardingProvider::GetDiskMappings(std::vector<DiskMapping>& mappings, bool withUnmounted) {
  Pass(Named("GetDiskMappings"), {withUnmounted}, [&] { _target->GetDiskMappings(mappings, withUnmounted); });
}

void ForwardingProvider::FormatDiskMapping(const std::string& ssd,
                                           const std::vector<std::string>& capacityDisks,
                                           const FormatContext& context) {
  Pass(Named("FormatDiskMapping"), {ssd, capacityDisks, context},
       [&] { _target->FormatDiskMapping(ssd, capacityDisks, context); });
}

void ForwardingProvider::RestampDiskMapping(const std::string& ssd,
                                            const std::vector<std::string>& capacityDisks) {
  Pass(Named("RestampDiskMapping"), {ssd, capacityDisks},
       [&] { _target->RestampDiskMapping(ssd, capacityDisks); });
}

void ForwardingProvider::MountDiskMapping(const std::string& ssd, bool flag) {
  Pass(Named("MountDiskMapping"), {ssd, flag}, [&] { _target->MountDiskMapping(ssd, flag); });
}

void ForwardingProvider::RestampDiskMappingByUuid(const std::string& kovaUuid) {
  Pass(Named("RestampDiskMappingByUuid"), {kovaUuid}, [&] { _target->RestampDiskMappingByUuid(kovaUuid); });
}

void ForwardingProvider::RemoveDisk(const std::string& disk, const std::string& passThrough,
                                    const RemovalOptions& options) {
  Pass(Named("RemoveDisk"), {disk, passThrough, options},
       [&] { _target->RemoveDisk(disk, passThrough, options); });
}

void ForwardingProvider::RemoveDiskMapping(const std::string& ssd, const std::string& passThrough,
                                           const RemovalOptions& options) {
  Pass(Named("RemoveDiskMapping"), {ssd, passThrough, options},
       [&] { _target->RemoveDiskMapping(ssd, passThrough, options); });
}

void ForwardingProvider::UnmountDiskMapping(const std::string& ssd) {
  Pass(Named("UnmountDiskMapping"), {ssd}, [&] { _target->UnmountDiskMapping(ssd); });
}

void ForwardingProvider::RemoveDiskByUuid(const std::string& kovaUuid, const std::string& passThrough) {
  Pass(Named("RemoveDiskByUuid"), {kovaUuid, passThrough},
       [&] { _target->RemoveDiskByUuid(kovaUuid, passThrough); });
}

bool ForwardingProvider::IsAutoModeEnabled() {
  bool isEnabled = false;
  Pass(Named("IsAutoModeEnabled"), {}, [&] { isEnabled = _target->IsAutoModeEnabled(); });
  return isEnabled;
}

std::vector<KovaOtxNicConfig*> ForwardingProvider::GetKovaOtxNicConfigs() {
  std::vector<KovaOtxNicConfig*> records;
  try {
    Pass(Named("GetKovaOtxNicConfigs"), {}, [&] { records = _target->GetKovaOtxNicConfigs(); });
  } catch (...) {
    Util::DeleteVector(records);  // an override may throw when the caller's records are already made
    throw;
  }
  return records;
}

void ForwardingProvider::GetClusterInfoDetailed(KovaClusterInfoDetailed& info) {
  Pass(Named("GetClusterInfoDetailed"), {}, [&] { _target->GetClusterInfoDetailed(info); });
}

std::string ForwardingProvider::GetFaultDomainName() {
  std::string name;
  Pass(Named("GetFaultDomainName"), {}, [&] { name = _target->GetFaultDomainName(); });
  return name;
}

void ForwardingProvider::ClaimUnmountedDiskgroups() {
  Pass(Named("ClaimUnmountedDiskgroups"), {}, [&] { _target->ClaimUnmountedDiskgroups(); });
}

void ForwardingProvider::RefreshKovaInfo() {
  Pass(Named("RefreshKovaInfo"), {}, [&] { _target->RefreshKovaInfo(); });
}

}  // namespace OtxCtl::Provider
