#include "kova/agentd/include/KovaNetwork.h"

#include <utility>

namespace HostCtl::Network {

Ipv4Address::Ipv4Address() = default;
Ipv4Address::Ipv4Address(std::string text) : _text(std::move(text)) {}

Ipv6Address::Ipv6Address() = default;
Ipv6Address::Ipv6Address(std::string text) : _text(std::move(text)) {}

}  // namespace HostCtl::Network

namespace HostCtl::Kova {

KovaOtxNicConfig::~KovaOtxNicConfig() = default;

}  // namespace HostCtl::Kova

namespace OtxCtl::Util {

void DeleteVector(std::vector<HostCtl::Kova::KovaOtxNicConfig*>& records) noexcept {
  for (const HostCtl::Kova::KovaOtxNicConfig* record : records) {
    delete record;
  }
  records.clear();
}

}  // namespace OtxCtl::Util
