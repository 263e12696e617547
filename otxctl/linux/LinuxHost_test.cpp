#include "otxctl/linux/LinuxHost.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>
#include <thread>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/linux/testing/TestMachine.h"

namespace OtxCtl::Linux {
namespace {

using HostCtl::Kova::DiskState;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

std::string WhyNotSeen(LinuxHost& host) {
  try {
    host.Look();
    return "";
  } catch (const HostCtl::Lib::HostCtlException& failed) {
    return failed.what();
  }
}

TEST(LinuxHost, JudgesTheDisksOfTheMachine) {
  TestMachine machine;
  machine.tree.AddScsiDisk("sda", {.worldWideName = "naa.1", .serial = "S1"});
  machine.tree.AddUsbDisk("sdb", {.serial = "S2"});
  const auto seen = machine.Host()->Look();
  ASSERT_THAT(seen->disks, SizeIs(2));
  EXPECT_EQ(seen->verdicts[0].state, DiskState::Eligible) << seen->verdicts[0].detail;
  EXPECT_THAT(seen->verdicts[1].detail, HasSubstr("attached by USB"));
}

TEST(LinuxHost, RunsNoProgramWhereNoDiskIsAPhysicalVolume) {
  TestMachine machine;
  machine.tree.AddScsiDisk("sda", {.worldWideName = "naa.1", .serial = "S1"});
  EXPECT_THAT(machine.Host()->Look()->groups, IsEmpty());
  EXPECT_THAT(machine.results.commands, IsEmpty());
}

TEST(LinuxHost, FindsItsGroupsByTwoReportsOfTheDisksConcerned) {
  TestMachine machine;
  machine.AddGroup();
  machine.tree.AddScsiDisk("sdc", {.worldWideName = "naa.3", .serial = "S3"});
  const auto seen = machine.Host()->Look();
  ASSERT_THAT(seen->groups, SizeIs(1));
  EXPECT_EQ(seen->groups[0].cache.canonicalName, "naa.1");
  EXPECT_EQ(seen->verdicts[0].state, DiskState::InUse);
  EXPECT_EQ(seen->verdicts[1].state, DiskState::InUse);
  EXPECT_EQ(seen->verdicts[2].state, DiskState::Eligible) << seen->verdicts[2].detail;
  ASSERT_THAT(machine.results.commands, SizeIs(2));
  const std::string devices = seen->disks[0].deviceNode + "," + seen->disks[1].deviceNode;
  EXPECT_THAT(machine.results.commands[0],
              ElementsAre("/usr/sbin/lvm", "pvs", "--reportformat", "json", "--units", "b", "--nosuffix",
                          "--devices", devices, "-o", physicalVolumeColumns));
  EXPECT_EQ(machine.results.commands[1].at(1), "lvs");
}

TEST(LinuxHost, AsksForVolumesOnlyOfGroupsWithKovasMarks) {
  TestMachine machine;
  machine.AddGroup();
  std::string& report = machine.results.of["pvs"].output;
  for (std::size_t at = report.find("\"kova,"); at != std::string::npos; at = report.find("\"kova,")) {
    report.replace(at, 6, "\"");
  }
  const auto seen = machine.Host()->Look();
  EXPECT_THAT(machine.results.commands, SizeIs(1));
  EXPECT_EQ(seen->verdicts[0].detail, "member of volume group vg, held by vg-d (LVM)");
}

TEST(LinuxHost, WithoutAVolumeManagerAPhysicalVolumeIsSomebodysAllTheSame) {
  TestMachine machine;
  machine.AddGroup();
  machine.results.areThere = false;
  const auto seen = machine.Host()->Look();
  EXPECT_THAT(seen->groups, IsEmpty());
  EXPECT_EQ(seen->verdicts[0].detail, "LVM physical volume, held by vg-d (LVM)");
}

TEST(LinuxHost, GroupsThatCannotBeReadAreAnErrorNotNone) {
  TestMachine machine;
  machine.AddGroup();
  machine.results.of.erase("lvs");
  EXPECT_EQ(WhyNotSeen(*machine.Host()),
            "the volume groups cannot be read: lvs ended with status 5: no such group");
  machine.results.of["pvs"].output = "rubbish";
  EXPECT_EQ(WhyNotSeen(*machine.Host()),
            "the volume groups cannot be read: the volume manager gave no report");
  machine.results.hang = true;
  EXPECT_EQ(WhyNotSeen(*machine.Host()),
            "the volume groups cannot be read: /usr/sbin/lvm has not ended in time");
}

TEST(LinuxHost, SettingsThatCannotBeReadAreAnError) {
  TestMachine machine;
  LinuxHostOptions options;
  options.paths = machine.tree.Paths();
  options.readSettings = []() -> HostSettings { throw std::runtime_error("host.json: is odd"); };
  LinuxHost host(std::move(options), std::make_unique<FakeProbe>(),
                 std::make_unique<FakeCommands>(machine.results));
  EXPECT_EQ(WhyNotSeen(host), "this host's settings cannot be used: host.json: is odd");
}

TEST(LinuxHost, AMachineThatCannotBeLookedAtIsAnErrorAndWhatWasSeenStays) {
  TestMachine machine;
  machine.tree.AddScsiDisk("sda", {.worldWideName = "naa.1", .serial = "S1"});
  const auto host = machine.Host();
  const auto seen = host->Look();
  machine.tree.Remove("sys/class/block");
  EXPECT_THAT(WhyNotSeen(*host), HasSubstr("this machine's disks cannot be looked at: "));
  EXPECT_EQ(host->Last(), seen);
}

TEST(LinuxHost, TheSmallestDiskIsASetting) {
  TestMachine machine;
  machine.tree.AddScsiDisk("sda", {.worldWideName = "naa.1", .serial = "S1"});
  machine.settings.minimumDiskBytes = std::int64_t{1} << 40;
  EXPECT_THAT(machine.Host()->Look()->verdicts.at(0).detail, HasSubstr("smaller than 1 TiB"));
}

TEST(LinuxHost, TellsWhoListensOfWhatIsOtherThanBefore) {
  TestMachine machine;
  machine.tree.AddScsiDisk("sda", {.worldWideName = "naa.1", .serial = "S1"});
  const auto host = machine.Host();
  int told = 0;
  std::size_t disks = 0;
  host->SetListener([&] {
    ++told;
    disks = host->Last()->disks.size();
  });
  host->Look();
  EXPECT_EQ(told, 1);
  host->Look();
  EXPECT_EQ(told, 1) << "nothing has changed";
  machine.tree.AddScsiDisk("sdb", {.worldWideName = "naa.2", .serial = "S2"});
  host->Look();
  EXPECT_EQ(told, 2);
  EXPECT_EQ(disks, 2U);
  machine.tree.Mount(machine.tree.NumberOf("sda"), "/dev/sda", "/data");
  host->Look();
  EXPECT_EQ(told, 3) << "a disk that is used now";
  host->SetListener({});
  machine.settings.minimumDiskBytes = std::int64_t{1} << 40;
  host->Look();
  EXPECT_EQ(told, 3);
}

TEST(LinuxHost, WithinOneLookAllLooksOfAThreadAreTheFirst) {
  TestMachine machine;
  machine.AddGroup();
  const auto host = machine.Host();
  std::shared_ptr<const LinuxSnapshot> held;
  {
    const LinuxHost::OneLook look;
    held = host->Look();
    EXPECT_EQ(host->Look(), held);
    EXPECT_EQ(host->Current(), held);
    EXPECT_THAT(machine.results.commands, SizeIs(2));
    const auto other = machine.Host();
    EXPECT_NE(other->Look(), held) << "of another host";
  }
  EXPECT_NE(host->Look(), held);
}

TEST(LinuxHost, WithinOneLookNobodyElsesLookIsSeen) {
  TestMachine machine;
  machine.freshness = std::chrono::hours(1);
  const auto host = machine.Host();
  const LinuxHost::OneLook look;
  const auto held = host->Look();
  std::thread([&host] { host->Look(); }).join();
  ASSERT_NE(host->Last(), held);
  EXPECT_EQ(host->Current(), held);
}

TEST(LinuxHost, AFreshLookAnswersTheNextQuestionToo) {
  TestMachine machine;
  machine.freshness = std::chrono::hours(1);
  const auto host = machine.Host();
  EXPECT_EQ(host->Last(), nullptr);
  const auto first = host->Current();
  EXPECT_EQ(host->Current(), first);
  EXPECT_NE(host->Look(), first);
  machine.freshness = {};
  const auto impatient = machine.Host();
  EXPECT_NE(impatient->Current(), impatient->Current());
}

}  // namespace
}  // namespace OtxCtl::Linux
