#include "kova/agentd/marshal/ConfigMarshal.h"

#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/include/KovaInfo.h"
#include "nox/Kova.h"

namespace Kovasvc {

using HostCtl::Kova::KovaInfo;
using HostCtl::Kova::KovaIpAddress;
using HostCtl::Kova::KovaOtxNicConfig;
using HostCtl::Lib::HostCtlException;
using Nox::Kova::Host::ConfigInfo;
using Nox::Kova::Host::IpConfig;
using PortConfig = ConfigInfo::NetworkInfo::PortConfig;
using Orbis::DataArray;
using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::Logger;
using Tessa::Service::LogInternal;
using Tessa::Service::LogLevel;

namespace {

// The kernel library's records of the interfaces, freed on every way out.
class NicConfigs {
 public:
  explicit NicConfigs(KovaInfo& provider) : _records(provider.GetKovaOtxNicConfigs()) {}
  ~NicConfigs() { OtxCtl::Util::DeleteVector(_records); }
  NicConfigs(const NicConfigs&) = delete;
  NicConfigs& operator=(const NicConfigs&) = delete;

  const std::vector<KovaOtxNicConfig*>& Records() const noexcept { return _records; }

 private:
  std::vector<KovaOtxNicConfig*> _records;
};

std::string TextOf(const KovaIpAddress& address) {
  return address.isIpv6 ? address.ipv6.GetStringAddress() : address.ipv4.GetStringAddress();
}

Ref<PortConfig> ToPort(const KovaOtxNicConfig& nic) {
  const auto addresses = MakeRef<IpConfig>();
  addresses->SetMasterGroup(TextOf(nic.GetMasterMulticastGroup()));
  addresses->SetAgentGroup(TextOf(nic.GetAgentMulticastGroup()));
  const auto port = MakeRef<PortConfig>();
  port->SetInterfaceName(nic.GetOtxnicName());
  port->SetIpConfig(addresses);
  return port;
}

}  // namespace

void MarshalClusterInfo(Logger&, KovaInfo& provider, Ref<ConfigInfo>& config) {
  HostCtl::Kova::KovaClusterInfoDetailed kernel;
  provider.RefreshKovaInfo();
  provider.GetClusterInfoDetailed(kernel);
  config->SetEnabled(kernel.enabled);
  const auto cluster = MakeRef<ConfigInfo::ClusterInfo>();
  // Of a host that is in no cluster both are set, and empty.
  cluster->SetClusterUuid(kernel.enabled ? kernel.clusterUuid : std::string());
  cluster->SetNodeUuid(kernel.enabled ? kernel.nodeUuid : std::string());
  config->SetClusterInfo(cluster);
}

void MarshalNetworkInfo(Logger& logger, KovaInfo& provider, Ref<ConfigInfo>& config) {
  const auto network = MakeRef<ConfigInfo::NetworkInfo>();
  {
    const NicConfigs nics(provider);
    if (!nics.Records().empty()) {
      const auto ports = MakeRef<DataArray<PortConfig>>();
      for (const KovaOtxNicConfig* nic : nics.Records()) {
        if (nic == nullptr) {
          continue;
        }
        try {
          ports->Append(ToPort(*nic));
        } catch (const HostCtlException& exception) {
          LogInternal(logger, LogLevel::Warning, "%1: Error getting port info: %2", "MarshalNetworkInfo",
                      exception.Describe());
        }
      }
      network->SetPort(ports);
    }
  }
  config->SetNetworkInfo(network);
}

void MarshalFaultDomainInfo(Logger& logger, KovaInfo& provider, Ref<ConfigInfo>& config) {
  const auto faultDomain = MakeRef<ConfigInfo::FaultDomainInfo>();
  try {
    faultDomain->SetName(provider.GetFaultDomainName());
  } catch (const HostCtlException& exception) {
    LogInternal(logger, LogLevel::Warning, "%1: Error retrieving host fault domain info: %2",
                "MarshalFaultDomainInfo", exception.Describe());
  }
  config->SetFaultDomainInfo(faultDomain);
}

}  // namespace Kovasvc
