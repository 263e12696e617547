#include "otxctl/provider/NicRecords.h"

#include <memory>
#include <utility>

namespace OtxCtl::Provider {
namespace {

using HostCtl::Kova::KovaIpAddress;
using HostCtl::Kova::KovaOtxNicConfig;

KovaIpAddress AddressOf(const std::string& text) {
  KovaIpAddress address;
  address.isIpv6 = text.find(':') != std::string::npos;
  if (address.isIpv6) {
    address.ipv6 = HostCtl::Network::Ipv6Address(text);
  } else {
    address.ipv4 = HostCtl::Network::Ipv4Address(text);
  }
  return address;
}

class NicRecord final : public KovaOtxNicConfig {
 public:
  explicit NicRecord(NicGroups nic) : _nic(std::move(nic)) {}

  std::string GetOtxnicName() const override { return _nic.interface; }
  KovaIpAddress GetMasterMulticastGroup() const override { return AddressOf(_nic.masterGroup); }
  KovaIpAddress GetAgentMulticastGroup() const override { return AddressOf(_nic.agentGroup); }

 private:
  NicGroups _nic;
};

}  // namespace

std::vector<KovaOtxNicConfig*> MakeNicRecords(const std::vector<NicGroups>& nics) {
  std::vector<std::unique_ptr<KovaOtxNicConfig>> owned;
  for (const NicGroups& nic : nics) {
    owned.push_back(std::make_unique<NicRecord>(nic));
  }
  std::vector<KovaOtxNicConfig*> records(owned.size());
  for (std::size_t i = 0; i < owned.size(); ++i) {
    records[i] = owned[i].release();
  }
  return records;
}

}  // namespace OtxCtl::Provider
