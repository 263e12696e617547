// What an operator says of a machine, for no kernel knows it.
#pragma once

#include <cstdint>
#include <set>
#include <string>
#include <vector>

#include "otxctl/provider/NicRecords.h"

namespace OtxCtl::Linux {

struct HostSettings {
  std::int64_t minimumDiskBytes = std::int64_t{1} << 30;
  bool isAutoMode = false;  // the service claims disks on its own
  bool isInCluster = false;
  std::string clusterUuid;
  std::string nodeUuid;
  std::string faultDomain;
  std::vector<Provider::NicGroups> nics;
  std::set<std::string> capacityFlash;  // canonical names of flash disks for the capacity tier
};

}  // namespace OtxCtl::Linux
