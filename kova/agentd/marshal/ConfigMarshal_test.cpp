#include "kova/agentd/marshal/ConfigMarshal.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "kova/agentd/include/HostCtlException.h"
#include "nox/Kova.h"
#include "tests/support/FakeKernel.h"
#include "tests/support/Matchers.h"

namespace Kovasvc {
namespace {

using HostCtl::Kova::KovaIpAddress;
using HostCtl::Kova::KovaOtxNicConfig;
using HostCtl::Lib::HostCtlException;
using Nox::Kova::Host::ConfigInfo;
using Tessa::MakeRef;
using Tessa::Ref;
using Tessa::Service::LogLevel;
using testing::ElementsAre;
using testing::IsEmpty;
using TestSupport::LogLineIs;

// Both families are set, and differ, so that a mix-up shows.
KovaIpAddress Ipv4(const std::string& text) {
  return {.isIpv6 = false,
          .ipv4 = HostCtl::Network::Ipv4Address(text),
          .ipv6 = HostCtl::Network::Ipv6Address("not " + text)};
}
KovaIpAddress Ipv6(const std::string& text) {
  return {.isIpv6 = true,
          .ipv4 = HostCtl::Network::Ipv4Address("not " + text),
          .ipv6 = HostCtl::Network::Ipv6Address(text)};
}

// An interface that says when it goes, and that fails where it is told to.
class FakeNic final : public KovaOtxNicConfig {
 public:
  enum class Getter { None, Name, Master, Agent };
  struct Setup {
    std::string name;
    KovaIpAddress master;
    KovaIpAddress agent;
    Getter failing = Getter::None;
    std::function<void()> raise = nullptr;
    std::function<void(Getter)> onRead = nullptr;
    std::function<void()> onEnd = nullptr;
  };

  FakeNic(Setup setup, std::vector<std::string>& journal) : _setup(std::move(setup)), _journal(journal) {}
  ~FakeNic() override {
    _journal.push_back("delete " + _setup.name);
    if (_setup.onEnd) {
      _setup.onEnd();
    }
  }

  std::string GetOtxnicName() const override {
    Begin(Getter::Name);
    return _setup.name;
  }
  KovaIpAddress GetMasterMulticastGroup() const override {
    Begin(Getter::Master);
    return _setup.master;
  }
  KovaIpAddress GetAgentMulticastGroup() const override {
    Begin(Getter::Agent);
    return _setup.agent;
  }

 private:
  void Begin(Getter getter) const {
    if (_setup.onRead) {
      _setup.onRead(getter);
    }
    if (getter == _setup.failing) {
      _setup.raise();
    }
  }

