#include "host/HostState.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <set>

#include "kova/agentd/include/HostCtlException.h"
#include "nox/Host.h"
#include "otxctl/fault/CallRecorder.h"
#include "otxctl/fault/RecordingProvider.h"
#include "otxctl/sim/HostBuilder.h"
#include "otxctl/sim/SimProvider.h"

namespace Host {
namespace {

using OtxCtl::Sim::AHost;

// What may be asked of a host that must stay as it is.
const std::set<std::string> queries = {
    "QueryDisks",           "GetDiskMappings",        "IsAutoModeEnabled",
    "GetKovaOtxNicConfigs", "GetClusterInfoDetailed", "GetFaultDomainName"};

class HostStateTest : public testing::Test {
 protected:
  HostState Read(const OtxCtl::Sim::HostBuilder& host) {
    const auto provider =
        std::make_shared<OtxCtl::Sim::SimProvider>(std::make_shared<OtxCtl::Sim::SimHost>(host.Build()));
    OtxCtl::Fault::RecordingProvider recording(provider, _recorder);
    return ReadHostState(recording, _inventory);
  }

  const std::shared_ptr<OtxCtl::Fault::CallRecorder> _recorder =
      std::make_shared<OtxCtl::Fault::CallRecorder>();
  const Tessa::Ref<Nox::Host::StorageDeviceInfo> _inventory = Tessa::MakeRef<Nox::Host::StorageDeviceInfo>();
};

TEST_F(HostStateTest, IsWhatTheKernelTells) {
  const HostState state = Read(AHost()
                                   .WithSsd("naa.1")
                                   .WithHdds({"naa.2", "naa.3", "naa.5"})
                                   .WithSsd("naa.4")
                                   .WithGroup("naa.1", {"naa.2"})
                                   .WithUnmountedGroup("naa.4", {"naa.3"})
                                   .Edit([](OtxCtl::Sim::HostDescription& host) {
                                     host.autoMode = true;
                                     host.cluster.clusterUuid = "c-1";
                                     host.faultDomain = "rack-7";
                                     host.networks = {{"otx1", "224.1.2.3", "FF19::1"}};
                                   }));
  EXPECT_EQ(state.disks.size(), 5U);
  ASSERT_EQ(state.groups.size(), 2U);
  EXPECT_TRUE(state.groups[0].mounted);
  EXPECT_EQ(state.groups[1].disks.ssd.deviceName, "naa.4");
  EXPECT_FALSE(state.groups[1].mounted);
  EXPECT_TRUE(state.autoMode);
  EXPECT_EQ(state.cluster.clusterUuid, "c-1");
  EXPECT_EQ(state.faultDomain, "rack-7");
  ASSERT_EQ(state.nics.size(), 1U);
  EXPECT_EQ(state.nics[0].interface, "otx1");
  EXPECT_EQ(state.nics[0].masterGroup, "224.1.2.3");
  EXPECT_EQ(state.nics[0].agentGroup, "FF19::1");
  EXPECT_EQ(state.inventory.Get(), _inventory.Get());
}

TEST_F(HostStateTest, IsReadByQueriesAlone) {
  Read(AHost().WithSsd("naa.1").WithHdd("naa.2").WithGroup("naa.1", {"naa.2"}));
  std::set<std::string> asked;
  for (const OtxCtl::Fault::RecordedCall& call : _recorder->Calls()) {
    asked.insert(call.operation);
  }
  EXPECT_EQ(asked, queries);
}

TEST_F(HostStateTest, IsNotReadByHalves) {
  for (const std::string& query : queries) {
    _recorder->ClearFaults();
    _recorder->Inject({.operation = query, .exception = "HostCtlException", .message = "asleep", .disk = ""});
    EXPECT_THROW(Read(AHost().WithSsd("naa.1")), HostCtl::Lib::HostCtlException) << query;
  }
}

}  // namespace
}  // namespace Host
