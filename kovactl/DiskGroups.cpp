#include "kovactl/DiskGroups.h"

#include "kovactl/ExitStatus.h"
#include "kovactl/Words.h"
#include "tessa/text/Escape.h"

namespace Kovactl {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapInfo;
using Nox::Kova::Host::DiskMapping;

DiskGroups::DiskGroups(const Host::Answer& answer)
    : _info(dynamic_cast<StorageInfo*>(answer.result.Get())), _fault(answer.fault) {
  if (!_info && !_fault) {
    _fault = Tessa::MakeRef<Orbis::Fault::SystemError>("the host did not tell its disk groups");
  }
  _groups = _info && _info->GetDiskMapInfo() ? _info->GetDiskMapInfo() : Tessa::MakeRef<GroupList>();
}

const DiskMapInfo* DiskGroups::Find(const std::string& cacheDisk) const {
  for (const DiskMapInfo* group : *_groups) {
    if (CacheDiskOf(*group->GetMapping()) == cacheDisk) {
      return group;
    }
  }
  return nullptr;
}

const DiskMapInfo& DiskGroups::Require(const std::string& cacheDisk) const {
  const DiskMapInfo* const group = Find(cacheDisk);
  if (group == nullptr) {
    throw BadInput("this host has no disk group with the cache disk '" + Tessa::Escape(cacheDisk) +
                   "'; `kovactl groups` lists those it has");
  }
  return *group;
}

std::vector<std::string> DisksOf(const DiskMapping& group) {
  std::vector<std::string> names;
  if (group.GetSsd()) {
    names.push_back(NameOf(*group.GetSsd()));
  }
  if (group.GetNonSsd()) {
    for (const ScsiDisk* disk : *group.GetNonSsd()) {
      names.push_back(disk != nullptr ? NameOf(*disk) : "");
    }
  }
  return names;
}

std::string CacheDiskOf(const DiskMapping& group) {
  return group.GetSsd() ? NameOf(*group.GetSsd()) : "";
}

}  // namespace Kovactl
