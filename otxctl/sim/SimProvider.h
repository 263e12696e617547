// What the plug-in holds of a simulated host: a thin face that can be deleted while the host lives on.
#pragma once

#include <memory>
#include <utility>

#include "otxctl/provider/ForwardingProvider.h"
#include "otxctl/sim/SimHost.h"

namespace OtxCtl::Sim {

class SimProvider final : public Provider::ForwardingProvider {
 public:
  explicit SimProvider(std::shared_ptr<SimHost> host) : ForwardingProvider(std::move(host)) {}
};

}  // namespace OtxCtl::Sim
