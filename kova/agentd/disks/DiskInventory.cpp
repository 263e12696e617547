#include "kova/agentd/disks/DiskInventory.h"

#include <cassert>
#include <utility>

#include "kova/agentd/disks/NameList.h"
#include "nox/Host.h"
#include "tessa/Throwable.h"

namespace Kovasvc {

using Nox::Host::ScsiDisk;
using Orbis::DataArray;
using Tessa::NotInitializedException;
using Tessa::Ref;

DiskInventory::DiskInventory(Ref<DataArray<ScsiDisk>> disks) : _disks(std::move(disks)) {
  if (_disks) {
    _named.reserve(_disks->Size());
  }
  Index(_disks ? _disks->Size() : 0, [](const std::string&) { return true; });
}

DiskInventory::DiskInventory(Ref<DataArray<ScsiDisk>> disks, NameList& names) : _disks(std::move(disks)) {
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
      assert(_named.size() <= most);
      if (_named.size() == most) {
        return;
      }
    }
  }
}

DiskInventory::~DiskInventory() = default;

void GetScsiDiskFromArray(std::string_view canonicalName, const DiskInventory& disks, Ref<ScsiDisk>& disk) {
  const auto found = disks._named.find(canonicalName);
  if (found != disks._named.end()) {
    disk = Ref<ScsiDisk>(found->second);
  } else if (disks._endsUnnamed) {
    NotInitializedException::ThrowNotInitialized();
  }
}

}  // namespace Kovasvc
