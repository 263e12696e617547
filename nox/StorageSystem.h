// The managed object of the agent that knows the host's storage devices.
#pragma once

#include "nox/Fwd.h"
#include "tessa/Object.h"
#include "tessa/Ref.h"

namespace Nox::Host {

// Registered with the application as "storageSystem".
//
// Threads: safe from any thread.
class TESSA_API StorageSystem : public Tessa::ObjectImpl {
 public:
  // Fills `info` with the logical units as they are now; null when the host cannot say. The objects
  // belong to the agent: whoever wants to change one copies it first.
  virtual void GetStorageDeviceInfo(Tessa::Ref<StorageDeviceInfo>& info) = 0;

 protected:
  ~StorageSystem() override;
};

}  // namespace Nox::Host
