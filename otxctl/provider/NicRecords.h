// Records of network interfaces, from plain texts.
#pragma once

#include <string>
#include <vector>

#include "kova/agentd/include/KovaNetwork.h"

namespace OtxCtl::Provider {

// The multicast groups of one interface; an address with a colon is of the sixth version.
struct NicGroups {
  std::string interface;
  std::string masterGroup;
  std::string agentGroup;
};

// The caller frees the records with OtxCtl::Util::DeleteVector.
std::vector<HostCtl::Kova::KovaOtxNicConfig*> MakeNicRecords(const std::vector<NicGroups>& nics);

}  // namespace OtxCtl::Provider
