// How the service is set up on the host, from the kernel to the text.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <vector>

#include "kova/agentd/KovaLibManager.h"
#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/include/HostCtlException.h"
#include "nox/Faults.h"
#include "nox/Kova.h"
#include "tests/support/Matchers.h"
#include "tests/support/PluginFixture.h"

namespace Kovasvc {
namespace {

using HostCtl::Kova::KovaIpAddress;
using HostCtl::Kova::KovaOtxNicConfig;
using HostCtl::Lib::HostCtlException;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::StartsWith;
using TestSupport::LogLineIs;
using Info = Nox::Kova::Host::ConfigInfo;

constexpr const char* noFault = "No fault. Operation completed successfully";

class FakeNic final : public KovaOtxNicConfig {
 public:
  std::string GetOtxnicName() const override { return "otx0"; }
  KovaIpAddress GetMasterMulticastGroup() const override {
    return {.isIpv6 = false, .ipv4 = HostCtl::Network::Ipv4Address("224.1.2.3"), .ipv6 = {}};
  }
  KovaIpAddress GetAgentMulticastGroup() const override {
    return {.isIpv6 = true, .ipv4 = {}, .ipv6 = HostCtl::Network::Ipv6Address("ff19::1")};
  }
};

class ConfigInfo : public TestSupport::PluginFixture {
 protected:
  ConfigInfo() : _manager(MakeManager()) {
    _kernel.cluster.enabled = true;
    _kernel.cluster.clusterUuid = "cluster";
    _kernel.cluster.nodeUuid = "node";
    _kernel.faultDomain = "rack-1";
    _kernel.makeNics = [] { return std::vector<KovaOtxNicConfig*>{new FakeNic}; };
  }

  // The answer. The texts of before stay in front.
  Ref<Info> Ask() {
    const std::size_t length = _result.size();
    _manager->GetConfigInfo(_result);
    return TestSupport::ReadAnswer<Info>(_result.substr(length));
  }
  void Fail(const char* operation) {
    _kernel.Fail(operation, HostCtlException(std::string("no ") + operation));
  }

  Ref<KovaManagerImpl> _manager;
  std::string _result;
};

TEST_F(ConfigInfo, HasAllItsParts) {
  const Ref<Info> info = Ask();
  EXPECT_TRUE(info->GetEnabled());
  EXPECT_EQ(info->GetClusterInfo()->GetClusterUuid(), "cluster");
  EXPECT_EQ(info->GetClusterInfo()->GetNodeUuid(), "node");
  ASSERT_EQ(info->GetNetworkInfo()->GetPort()->Size(), 1U);
  const Info::NetworkInfo::PortConfig& port = *(*info->GetNetworkInfo()->GetPort())[0];
  EXPECT_EQ(port.GetInterfaceName(), "otx0");
  EXPECT_EQ(port.GetIpConfig()->GetMasterGroup(), "224.1.2.3");
  EXPECT_EQ(port.GetIpConfig()->GetAgentGroup(), "ff19::1");
  EXPECT_EQ(info->GetFaultDomainInfo()->GetName(), "rack-1");
  EXPECT_FALSE(info->GetStorageInfo());
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Verbose, noFault)));
}

TEST_F(ConfigInfo, AsksInOrderAndTakesNoLock) {
  Ask();
  EXPECT_THAT(_timeline.Events(), ElementsAre("RefreshKovaInfo()", "GetClusterInfoDetailed()",
                                              "GetKovaOtxNicConfigs()", "GetFaultDomainName()"));
}

TEST_F(ConfigInfo, AppendsItsText) {
  _result = "before";
  Ask();
  EXPECT_THAT(_result, StartsWith("before<?xml"));
}

TEST_F(ConfigInfo, LeavesTheCacheAlone) {
  _manager->RefreshKovaDiskCache();
  _logger->Clear();
  Ask();
  _manager->RefreshKovaDiskCache();
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Verbose, noFault),
                          LogLineIs(LogLevel::Verbose, "Disk cache is valid, no need to refresh.")));
}

TEST_F(ConfigInfo, OfADisabledServiceHasEmptyIdentities) {
  _kernel.cluster.enabled = false;
  const Ref<Info> info = Ask();
  ASSERT_TRUE(info->HasEnabled());
  EXPECT_FALSE(info->GetEnabled());
  ASSERT_TRUE(info->GetClusterInfo()->HasClusterUuid());
  EXPECT_EQ(info->GetClusterInfo()->GetClusterUuid(), "");
  ASSERT_TRUE(info->GetClusterInfo()->HasNodeUuid());
  EXPECT_EQ(info->GetClusterInfo()->GetNodeUuid(), "");
}

