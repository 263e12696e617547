#include "otxctl/linux/VolumeManager.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "otxctl/linux/testing/FakeCommands.h"

namespace OtxCtl::Linux {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

using Texts = std::vector<std::string>;

struct Manager {
  FakeCommands::Results results;
  FakeCommands commands{results};
  Texts log;
  VolumeManager manager{commands, "/sbin/lvm", [this](const std::string& line) { log.push_back(line); }};
};

TEST(VolumeManager, ShowsItTheDisksConcerned) {
  Manager fixture;
  fixture.results.of["vgreduce"] = {};
  fixture.manager.RemoveMember({"/dev/sda", "/dev/sdb"}, "g", "/dev/sdb");
  ASSERT_EQ(fixture.results.commands.size(), 1U);
  EXPECT_THAT(fixture.results.commands[0],
              ElementsAre("/sbin/lvm", "vgreduce", "--devices", "/dev/sda,/dev/sdb", "--", "g", "/dev/sdb"));
}

TEST(VolumeManager, ARefusalHasTheWordsOfTheCommand) {
  Manager fixture;
  fixture.results.of["pvremove"] = {5, "", "  Can't open /dev/sda\x1b[31m exclusively.\n"};
  try {
    fixture.manager.ClearMembers({"/dev/sda"});
    ADD_FAILURE();
  } catch (const CommandRefused& refused) {
    EXPECT_THAT(refused.what(), HasSubstr("pvremove ended with status 5: Can't open /dev/sda"));
    EXPECT_THAT(refused.what(), Not(HasSubstr("\x1b"))) << "texts of devices may be hostile";
    EXPECT_EQ(refused.GetResult().status, 5);
    EXPECT_EQ(fixture.log.back(), refused.what());
  }
}

TEST(VolumeManager, WhatDoesNotEndIsTold) {
  Manager fixture;
  fixture.results.hang = true;
  EXPECT_THROW(fixture.manager.ClearMembers({"/dev/sda"}), CommandFailed);
  ASSERT_EQ(fixture.log.size(), 2U);
  EXPECT_THAT(fixture.log[1], HasSubstr("has not ended in time"));
}

TEST(VolumeManager, AnUnreadableReportIsAFailure) {
  Manager fixture;
  fixture.results.of["pvs"] = {5, "", "no such disk"};
  EXPECT_THROW(fixture.manager.CountExtents({"/dev/sda"}, "/dev/sda", 1 << 30), CommandFailed);
}

TEST(VolumeManager, ADryRunPrintsAndEstimates) {
  FakeCommands::Results results;
  FakeCommands commands(results);
  std::vector<Texts> printed;
  VolumeManager manager(
      commands, "/sbin/lvm", [](const std::string&) {},
      [&](const Texts& command) { printed.push_back(command); });
  manager.Deactivate({"/dev/sda"}, "g");
  EXPECT_EQ(manager.CountExtents({"/dev/sda"}, "/dev/sda", 512 * extentBytes), 511);
  EXPECT_THAT(results.commands, IsEmpty());
  ASSERT_EQ(printed.size(), 1U);
  EXPECT_EQ(InWords(printed[0]), "/sbin/lvm vgchange --devices /dev/sda --activate n -- g");
}

TEST(VolumeManager, WordsAreAsAShellTakesThem) {
  EXPECT_EQ(InWords({"lvm", "a/b,c", "x=\"y\"", "", "two words"}), "lvm a/b,c 'x=\"y\"' '' 'two words'");
}

}  // namespace
}  // namespace OtxCtl::Linux