  const Setup _setup;
  std::vector<std::string>& _journal;
};

class ConfigMarshalling : public testing::Test {
 protected:
  TestSupport::Timeline _timeline;
  TestSupport::FakeKernel _kernel{_timeline};
  const std::unique_ptr<HostCtl::Kova::KovaInfo> _provider = _kernel.MakeProvider();
  const Ref<TestSupport::RecordingLogger> _logger = MakeRef<TestSupport::RecordingLogger>();
  Ref<ConfigInfo> _config = MakeRef<ConfigInfo>();
};

// ---- cluster

class ClusterMarshalling : public ConfigMarshalling {
 protected:
  ClusterMarshalling() {
    _kernel.cluster.clusterUuid = "cluster";
    _kernel.cluster.nodeUuid = "node";
  }
  void Marshal() { MarshalClusterInfo(*_logger, *_provider, _config); }
};

TEST_F(ClusterMarshalling, RefreshesTheKernelFirst) {
  Marshal();
  EXPECT_THAT(_timeline.Events(), ElementsAre("RefreshKovaInfo()", "GetClusterInfoDetailed()"));
}

TEST_F(ClusterMarshalling, TellsTheIdentitiesOfAMember) {
  _kernel.cluster.enabled = true;
  Marshal();
  EXPECT_TRUE(_config->GetEnabled());
  EXPECT_EQ(_config->GetClusterInfo()->GetClusterUuid(), "cluster");
  EXPECT_EQ(_config->GetClusterInfo()->GetNodeUuid(), "node");
}

TEST_F(ClusterMarshalling, SetsEmptyIdentitiesForAHostThatIsNoMember) {
  Marshal();
  ASSERT_TRUE(_config->HasEnabled());
  EXPECT_FALSE(_config->GetEnabled());
  ASSERT_TRUE(_config->GetClusterInfo()->HasClusterUuid());
  ASSERT_TRUE(_config->GetClusterInfo()->HasNodeUuid());
  EXPECT_EQ(_config->GetClusterInfo()->GetClusterUuid(), "");
  EXPECT_EQ(_config->GetClusterInfo()->GetNodeUuid(), "");
}

TEST_F(ClusterMarshalling, LeavesTheObjectAloneWhenTheKernelFails) {
  for (const char* operation : {"RefreshKovaInfo", "GetClusterInfoDetailed"}) {
    _kernel.Fail(operation, HostCtlException("away"), TestSupport::FakeKernel::When::AfterEffect);
    EXPECT_THROW(Marshal(), HostCtlException);
    EXPECT_FALSE(_config->HasEnabled());
    EXPECT_FALSE(_config->GetClusterInfo());
    _kernel.Heal(operation);
  }
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

// ---- network

class NetworkMarshalling : public ConfigMarshalling {
 protected:
  // Nothing of the list is left behind, whatever happened.
  ~NetworkMarshalling() override {
    std::vector<std::string> deletions;
    for (const FakeNic::Setup& nic : _nics) {
      deletions.push_back("delete " + nic.name);
    }
    EXPECT_EQ(_journal, deletions);
  }
  void SetNics(std::vector<FakeNic::Setup> nics) {
    _nics = std::move(nics);
    _kernel.makeNics = [this] {
      std::vector<KovaOtxNicConfig*> made;
      for (const FakeNic::Setup& nic : _nics) {
        made.push_back(new FakeNic(nic, _journal));
      }
      return made;
    };
  }
  void Marshal() { MarshalNetworkInfo(*_logger, *_provider, _config); }
  // As in "otx0 MASTER AGENT".
  std::vector<std::string> Ports() const {
    std::vector<std::string> ports;
    for (const ConfigInfo::NetworkInfo::PortConfig* port : *_config->GetNetworkInfo()->GetPort()) {
      ports.push_back(port->GetInterfaceName() + " " + port->GetIpConfig()->GetMasterGroup() + " " +
                      port->GetIpConfig()->GetAgentGroup());
    }
    return ports;
  }

  std::vector<FakeNic::Setup> _nics;
  std::vector<std::string> _journal;
};

TEST_F(NetworkMarshalling, ListsTheInterfacesInTheKernelsOrder) {
  SetNics({{"otx1", Ipv4("224.1.2.3"), Ipv4("224.2.3.4")}, {"otx0", Ipv6("ff19::1"), Ipv6("ff19::2")}});
  Marshal();
  EXPECT_THAT(Ports(), ElementsAre("otx1 224.1.2.3 224.2.3.4", "otx0 ff19::1 ff19::2"));
  EXPECT_THAT(_timeline.Events(), ElementsAre("GetKovaOtxNicConfigs()"));
}

TEST_F(NetworkMarshalling, TakesTheFamilyOfEachGroupByItself) {
  SetNics({{"otx0", Ipv6("ff19::1"), Ipv4("224.2.3.4")}, {"otx1", Ipv4("224.1.2.3"), Ipv6("ff19::2")}});
  Marshal();
  EXPECT_THAT(Ports(), ElementsAre("otx0 ff19::1 224.2.3.4", "otx1 224.1.2.3 ff19::2"));
}

TEST_F(NetworkMarshalling, ReadsTheMasterGroupThenTheAgentGroupThenTheName) {
  std::vector<FakeNic::Getter> read;
  FakeNic::Setup nic = {"otx0", Ipv4("224.1.2.3"), Ipv4("224.2.3.4")};
  nic.onRead = [&read](FakeNic::Getter getter) { read.push_back(getter); };
  SetNics({nic});
  Marshal();
  EXPECT_THAT(read, ElementsAre(FakeNic::Getter::Master, FakeNic::Getter::Agent, FakeNic::Getter::Name));
}

TEST_F(NetworkMarshalling, FreesTheInterfacesBeforeItTellsThem) {
  bool wasTold = true;
  FakeNic::Setup nic = {"otx0", Ipv4("224.1.2.3"), Ipv4("224.2.3.4")};
  nic.onEnd = [&] { wasTold = static_cast<bool>(_config->GetNetworkInfo()); };
  SetNics({nic});
  Marshal();
  EXPECT_FALSE(wasTold);
  EXPECT_TRUE(_config->GetNetworkInfo());
}

TEST_F(NetworkMarshalling, HasNetworkInfoWithoutPortsWhenThereAreNoInterfaces) {
  SetNics({});
  Marshal();
  ASSERT_TRUE(_config->GetNetworkInfo());
  EXPECT_FALSE(_config->GetNetworkInfo()->GetPort()) << "no list at all";
}

TEST_F(NetworkMarshalling, LeavesOutAnInterfaceThatFailsAtAnyPoint) {
  const auto fail = [] { throw HostCtlException("link down"); };
  for (const auto getter : {FakeNic::Getter::Name, FakeNic::Getter::Master, FakeNic::Getter::Agent}) {
    _journal.clear();
    _logger->Clear();
    SetNics({{"otx0", Ipv4("1"), Ipv4("2")},
             {"otx1", Ipv4("3"), Ipv4("4"), getter, fail},
             {"otx2", Ipv4("5"), Ipv4("6")}});
    Marshal();
    EXPECT_THAT(Ports(), ElementsAre("otx0 1 2", "otx2 5 6"));
    EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Warning, "%1: Error getting port info: %2",
                                                        "MarshalNetworkInfo", "link down")));
  }
}

