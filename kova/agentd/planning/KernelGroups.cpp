#include "kova/agentd/planning/KernelGroups.h"

#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/include/KovaInfo.h"

namespace Kovasvc {

std::vector<HostCtl::Kova::DiskMapping> KernelGroupsOrNone(Tessa::Service::Logger& logger,
                                                           HostCtl::Kova::KovaInfo& provider) {
  std::vector<HostCtl::Kova::DiskMapping> groups;
  try {
    provider.GetDiskMappings(groups, true);
  } catch (const HostCtl::Lib::HostCtlException& exception) {
    LogInternal(logger, Tessa::Service::LogLevel::Warning, "Error retrieving disk mappings: %1",
                exception.Describe());
    groups.clear();
  }
  return groups;
}

}  // namespace Kovasvc
