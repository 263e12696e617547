#include "otxctl/fault/RecordingProvider.h"

#include <type_traits>
#include <utility>

#include "otxctl/fault/NamedException.h"

namespace OtxCtl::Fault {
namespace {

using HostCtl::Kova::DiskMapping;
using HostCtl::Kova::DiskResult;
using HostCtl::Kova::FormatContext;
using HostCtl::Kova::KovaClusterInfoDetailed;
using HostCtl::Kova::KovaOtxNicConfig;
using HostCtl::Kova::RemovalOptions;
using nlohmann::json;

// Built element by element: a brace list of texts could be taken for an object.
template <typename... Values>
json ArrayOf(const Values&... values) {
  json array = json::array();
  (array.push_back(json(values)), ...);
  return array;
}

json ToJson(const FormatContext& context) {
  return ArrayOf(context.requestTag, context.mappingCount, context.mappingIndex);
}

json ToJson(const RemovalOptions& options) {
  return ArrayOf(options.text, options.first, options.second);
}

}  // namespace

RecordingProvider::RecordingProvider(std::unique_ptr<HostCtl::Kova::KovaInfo> target,
                                     std::shared_ptr<CallRecorder> recorder)
    : _target(std::move(target)), _recorder(std::move(recorder)) {}

template <typename Call>
auto RecordingProvider::Record(std::string_view operation, nlohmann::json arguments, Call call) {
  FaultEffect effect;
  const std::uint64_t ticket = _recorder->Begin(operation, std::move(arguments), effect);
  try {
    Suffer(effect);
    if constexpr (std::is_void_v<decltype(call())>) {
      call();
      _recorder->End(ticket, "ok");
    } else {
      auto result = call();
      _recorder->End(ticket, "ok");
      return result;
    }
  } catch (const std::exception& failure) {
    _recorder->End(ticket, std::string(ExceptionName(failure)) + ": " + failure.what());
    throw;
  }
}

void RecordingProvider::QueryDisks(const std::vector<std::string>& names, std::vector<DiskResult>& results,
                                   bool flag) {
  Record("QueryDisks", ArrayOf(names, flag), [&] { _target->QueryDisks(names, results, flag); });
}

void RecordingProvider::GetDiskMappings(std::vector<DiskMapping>& mappings, bool withUnmounted) {
  Record("GetDiskMappings", ArrayOf(withUnmounted),
         [&] { _target->GetDiskMappings(mappings, withUnmounted); });
}

void RecordingProvider::FormatDiskMapping(const std::string& ssd,
                                          const std::vector<std::string>& capacityDisks,
                                          const FormatContext& context) {
  Record("FormatDiskMapping", ArrayOf(ssd, capacityDisks, ToJson(context)),
         [&] { _target->FormatDiskMapping(ssd, capacityDisks, context); });
}

void RecordingProvider::RestampDiskMapping(const std::string& ssd,
                                           const std::vector<std::string>& capacityDisks) {
  Record("RestampDiskMapping", ArrayOf(ssd, capacityDisks),
         [&] { _target->RestampDiskMapping(ssd, capacityDisks); });
}

void RecordingProvider::MountDiskMapping(const std::string& ssd, bool flag) {
  Record("MountDiskMapping", ArrayOf(ssd, flag), [&] { _target->MountDiskMapping(ssd, flag); });
}

void RecordingProvider::RestampDiskMappingByUuid(const std::string& kovaUuid) {
  Record("RestampDiskMappingByUuid", ArrayOf(kovaUuid), [&] { _target->RestampDiskMappingByUuid(kovaUuid); });
}

void RecordingProvider::RemoveDisk(const std::string& disk, const std::string& passThrough,
                                   const RemovalOptions& options) {
  Record("RemoveDisk", ArrayOf(disk, passThrough, ToJson(options)),
         [&] { _target->RemoveDisk(disk, passThrough, options); });
}

void RecordingProvider::RemoveDiskMapping(const std::string& ssd, const std::string& passThrough,
                                          const RemovalOptions& options) {
  Record("RemoveDiskMapping", ArrayOf(ssd, passThrough, ToJson(options)),
         [&] { _target->RemoveDiskMapping(ssd, passThrough, options); });
}

void RecordingProvider::UnmountDiskMapping(const std::string& ssd) {
  Record("UnmountDiskMapping", ArrayOf(ssd), [&] { _target->UnmountDiskMapping(ssd); });
}

void RecordingProvider::RemoveDiskByUuid(const std::string& kovaUuid, const std::string& passThrough) {
  Record("RemoveDiskByUuid", ArrayOf(kovaUuid, passThrough),
         [&] { _target->RemoveDiskByUuid(kovaUuid, passThrough); });
}

bool RecordingProvider::IsAutoModeEnabled() {
  return Record("IsAutoModeEnabled", ArrayOf(), [&] { return _target->IsAutoModeEnabled(); });
}

std::vector<KovaOtxNicConfig*> RecordingProvider::GetKovaOtxNicConfigs() {
  return Record("GetKovaOtxNicConfigs", ArrayOf(), [&] { return _target->GetKovaOtxNicConfigs(); });
}

void RecordingProvider::GetClusterInfoDetailed(KovaClusterInfoDetailed& info) {
  Record("GetClusterInfoDetailed", ArrayOf(), [&] { _target->GetClusterInfoDetailed(info); });
}

std::string RecordingProvider::GetFaultDomainName() {
  return Record("GetFaultDomainName", ArrayOf(), [&] { return _target->GetFaultDomainName(); });
}

void RecordingProvider::ClaimUnmountedDiskgroups() {
  Record("ClaimUnmountedDiskgroups", ArrayOf(), [&] { _target->ClaimUnmountedDiskgroups(); });
}

void RecordingProvider::RefreshKovaInfo() {
  Record("RefreshKovaInfo", ArrayOf(), [&] { _target->RefreshKovaInfo(); });
}

}  // namespace OtxCtl::Fault
