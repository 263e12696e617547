// Every operation of a provider, once, with inputs that no other input of the same call equals.
#pragma once

#include <ostream>
#include <string>
#include <vector>

#include "kova/agentd/include/KovaInfo.h"

namespace OtxCtl::Provider {

struct Operation {
  const char* name;
  void (*call)(HostCtl::Kova::KovaInfo& provider);
};

inline std::ostream& operator<<(std::ostream& out, const Operation& operation) {
  return out << operation.name;
}

// In the order of HostCtl::Kova::KovaInfo.
inline const std::vector<Operation>& AllOperations() {
  using HostCtl::Kova::KovaInfo;
  static const std::vector<Operation> operations = {
      {"QueryDisks",
       [](KovaInfo& provider) {
         std::vector<HostCtl::Kova::DiskResult> records;
         provider.QueryDisks({"naa.1", "naa.2"}, records, true);
       }},
      {"GetDiskMappings",
       [](KovaInfo& provider) {
         std::vector<HostCtl::Kova::DiskMapping> groups;
         provider.GetDiskMappings(groups, true);
       }},
      {"FormatDiskMapping",
       [](KovaInfo& provider) {
         provider.FormatDiskMapping("naa.1", {"naa.2"}, {"t1", 1, 0});
       }},
      {"RestampDiskMapping", [](KovaInfo& provider) { provider.RestampDiskMapping("naa.1", {"naa.2"}); }},
      {"MountDiskMapping", [](KovaInfo& provider) { provider.MountDiskMapping("naa.1", true); }},
      {"RestampDiskMappingByUuid", [](KovaInfo& provider) { provider.RestampDiskMappingByUuid("uuid"); }},
      {"RemoveDisk",
       [](KovaInfo& provider) {
         provider.RemoveDisk("naa.2", "pass", {"text", 1, 2});
       }},
      {"RemoveDiskMapping",
       [](KovaInfo& provider) {
         provider.RemoveDiskMapping("naa.1", "", {"", 0, -1});
       }},
      {"UnmountDiskMapping", [](KovaInfo& provider) { provider.UnmountDiskMapping("naa.1"); }},
      {"RemoveDiskByUuid", [](KovaInfo& provider) { provider.RemoveDiskByUuid("uuid", "pass"); }},
      {"IsAutoModeEnabled", [](KovaInfo& provider) { provider.IsAutoModeEnabled(); }},
      {"GetKovaOtxNicConfigs", [](KovaInfo& provider) { provider.GetKovaOtxNicConfigs(); }},
      {"GetClusterInfoDetailed",
       [](KovaInfo& provider) {
         HostCtl::Kova::KovaClusterInfoDetailed cluster;
         provider.GetClusterInfoDetailed(cluster);
       }},
      {"GetFaultDomainName", [](KovaInfo& provider) { provider.GetFaultDomainName(); }},
      {"ClaimUnmountedDiskgroups", [](KovaInfo& provider) { provider.ClaimUnmountedDiskgroups(); }},
      {"RefreshKovaInfo", [](KovaInfo& provider) { provider.RefreshKovaInfo(); }},
  };
  return operations;
}

}  // namespace OtxCtl::Provider
