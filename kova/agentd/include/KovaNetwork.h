// Network addresses and the service's configuration of one kernel network interface.
#pragma once

#include <string>
#include <vector>

#include "kova/agentd/include/Api.h"

namespace HostCtl::Network {

class HOSTCTL_API Ipv4Address {
 public:
  Ipv4Address();
  explicit Ipv4Address(std::string text);
  const std::string& GetStringAddress() const noexcept { return _text; }

 private:
  std::string _text;
};

class HOSTCTL_API Ipv6Address {
 public:
  Ipv6Address();
  explicit Ipv6Address(std::string text);
  const std::string& GetStringAddress() const noexcept { return _text; }

 private:
  std::string _text;
};

}  // namespace HostCtl::Network

namespace HostCtl::Kova {

// An address of either family; the flag says which one counts.
struct KovaIpAddress {
  bool isIpv6 = false;
  Network::Ipv4Address ipv4;
  Network::Ipv6Address ipv6;
};

// One kernel network interface that carries traffic of the service. Made by the kernel control
// library; the receiver frees a list of them with OtxCtl::Util::DeleteVector. Any getter may throw
// HostCtl::Lib::HostCtlException.
class HOSTCTL_API KovaOtxNicConfig {
 public:
  virtual ~KovaOtxNicConfig();
  virtual std::string GetOtxnicName() const = 0;
  virtual KovaIpAddress GetMasterMulticastGroup() const = 0;
  virtual KovaIpAddress GetAgentMulticastGroup() const = 0;
};

}  // namespace HostCtl::Kova

namespace OtxCtl::Util {

// Deletes every record of the list, null entries included, and empties it.
HOSTCTL_API void DeleteVector(std::vector<HostCtl::Kova::KovaOtxNicConfig*>& records) noexcept;

}  // namespace OtxCtl::Util
