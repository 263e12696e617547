// Which kernel provider the plug-in of this process gets.
//
// Threads: safe from any thread. The factory outlives every provider it made.
#pragma once

#include <functional>
#include <memory>

#include "kova/agentd/include/Api.h"

namespace HostCtl::Kova {
class KovaInfo;
}

namespace OtxCtl::Kova {

// Makes a provider; may throw HostCtl::Lib::HostCtlException.
using ProviderFactory = std::function<std::unique_ptr<HostCtl::Kova::KovaInfo>()>;

// Installed by the host program, or a test, before the plug-in is initialised. An empty factory takes
// the one before away.
HOSTCTL_API void SetProviderFactory(ProviderFactory factory);

}  // namespace OtxCtl::Kova
