#include "kovactl/plan/Plan.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "kovactl/testing/Objects.h"
#include "nox/Faults.h"
#include "otxctl/sim/HostBuilder.h"

namespace Kovactl {
namespace {

using OtxCtl::Sim::AHost;
using OtxCtl::Sim::HostBuilder;
using testing::ElementsAre;
using testing::IsEmpty;

// Each group in a line: "made hybrid naa.1: naa.2 naa.3".
std::vector<std::string> Lines(const std::vector<PlannedGroup>& groups) {
  std::vector<std::string> lines;
  for (const PlannedGroup& group : groups) {
    std::string line = WordFor(group.fate) + (group.allFlash ? " all-flash " : " hybrid ") + group.ssd + ":";
    for (const std::string& disk : group.capacity) {
      line += " " + disk;
    }
    lines.push_back(line);
  }
  return lines;
}

// A host with three disks of each kind.
HostBuilder Disks() {
  return AHost().WithSsd("ssd1").WithSsd("ssd2").WithSsd("ssd3").WithHdds({"hdd1", "hdd2", "hdd3"});
}

std::vector<std::string> Compared(const HostBuilder& before, const HostBuilder& after) {
  return Lines(CompareGroups(before.Build(), after.Build()));
}

TEST(Plan, OfNoDifferenceIsEmpty) {
  EXPECT_THAT(Compared(Disks(), Disks()), IsEmpty());
  EXPECT_THAT(Compared(Disks().WithGroup("ssd1", {"hdd1"}), Disks().WithGroup("ssd1", {"hdd1"})), IsEmpty());
}

TEST(Plan, FindsGroupsThatAreMade) {
  EXPECT_THAT(Compared(Disks().WithGroup("ssd1", {"hdd1"}),
                       Disks()
                           .WithGroup("ssd1", {"hdd1"})
                           .WithGroup("ssd2", {"hdd3", "hdd2"}, [](auto& group) { group.allFlash = true; })),
              ElementsAre("made all-flash ssd2: hdd3 hdd2"));
}

TEST(Plan, FindsGroupsThatAreRemoved) {
  EXPECT_THAT(Compared(Disks().WithGroup("ssd1", {"hdd1", "hdd2"}), Disks()),
              ElementsAre("removed hybrid ssd1: hdd1 hdd2"));
}

TEST(Plan, ShowsOnlyTheDisksThatComeOrGo) {
  EXPECT_THAT(Compared(Disks().WithGroup("ssd1", {"hdd1"}), Disks().WithGroup("ssd1", {"hdd1", "hdd2"})),
              ElementsAre("extended hybrid ssd1: hdd2"));
  EXPECT_THAT(Compared(Disks().WithGroup("ssd1", {"hdd1", "hdd2"}), Disks().WithGroup("ssd1", {"hdd2"})),
              ElementsAre("reduced hybrid ssd1: hdd1"));
}

TEST(Plan, FindsGroupsThatAreMountedOrNoLonger) {
  const HostBuilder mounted = Disks().WithGroup("ssd1", {"hdd1"});
  const HostBuilder unmounted = Disks().WithUnmountedGroup("ssd1", {"hdd1"});
  EXPECT_THAT(Compared(mounted, unmounted), ElementsAre("unmounted hybrid ssd1: hdd1"));
  EXPECT_THAT(Compared(unmounted, mounted), ElementsAre("mounted hybrid ssd1: hdd1"));
}

TEST(Plan, FindsEveryDifference) {
  EXPECT_THAT(
      Compared(Disks().WithUnmountedGroup("ssd1", {"hdd1"}).WithGroup("ssd2", {"hdd2"}),
               Disks().WithGroup("ssd1", {"hdd3"}).WithGroup("ssd3", {"hdd2"})),
      ElementsAre("mounted hybrid ssd1: hdd3", "extended hybrid ssd1: hdd3", "reduced hybrid ssd1: hdd1",
                  "removed hybrid ssd2: hdd2", "made hybrid ssd3: hdd2"));
}

TEST(Plan, CallsDisksThatHaveLeftAsTheHostsAnswersDo) {
  const HostBuilder before = Disks().WithGroup("ssd1", {"hdd1", "hdd2"}).Without("ssd1").Without("hdd2");
  EXPECT_THAT(Compared(before, Disks().Without("ssd1").Without("hdd2")),
              ElementsAre("removed hybrid kova:uuid-of-ssd1: hdd1 kova:uuid-of-hdd2"));
}

TEST(Plan, NamesTheGroupsThatWouldFailAndWhy) {
  const auto fault = Tessa::MakeRef<Nox::Fault::DiskIsUSB>("hdd3");
  const auto answer = Testing::WithList<Testing::DiskMapResult>(
      {Testing::AGroupResult("ssd1", {"hdd1"}), Testing::AGroupResult("ssd2", {"hdd2", "hdd3"}, {}, fault)});
  const auto failed = FailedGroups(answer);
  EXPECT_THAT(Lines(failed), ElementsAre("failed hybrid ssd2: hdd2 hdd3"));
  EXPECT_EQ(failed.front().fault.Get(), fault.Get());
  EXPECT_THAT(FailedGroups({}), IsEmpty());
}

}  // namespace
}  // namespace Kovactl
