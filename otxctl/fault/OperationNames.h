// The names of the provider's operations, as call records and fault rules write them.
#pragma once

#include <array>
#include <string_view>

namespace OtxCtl::Fault {

// In the order of HostCtl::Kova::KovaInfo.
inline constexpr std::array<std::string_view, 16> kOperationNames = {
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

bool IsOperationName(std::string_view name) noexcept;

}  // namespace OtxCtl::Fault
