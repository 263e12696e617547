#include "kova/agentd/disks/DiskQuery.h"

#include "kova/agentd/disks/NameList.h"
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
  NameList wanted(names);
  const auto passes = [&](const HostCtl::Kova::DiskResult& record) {
    return (wanted.IsEmpty() || wanted.Contains(record.name)) &&
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

std::vector<std::string_view> NamesOfRecords(const std::vector<HostCtl::Kova::DiskResult>& records) {
  std::vector<std::string_view> names;
  names.reserve(records.size());
  for (const HostCtl::Kova::DiskResult& record : records) {
    names.push_back(record.name);
  }
  return names;
}

}  // namespace Kovasvc
