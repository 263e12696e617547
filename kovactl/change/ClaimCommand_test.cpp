// Claiming is told by how the groups are before and behind it.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>

#include "kovactl/change/ChangeCommand.h"
#include "kovactl/testing/FakeHost.h"
#include "kovactl/testing/Objects.h"

namespace Kovactl {
namespace {

using Testing::AGroup;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using Testing::WithGroups;

class ClaimCommand : public testing::Test {
 protected:
  ExitStatus Run() { return RunClaim(_host, _options, _out, _err); }

  Testing::FakeHost _host;
  ChangeOptions _options;
  std::ostringstream _out;
  std::ostringstream _err;
};

TEST_F(ClaimCommand, TellsWhichGroupsAreMountedNow) {
  _host.groups = {WithGroups({AGroup("naa.1", {"naa.2"}), AGroup("naa.3", {"naa.4"}, false)}),
                  WithGroups({AGroup("naa.1", {"naa.2"}), AGroup("naa.3", {"naa.4"})})};
  EXPECT_EQ(Run(), ExitStatus::Done);
  EXPECT_THAT(_host.changes, ElementsAre("ClaimUnmountedDiskgroup"));
  EXPECT_EQ(_out.str(), "OUTCOME  CACHE DISK\nmounted  naa.3\n");
  EXPECT_EQ(_err.str(), "");
}

TEST_F(ClaimCommand, FailsWhenAGroupIsStillNotMounted) {
  const auto groups = [](bool firstMounted) {
    return WithGroups({AGroup("naa.1", {"naa.2"}, firstMounted), AGroup("naa.3", {"naa.4"}, false)});
  };
  _host.groups = {groups(false), groups(true)};
  EXPECT_EQ(Run(), ExitStatus::Fault);
  EXPECT_EQ(_out.str(), "OUTCOME      CACHE DISK\nmounted      naa.1\nnot mounted  naa.3\n");
  EXPECT_THAT(_err.str(), HasSubstr("1 disk group is still not mounted\n  The host's log tells why.\n"));
}

TEST_F(ClaimCommand, SaysWhenThereWasNothingToMount) {
  _host.groups = {WithGroups({AGroup("naa.1", {"naa.2"})})};
  EXPECT_EQ(Run(), ExitStatus::Done);
  EXPECT_EQ(_out.str(), "Every disk group was mounted already.\n");
}

TEST_F(ClaimCommand, ClaimsNothingOnAHostThatCannotTellItsGroups) {
  _host.groups = {Host::FailedWith("asleep")};
  EXPECT_EQ(Run(), ExitStatus::Fault);
  EXPECT_THAT(_host.changes, IsEmpty());
  EXPECT_THAT(_err.str(), HasSubstr("asleep"));
}

TEST_F(ClaimCommand, FailsWhenTheHostSaysSoOrCannotTellAfterwards) {
  _host.groups = {WithGroups({}), Host::FailedWith("asleep")};
  EXPECT_EQ(Run(), ExitStatus::Fault);
  _host.groups = {WithGroups({})};
  _host.changeAnswer = Host::FailedWith("too busy");
  EXPECT_EQ(Run(), ExitStatus::Fault);
  EXPECT_THAT(_err.str(), testing::AllOf(HasSubstr("asleep"), HasSubstr("too busy")));
}

TEST_F(ClaimCommand, PrintsTheGroupsForScripts) {
  _host.groups = {WithGroups({AGroup("naa.1", {"naa.2"}, false)}), WithGroups({AGroup("naa.1", {"naa.2"})})};
  _options.output = "json";
  EXPECT_EQ(Run(), ExitStatus::Done);
  EXPECT_THAT(_out.str(), HasSubstr("\"mounted\":true"));
}

TEST_F(ClaimCommand, SaysThatMountingIsForgottenOnlyWhereThereWasSome) {
  _options.forgotten = true;
  _host.groups = {WithGroups({AGroup("naa.1", {"naa.2"})})};
  Run();
  EXPECT_EQ(_err.str(), "");
  _host.groups = {WithGroups({AGroup("naa.1", {"naa.2"}, false)}), WithGroups({AGroup("naa.1", {"naa.2"})})};
  Run();
  EXPECT_THAT(_err.str(), HasSubstr("--save"));
}

TEST_F(ClaimCommand, ADryRunLeavesGroupsAsTheyAreWithoutFault) {
  _options.dryRun = true;
  _host.groups = {WithGroups({AGroup("naa.1", {"naa.2"}, false)})};
  EXPECT_EQ(Run(), ExitStatus::Done);
  EXPECT_EQ(_out.str(), "");
  EXPECT_THAT(_err.str(), HasSubstr("(dry run: nothing was changed)"));
}

}  // namespace
}  // namespace Kovactl
