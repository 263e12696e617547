// Hosts of the contract suite on the disks of a real machine: what a description tells of is brought about on
// them, by the provider itself and by programs of the system.
#pragma once

#include <memory>

#include "otxctl/contract/ProviderContract.h"
#include "tests/lab/contract/LabMachine.h"

namespace Lab {

// Clears the machine and makes the host. Throws std::runtime_error for a description that these disks cannot
// follow.
std::unique_ptr<OtxCtl::Contract::ContractHost> MakeRealHost(const LabMachine& machine,
                                                             const OtxCtl::Sim::HostDescription& host);

}  // namespace Lab
