// The names of the provider's operations, as call records and fault rules write them.
#pragma once

#include <algorithm>
#include <array>
#include <string_view>

namespace OtxCtl::Provider {

// In the order of HostCtl::Kova::KovaInfo.
inline constexpr std::array<std::string_view, 16> operationNames = {
    "QueryDisks",
    "GetDiskMappings",
    "FormatDiskMapping",
    "RestampDiskMapping",
    "MountDiskMapping",
    "RestampDiskMappingByUuid",
    "RemoveDisk",
    "RemoveDiskMapping",
    "UnmountDiskMapping",
    "RemoveDiskByUuid",
    "IsAutoModeEnabled",
    "GetKovaOtxNicConfigs",
    "GetClusterInfoDetailed",
    "GetFaultDomainName",
    "ClaimUnmountedDiskgroups",
    "RefreshKovaInfo",
};

constexpr bool IsOperationName(std::string_view name) noexcept {
  return std::find(operationNames.begin(), operationNames.end(), name) != operationNames.end();
}

}  // namespace OtxCtl::Provider
