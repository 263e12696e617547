#include "kova/agentd/marshal/DiskInventory.h"

#include <utility>

#include "kova/agentd/query/NameSet.h"
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
  if (_disks) {
    _named.reserve(_disks->Size());
  }
  Index(_disks ? _disks->Size() : 0, [](const std::string&) { return true; });
}

DiskInventory::DiskInventory(Ref<DataArray<ScsiDisk>> disks, NameSet& names) : _disks(std::move(disks)) {
  Index(names.Size(), [&names](const std::string& name) { return names.Contains(name); });
}

template <class IsWanted>
void DiskInventory::Index(std::size_t most, IsWanted isWanted) {
  if (!_disks) {
    return;
  }
  for (ScsiDisk* disk : *_disks) {
    if (disk == nullptr || !disk->HasCanonicalName()) {
      _endsUnnamed = true;
      return;
    }
    const std::string& name = disk->GetCanonicalName();
    if (isWanted(name)) {
      _named.emplace(name, disk);  // of two with one name the first counts
      if (_named.size() == most) {
        return;
      }
    }
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
