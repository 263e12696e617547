#include "kovactl/change/ChangeCommand.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>

#include "kovactl/testing/FakeHost.h"
#include "kovactl/testing/Objects.h"
#include "nox/Faults.h"
#include "orbis/Engine.h"
#include "orbis/Json.h"
#include "otxctl/sim/HostBuilder.h"

namespace Kovactl {
namespace {

using Testing::AGroup;
using Testing::AGroupResult;
using testing::AllOf;
using Testing::AVerdict;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using Testing::MakeRef;
using testing::Not;
using GroupResultList = Orbis::DataArray<Testing::DiskMapResult>;

class ChangeCommand : public testing::Test {
 protected:
  ExitStatus Run(const ChangeRef& change, const Consent& consent = Consent::Given()) {
    _out.str("");
    _err.str("");
    return RunChange(_host, *change, consent, _options, _out, _err);
  }
  // With somebody at the terminal who answers that.
  ExitStatus RunAsking(const ChangeRef& change, const std::string& reply) {
    std::istringstream in(reply);
    return Run(change, Consent::AskedFor(in, _err));
  }
  std::string NotAllowed(const ChangeRef& change) {
    try {
      Run(change, Consent::OfNobody());
      return "it was";
    } catch (const BadInput& refused) {
      return refused.what();
    }
  }

