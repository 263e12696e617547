// The agent's inventory: the host's logical units as management API objects.
#pragma once

#include <mutex>

#include "nox/Fwd.h"
#include "nox/StorageSystem.h"
#include "tessa/Ref.h"

namespace Host {

// The managed object "storageSystem". Holds one inventory, which is replaced as a whole; objects that were
// handed out stay as they are.
//
// Threads: safe from any thread.
class Inventory final : public Nox::Host::StorageSystem {
 public:
  void GetStorageDeviceInfo(Tessa::Ref<Nox::Host::StorageDeviceInfo>& info) override;
  void Replace(Tessa::Ref<Nox::Host::StorageDeviceInfo> info);

 private:
  mutable std::mutex _mutex;
  Tessa::Ref<Nox::Host::StorageDeviceInfo> _info;
};

}  // namespace Host
