#include "kova/agentd/marshal/DiskInventory.h"

#include <utility>

#include "nox/Host.h"
#include "tessa/Throwable.h"

namespace Kovasvc {

using Nox::Host::ScsiDisk;
using Orbis::DataArray;
using Tessa::NotInitializedException;
using Tessa::Ref;

void GetScsiDiskFromArray(const std::string& canonicalName, const Ref<DataArray<ScsiDisk>>& disks,
                          Ref<ScsiDisk>& disk) {
  if (!disks) {
    return;
  }
  for (ScsiDisk* candidate : *disks) {
    if (candidate == nullptr) {
      NotInitializedException::ThrowNotInitialized();
    }
    if (candidate->GetCanonicalName() == canonicalName) {
      disk = Ref<ScsiDisk>(candidate);
      return;
    }
  }
}

DiskInventory::DiskInventory(Ref<DataArray<ScsiDisk>> disks) : _disks(std::move(disks)) {
  if (!_disks) {
    return;
  }
  _named.reserve(_disks->Size());
  for (ScsiDisk* disk : *_disks) {
    if (disk == nullptr || !disk->HasCanonicalName()) {
      _endsUnnamed = true;
      return;
    }
    _named.emplace(disk->GetCanonicalName(), disk);  // of two with one name the first counts
  }
}

DiskInventory::~DiskInventory() = default;

void DiskInventory::Find(const std::string& canonicalName, Ref<ScsiDisk>& disk) const {
  const auto found = _named.find(canonicalName);
  if (found != _named.end()) {
    disk = Ref<ScsiDisk>(found->second);
  } else if (_endsUnnamed) {
    NotInitializedException::ThrowNotInitialized();
  }
}

}  // namespace Kovasvc