// Its two texts differ.
class LinkDown final : public HostCtlException {
 public:
  LinkDown() : HostCtlException("the message") {}
  std::string Describe() const override { return "as it describes itself"; }
  const char* what() const noexcept override { return "as what() says"; }
};

TEST_F(NetworkMarshalling, TellsAnInterfacesFailureAsItDescribesItself) {
  SetNics({{"otx0", Ipv4("1"), Ipv4("2"), FakeNic::Getter::Name, [] { throw LinkDown(); }}});
  Marshal();
  EXPECT_THAT(_logger->Lines(), ElementsAre(LogLineIs(LogLevel::Warning, "%1: Error getting port info: %2",
                                                      "MarshalNetworkInfo", "as it describes itself")));
}

TEST_F(NetworkMarshalling, HasAnEmptyListWhenEveryInterfaceFails) {
  SetNics({{"otx0", Ipv4("1"), Ipv4("2"), FakeNic::Getter::Name, [] { throw HostCtlException("x"); }}});
  Marshal();
  ASSERT_TRUE(_config->GetNetworkInfo()->GetPort());
  EXPECT_THAT(Ports(), IsEmpty());
}

TEST_F(NetworkMarshalling, PassesOverANullInterfaceWithoutAWord) {
  SetNics({{"otx0", Ipv4("1"), Ipv4("2")}, {"otx1", Ipv4("3"), Ipv4("4")}});
  _kernel.makeNics = [make = _kernel.makeNics] {
    std::vector<KovaOtxNicConfig*> nics = make();
    nics.insert(nics.begin() + 1, nullptr);
    return nics;
  };
  Marshal();
  EXPECT_THAT(Ports(), ElementsAre("otx0 1 2", "otx1 3 4"));
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(NetworkMarshalling, FreesTheInterfacesBeforeItLetsAnotherExceptionOut) {
  SetNics({{"otx0", Ipv4("1"), Ipv4("2")},
           {"otx1", Ipv4("3"), Ipv4("4"), FakeNic::Getter::Agent, [] { throw std::runtime_error("x"); }},
           {"otx2", Ipv4("5"), Ipv4("6")}});
  EXPECT_THROW(Marshal(), std::runtime_error);
  EXPECT_FALSE(_config->GetNetworkInfo());
  EXPECT_THAT(_journal, ElementsAre("delete otx0", "delete otx1", "delete otx2"));
  EXPECT_THAT(_logger->Lines(), IsEmpty());
}

TEST_F(NetworkMarshalling, LeavesTheObjectAloneWhenTheListCannotBeRead) {
  _kernel.Fail("GetKovaOtxNicConfigs", HostCtlException("away"));
  EXPECT_THROW(Marshal(), HostCtlException);
  EXPECT_FALSE(_config->GetNetworkInfo());
}

// ---- fault domain

class FaultDomainMarshalling : public ConfigMarshalling {
 protected:
  void Marshal() { MarshalFaultDomainInfo(*_logger, *_provider, _config); }
};

TEST_F(FaultDomainMarshalling, TellsTheName) {
  _kernel.faultDomain = "rack-1";
  Marshal();
  EXPECT_EQ(_config->GetFaultDomainInfo()->GetName(), "rack-1");
  EXPECT_THAT(_timeline.Events(), ElementsAre("GetFaultDomainName()"));
}

TEST_F(FaultDomainMarshalling, WarnsAndTellsAnEmptyNameWhenTheKernelFails) {
  _kernel.faultDomain = "rack-1";
  _kernel.Fail("GetFaultDomainName", HostCtlException("away"));
  Marshal();
  ASSERT_TRUE(_config->GetFaultDomainInfo());
  EXPECT_EQ(_config->GetFaultDomainInfo()->GetName(), "");
  EXPECT_THAT(_logger->Lines(),
              ElementsAre(LogLineIs(LogLevel::Warning, "%1: Error retrieving host fault domain info: %2",
                                    "MarshalFaultDomainInfo", "away")));
}

TEST_F(FaultDomainMarshalling, LetsOtherExceptionsThrough) {
  _kernel.Fail("GetFaultDomainName", std::runtime_error("x"));
  EXPECT_THROW(Marshal(), std::runtime_error);
  EXPECT_FALSE(_config->GetFaultDomainInfo());
}

}  // namespace
}  // namespace Kovasvc
