// API objects in a line, for tests of commands.
#pragma once

#include <string>
#include <vector>

#include "host/Answer.h"
#include "nox/Kova.h"
#include "orbis/DataArray.h"

namespace Kovactl::Testing {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapInfo;
using Nox::Kova::Host::DiskMapping;
using Nox::Kova::Host::DiskMapResult;
using Nox::Kova::Host::DiskResult;
using Orbis::DataArray;
using Tessa::MakeRef;
using Tessa::Ref;
using StorageInfo = Nox::Kova::Host::ConfigInfo::StorageInfo;

inline Ref<ScsiDisk> ADisk(const std::string& name, bool ssd) {
  const auto disk = MakeRef<ScsiDisk>();
  disk->SetCanonicalName(name);
  disk->SetSsd(ssd);
  disk->GetCapacity()->SetBlockSize(512);
  disk->GetCapacity()->SetBlock(std::int64_t{1} << 21);
  return disk;
}

inline Ref<DiskMapping> AMapping(const std::string& ssd, const std::vector<std::string>& capacity) {
  const auto disks = MakeRef<DataArray<ScsiDisk>>();
  for (const std::string& name : capacity) {
    disks->Append(ADisk(name, false));
  }
  const auto mapping = MakeRef<DiskMapping>();
  mapping->SetSsd(ADisk(ssd, true));
  mapping->SetNonSsd(disks);
  return mapping;
}

inline Ref<DiskMapInfo> AGroup(const std::string& ssd, const std::vector<std::string>& capacity,
                               bool mounted = true) {
  const auto group = MakeRef<DiskMapInfo>();
  group->SetMapping(AMapping(ssd, capacity));
  group->SetMounted(mounted);
  return group;
}

// What a host answers that has these groups.
inline Host::Answer WithGroups(const std::vector<Ref<DiskMapInfo>>& groups) {
  const auto list = MakeRef<DataArray<DiskMapInfo>>();
  for (const Ref<DiskMapInfo>& group : groups) {
    list->Append(group);
  }
  const auto info = MakeRef<StorageInfo>();
  info->SetDiskMapInfo(list);
  return {.result = info, .fault = nullptr};
}

inline Ref<DiskResult> AVerdict(const std::string& name, const std::string& state,
                                const Ref<Orbis::MethodFault>& error = nullptr) {
  const auto verdict = MakeRef<DiskResult>();
  verdict->SetDisk(ADisk(name, false));
  verdict->SetState(state);
  verdict->SetError(error);
  return verdict;
}

template <class Item>
Host::Answer WithList(const std::vector<Ref<Item>>& items, const Ref<Orbis::MethodFault>& fault = nullptr) {
  const auto list = MakeRef<DataArray<Item>>();
  for (const Ref<Item>& item : items) {
    list->Append(item);
  }
  return {.result = list, .fault = fault};
}

inline Ref<DiskMapResult> AGroupResult(const std::string& ssd, const std::vector<std::string>& capacity,
                                       const std::vector<Ref<DiskResult>>& verdicts = {},
                                       const Ref<Orbis::MethodFault>& error = nullptr) {
  const auto list = MakeRef<DataArray<DiskResult>>();
  for (const Ref<DiskResult>& verdict : verdicts) {
    list->Append(verdict);
  }
  const auto result = MakeRef<DiskMapResult>();
  result->SetMapping(AMapping(ssd, capacity));
  result->SetDiskResult(list);
  result->SetError(error);
  return result;
}

}  // namespace Kovactl::Testing
