#include "agentd/routes/DoorMetrics.h"

#include <gtest/gtest.h>

namespace Agentd {
namespace {

TEST(DoorMetrics, TellConnectionsByListenerRefusalsByCauseAndTheMemoryOfBodies) {
  HttpLoad load{.listeners = {{"unix:/a", 3}, {"tcp:127.0.0.1:1", 0}}, .bodyBytes = 77};
  load.refused[static_cast<std::size_t>(HttpRefusal::ConnectionsOfPeer)] = 9;
  EXPECT_EQ(
      DescribeDoors(load),
      "# HELP kova_agent_connections Connections that are served, by the address that they came to.\n"
      "# TYPE kova_agent_connections gauge\n"
      "kova_agent_connections{listener=\"unix:/a\"} 3\n"
      "kova_agent_connections{listener=\"tcp:127.0.0.1:1\"} 0\n"
      "# HELP kova_agent_refusals_total Clients that were turned away before they were heard, by cause.\n"
      "# TYPE kova_agent_refusals_total counter\n"
      "kova_agent_refusals_total{cause=\"connections\"} 0\n"
      "kova_agent_refusals_total{cause=\"connectionsOfPeer\"} 9\n"
      "kova_agent_refusals_total{cause=\"descriptors\"} 0\n"
      "kova_agent_refusals_total{cause=\"handshake\"} 0\n"
      "kova_agent_refusals_total{cause=\"slow\"} 0\n"
      "kova_agent_refusals_total{cause=\"bodies\"} 0\n"
      "# HELP kova_agent_body_bytes Memory held for bodies that are read or wait to be handled.\n"
      "# TYPE kova_agent_body_bytes gauge\n"
      "kova_agent_body_bytes 77\n");
}

TEST(DoorMetrics, APathOfASocketMayHoldAnything) {
  const std::string text = DescribeDoors({.listeners = {{"unix:/a\"b\\c\nd", 1}}});
  EXPECT_NE(text.find("{listener=\"unix:/a\\\"b\\\\c\\nd\"} 1\n"), std::string::npos) << text;
}

}  // namespace
}  // namespace Agentd