  Testing::FakeHost _host;
  ChangeOptions _options;
  std::ostringstream _out;
  std::ostringstream _err;
};

TEST_F(ChangeCommand, AddsDisksByTheirNames) {
  _host.changeAnswer = Testing::WithList<Testing::DiskMapResult>({AGroupResult("naa.1", {"naa.2"})});
  EXPECT_EQ(Run(AddTheseDisks({"naa.1", "naa.2"})), ExitStatus::Done);
  EXPECT_THAT(_host.changes, ElementsAre("AddDisks naa.1? naa.2?"));
  EXPECT_THAT(_out.str(), HasSubstr("1 disk group: 1 added\n"));
  EXPECT_EQ(_err.str(), "");
}

TEST_F(ChangeCommand, MakesExactlyTheGroupItIsTold) {
  _host.changeAnswer = Testing::WithList<Testing::DiskMapResult>({AGroupResult("naa.1", {"naa.2", "naa.3"})});
  EXPECT_EQ(Run(MakeGroup("naa.1", {"naa.2", "naa.3"})), ExitStatus::Done);
  EXPECT_THAT(_host.changes, ElementsAre("InitializeDisks naa.1? < naa.2? naa.3? >"));
  EXPECT_THAT(_out.str(), HasSubstr("1 disk group: 1 made\n"));
}

TEST_F(ChangeCommand, RemovesADiskWithWhatTheKernelIsToBeGiven) {
  _host.answer = Testing::WithGroups({AGroup("naa.1", {"naa.2"})});
  EXPECT_EQ(Run(RemoveOneDisk("naa.2", {"p", "o", 1, -2})), ExitStatus::Done);
  EXPECT_THAT(_host.changes, ElementsAre("RemoveDisk naa.2 p o 1 -2"));
  EXPECT_EQ(_out.str(), "Removed naa.2.\n");
}

TEST_F(ChangeCommand, RemovesAGroupAsTheHostHasIt) {
  _host.answer = Testing::WithGroups({AGroup("naa.1", {"naa.2"}), AGroup("naa.3", {"naa.4", "naa.5"})});
  EXPECT_EQ(Run(RemoveGroup("naa.3", {})), ExitStatus::Done);
  EXPECT_THAT(_host.changes, ElementsAre("RemoveDiskMapping naa.3! < naa.4 naa.5 >   0 0"));
  EXPECT_EQ(_out.str(), "Removed the disk group of naa.3.\n");
}

TEST_F(ChangeCommand, UnmountsGroupsInTheOrderTheyAreNamed) {
  _host.answer = Testing::WithGroups({AGroup("naa.1", {"naa.2"}), AGroup("naa.3", {"naa.4"})});
  _host.changeAnswer = Testing::WithList<Testing::DiskMapResult>(
      {AGroupResult("naa.3", {"naa.4"}), AGroupResult("naa.1", {"naa.2"})});
  EXPECT_EQ(Run(UnmountGroups({"naa.3", "naa.1"}), Consent::OfNobody()), ExitStatus::Done)
      << "unmounting erases nothing, so nobody is asked";
  EXPECT_THAT(_host.changes, ElementsAre("UnmountDiskMapping naa.3! < naa.4 > naa.1! < naa.2 >"));
  EXPECT_THAT(_out.str(), HasSubstr("2 disk groups: 2 unmounted\n"));
}

TEST_F(ChangeCommand, ChangesNothingWhenAGroupIsUnknown) {
  _host.answer = Testing::WithGroups({AGroup("naa.1", {"naa.2"})});
  EXPECT_THROW(Run(UnmountGroups({"naa.1", "naa.2"})), BadInput);
  EXPECT_THROW(Run(RemoveGroup("naa.2", {})), BadInput);
  EXPECT_THAT(_host.changes, IsEmpty());
}

TEST_F(ChangeCommand, ChangesNothingWhenTheHostCannotBeLookedAt) {
  _host.answer = Host::FailedWith("asleep");
  for (const ChangeRef& change : {AddEveryEligibleDisk(), UnmountGroups({"naa.1"})}) {
    EXPECT_EQ(Run(change), ExitStatus::Fault);
    EXPECT_THAT(_err.str(), HasSubstr("asleep"));
  }
  EXPECT_EQ(Run(RemoveGroup("naa.1", {})), ExitStatus::Fault);
  EXPECT_EQ(Run(RemoveOneDisk("naa.1", {})), ExitStatus::Fault);
  EXPECT_THAT(_host.changes, IsEmpty());
}

TEST_F(ChangeCommand, DestroysNothingWithoutConsent) {
  _host.answer = Testing::WithGroups({AGroup("naa.1", {"naa.2"})});
  EXPECT_THAT(NotAllowed(AddTheseDisks({"naa.1"})), HasSubstr("--yes"));
  EXPECT_THAT(NotAllowed(AddEveryEligibleDisk()), HasSubstr("--yes"));
  EXPECT_THAT(NotAllowed(MakeGroup("naa.1", {"naa.2"})), HasSubstr("--yes"));
  EXPECT_THAT(NotAllowed(RemoveOneDisk("naa.1", {})), HasSubstr("--yes"));
  EXPECT_THAT(NotAllowed(RemoveGroup("naa.1", {})), HasSubstr("--yes"));
  EXPECT_EQ(RunAsking(RemoveGroup("naa.1", {}), "n\n"), ExitStatus::BadInput);
  EXPECT_THAT(_err.str(), HasSubstr("Nothing was changed.\n"));
  EXPECT_THAT(_host.changes, IsEmpty());
}

TEST_F(ChangeCommand, AsksAboutEveryDiskThatMayLoseItsData) {
  _host.answer = Testing::WithGroups({AGroup("naa.1", {"naa.2", "naa.3"})});
  const auto disksAskedAbout = [&](const ChangeRef& change) {
    RunAsking(change, "no\n");
    std::string question = _err.str();
    question.erase(question.find("Go on?"));
    return question.substr(question.find('\n') + 1);
  };
  EXPECT_EQ(disksAskedAbout(AddTheseDisks({"naa.8", "naa.9"})), "  naa.8\n  naa.9\n");
  EXPECT_EQ(disksAskedAbout(MakeGroup("naa.8", {"naa.9"})), "  naa.8\n  naa.9\n");
  EXPECT_EQ(disksAskedAbout(RemoveOneDisk("naa.2", {})), "  naa.2\n");
  EXPECT_EQ(disksAskedAbout(RemoveOneDisk("naa.1", {})), "  naa.1\n  naa.2\n  naa.3\n");
  EXPECT_EQ(disksAskedAbout(RemoveGroup("naa.1", {})), "  naa.1\n  naa.2\n  naa.3\n");
  _host.answer = Testing::WithList<Testing::DiskResult>(
      {AVerdict("naa.4", "eligible"), AVerdict("naa.5", "inUse"), AVerdict("naa.6", "ineligible")});
  EXPECT_EQ(disksAskedAbout(AddEveryEligibleDisk()), "  naa.4\n");
}

TEST_F(ChangeCommand, GoesOnWhenSomebodyAgrees) {
  EXPECT_EQ(RunAsking(AddTheseDisks({"naa.1"}), "yes\n"), ExitStatus::Done);
  EXPECT_THAT(_host.changes, ElementsAre("AddDisks naa.1?"));
}

TEST_F(ChangeCommand, PrintsAPartialSuccessAndItsFault) {
  const auto fault = MakeRef<Nox::Fault::DiskIsUSB>("naa.4");
  _host.changeAnswer = Testing::WithList<Testing::DiskMapResult>(
      {AGroupResult("naa.1", {"naa.2"}), AGroupResult("naa.3", {"naa.4"}, {}, fault)}, fault);
  EXPECT_EQ(Run(AddTheseDisks({"naa.1"})), ExitStatus::Fault);
  EXPECT_THAT(_out.str(), HasSubstr("2 disk groups: 1 added, 1 failed\n"));
  EXPECT_THAT(_err.str(), HasSubstr("disk group of naa.3: attached by USB: naa.4\n"));
}

TEST_F(ChangeCommand, PrintsAFaultAlone) {
  _host.changeAnswer = Host::FailedWith("out of order");
  _host.answer = Testing::WithGroups({});
  EXPECT_EQ(Run(RemoveOneDisk("naa.2", {})), ExitStatus::Fault);
  EXPECT_EQ(_out.str(), "");
  EXPECT_THAT(_err.str(), HasSubstr("out of order"));
}

TEST_F(ChangeCommand, SaysWhyNothingWasAdded) {
  _host.answer = Testing::WithList<Testing::DiskResult>({AVerdict("naa.1", "eligible")});
  _host.descriptions = {OtxCtl::Sim::WriteHostDescription(OtxCtl::Sim::AHost().WithHdd("naa.1").Build())};
  EXPECT_EQ(Run(AddEveryEligibleDisk()), ExitStatus::Done);
  EXPECT_THAT(_host.changes, ElementsAre("AddAllEligibleDisks"));
  EXPECT_THAT(_out.str(), HasSubstr("Nothing was added: no disk group can be made of the eligible disks.\n"));
  EXPECT_THAT(_out.str(), AllOf(HasSubstr("        1  no flash disk is free to be its cache"),
                                HasSubstr("\n\n`kovactl plan add` with --all-disks names them.\n")));
}

TEST_F(ChangeCommand, SaysThatNothingWasAddedAlsoOnAHostThatCannotSayWhy) {
  _host.answer = Testing::WithList<Testing::DiskResult>({AVerdict("naa.1", "ineligible")});
  EXPECT_EQ(Run(AddEveryEligibleDisk()), ExitStatus::Done);
  EXPECT_EQ(_out.str(), "Nothing was added: no disk is eligible.\n");
}

TEST_F(ChangeCommand, PrintsTheResultsForScripts) {
  const auto answer = Testing::WithList<Testing::DiskMapResult>({AGroupResult("naa.1", {"naa.2"})});
  _host.changeAnswer = answer;
  _options.output = "json";
  EXPECT_EQ(Run(AddTheseDisks({"naa.1"})), ExitStatus::Done);
  const auto back = Orbis::ReadJson(_out.str(), Orbis::Limits::OwnOutput(), &GroupResultList::StaticType());
  EXPECT_TRUE(Orbis::Equal(back.Get(), answer.result.Get()));
}

TEST_F(ChangeCommand, PrintsAnEmptyListForScriptsWhereThereWasNothingToDo) {
  _host.answer = Testing::WithList<Testing::DiskResult>({});
  _options.output = "json";
  EXPECT_EQ(Run(AddEveryEligibleDisk()), ExitStatus::Done);
  EXPECT_EQ(_out.str(), "[]\n");
}

TEST_F(ChangeCommand, PrintsNothingForScriptsWhereAChangeHasNoResult) {
  _host.answer = Testing::WithGroups({AGroup("naa.1", {"naa.2"})});
  _options.output = "json";
  EXPECT_EQ(Run(RemoveOneDisk("naa.2", {})), ExitStatus::Done);
  EXPECT_EQ(_out.str(), "");
}

TEST_F(ChangeCommand, SaysThatAChangeIsForgotten) {
  _options.forgotten = true;
  _host.answer = Testing::WithGroups({AGroup("naa.1", {"naa.2"})});
  Run(RemoveOneDisk("naa.2", {}));
  EXPECT_THAT(_err.str(), HasSubstr("--save"));
  _host.changeAnswer = Host::FailedWith("out of order");
  Run(RemoveOneDisk("naa.2", {}));
  EXPECT_THAT(_err.str(), Not(HasSubstr("--save"))) << "there is nothing to forget";
}

TEST_F(ChangeCommand, SaysThatADryRunChangesNothing) {
  _options.dryRun = true;
  _host.answer = Testing::WithGroups({AGroup("naa.1", {"naa.2"})});
  Run(RemoveOneDisk("naa.2", {}));
  EXPECT_THAT(_err.str(), HasSubstr("(dry run: nothing was changed)"));
}

TEST_F(ChangeCommand, LetsNoNamePlayWithTheTerminal) {
  _host.answer = Testing::WithGroups({});
  Run(RemoveOneDisk("naa.\x1b[2J", {}));
  EXPECT_EQ(_out.str(), "Removed naa.\\x1b[2J.\n");
}

}  // namespace
}  // namespace Kovactl
