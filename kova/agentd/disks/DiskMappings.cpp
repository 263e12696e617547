#include "kova/agentd/disks/DiskMappings.h"

#include <algorithm>

#include "nox/Kova.h"
#include "tessa/Throwable.h"

namespace Kovasvc {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;
using Orbis::DataArray;
using Tessa::NotInitializedException;
using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;

const std::string& NameOf(const ScsiDisk* disk) {
  if (disk == nullptr) {
    NotInitializedException::ThrowNotInitialized();
  }
  return disk->GetCanonicalName();
}

bool IsSsd(const ScsiDisk* disk) {
  if (disk == nullptr) {
    NotInitializedException::ThrowOptionalNotSet();
  }
  return disk->GetSsd();
}

const DiskMapping& Existing(const DiskMapping* mapping) {
  if (mapping == nullptr) {
    NotInitializedException::ThrowNotInitialized();
  }
  return *mapping;
}

const std::string& SsdNameOf(const DiskMapping* mapping) {
  return NameOf(Existing(mapping).GetSsd().Get());
}

std::vector<std::string> CapacityNamesOf(const DiskMapping* mapping) {
  return NamesOf(Existing(mapping).GetNonSsd().Get());
}

std::string NameForLog(const ScsiDisk* disk) {
  return disk != nullptr && disk->HasCanonicalName() ? disk->GetCanonicalName() : "<unset>";
}

std::vector<std::string> NamesOf(const DataArray<ScsiDisk>* disks) {
  std::vector<std::string> names;
  if (disks != nullptr) {
    names.reserve(disks->Size());
    for (const ScsiDisk* disk : *disks) {
      names.push_back(NameOf(disk));
    }
  }
  return names;
}

std::string JoinNames(const std::vector<std::string>& names) {
  std::string joined;
  for (const std::string& name : names) {
    joined += (&name == &names.front() ? "" : ", ") + name;
  }
  return joined;
}

void AppendDeviceNames(const DiskMapping* mapping, std::vector<std::string_view>& names) {
  const auto appendNameOf = [&names](const ScsiDisk* disk) {
    const std::string& name = NameOf(disk);
    if (!name.empty()) {
      names.push_back(name);
    }
  };
  const DiskMapping& group = Existing(mapping);
  appendNameOf(group.GetSsd().Get());
  if (group.GetNonSsd()) {
    for (const ScsiDisk* disk : *group.GetNonSsd()) {
      appendNameOf(disk);
    }
  }
}

void DiskMappingToDeviceNames(const Tessa::Ref<DiskMapping>& mapping, std::vector<std::string>& names) {
  std::vector<std::string_view> own;
  AppendDeviceNames(mapping.Get(), own);
  names.insert(names.end(), own.begin(), own.end());
  std::sort(names.begin(), names.end());
}

void LogDiskMappings(Tessa::Service::Logger& logger, const DataArray<DiskMapping>* mappings) {
  if (mappings == nullptr) {
    return;
  }
  std::size_t index = 0;
  for (const DiskMapping* mapping : *mappings) {
    const std::string& ssd = SsdNameOf(mapping);
    const std::string disks = JoinNames(CapacityNamesOf(mapping));
    LogInternal(logger, LogLevel::Verbose, "%1: Mapping[%2]: { SSD: %3, MDs: %4 }", "LogDiskMappings", index,
                ssd, disks);
    ++index;
  }
}

void LogOneDiskMapping(Tessa::Service::Logger& logger, const Tessa::Ref<DiskMapping>& mapping) {
  DataArray<DiskMapping> one;
  one.Append(mapping);
  LogDiskMappings(logger, &one);
}

void AppendDisks(const DataArray<Nox::Kova::Host::DiskResult>& results, DataArray<ScsiDisk>& disks) {
  for (const Nox::Kova::Host::DiskResult* result : results) {
    disks.Append(result->GetDisk());
  }
}

void AppendMappings(const DataArray<DiskMapping>* more, DataArray<DiskMapping>& mappings) {
  if (more != nullptr) {
    for (DiskMapping* const mapping : *more) {
      mappings.Append(Tessa::Ref<DiskMapping>(mapping));
    }
  }
}

}  // namespace Kovasvc
