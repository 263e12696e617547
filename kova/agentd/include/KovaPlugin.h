// How the plug-in comes by its kernel provider.
#pragma once

#include "kova/agentd/include/Api.h"

namespace HostCtl::Kova {
class KovaInfo;
}

namespace HostCtl {

class HOSTCTL_API KovaPlugin {
 public:
  virtual ~KovaPlugin();

  // A new provider, owned by the caller and deleted by it. Throws HostCtl::Lib::HostCtlException.
  virtual Kova::KovaInfo* GetKovaInfo() = 0;
};

}  // namespace HostCtl

namespace OtxCtl::Kova {

// Asks the provider factory that the host program has installed (otxctl/ProviderFactory.h); without
// one it throws HostCtl::Lib::HostCtlException. Safe to use from any thread.
class HOSTCTL_API KovaPluginImpl final : public HostCtl::KovaPlugin {
 public:
  HostCtl::Kova::KovaInfo* GetKovaInfo() override;
};

}  // namespace OtxCtl::Kova
