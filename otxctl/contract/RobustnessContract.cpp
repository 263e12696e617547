#include <atomic>
#include <set>
#include <thread>

#include "otxctl/contract/ProviderContract.h"

namespace OtxCtl::Contract {
namespace {

using HostCtl::Kova::DiskState;
using HostCtl::Kova::KovaInfo;
using HostCtl::Lib::HostCtlException;
using Sim::AHost;
using Sim::HostBuilder;

// Names as a careless or hostile client might send them.
std::vector<std::string> StrangeNames() {
  return {"",
          " ",
          std::string(64 * 1024, 'x'),
          "naa.\"1\"",
          "naa.1\n",
          std::string("naa.1\0", 6),
          "--help",
          "$(reboot)",
          "../../dev/sda",
          "kova:",
          "kova:00000000-0000-0000-0000-000000000000",
          "\xFF\xFE",
          "naa.1 "};
}

TEST_P(ProviderContract, StrangeNamesAreRefusedByTheOneFamilyOfExceptions) {
  Start(AHost().WithSsd("naa.1").WithHdds({"naa.2", "naa.3"}));
  Format("naa.1", {"naa.2"});
  const HostState before = State();
  for (const std::string& name : StrangeNames()) {
    SCOPED_TRACE(testing::PrintToString(name.substr(0, 40)));
    EXPECT_THROW(Provider().FormatDiskMapping(name, {"naa.3"}, {"", 0, 0}), HostCtlException);
    EXPECT_THROW(Provider().FormatDiskMapping("naa.1", {name}, {"", -1, 5}), HostCtlException);
    EXPECT_THROW(Provider().RestampDiskMapping(name, {name}), HostCtlException);
    EXPECT_THROW(Provider().RestampDiskMappingByUuid(name), HostCtlException);
    EXPECT_THROW(Provider().MountDiskMapping(name, true), HostCtlException);
    EXPECT_THROW(Provider().UnmountDiskMapping(name), HostCtlException);
    EXPECT_THROW(Provider().RemoveDisk(name, name, {name, -1, -1}), HostCtlException);
    EXPECT_THROW(Provider().RemoveDiskMapping(name, name, {name, -1, -1}), HostCtlException);
    EXPECT_THROW(Provider().RemoveDiskByUuid(name, name), HostCtlException);
    EXPECT_TRUE(Query({name}).empty());
  }
  EXPECT_TRUE(State() == before);
}

// Four makers, each with cache and capacity disks of its own.
constexpr int makerCount = 4;

std::string SsdOf(int maker) {
  return "naa.ssd" + std::to_string(maker);
}
std::string HddOf(int maker, int number) {
  return "naa.hdd" + std::to_string(maker) + "." + std::to_string(number);
}

void MakeAndBreak(KovaInfo& provider, int maker) {
  for (int round = 0; round < 25; ++round) {
    provider.FormatDiskMapping(SsdOf(maker), {HddOf(maker, 0)}, {"", 1, 0});
    provider.FormatDiskMapping(SsdOf(maker), {HddOf(maker, 1)}, {"", 1, 0});
    provider.UnmountDiskMapping(SsdOf(maker));
    provider.MountDiskMapping(SsdOf(maker), false);
    provider.RemoveDisk(HddOf(maker, 0), "", {});
    provider.RemoveDiskMapping(SsdOf(maker), "", {});
  }
}

bool NoDiskStandsInTwoGroups(KovaInfo& provider) {
  std::vector<HostCtl::Kova::DiskMapping> groups;
  provider.GetDiskMappings(groups, true);
  std::set<std::string> seen;
  for (const auto& group : groups) {
    for (const std::string& name : NamesOf(group)) {
      if (!seen.insert(name).second) {
        return false;
      }
    }
  }
  return true;
}

TEST_P(ProviderContract, ConcurrentCallsDoNotDisturbEachOther) {
  HostBuilder host = AHost();
  for (int maker = 0; maker < makerCount; ++maker) {
    host.WithSsd(SsdOf(maker)).WithHdds({HddOf(maker, 0), HddOf(maker, 1)});
  }
  Start(host);
  std::atomic<bool> isDone = false;
  std::atomic<int> strange = 0;
  std::thread reader([&] {
    const auto provider = AnotherProvider();
    while (!isDone) {
      std::vector<HostCtl::Kova::DiskResult> records;
      provider->QueryDisks({}, records, true);
      strange += records.size() == makerCount * 3 && NoDiskStandsInTwoGroups(*provider) ? 0 : 1;
      provider->RefreshKovaInfo();
    }
  });
  std::vector<std::thread> makers;
  for (int maker = 0; maker < makerCount; ++maker) {
    makers.emplace_back([&, maker] {
      try {
        MakeAndBreak(Provider(), maker);
      } catch (const std::exception&) {
        ++strange;
      }
    });
  }
  for (std::thread& maker : makers) {
    maker.join();
  }
  isDone = true;
  reader.join();
  EXPECT_EQ(strange, 0);
  EXPECT_TRUE(Groups().empty());
  for (const auto& record : Query()) {
    EXPECT_EQ(record.state, DiskState::Eligible) << record.name;
  }
}

TEST_P(ProviderContract, OfManyWhoWantTheSameDiskOneGetsIt) {
  constexpr int rivalCount = 4;
  HostBuilder host = AHost().WithHdd("naa.prize");
  for (int rival = 0; rival < rivalCount; ++rival) {
    host.WithSsd(SsdOf(rival));
  }
  Start(host);
  std::atomic<int> winners = 0;
  std::vector<std::thread> rivals;
  for (int rival = 0; rival < rivalCount; ++rival) {
    rivals.emplace_back([&, rival] {
      try {
        Provider().FormatDiskMapping(SsdOf(rival), {"naa.prize"}, {"", 1, 0});
        ++winners;
      } catch (const HostCtlException&) {
        // Somebody else was faster.
      }
    });
  }
  for (std::thread& rival : rivals) {
    rival.join();
  }
  EXPECT_EQ(winners, 1);
  EXPECT_EQ(Groups().size(), 1U);
}

}  // namespace

// A program that links the suite for its helpers alone is no mistake.
GTEST_ALLOW_UNINSTANTIATED_PARAMETERIZED_TEST(ProviderContract);

}  // namespace OtxCtl::Contract
