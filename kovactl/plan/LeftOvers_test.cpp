#include "kovactl/plan/LeftOvers.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>

#include "kovactl/testing/FakeHost.h"
#include "kovactl/testing/Objects.h"
#include "nox/Faults.h"
#include "otxctl/sim/HostBuilder.h"

namespace Kovactl {
namespace {

using OtxCtl::Sim::AHost;
using Testing::AVerdict;
using testing::ElementsAre;
using testing::IsEmpty;

class LeftOvers : public testing::Test {
 protected:
  void HostSays(const std::vector<Testing::Ref<Testing::DiskResult>>& verdicts) {
    _host.answer = Testing::WithList(verdicts);
  }
  // Each in a line: "naa.1 groupsFull".
  std::vector<std::string> Find(const OtxCtl::Sim::HostBuilder& before,
                                const std::vector<std::string>& offered = {},
                                const std::set<std::string>& placed = {}) {
    _found = FindLeftOvers(_host, before.Build(), offered, placed);
    std::vector<std::string> lines;
    for (const LeftOverDisk& disk : _found) {
      lines.push_back(disk.disk + " " + disk.reason);
    }
    return lines;
  }

  Testing::FakeHost _host;
  std::vector<LeftOverDisk> _found;
};

TEST_F(LeftOvers, AreNotDisksThatFoundAPlace) {
  HostSays({AVerdict("ssd1", "eligible"), AVerdict("hdd1", "eligible")});
  EXPECT_THAT(Find(AHost().WithSsd("ssd1").WithHdd("hdd1"), {}, {"ssd1", "hdd1"}), IsEmpty());
}

TEST_F(LeftOvers, HaveTheReasonOfTheKernelWhenTheyAreNotEligible) {
  HostSays({AVerdict("hdd1", "ineligible", Tessa::MakeRef<Nox::Fault::DiskIsUSB>("hdd1"))});
  EXPECT_THAT(Find(AHost().WithDisk("hdd1", false, [](auto& disk) { disk.transport = "usb"; })),
              ElementsAre("hdd1 notEligible"));
  EXPECT_EQ(_found.front().text, "attached by USB");
}

TEST_F(LeftOvers, HaveTheReasonOfPlanningWhenTheyAreEligible) {
  HostSays({AVerdict("ssd1", "eligible"), AVerdict("hdd1", "eligible")});
  EXPECT_THAT(Find(AHost().WithHdd("hdd1")), ElementsAre("ssd1 notEligible", "hdd1 noCacheDisk"))
      << "a disk that the host did not have before has no reason of planning";
  EXPECT_THAT(Find(AHost().WithSsd("ssd1")), testing::Contains("ssd1 noCapacityDisk"));
}

TEST_F(LeftOvers, KnowTheGroupsOfTheHost) {
  auto full = AHost().WithSsd("ssd1");
  for (int i = 0; i < 8; ++i) {
    full.WithHdd("hdd" + std::to_string(i));
  }
  full.WithGroup("ssd1", {"hdd0", "hdd1", "hdd2", "hdd3", "hdd4", "hdd5", "hdd6"});
  HostSays({AVerdict("ssd1", "inUse"), AVerdict("hdd7", "eligible")});
  EXPECT_THAT(Find(full), ElementsAre("hdd7 groupsFull"));
}

TEST_F(LeftOvers, KnowThatAGroupWhoseCacheDiskIsNotListedCannotGrow) {
  auto host = AHost().WithDisk("ssd1", true, [](auto& disk) { disk.inInventory = false; });
  host.WithHdds({"hdd1", "hdd2"}).WithGroup("ssd1", {"hdd1"});
  HostSays({AVerdict("hdd2", "eligible")});
  EXPECT_THAT(Find(host), ElementsAre("hdd2 noCacheDisk"));
}

TEST_F(LeftOvers, OfEveryDiskAreNotThoseInUse) {
  HostSays({AVerdict("ssd1", "inUse"), AVerdict("hdd1", "inUse")});
  const auto host = AHost().WithSsd("ssd1").WithHdd("hdd1").WithGroup("ssd1", {"hdd1"});
  EXPECT_THAT(Find(host), IsEmpty());
  EXPECT_THAT(Find(host, {"hdd1"}), testing::Contains("hdd1 notEligible")) << "but it was asked for by name";
  EXPECT_EQ(_found.back().text, "in use already");
}

TEST_F(LeftOvers, OfARequestThatFailedAsAWholeSaySo) {
  HostSays({AVerdict("ssd1", "eligible"), AVerdict("hdd1", "eligible")});
  EXPECT_THAT(Find(AHost().WithSsd("ssd1").WithHdd("hdd1"), {"ssd1", "hdd1"}),
              ElementsAre("ssd1 requestFailed", "hdd1 requestFailed"));
}

TEST_F(LeftOvers, OfARequestThatRepeatsADiskWouldHaveBeenUsedWithoutThat) {
  HostSays({AVerdict("ssd1", "eligible"), AVerdict("hdd1", "eligible")});
  EXPECT_THAT(Find(AHost().WithSsd("ssd1").WithHdd("hdd1"), {"ssd1", "ssd1", "hdd1"}),
              ElementsAre("ssd1 requestFailed", "hdd1 requestFailed"));
}

TEST_F(LeftOvers, KnowThatANamedCacheDiskBringsBackItsGroup) {
  const auto host = AHost().WithSsd("ssd1").WithHdd("hdd1").WithUnmountedGroup("ssd1", {"hdd1"});
  HostSays({AVerdict("ssd1", "ineligible"), AVerdict("hdd1", "ineligible")});
  EXPECT_THAT(Find(host, {"ssd1", "hdd1"}), ElementsAre("ssd1 requestFailed", "hdd1 requestFailed"));
  EXPECT_THAT(Find(host, {"hdd1"}), testing::Contains("hdd1 notEligible")) << "its cache disk is not named";
  EXPECT_THAT(Find(host), testing::Contains("ssd1 notEligible")) << "that is for named disks only";
}

TEST_F(LeftOvers, MindAReasonBesideTheStateOnlyWhenNobodyNamedTheDisk) {
  const auto host = AHost().WithSsd("ssd1").WithDisk("hdd1", false, [](auto& disk) {
    disk.verdict = OtxCtl::Sim::HostVerdict{1, 3};
  });
  HostSays({AVerdict("ssd1", "eligible"),
            AVerdict("hdd1", "eligible", Tessa::MakeRef<Nox::Fault::DiskIsUSB>("hdd1"))});
  EXPECT_THAT(Find(host), ElementsAre("ssd1 noCapacityDisk", "hdd1 notEligible"));
  EXPECT_EQ(_found.back().text, "attached by USB");
  EXPECT_THAT(Find(host, {"ssd1", "hdd1"}), ElementsAre("ssd1 requestFailed", "hdd1 requestFailed"));
}

TEST_F(LeftOvers, CannotBeToldByAHostThatFails) {
  _host.answer = Host::FailedWith("asleep");
  EXPECT_THAT(Find(AHost().WithHdd("hdd1")), IsEmpty());
}

TEST_F(LeftOvers, AreExplainedOnlyOfAHostThatCanBeLookedAt) {
  HostSays({AVerdict("hdd1", "eligible")});
  EXPECT_THAT(ExplainLeftOvers(_host, {}), IsEmpty());
  _host.descriptions = {OtxCtl::Sim::WriteHostDescription(AHost().WithHdd("hdd1").Build())};
  EXPECT_EQ(ExplainLeftOvers(_host, {}).size(), 1u);
}

TEST_F(LeftOvers, ArePrintedWithTheirReasons) {
  std::ostringstream out;
  PrintLeftOverNames({{"naa.1", "noCacheDisk", "no flash disk"}}, out);
  EXPECT_EQ(out.str(), "DISK LEFT OVER  WHY\nnaa.1           no flash disk\n");
  out.str("");
  PrintLeftOverNames({}, out);
  EXPECT_EQ(out.str(), "");
}

TEST_F(LeftOvers, AreCountedByReasonTheMostFrequentFirst) {
  std::ostringstream out;
  PrintLeftOverCounts({{"naa.1", "notEligible", "too small"},
                       {"naa.2", "notEligible", "attached by USB"},
                       {"naa.3", "noCacheDisk", "no flash disk"},
                       {"naa.4", "notEligible", "attached by USB"}},
                      out);
  EXPECT_EQ(out.str(),
            "LEFT OVER  WHY\n"
            "        2  attached by USB\n"
            "        1  too small\n"
            "        1  no flash disk\n");
  out.str("");
  PrintLeftOverCounts({}, out);
  EXPECT_EQ(out.str(), "");
}

}  // namespace
}  // namespace Kovactl
