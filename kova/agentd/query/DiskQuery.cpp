#include "kova/agentd/query/DiskQuery.h"

#include <string_view>
#include <unordered_set>

#include "kova/agentd/include/HostCtlException.h"

namespace Kovasvc {

using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;

void LimitQueryDisksForKova(Tessa::Service::Logger& logger, const std::vector<std::string>& names,
                            const DiskQueryLimit& limit,
                            const std::vector<HostCtl::Kova::DiskResult>& records,
                            std::vector<HostCtl::Kova::DiskResult>& passed) {
  if (records.empty()) {
    return;
  }
  const std::unordered_set<std::string_view> wanted(names.begin(), names.end());
  const auto passes = [&](const HostCtl::Kova::DiskResult& record) {
    return (wanted.empty() || wanted.contains(record.name)) &&
           (!limit.byState || record.state == limit.state) &&
           (!limit.byReason || record.reason == limit.reason);
  };
  try {
    for (const HostCtl::Kova::DiskResult& record : records) {
      if (passes(record)) {
        passed.push_back(record);
      }
    }
  } catch (const HostCtl::Lib::HostCtlException& exception) {
    LogInternal(logger, LogLevel::Warning, "%1: Error querying disks for KOVA: %2", "LimitQueryDisksForKova",
                exception.Describe());
  }
}

}  // namespace Kovasvc