TEST_F(ConfigInfo, WithoutInterfacesHasNoPorts) {
  _kernel.makeNics = nullptr;
  const Ref<Info> info = Ask();
  ASSERT_TRUE(info->GetNetworkInfo());
  EXPECT_TRUE(!info->GetNetworkInfo()->GetPort() || info->GetNetworkInfo()->GetPort()->IsEmpty());
}

// ---- each part may fail by itself

TEST_F(ConfigInfo, LacksTheClusterWhenItCannotBeRead) {
  for (const char* operation : {"RefreshKovaInfo", "GetClusterInfoDetailed"}) {
    _logger->Clear();
    Fail(operation);
    const Ref<Info> info = Ask();
    EXPECT_FALSE(info->HasEnabled());
    EXPECT_FALSE(info->GetClusterInfo());
    EXPECT_TRUE(info->GetNetworkInfo());
    EXPECT_EQ(info->GetFaultDomainInfo()->GetName(), "rack-1");
    EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Warning, "Error getting cluster info: %1",
                                                        std::string("no ") + operation),
                                              LogLineIs(LogLevel::Verbose, noFault)));
    _kernel.Heal(operation);
  }
}

TEST_F(ConfigInfo, LacksTheNetworkWhenItCannotBeRead) {
  Fail("GetKovaOtxNicConfigs");
  const Ref<Info> info = Ask();
  EXPECT_TRUE(info->GetClusterInfo());
  EXPECT_FALSE(info->GetNetworkInfo());
  EXPECT_EQ(info->GetFaultDomainInfo()->GetName(), "rack-1");
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Warning, "Error getting network info: %1",
                                                      "no GetKovaOtxNicConfigs"),
                                            LogLineIs(LogLevel::Verbose, noFault)));
}

TEST_F(ConfigInfo, HasAnUnnamedFaultDomainWhenItCannotBeRead) {
  Fail("GetFaultDomainName");
  const Ref<Info> info = Ask();
  EXPECT_EQ(info->GetFaultDomainInfo()->GetName(), "");
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Warning, "%1: Error retrieving host fault domain info: %2",
                                    "MarshalFaultDomainInfo", "no GetFaultDomainName"),
                          LogLineIs(LogLevel::Verbose, noFault)));
}

TEST_F(ConfigInfo, IsAlmostEmptyButThereWhenEverythingFails) {
  Fail("RefreshKovaInfo");
  Fail("GetKovaOtxNicConfigs");
  Fail("GetFaultDomainName");
  const Ref<Info> info = Ask();
  EXPECT_FALSE(info->HasEnabled());
  EXPECT_FALSE(info->GetClusterInfo());
  EXPECT_FALSE(info->GetNetworkInfo());
  EXPECT_EQ(info->GetFaultDomainInfo()->GetName(), "");
  EXPECT_EQ(_logger->Lines(LogLevel::Warning).size(), 3U);
  EXPECT_THAT(_kernel.CallTexts(),
              ElementsAre("RefreshKovaInfo()", "GetKovaOtxNicConfigs()", "GetFaultDomainName()"));
}

TEST_F(ConfigInfo, LetsOtherExceptionsThroughAndAnswersNothing) {
  for (const char* operation :
       {"RefreshKovaInfo", "GetClusterInfoDetailed", "GetKovaOtxNicConfigs", "GetFaultDomainName"}) {
    _kernel.Fail(operation, std::runtime_error("not the kernel's"));
    EXPECT_THROW(_manager->GetConfigInfo(_result), std::runtime_error) << operation;
    _kernel.Heal(operation);
  }
  EXPECT_EQ(_result, "");
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

// ---- through the hook

TEST_F(ConfigInfo, IsWhatTheHookAppends) {
  _kovaManagerImpl = _manager;
  _result = "before";
  GetConfigInfoHookFn(_result);
  ASSERT_THAT(_result, StartsWith("before<?xml"));
  EXPECT_EQ(TestSupport::ReadAnswer<Info>(_result.substr(6))->GetFaultDomainInfo()->GetName(), "rack-1");
}

}  // namespace
}  // namespace Kovasvc
