#include "kovactl/plan/PlanCommand.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <sstream>

#include "kovactl/testing/FakeHost.h"
#include "kovactl/testing/Objects.h"
#include "nox/Faults.h"
#include "otxctl/sim/HostBuilder.h"

namespace Kovactl {
namespace {

using OtxCtl::Sim::AHost;
using Testing::AGroupResult;
using Testing::AVerdict;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class PlanCommand : public testing::Test {
 protected:
  // The copy is first like this, then like that.
  void CopyGoes(const OtxCtl::Sim::HostBuilder& before, const OtxCtl::Sim::HostBuilder& after) {
    _copy.descriptions = {OtxCtl::Sim::WriteHostDescription(before.Build()),
                          OtxCtl::Sim::WriteHostDescription(after.Build())};
  }
  ExitStatus Run(const ChangeRef& change, PlanOptions options = {}) {
    options.generation = "0123456789abcdef";
    return RunPlan(_copy, *change, options, _out, _err);
  }
  static PlanOptions Json() { return {.generation = "", .output = "json"}; }
  static OtxCtl::Sim::HostBuilder Disks() { return AHost().WithSsd("ssd1").WithHdds({"hdd1", "hdd2"}); }

  Testing::FakeHost _copy;
  std::ostringstream _out;
  std::ostringstream _err;
};

TEST_F(PlanCommand, ShowsTheGroupsAndWhatIsLeftOver) {
  const auto withStick = [] {
    return Disks().WithDisk("hdd3", false, [](auto& disk) { disk.transport = "usb"; });
  };
  CopyGoes(withStick(), withStick().WithGroup("ssd1", {"hdd1", "hdd2"}));
  _copy.answer = Testing::WithList<Testing::DiskResult>(
      {AVerdict("ssd1", "inUse"), AVerdict("hdd1", "inUse"), AVerdict("hdd2", "inUse"),
       AVerdict("hdd3", "ineligible", Tessa::MakeRef<Nox::Fault::DiskIsUSB>("hdd3"))});
  EXPECT_EQ(Run(AddEveryEligibleDisk()), ExitStatus::Done);
  EXPECT_THAT(_copy.changes, ElementsAre("AddAllEligibleDisks"));
  EXPECT_EQ(_out.str(),
            "CHANGE  GROUP   ROLE      DISK\n"
            "made    hybrid  cache     ssd1\n"
            "                capacity  hdd1\n"
            "                capacity  hdd2\n"
            "\n"
            "LEFT OVER  WHY\n"
            "        1  attached by USB\n"
            "\n"
            "1 disk is left over; --all-disks names it.\n"
            "This is a plan: nothing was changed.\n"
            "Planned on generation 0123456789abcdef.\n");
  EXPECT_EQ(_err.str(), "");
}

TEST_F(PlanCommand, NamesTheDisksLeftOverWhenItIsToldTo) {
  CopyGoes(Disks(), Disks());
  _copy.answer = Testing::WithList<Testing::DiskResult>(
      {AVerdict("hdd3", "ineligible", Tessa::MakeRef<Nox::Fault::DiskIsUSB>("hdd3")),
       AVerdict("hdd4", "ineligible", Tessa::MakeRef<Nox::Fault::DiskIsUSB>("hdd4"))});
  EXPECT_EQ(Run(AddEveryEligibleDisk()), ExitStatus::Done);
  EXPECT_EQ(_out.str(),
            "LEFT OVER  WHY\n"
            "        2  attached by USB\n"
            "\n"
            "2 disks are left over; --all-disks names them.\n"
            "Nothing would change.\n"
            "Planned on generation 0123456789abcdef.\n");
  _out.str("");
  EXPECT_EQ(Run(AddEveryEligibleDisk(), {.generation = "", .allDisks = true}), ExitStatus::Done);
  EXPECT_EQ(_out.str(),
            "LEFT OVER  WHY\n"
            "        2  attached by USB\n"
            "\n"
            "DISK LEFT OVER  WHY\n"
            "hdd3            attached by USB\n"
            "hdd4            attached by USB\n"
            "\n"
            "Nothing would change.\n"
            "Planned on generation 0123456789abcdef.\n");
}

TEST_F(PlanCommand, ShowsNoDisksLeftOverOfAChangeThatOffersNone) {
  CopyGoes(Disks().WithGroup("ssd1", {"hdd1"}), Disks());
  _copy.answer = Testing::WithGroups({Testing::AGroup("ssd1", {"hdd1"})});
  EXPECT_EQ(Run(RemoveGroup("ssd1", {})), ExitStatus::Done);
  EXPECT_THAT(_out.str(), HasSubstr("removed  hybrid  cache     ssd1\n"));
  EXPECT_THAT(_out.str(), testing::Not(HasSubstr("LEFT OVER")));
}

TEST_F(PlanCommand, SaysThatNothingWouldChange) {
  CopyGoes(Disks(), Disks());
  _copy.answer = Testing::WithGroups({});
  EXPECT_EQ(Run(ClaimGroups()), ExitStatus::Done);
  EXPECT_EQ(_out.str(), "Nothing would change.\nPlanned on generation 0123456789abcdef.\n");
}

TEST_F(PlanCommand, PrintsForScripts) {
  CopyGoes(Disks(), Disks().WithGroup("ssd1", {"hdd1"}));
  const auto fault = Tessa::MakeRef<Nox::Fault::DiskIsUSB>("hdd2");
  _copy.changeAnswer = Testing::WithList<Testing::DiskMapResult>(
      {AGroupResult("ssd1", {"hdd1"}), AGroupResult("ssd2", {"hdd2"}, {}, fault)}, fault);
  _copy.answer = Testing::WithList<Testing::DiskResult>(
      {AVerdict("hdd3", "ineligible", Tessa::MakeRef<Nox::Fault::DiskTooSmall>("hdd3"))});
  EXPECT_EQ(Run(AddTheseDisks({"ssd1", "hdd1", "hdd2", "hdd3"}), Json()), ExitStatus::Fault);
  EXPECT_EQ(nlohmann::json::parse(_out.str()), nlohmann::json::parse(R"({
    "generation": "0123456789abcdef",
    "groups": [{"change": "made", "ssd": "ssd1", "capacity": ["hdd1"], "allFlash": false},
               {"change": "failed", "ssd": "ssd2", "capacity": ["hdd2"],
                "fault": {"@type": "DiskIsUSB", "device": "hdd2"}}],
    "leftOver": [{"disk": "hdd3", "reason": "notEligible", "text": "too small"}],
    "fault": {"@type": "DiskIsUSB", "device": "hdd2"}})"));
}

TEST_F(PlanCommand, PrintsNothingThatIsThereForScripts) {
  CopyGoes(Disks(), Disks());
  _copy.answer = Testing::WithGroups({});
  EXPECT_EQ(Run(ClaimGroups(), Json()), ExitStatus::Done);
  EXPECT_EQ(nlohmann::json::parse(_out.str()),
            nlohmann::json::parse(R"({"generation": "0123456789abcdef", "groups": [], "leftOver": [],
                                      "fault": null})"));
}

TEST_F(PlanCommand, ExplainsTheFaultThatWouldCome) {
  CopyGoes(Disks(), Disks());
  _copy.answer = Testing::WithGroups({});
  _copy.changeAnswer.fault = Tessa::MakeRef<Nox::Fault::DiskIsLastRemainingNonSSD>("hdd1");
  EXPECT_EQ(Run(RemoveOneDisk("hdd1", {})), ExitStatus::Fault);
  EXPECT_EQ(_out.str(), "Nothing would change.\nPlanned on generation 0123456789abcdef.\n");
  EXPECT_THAT(_err.str(), HasSubstr("last capacity disk of its group: hdd1"));
}

TEST_F(PlanCommand, ChangesNothingWhenTheHostCannotBeLookedAt) {
  _copy.answer = Host::FailedWith("asleep");
  EXPECT_EQ(Run(UnmountGroups({"ssd1"})), ExitStatus::Fault);
  EXPECT_THAT(_copy.changes, IsEmpty());
  EXPECT_THAT(_err.str(), HasSubstr("asleep"));
}

}  // namespace
}  // namespace Kovactl
