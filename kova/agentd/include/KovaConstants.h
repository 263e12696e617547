// Texts that the storage service's parts agree on. Defined by the plug-in, which builds them when it is
// loaded, in this order; nothing of the plug-in itself reads them.
#pragma once

#include <string>

namespace Kovasvc {

// Default multicast groups of the service's two kinds of traffic.
extern const std::string masterGroupIpv4;
extern const std::string masterGroupIpv6;
extern const std::string agentGroupIpv4;
extern const std::string agentGroupIpv6;

extern const std::string lastHddText;
extern const std::string witnessName;
extern const std::string serviceName;
extern const std::string allName;
extern const std::string tcpStates[4];
extern const std::string anyIpv6Address;
extern const std::string keyExchangeFolder;
extern const std::string congestionControl;

}  // namespace Kovasvc
