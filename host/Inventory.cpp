#include "host/Inventory.h"

#include <utility>

#include "nox/Host.h"

namespace Host {

using Nox::Host::StorageDeviceInfo;
using Tessa::Ref;

void Inventory::GetStorageDeviceInfo(Ref<StorageDeviceInfo>& info) {
  const std::lock_guard guard(_mutex);
  info = _info;
}

void Inventory::Replace(Ref<StorageDeviceInfo> info) {
  const std::lock_guard guard(_mutex);
  std::swap(_info, info);
}

}  // namespace Host
