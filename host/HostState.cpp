#include "host/HostState.h"

#include <utility>

#include "kova/agentd/include/KovaInfo.h"
#include "nox/Host.h"

namespace Host {
namespace {

using HostCtl::Kova::KovaOtxNicConfig;
using OtxCtl::Provider::NicGroups;

// The kernel's records, freed whatever happens.
class NicRecords {
 public:
  explicit NicRecords(HostCtl::Kova::KovaInfo& kernel) : _records(kernel.GetKovaOtxNicConfigs()) {}
  ~NicRecords() { OtxCtl::Util::DeleteVector(_records); }
  NicRecords(const NicRecords&) = delete;
  NicRecords& operator=(const NicRecords&) = delete;

  const std::vector<KovaOtxNicConfig*>& Get() const noexcept { return _records; }

 private:
  std::vector<KovaOtxNicConfig*> _records;
};

std::string TextOf(const HostCtl::Kova::KovaIpAddress& address) {
  return address.isIpv6 ? address.ipv6.GetStringAddress() : address.ipv4.GetStringAddress();
}

std::vector<NicGroups> NicsOf(HostCtl::Kova::KovaInfo& kernel) {
  const NicRecords records(kernel);
  std::vector<NicGroups> nics;
  for (const KovaOtxNicConfig* record : records.Get()) {
    if (record != nullptr) {
      nics.push_back({record->GetOtxnicName(), TextOf(record->GetMasterMulticastGroup()),
                      TextOf(record->GetAgentMulticastGroup())});
    }
  }
  return nics;
}

}  // namespace

HostState ReadHostState(HostCtl::Kova::KovaInfo& kernel, Tessa::Ref<Nox::Host::StorageDeviceInfo> inventory) {
  HostState state;
  kernel.QueryDisks({}, state.disks, true);
  state.groups = GroupsOf(kernel);
  state.autoMode = kernel.IsAutoModeEnabled();
  kernel.GetClusterInfoDetailed(state.cluster);
  state.faultDomain = kernel.GetFaultDomainName();
  state.nics = NicsOf(kernel);
  state.inventory = std::move(inventory);
  return state;
}

}  // namespace Host
