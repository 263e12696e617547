#include "otxctl/sim/SimHost.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <nlohmann/json.hpp>
#include <stdexcept>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/TaskScope.h"
#include "otxctl/provider/testing/Operations.h"
#include "otxctl/sim/HostBuilder.h"
#include "otxctl/sim/SimProvider.h"

namespace OtxCtl::Sim {
namespace {

using Fault::FaultRule;
using HostCtl::Kova::KovaInfo;
using HostCtl::Lib::HostCtlException;
using HostCtl::Lib::KovaExceptionHasPartition;
using nlohmann::json;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::Pair;
using testing::ThrowsMessage;

HostBuilder ThreeDisks() {
  return AHost().WithSsd("naa.1").WithHdds({"naa.2", "naa.3"});
}

HostBuilder WithFaults(const std::vector<FaultRule>& faults) {
  return ThreeDisks().Edit([&faults](HostDescription& host) { host.faults = faults; });
}

void Format(KovaInfo& provider, const std::vector<std::string>& capacity) {
  provider.FormatDiskMapping("naa.1", capacity, {"tag", 1, 0});
}

TEST(SimHost, RefusesADescriptionThatAFileCouldNotHold) {
  EXPECT_THROW(SimHost(AHost().WithSsd("naa.1").WithSsd("naa.1").Build()), HostDescriptionError);
  EXPECT_THROW(SimHost(AHost().WithSsd("naa\n1").Build()), HostDescriptionError);
}

TEST(SimHost, OutlivesItsProviders) {
  const auto host = std::make_shared<SimHost>(ThreeDisks().Build());
  {
    SimProvider provider(host);
    Format(provider, {"naa.2"});
  }
  EXPECT_EQ(host->Snapshot().groups.size(), 1U);
}

TEST(SimHost, ASnapshotIsACopy) {
  SimHost host(ThreeDisks().Build());
  HostDescription copy = host.Snapshot();
  copy.disks.clear();
  EXPECT_EQ(host.Snapshot().disks.size(), 3U);
}

TEST(SimHostChange, IsSeenByTheNextCall) {
  SimHost host(ThreeDisks().Build());
  host.Change(json{{"autoMode", true}}, json{{"name", "naa.2"}, {"absent", true}});
  EXPECT_TRUE(host.IsAutoModeEnabled());
  std::vector<HostCtl::Kova::DiskResult> records;
  host.QueryDisks({""}, records, false);
  EXPECT_EQ(records.size(), 1U);
}

TEST(SimHostChange, IsRefusedAsAWhole) {
  SimHost host(ThreeDisks().Build());
  EXPECT_THROW(host.Change(json{{"autoMode", true}}, json{{"name", "naa.9"}}), HostDescriptionError);
  EXPECT_THROW(host.Change([](HostDescription& changed) { changed.disks.push_back(changed.disks[0]); }),
               HostDescriptionError);
  EXPECT_EQ(host.Snapshot(), ThreeDisks().Build());
}

TEST(SimHostSaver, SeesEveryChangeAndNoQuery) {
  SimHost host(ThreeDisks().Build());
  std::vector<HostDescription> saved;
  host.SetSaver([&saved](const HostDescription& changed) { saved.push_back(changed); });
  std::vector<HostCtl::Kova::DiskResult> records;
  host.QueryDisks({}, records, false);
  host.RefreshKovaInfo();
  host.ClaimUnmountedDiskgroups();
  EXPECT_TRUE(saved.empty());
  Format(host, {"naa.2"});
  ASSERT_EQ(saved.size(), 1U);
  EXPECT_EQ(saved[0], host.Snapshot());
  host.Change(json{{"autoMode", true}}, nullptr);
  EXPECT_EQ(saved.size(), 2U);
}

TEST(SimHostSaver, AFailedSaveDropsTheChange) {
  SimHost host(ThreeDisks().Build());
  host.SetSaver([](const HostDescription&) { throw std::runtime_error("disk is full"); });
  EXPECT_THAT([&host] { Format(host, {"naa.2"}); },
              ThrowsMessage<HostCtlException>(HasSubstr("disk is full")));
  EXPECT_THROW(host.Change(json{{"autoMode", true}}, nullptr), std::runtime_error);
  EXPECT_EQ(host.Snapshot(), ThreeDisks().Build());
}

TEST(SimHostListener, IsToldAfterEachChangeWithoutALock) {
  SimHost host(ThreeDisks().Build());
  std::vector<std::size_t> groups;
  host.SetListener([&] { groups.push_back(host.Snapshot().groups.size()); });
  Format(host, {"naa.2"});
  EXPECT_ANY_THROW(Format(host, {"naa.2"}));
  host.RemoveDiskMapping("naa.1", "", {});
  EXPECT_THAT(groups, ElementsAre(1U, 0U));
}

TEST(SimHostFaults, ThrowBeforeAnyEffectOnTheGivenCallOnly) {
  SimHost host(
      WithFaults({{"FormatDiskMapping", 2, "KovaExceptionHasPartition", "text", "naa.x", 0}}).Build());
  Format(host, {"naa.2"});
  const HostDescription before = host.Snapshot();
  try {
    Format(host, {"naa.3"});
    FAIL();
  } catch (const KovaExceptionHasPartition& exception) {
    EXPECT_STREQ(exception.what(), "text");
    EXPECT_EQ(exception.GetDiskName(), "naa.x");
  }
  EXPECT_EQ(host.Snapshot(), before);
  EXPECT_NO_THROW(Format(host, {"naa.3"}));
}

TEST(SimHostFaults, AreCountedOverEveryProviderOfTheHost) {
  const auto host = std::make_shared<SimHost>(
      WithFaults({{"RefreshKovaInfo", 3, "HostCtlException", "third", "", 0}}).Build());
  SimProvider(host).RefreshKovaInfo();
  SimProvider(host).RefreshKovaInfo();
  EXPECT_THROW(SimProvider(host).RefreshKovaInfo(), HostCtlException);
}

TEST(SimHostFaults, ChangingThemDoesNotRestartTheCounts) {
  SimHost host(ThreeDisks().Build());
  host.RefreshKovaInfo();
  host.Change(
      json::parse(
          R"({"faults": [{"operation": "RefreshKovaInfo", "call": 2, "exception": "HostCtlException"}]})"),
      nullptr);
  EXPECT_THROW(host.RefreshKovaInfo(), HostCtlException);
  EXPECT_NO_THROW(host.RefreshKovaInfo());
}

TEST(SimHostFaults, ARefusedCallCountsToo) {
  SimHost host(WithFaults({{"RemoveDisk", 2, "std::runtime_error", "second", "", 0}}).Build());
  EXPECT_THROW(host.RemoveDisk("naa.9", "", {}), HostCtl::Lib::KovaStorageException);
  EXPECT_THROW(host.RemoveDisk("naa.9", "", {}), std::runtime_error);
}

TEST(SimHostFaults, CanBeGivenToEveryOperation) {
  for (const Provider::Operation& operation : Provider::AllOperations()) {
    const std::string name(operation.name);
    const auto host = std::make_shared<SimHost>(
        WithFaults({{name, 1, "KovaExceptionRescanError", "injected", "naa.x", 0}}).Build());
    SimProvider provider(host);
    EXPECT_THAT([&] { operation.call(provider); },
                ThrowsMessage<HostCtl::Lib::KovaExceptionRescanError>("injected"))
        << name;
    EXPECT_EQ(host->Snapshot().groups.size(), 0U) << name;
  }
}

TEST(SimHostFaults, AWaitHoldsNoLockAndComesBeforeAnyEffect) {
  SimHost host(WithFaults({{"FormatDiskMapping", 0, "", "", "", 1500}}).Build());
  std::vector<std::int64_t> waits;
  host.SetWaiter([&](std::chrono::milliseconds delay) {
    // Would never return if the waiting call held the lock.
    host.RefreshKovaInfo();
    EXPECT_TRUE(host.Snapshot().groups.empty());
    waits.push_back(delay.count());
  });
  Format(host, {"naa.2"});
  EXPECT_THAT(waits, ElementsAre(1500));
  EXPECT_EQ(host.Snapshot().groups.size(), 1U);
}

TEST(SimHostConfiguration, AnswersAddressesAsGiven) {
  SimHost host(
      AHost()
          .Edit([](HostDescription& description) {
            description.networks = {{"otx1", "224.1.2.3", "FF19:0:0:0:0:2:3:4"}, {"", "", "nonsense"}};
          })
          .Build());
  auto nics = host.GetKovaOtxNicConfigs();
  ASSERT_EQ(nics.size(), 2U);
  EXPECT_EQ(nics[0]->GetAgentMulticastGroup().ipv6.GetStringAddress(), "FF19:0:0:0:0:2:3:4");
  EXPECT_EQ(nics[0]->GetAgentMulticastGroup().ipv4.GetStringAddress(), "");
  EXPECT_FALSE(nics[1]->GetMasterMulticastGroup().isIpv6);
  EXPECT_EQ(nics[1]->GetAgentMulticastGroup().ipv4.GetStringAddress(), "nonsense");
  OtxCtl::Util::DeleteVector(nics);
}

TEST(SimHostConfiguration, RecordsOfInterfacesOutliveAChangeOfTheHost) {
  SimHost host(AHost()
                   .Edit([](HostDescription& description) {
                     description.networks = {{"otx1", "a", "b"}};
                   })
                   .Build());
  auto nics = host.GetKovaOtxNicConfigs();
  host.Change(json{{"networks", json::array()}}, nullptr);
  EXPECT_EQ(nics.at(0)->GetOtxnicName(), "otx1");
  OtxCtl::Util::DeleteVector(nics);
}

TEST(SimHostProgress, IsReportedToTheTaskOfTheThread) {
  SimHost host(ThreeDisks().Build());
  std::vector<std::pair<int, std::string>> steps;
  const TaskScope task("t1", [&](int percent, std::string_view step) { steps.emplace_back(percent, step); });
  host.FormatDiskMapping("naa.1", {"naa.2"}, {"tag", 2, 1});
  EXPECT_THAT(steps, ElementsAre(Pair(50, "formatting the disk group of naa.1"),
                                 Pair(100, "formatted the disk group of naa.1")));
}

TEST(SimHostProgress, SurvivesStrangeCounts) {
  SimHost host(ThreeDisks().Build());
  std::vector<int> percents;
  const TaskScope task("t1", [&](int percent, std::string_view) { percents.push_back(percent); });
  host.FormatDiskMapping("naa.1", {"naa.2"}, {"tag", 1, INT32_MAX});
  host.FormatDiskMapping("naa.1", {"naa.3"}, {"tag", -1, INT32_MIN});
  EXPECT_THAT(percents, ElementsAre(100, 100, 0, 0));
}

TEST(SimHost, ManyDisksAreFormattedInReasonableTime) {
  HostBuilder builder;
  constexpr int groupCount = 2000;
  for (int group = 0; group < groupCount; ++group) {
    builder.WithSsd("s" + std::to_string(group)).WithHdd("h" + std::to_string(group));
  }
  SimHost host(builder.Build());
  for (int group = 0; group < groupCount; ++group) {
    host.FormatDiskMapping("s" + std::to_string(group), {"h" + std::to_string(group)},
                           {"", groupCount, group});
  }
  EXPECT_EQ(host.Snapshot().groups.size(), std::size_t{groupCount});
}

}  // namespace
}  // namespace OtxCtl::Sim
