// Making disk groups and extending them: which commands are run, and what is undone when one fails.

#include "otxctl/linux/GroupFormat.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <regex>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/TaskScope.h"
#include "otxctl/linux/GroupNames.h"
#include "otxctl/linux/testing/ChangeableMachine.h"

namespace OtxCtl::Linux {
namespace {

using HostCtl::Lib::HostCtlException;
using HostCtl::Lib::KovaStorageException;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

// UUIDs become "U", short ones "u", times "T".
std::vector<std::string> Plain(std::vector<std::string> lines) {
  for (std::string& line : lines) {
    line = std::regex_replace(line, std::regex("[0-9a-f]{8}(-[0-9a-f]{4}){3}-[0-9a-f]{12}"), "U");
    line = std::regex_replace(line, std::regex("(kova|data)_[0-9a-f]{12}"), "$1_u");
    line = std::regex_replace(line, std::regex("kova.created=[0-9]+"), "kova.created=T");
  }
  return lines;
}

const std::string create =
    "vgcreate --setautoactivation n --physicalextentsize 4194304b --addtag kova --addtag kova.group=U "
    "--addtag kova.machine=m1 --addtag kova.state=creating --addtag kova.created=T --addtag kova.kind=hybrid "
    "-- kova_u sda sdb sdc";
const std::string tagCache = "pvchange --addtag kova.disk=U --addtag kova.role=cache -- sda";

std::string TagDisk(const std::string& disk, const std::string& place) {
  return "pvchange --addtag kova.disk=U --addtag kova.role=capacity --addtag kova.place=" + place + " -- " +
         disk;
}

std::string CreateVolume(const std::string& group, const std::string& disk) {
  return "lvcreate --yes --wipesignatures y --zero y --config 'allocation/cache_mode=\"writethrough\"' "
         "--type "
         "cache --cachedevice sda --cachesize 306184192b --extents 100%PVS --addtag kova.disk=U --name "
         "data_u -- " +
         group + " " + disk;
}

const std::string makeReady = "vgchange --deltag kova.state=creating --addtag kova.state=ready -- kova_u";

// The cache disk's extents are asked for once it is a member.
void ShowMade(ChangeableMachine& machine) {
  machine.after = [&machine](const std::vector<std::string>& command) {
    if (command.at(1) == "vgcreate") {
      machine.Show({{"creating", {{"sda", "u1", true}}}});
    }
    if (command.back().find("kova_") == 0) {  // the last one: it is ready
      machine.Show({WholeGroup()});
    }
  };
}

std::string WhyNotMade(ChangeableMachine& machine,
                       const std::vector<std::string>& capacity = {"naa.2", "naa.3"}) {
  try {
    machine.changes->Format("naa.1", capacity);
    return "";
  } catch (const HostCtlException& failed) {
    return failed.Describe();
  }
}

TEST(GroupFormat, MakesAVolumeGroupWithAVolumeForEachCapacityDisk) {
  ChangeableMachine machine;
  ShowMade(machine);
  EXPECT_EQ(WhyNotMade(machine), "");
  EXPECT_THAT(Plain(machine.Changes()),
              ElementsAre(create, tagCache, TagDisk("sdb", "0"), TagDisk("sdc", "1"),
                          CreateVolume("kova_u", "sdb"), CreateVolume("kova_u", "sdc"), makeReady));
  EXPECT_THAT(machine.locked, ElementsAre("naa.1 free", "naa.2 free", "naa.3 free"));
  EXPECT_THAT(Plain(machine.flushed), ElementsAre("/dev/kova_u/data_u", "/dev/kova_u/data_u"));
  EXPECT_THAT(machine.Recorded(), IsEmpty());
}

TEST(GroupFormat, AGroupOfFlashDisksAloneSaysSo) {
  ChangeableMachine machine;
  ShowMade(machine);
  WhyNotMade(machine, {"naa.5"});
  EXPECT_THAT(machine.Changes().at(0), HasSubstr("--addtag kova.kind=all-flash"));
}

TEST(GroupFormat, LetsTheVolumeManagerSeeTheDisksConcernedAlone) {
  ChangeableMachine machine;
  ShowMade(machine);
  WhyNotMade(machine);
  for (const auto& command : machine.machine.results.commands) {
    EXPECT_EQ(command.at(0), "/usr/sbin/lvm");
    if (command.at(1) != "pvs" && command.at(1) != "lvs") {
      EXPECT_EQ(command.at(2), "--devices");
      EXPECT_EQ(machine.Shortened(command.at(3)), "sda,sdb,sdc") << command.at(1);
    }
  }
}

TEST(GroupFormat, NamesItsIdentitiesOnceAndTheSameInAllPlaces) {
  ChangeableMachine machine;
  ShowMade(machine);
  WhyNotMade(machine);
  const auto commands = machine.Changes();
  std::smatch tag;
  std::smatch volume;
  ASSERT_TRUE(std::regex_search(commands[2], tag, std::regex("kova.disk=([0-9a-f-]{36})")));
  ASSERT_TRUE(
      std::regex_search(commands[4], volume, std::regex("kova.disk=([0-9a-f-]{36}) --name ([a-z_0-9]+)")));
  EXPECT_EQ(tag[1], volume[1]);
  EXPECT_EQ(DataVolumeName(tag[1]), volume[2]);
}

TEST(GroupFormat, TellsEachCommandBeforeAndAfter) {
  ChangeableMachine machine;
  ShowMade(machine);
  WhyNotMade(machine);
  ASSERT_GE(machine.log.size(), 2U);
  EXPECT_THAT(machine.log[0], testing::StartsWith("Running /usr/sbin/lvm vgcreate --devices "));
  EXPECT_THAT(machine.log[1], testing::MatchesRegex("vgcreate ended with status 0 after [0-9.]+ s"));
}

TEST(GroupFormat, TellsItsTaskHowFarItIs) {
  ChangeableMachine machine;
  ShowMade(machine);
  std::vector<std::string> steps;
  int last = -1;
  {
    const TaskScope task("t", [&](int percent, std::string_view step) {
      EXPECT_GT(percent, last);
      EXPECT_LT(percent, 100);
      last = percent;
      steps.emplace_back(step);
    });
    EXPECT_EQ(WhyNotMade(machine), "");
  }
  EXPECT_THAT(
      steps, ElementsAre("making the volume group", "disk naa.2: 1 of 2", "disk naa.3: 2 of 2", "finishing"));
}

TEST(GroupFormat, IsNotBelievedBeforeTheGroupIsSeen) {
  ChangeableMachine machine;
  machine.after = [&machine](const std::vector<std::string>&) {
    machine.Show({{"creating", {{"sda", "u1", true}}}});
  };
  EXPECT_THAT(WhyNotMade(machine), HasSubstr("it is not mounted"));
}

// From the second command on the group is there, and goes again.
TEST(GroupFormat, WhateverFailsIsUndone) {
  for (std::size_t failing = 2; failing <= 7; ++failing) {
    SCOPED_TRACE(failing);
    ChangeableMachine machine;
    ShowMade(machine);
    machine.failing[failing] = {5, "", "  no space\n"};
    EXPECT_THAT(WhyNotMade(machine), HasSubstr("ended with status 5"));
    const auto commands = Plain(machine.Changes());
    ASSERT_EQ(commands.size(), failing + 2);
    EXPECT_EQ(commands[failing], "vgremove --yes -- kova_u");
    EXPECT_EQ(commands[failing + 1], "pvremove -- sda sdb sdc");
    EXPECT_THAT(machine.Recorded(), IsEmpty());
  }
}

TEST(GroupFormat, AGroupThatWasRefusedLeavesNothingButWhatItSaysItHasMade) {
  ChangeableMachine nothing;
  nothing.failing[1] = {5, "", "  ext4 signature detected\n"};
  EXPECT_THAT(WhyNotMade(nothing), HasSubstr("ext4 signature detected"));
  EXPECT_EQ(nothing.Changes().size(), 1U);
  EXPECT_THAT(nothing.Recorded(), IsEmpty());
  ChangeableMachine some;
  some.failing[1] = {5, "  Physical volume \"" + some.Node("sdb") + "\" successfully created.\n", "bad"};
  WhyNotMade(some);
  ASSERT_EQ(some.Changes().size(), 2U);
  EXPECT_EQ(some.Changes()[1], "pvremove -- sdb");
}

TEST(GroupFormat, WhatCannotBeUndoneIsToldAndRemembered) {
  ChangeableMachine machine;
  ShowMade(machine);
  machine.failing[3] = {5, "", "first"};
  machine.failing[4] = {5, "", "second"};
  const std::string why = WhyNotMade(machine);
  EXPECT_THAT(why, HasSubstr("first"));
  EXPECT_THAT(why, HasSubstr("and what was begun could not be undone: vgremove ended with status 5: second"));
  EXPECT_THAT(machine.Recorded(), ElementsAre("naa.1", "naa.2", "naa.3"));
}

TEST(GroupFormat, ACommandThatDoesNotEndLeavesNobodyKnowsWhat) {
  ChangeableMachine machine;
  machine.hanging = 1;
  EXPECT_THAT(WhyNotMade(machine), HasSubstr("has not ended in time"));
  EXPECT_EQ(machine.Changes().size(), 1U) << "it may still be at work";
  EXPECT_THAT(machine.Recorded(), ElementsAre("naa.1", "naa.2", "naa.3"));
}

TEST(GroupFormat, AVolumeThatCannotBeWrittenOutIsNoVolume) {
  ChangeableMachine machine;
  ChangeTools tools;
  tools.commands = std::make_unique<FakeCommands>(machine.machine.results);
  tools.locks = std::make_unique<FakeLocks>(machine.locked, machine.whyNotTheSame);
  tools.flush = [](const std::string& path) { throw CommandFailed(path + " cannot be written out"); };
  GroupChanges changes(machine.host, std::move(tools));
  ShowMade(machine);
  EXPECT_THROW(changes.Format("naa.1", {"naa.2"}), HostCtlException);
  EXPECT_EQ(machine.Changes().back(), "pvremove -- sda sdb");
}

TEST(GroupFormat, ADiskOnWhichSomethingStandsAtTheLastMomentIsRefused) {
  ChangeableMachine machine;
  machine.machine.probe->whileProbing = [&](const std::string& name) {
    if (name == "sdb" && !machine.locked.empty()) {
      machine.machine.probe->results["sdb"] = EmptyDisk();
      machine.machine.probe->results["sdb"].signatures = std::vector<std::string>{"ext4 file system"};
    }
  };
  try {
    machine.changes->Format("naa.1", {"naa.2"});
    ADD_FAILURE() << "it was formatted";
  } catch (const KovaStorageException& refused) {
    EXPECT_EQ(refused.GetDiskName(), "naa.2");
  }
  EXPECT_THAT(machine.Changes(), IsEmpty());
}

TEST(GroupFormat, ADiskThatWentAwayMeanwhileIsTold) {
  ChangeableMachine machine;
  ShowMade(machine);
  machine.whyNotTheSame = "it has gone";
  EXPECT_THAT(WhyNotMade(machine), HasSubstr("naa.1 went away while it was changed: it has gone"));
}

TEST(GroupFormat, ExtendsAGroupBehindItsLastDisk) {
  ChangeableMachine machine;
  machine.Show({WholeGroup()});
  machine.changes->Format("naa.1", {"naa.4"});
  EXPECT_THAT(Plain(machine.Changes()),
              ElementsAre("vgextend -- kova_g1 sdd", TagDisk("sdd", "4"), CreateVolume("kova_g1", "sdd")));
  for (const auto& command : machine.machine.results.commands) {
    if (command.at(1) == "vgextend") {
      EXPECT_EQ(machine.Shortened(command.at(3)), "sda,sdb,sdc,sdd");
    }
  }
  EXPECT_THAT(machine.locked, ElementsAre("naa.4 free"));
}

TEST(GroupFormat, WhatFailsOfAnExtensionIsUndone) {
  ChangeableMachine machine;
  machine.Show({WholeGroup()});
  machine.failing[3] = {5, "", "no space"};
  EXPECT_THAT(WhyNotMade(machine, {"naa.4"}), HasSubstr("no space"));
  EXPECT_THAT(Plain(machine.Changes()),
              ElementsAre("vgextend -- kova_g1 sdd", TagDisk("sdd", "4"), CreateVolume("kova_g1", "sdd"),
                          "lvremove --yes -- kova_g1/data_u", "lvremove --yes -- kova_g1/data_u_cache",
                          "vgreduce -- kova_g1 sdd", "pvremove -- sdd"));
  EXPECT_THAT(machine.Recorded(), IsEmpty());
}

TEST(GroupFormat, VolumesThatWereNotThereYetAreNoReasonToStopUndoing) {
  ChangeableMachine machine;
  machine.Show({WholeGroup()});
  machine.failing[3] = {5, "", "no space"};
  machine.failing[4] = machine.failing[5] = {5, "", "  Failed to find logical volume \"x\"\n"};
  WhyNotMade(machine, {"naa.4"});
  EXPECT_EQ(machine.Changes().back(), "pvremove -- sdd");
  ChangeableMachine refused;
  refused.Show({WholeGroup()});
  refused.failing[3] = refused.failing[4] = {5, "", "in use"};
  EXPECT_THAT(WhyNotMade(refused, {"naa.4"}), HasSubstr("could not be undone: lvremove"));
}

TEST(GroupFormat, ADryRunOnlyPrints) {
  ChangeableMachine machine;
  std::vector<std::string> printed;
  ChangeTools tools;
  tools.commands = std::make_unique<FakeCommands>(machine.machine.results);
  tools.locks = std::make_unique<FakeLocks>(machine.locked, machine.whyNotTheSame);
  tools.dryRun = [&](const std::vector<std::string>& command) { printed.push_back(command.at(1)); };
  tools.flush = [](const std::string&) { ADD_FAILURE() << "nothing is there to be written out"; };
  GroupChanges(machine.host, std::move(tools)).Format("naa.1", {"naa.2"});
  EXPECT_THAT(printed, ElementsAre("vgcreate", "pvchange", "pvchange", "lvcreate", "vgchange"));
  EXPECT_THAT(machine.machine.results.commands, IsEmpty());
  EXPECT_FALSE(std::filesystem::exists(machine.machine.stateFolder));
}

}  // namespace
}  // namespace OtxCtl::Linux
