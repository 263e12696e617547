// How the storage service is set up on the host: cluster, network, fault domain. A part that cannot be read
// is missing from the answer; the others are still reported.

#include <array>

#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/include/KovaInfo.h"
#include "kova/agentd/marshal/ConfigMarshal.h"
#include "nox/Kova.h"
#include "orbis/Types.h"

namespace Kovasvc {

using Nox::Kova::Host::ConfigInfo;
using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::Logger;
using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;

namespace {

struct Part {
  void (*marshal)(Logger&, HostCtl::Kova::KovaInfo&, Ref<ConfigInfo>&);
  std::string_view failure;
};

constexpr std::array<Part, 3> parts = {{
    {&MarshalClusterInfo, "Error getting cluster info: %1"},
    {&MarshalNetworkInfo, "Error getting network info: %1"},
    {&MarshalFaultDomainInfo, "Error getting host fault domain info: %1"},
}};

}  // namespace

void KovaManagerImpl::GetConfigInfo(std::string& resultText) {
  Ref<ConfigInfo> config = MakeRef<ConfigInfo>();
  for (const Part& part : parts) {
    try {
      part.marshal(*_logger, *_provider, config);
    } catch (const HostCtl::Lib::HostCtlException& exception) {
      LogInternal(_logger, LogLevel::Warning, part.failure, exception.Describe());
    }
  }
  std::string droppedFaultText;
  Ref<Orbis::Any> result = config;
  Ref<Orbis::MethodFault> noFault;
  SerializeKovaResultAndFault(resultText, droppedFaultText, result, noFault);
}

}  // namespace Kovasvc
