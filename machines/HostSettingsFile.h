// The file in which the operator of a real machine says what no kernel knows: cluster, fault domain,
// networks, the smallest disk to use, and which flash disks are for the capacity tier.
//
//   {"cluster": {"enabled": true, "clusterUuid": "..", "nodeUuid": ".."}, "faultDomain": "rack-1",
//    "networks": [{"interface": "otx1", "masterMulticastGroup": "224.1.2.3", "agentMulticastGroup": ".."}],
//    "minimumDiskBytes": 1073741824, "capacityFlash": ["naa.5000c50000000100"]}
//
// Its keys are those of a host description, but for the last. Errors are Host::HostError; the text names the
// file, and the path in it.
#pragma once

#include <string>

#include "otxctl/linux/HostSettings.h"

namespace Machines {

// What is not said there has its default; so has everything if there is no such file. Refuses a file that is
// not root's or the caller's own, or that others may write: whoever can write it decides which disks are
// used.
OtxCtl::Linux::HostSettings ReadHostSettings(const std::string& file);

// Marks a flash disk for the capacity tier, or takes the mark away; whatever else the file says stays. False:
// it was like that before. The file is replaced whole; its folder must be there.
bool MarkCapacityFlash(const std::string& file, const std::string& disk, bool isMarked);

}  // namespace Machines
