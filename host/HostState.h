// Everything that the plug-in decides by, as a machine told it at one moment.
#pragma once

#include <string>
#include <vector>

#include "host/UnmountedGroups.h"
#include "kova/agentd/include/KovaRecords.h"
#include "nox/Fwd.h"
#include "otxctl/provider/NicRecords.h"
#include "tessa/Ref.h"

namespace HostCtl::Kova {
class KovaInfo;
}

namespace Host {

// Values; the inventory is only read.
struct HostState {
  std::vector<HostCtl::Kova::DiskResult> disks;  // the kernel's records, in its order
  std::vector<KernelGroup> groups;               // in order of creation, mounted or not
  bool autoMode = false;
  HostCtl::Kova::KovaClusterInfoDetailed cluster;
  std::string faultDomain;
  std::vector<OtxCtl::Provider::NicGroups> nics;
  Tessa::Ref<Nox::Host::StorageDeviceInfo> inventory = nullptr;  // null: the machine cannot list anything
};

// Asks the provider for all of it, and for nothing that changes anything. Throws what the provider throws.
//
// Threads: any. What the answers have in common is the provider's matter: hold a look (Machine.h) to have
// them of one moment.
HostState ReadHostState(HostCtl::Kova::KovaInfo& kernel, Tessa::Ref<Nox::Host::StorageDeviceInfo> inventory);

}  // namespace Host
