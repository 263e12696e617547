#include "host/DataVolumes.h"

#include <string_view>
#include <unordered_map>

#include "nox/Host.h"
#include "orbis/DataArray.h"

namespace Host {
namespace {

using Nox::Kova::Host::DiskMapInfo;
using Shown = Nox::Kova::Host::DataVolume;
using ByDisk = std::unordered_map<std::string_view, const DataVolume*>;
using Tessa::MakeRef;
using Tessa::Ref;

Ref<Shown> Show(const DataVolume& volume) {
  const auto shown = MakeRef<Shown>();
  shown->SetDisk(volume.disk);
  shown->SetPath(volume.path);
  shown->SetBytes(volume.bytes);
  shown->SetCacheState(volume.cacheState);
  return shown;
}

Ref<Orbis::DataArray<Shown>> VolumesOf(const DiskMapInfo& group, const ByDisk& volumes) {
  const auto shown = MakeRef<Orbis::DataArray<Shown>>();
  if (group.GetMapping()->GetNonSsd()) {
    for (const Nox::Host::ScsiDisk* disk : *group.GetMapping()->GetNonSsd()) {
      const auto volume = volumes.find(disk->GetCanonicalName());
      if (volume != volumes.end()) {
        shown->Append(Show(*volume->second));
      }
    }
  }
  return shown;
}

}  // namespace

void AddDataVolumes(const std::vector<DataVolume>& volumes, Nox::Kova::Host::ConfigInfo::StorageInfo& info) {
  ByDisk byDisk;
  for (const DataVolume& volume : volumes) {
    byDisk.emplace(volume.disk, &volume);
  }
  if (byDisk.empty() || !info.GetDiskMapInfo()) {
    return;
  }
  for (DiskMapInfo* group : *info.GetDiskMapInfo()) {
    const auto shown = VolumesOf(*group, byDisk);
    if (!shown->IsEmpty()) {
      group->SetVolume(shown);
    }
  }
}

}  // namespace Host
