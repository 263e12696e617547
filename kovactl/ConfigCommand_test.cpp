#include "kovactl/ConfigCommand.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>

#include "kovactl/testing/FakeHost.h"
#include "nox/Kova.h"
#include "orbis/Engine.h"
#include "orbis/Soap.h"

namespace Kovactl {
namespace {

using Nox::Kova::Host::ConfigInfo;
using Orbis::DataArray;
using Tessa::MakeRef;
using Tessa::Ref;

Ref<ConfigInfo> AFullConfig() {
  const auto config = MakeRef<ConfigInfo>();
  config->SetEnabled(true);
  const auto cluster = MakeRef<ConfigInfo::ClusterInfo>();
  cluster->SetClusterUuid("c-1");
  cluster->SetNodeUuid("n-1");
  config->SetClusterInfo(cluster);
  const auto port = MakeRef<ConfigInfo::NetworkInfo::PortConfig>();
  port->SetInterfaceName("otx1");
  port->GetIpConfig()->SetMasterGroup("224.1.2.3");
  port->GetIpConfig()->SetAgentGroup("FF19::1");
  const auto ports = MakeRef<DataArray<ConfigInfo::NetworkInfo::PortConfig>>();
  ports->Append(port);
  const auto network = MakeRef<ConfigInfo::NetworkInfo>();
  network->SetPort(ports);
  config->SetNetworkInfo(network);
  const auto faultDomain = MakeRef<ConfigInfo::FaultDomainInfo>();
  faultDomain->SetName("rack-1");
  config->SetFaultDomainInfo(faultDomain);
  return config;
}

class ConfigCommand : public testing::Test {
 protected:
  ExitStatus Run(const Ref<ConfigInfo>& config, const std::string& output = "table") {
    _host.answer.result = config;
    return RunConfig(_host, output, _out, _err);
  }

  Testing::FakeHost _host;
  std::ostringstream _out;
  std::ostringstream _err;
};

TEST_F(ConfigCommand, PrintsSettingsAndNetworks) {
  EXPECT_EQ(Run(AFullConfig()), ExitStatus::Done);
  EXPECT_EQ(_out.str(),
            "SETTING       VALUE\n"
            "Enabled       yes\n"
            "Cluster       c-1\n"
            "Node          n-1\n"
            "Fault domain  rack-1\n"
            "\n"
            "INTERFACE  MASTER GROUP  AGENT GROUP\n"
            "otx1       224.1.2.3     FF19::1\n");
}

TEST_F(ConfigCommand, SaysNoneForWhatTheHostDoesNotHave) {
  const auto config = AFullConfig();
  config->SetEnabled(false);
  config->GetClusterInfo()->SetClusterUuid("");
  config->GetClusterInfo()->SetNodeUuid("");
  config->GetFaultDomainInfo()->SetName("");
  config->GetNetworkInfo()->SetPort(nullptr);
  EXPECT_EQ(Run(config), ExitStatus::Done);
  EXPECT_EQ(_out.str(),
            "SETTING       VALUE\n"
            "Enabled       no\n"
            "Cluster       none\n"
            "Node          none\n"
            "Fault domain  none\n"
            "\n"
            "Networks: none\n");
}

TEST_F(ConfigCommand, SaysUnknownForWhatTheHostCouldNotRead) {
  EXPECT_EQ(Run(MakeRef<ConfigInfo>()), ExitStatus::Done);
  EXPECT_EQ(_out.str(),
            "SETTING       VALUE\n"
            "Enabled       unknown (the host could not read it)\n"
            "Cluster       unknown (the host could not read it)\n"
            "Node          unknown (the host could not read it)\n"
            "Fault domain  unknown (the host could not read it)\n"
            "\n"
            "Networks: unknown (the host could not read it)\n");
}

TEST_F(ConfigCommand, PrintsTheObjectForScripts) {
  const auto config = AFullConfig();
  EXPECT_EQ(Run(config, "soap"), ExitStatus::Done);
  Ref<Orbis::Any> read;
  std::string text = _out.str();
  text.pop_back();
  Orbis::DeserializeSoapToObject(text, read);
  EXPECT_TRUE(Orbis::Equal(read.Get(), config.Get()));
}

TEST_F(ConfigCommand, ExplainsAFault) {
  _host.answer = Host::FailedWith("no host");
  EXPECT_EQ(RunConfig(_host, "table", _out, _err), ExitStatus::Fault);
  EXPECT_THAT(_err.str(), testing::HasSubstr("no host"));
}

}  // namespace
}  // namespace Kovactl
