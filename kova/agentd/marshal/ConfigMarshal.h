// The three parts of the host's configuration, from the kernel into the management API's object.
//
// Each may fail on its own by letting HostCtl::Lib::HostCtlException out; the object then lacks that part.
#pragma once

#include "nox/Fwd.h"
#include "tessa/Logger.h"
#include "tessa/Ref.h"

namespace HostCtl::Kova {
class KovaInfo;
}

namespace Kovasvc {

void MarshalClusterInfo(Tessa::Service::Logger& logger, HostCtl::Kova::KovaInfo& provider,
                        Tessa::Ref<Nox::Kova::Host::ConfigInfo>& config);

// An interface that fails is left out with a warning, a null one without a word; the others stay.
void MarshalNetworkInfo(Tessa::Service::Logger& logger, HostCtl::Kova::KovaInfo& provider,
                        Tessa::Ref<Nox::Kova::Host::ConfigInfo>& config);

// Handles the kernel's failure itself: the fault domain is then there with an empty name.
void MarshalFaultDomainInfo(Tessa::Service::Logger& logger, HostCtl::Kova::KovaInfo& provider,
                            Tessa::Ref<Nox::Kova::Host::ConfigInfo>& config);

}  // namespace Kovasvc
