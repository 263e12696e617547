#include "machines/Twin.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <random>

#include "host/Generation.h"
#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/include/KovaInfo.h"
#include "machines/LinuxMachine.h"
#include "machines/SimulatedInventory.h"
#include "machines/SimulatedMachine.h"
#include "nox/Host.h"
#include "orbis/Json.h"
#include "otxctl/linux/testing/TestMachine.h"
#include "otxctl/sim/HostBuilder.h"
#include "otxctl/sim/SimProvider.h"

namespace Machines {
namespace {

using Host::HostState;
using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskState;
using OtxCtl::Linux::TestMachine;
using OtxCtl::Sim::AHost;
using OtxCtl::Sim::HostBuilder;
using OtxCtl::Sim::HostDescription;
using OtxCtl::Sim::HostDisk;
using OtxCtl::Sim::HostGroup;
using OtxCtl::Sim::SimHost;
using OtxCtl::Sim::SimProvider;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

// What a simulated host's provider and inventory tell.
HostState StateOf(const HostDescription& host) {
  SimProvider provider(std::make_shared<SimHost>(host));
  const bool isPresent = host.storageSystem == OtxCtl::Sim::StorageSystem::Present;
  return Host::ReadHostState(provider, isPresent ? DescribeInventory(host) : nullptr);
}

std::string InventoryText(const HostState& state) {
  if (!state.inventory) {
    return "none";
  }
  std::string text;
  for (const Nox::Host::ScsiLun* unit : *state.inventory->GetScsiLun()) {
    if (unit == nullptr) {
      text += "null";
    } else {
      Orbis::WriteJson(*unit, text);
    }
    text += '\n';
  }
  return text;
}

void ExpectAlike(const HostState& twin, const HostState& original) {
  EXPECT_EQ(twin.disks, original.disks);
  ASSERT_EQ(twin.groups.size(), original.groups.size());
  for (std::size_t i = 0; i < twin.groups.size(); ++i) {
    EXPECT_EQ(twin.groups[i].disks, original.groups[i].disks) << i;
    EXPECT_EQ(twin.groups[i].mounted, original.groups[i].mounted) << i;
  }
  EXPECT_EQ(InventoryText(twin), InventoryText(original));
  EXPECT_EQ(Host::GenerationOf(twin), Host::GenerationOf(original)) << "all of it, configuration included";
}

// Hosts of every kind that a description can be of, the same in every run.
class RandomHosts {
 public:
  HostDescription Next() {
    HostDescription host;
    host.autoMode = Chance(4);
    host.minimumDiskBytes = Chance(2) ? 0 : 1 << 20;
    host.cluster = {.enabled = Chance(2), .clusterUuid = Text("c"), .nodeUuid = Text("n")};
    host.faultDomain = Text("rack-");
    if (Chance(2)) {
      host.networks.push_back(
          {.interface = "otx1", .masterMulticastGroup = "224.1.2.3", .agentMulticastGroup = "FF19::1"});
    }
    host.storageSystem = Chance(20) ? OtxCtl::Sim::StorageSystem::Missing : host.storageSystem;
    for (int count = Below(12); count > 0; --count) {
      host.disks.push_back(Disk("naa." + std::to_string(count)));
    }
    AddGroups(host);
    for (const char* const kind : {"cdrom", "enclosure"}) {
      if (Chance(5)) {
        host.otherLuns.emplace_back(kind);
        host.otherLuns.emplace_back(std::nullopt);
      }
    }
    return host;
  }

 private:
  int Below(int end) { return std::uniform_int_distribution<int>(0, end - 1)(_random); }
  bool Chance(int in) { return Below(in) == 0; }
  std::string Text(const std::string& begin) {
    return Chance(2) ? std::string() : begin + std::to_string(Below(3));
  }

  HostDisk Disk(const std::string& name) {
    HostDisk disk;
    disk.name = name;
    disk.ssd = Chance(2);
    disk.capacityFlash = Chance(3);
    disk.bytes = Chance(4) ? Below(5000) : std::int64_t{1} << 40;
    disk.blockSize = Chance(2) ? 512 : 4096;
    disk.transport = Chance(3) ? std::optional<std::string>(Chance(2) ? "usb" : "sas") : std::nullopt;
    disk.local = !Chance(6);
    disk.partitions = Chance(5) ? 2 : 0;
    disk.vendor = Text("V");
    disk.serial = Text("S");
    disk.displayName = Text("Disk ");
    disk.absent = Chance(6);
    disk.inInventory = !Chance(6);
    disk.inKernel = !Chance(6);
    disk.formatVersion = static_cast<std::uint8_t>(Below(4));
    disk.kovaUuid = Text("u");  // copies of one disk bear the same
    disk.detail = Text("why ");
    if (Chance(8)) {
      disk.verdict = {.state = Below(4), .reason = Below(8)};
    }
    SetNames(disk);
    return disk;
  }

  void SetNames(HostDisk& disk) {
    if (Chance(3)) {
      disk.durableName = {.authority = "naa", .identifier = "5"};
      disk.alternateName = {{.authority = "t10", .identifier = "x"}};
      disk.standardInquiry = {1, 2, 3};
    }
  }

  void AddGroups(HostDescription& host) {
    std::size_t next = 0;
    while (next + 2 <= host.disks.size() && !Chance(3)) {
      HostGroup& group = host.groups.emplace_back();
      group.ssd = host.disks[next++].name;
      for (int count = 1 + Below(3); count > 0 && next < host.disks.size(); --count) {
        group.capacity.push_back(host.disks[next++].name);
      }
      group.mounted = !Chance(3);
      group.allFlash = Chance(3);
      group.busy = Chance(4);
      group.formatVersion = static_cast<std::uint8_t>(Below(5));
    }
  }

  std::mt19937 _random{20261122};
};

TEST(Twin, AnswersLikeTheHostThatItIsOf) {
  RandomHosts hosts;
  std::size_t members = 0;
  for (int i = 0; i < 2000; ++i) {
    const HostDescription host = hosts.Next();
    const HostState original = StateOf(host);
    const HostDescription twin = DescribeTwin(original);
    SCOPED_TRACE(WriteHostDescription(host) + WriteHostDescription(twin));
    ASSERT_NO_FATAL_FAILURE(
        ExpectAlike(StateOf(OtxCtl::Sim::ParseHostDescription(WriteHostDescription(twin))), original));
    ASSERT_FALSE(testing::Test::HasFailure());
    members += host.groups.size();
  }
  EXPECT_GT(members, 1000U) << "hosts without groups would prove little";
}

// Its name in a line, with what is pinned to it.
std::vector<std::string> Pinned(const HostDescription& twin) {
  std::vector<std::string> lines;
  for (const HostDisk& disk : twin.disks) {
    if (disk.verdict) {
      lines.push_back(disk.name + " " + std::to_string(disk.verdict->state) + " " +
                      std::to_string(disk.verdict->reason));
    }
  }
  return lines;
}

TEST(Twin, HasPinnedToItOnlyWhatItsFactsWouldNotSay) {
  const auto host = AHost()
                        .WithSsd("naa.1")
                        .WithHdd("naa.2")
                        .WithHdd("naa.3")
                        .WithDisk("naa.4", false, [](HostDisk& disk) { disk.partitions = 1; })
                        .WithDisk("naa.5", false, [](HostDisk& disk) { disk.transport = "usb"; })
                        .WithDisk("naa.6", false,
                                  [](HostDisk& disk) {
                                    disk.verdict = {2, 4};
                                  })
                        .WithDisk("naa.7", false, [](HostDisk& disk) { disk.bytes = 5; })
                        .WithGroup("naa.1", {"naa.2"})
                        .Edit([](HostDescription& edited) { edited.minimumDiskBytes = 10; });
  EXPECT_THAT(Pinned(DescribeTwin(StateOf(host.Build()))), ElementsAre("naa.6 2 4", "naa.7 2 5"));
}

TEST(Twin, OfAGroupThatGoesLeavesItsDisksFree) {
  const auto host = AHost().WithSsd("naa.1").WithHdd("naa.2").WithGroup("naa.1", {"naa.2"});
  SimProvider twin(std::make_shared<SimHost>(DescribeTwin(StateOf(host.Build()))));
  twin.RemoveDiskMapping("naa.1", "", {});
  std::vector<HostCtl::Kova::DiskResult> records;
  twin.QueryDisks({}, records, true);
  ASSERT_EQ(records.size(), 2U);
  EXPECT_EQ(records[0].state, DiskState::Eligible);
  EXPECT_EQ(records[1].state, DiskState::Eligible);
}

TEST(Twin, KeepsADiskWithPartitionsFromBeingFormatted) {
  const auto host =
      AHost().WithSsd("naa.1").WithDisk("naa.2", false, [](HostDisk& disk) { disk.partitions = 3; });
  SimProvider twin(std::make_shared<SimHost>(DescribeTwin(StateOf(host.Build()))));
  EXPECT_THROW(twin.FormatDiskMapping("naa.1", {"naa.2"}, {}), HostCtl::Lib::KovaExceptionHasPartition);
}

TEST(Twin, OfAHostWithoutInventoryHasNone) {
  HostState state;
  state.disks.push_back({.name = "naa.1", .kovaUuid = "", .state = DiskState::Eligible});
  const HostDescription twin = DescribeTwin(state);
  EXPECT_EQ(twin.storageSystem, OtxCtl::Sim::StorageSystem::Missing);
  ASSERT_EQ(twin.disks.size(), 1U);
  EXPECT_FALSE(twin.disks[0].inInventory);
}

TEST(SimulatedMachine, IsItsOwnTwin) {
  auto host = AHost().WithSsd("naa.1").Build();
  host.faults.push_back({.operation = "QueryDisks",
                         .call = 1,
                         .exception = "HostCtlException",
                         .message = "asleep",
                         .disk = ""});
  const auto simulated = std::make_shared<SimHost>(host);
  SimulatedMachine machine(simulated);
  const Host::Twin twin = machine.TakeTwin();
  EXPECT_EQ(OtxCtl::Sim::ParseHostDescription(twin.description), host);
  host.faults.clear();
  EXPECT_EQ(twin.generation, Host::GenerationOf(StateOf(host))) << "faults on demand are nothing of the host";
  std::vector<HostCtl::Kova::DiskResult> records;
  EXPECT_THROW(simulated->QueryDisks({}, records, true), HostCtl::Lib::HostCtlException)
      << "this is the first call";
}

// A real machine with a mounted group, a disk in use, a disk on USB and two that are free.
class TwinOfLinux : public testing::Test {
 protected:
  TwinOfLinux() {
    _machine.AddGroup();
    _machine.tree.AddScsiDisk("sdc", {.worldWideName = "naa.3", .serial = "S3", .isFlash = true});
    _machine.tree.AddScsiDisk("sdd", {.worldWideName = "naa.4", .serial = "S4"});
    _machine.tree.AddPartition("sdd", "sdd1");
    _machine.tree.AddUsbDisk("sde", {.vendor = "", .model = "", .serial = "S5"});
    _machine.tree.AddScsiDisk("sdf", {.worldWideName = "naa.6", .serial = "S6"});
    _machine.tree.AddScsiDisk("sdg", {.worldWideName = "naa.7", .serial = "S7", .bytes = 1 << 20});
    _machine.settings.capacityFlash = {"naa.3"};
    _machine.settings.faultDomain = "rack-7";
    _machine.settings.nics = {{"otx1", "224.1.2.3", "FF19::1"}};
    _machine.settings.clusterUuid = "c-1";
  }

  Host::Twin Take() { return LinuxMachine(_machine.Host()).TakeTwin(); }
  HostDescription Described() { return OtxCtl::Sim::ParseHostDescription(Take().description); }
  std::string Generation() { return Take().generation; }

  TestMachine _machine;
};

TEST_F(TwinOfLinux, AnswersLikeTheMachine) {
  LinuxMachine machine(_machine.Host());
  const HostState real = Host::ReadHostState(*machine.MakeProvider(), machine.GetInventory());
  const HostState twin = StateOf(OtxCtl::Sim::ParseHostDescription(machine.TakeTwin().description));
  EXPECT_EQ(twin.disks, real.disks);
  ASSERT_EQ(twin.groups.size(), 1U);
  EXPECT_EQ(twin.groups[0].disks, real.groups[0].disks);
  EXPECT_TRUE(twin.groups[0].mounted);
  EXPECT_EQ(twin.faultDomain, "rack-7");
  EXPECT_EQ(twin.cluster.clusterUuid, "c-1");
  ASSERT_EQ(twin.nics.size(), 1U);
  EXPECT_EQ(twin.nics[0].agentGroup, "FF19::1");
  ASSERT_EQ(twin.inventory->GetScsiLun()->Size(), real.inventory->GetScsiLun()->Size());
  for (std::size_t i = 0; i < real.inventory->GetScsiLun()->Size(); ++i) {
    const auto& disk = dynamic_cast<const Nox::Host::ScsiDisk&>(*(*real.inventory->GetScsiLun())[i]);
    const auto& same = dynamic_cast<const Nox::Host::ScsiDisk&>(*(*twin.inventory->GetScsiLun())[i]);
    EXPECT_EQ(same.GetCanonicalName(), disk.GetCanonicalName());
    EXPECT_EQ(same.GetCapacity()->GetBlock(), disk.GetCapacity()->GetBlock());
    ASSERT_EQ(same.HasDetail(), disk.HasDetail()) << disk.GetCanonicalName();
    EXPECT_EQ(same.HasDetail() ? same.GetDetail() : "", disk.HasDetail() ? disk.GetDetail() : "");
  }
}

TEST_F(TwinOfLinux, SaysOfEachDiskWhyItCannotBeUsed) {
  const HostDescription twin = Described();
  ASSERT_EQ(twin.disks.size(), 7U);
  EXPECT_THAT(twin.disks[0].detail, IsEmpty());
  EXPECT_TRUE(twin.disks[2].capacityFlash);
  EXPECT_THAT(twin.disks[3].detail, HasSubstr("1 partition"));
  EXPECT_THAT(twin.disks[4].detail, HasSubstr("attached by USB"));
  EXPECT_THAT(twin.disks[6].detail, HasSubstr("smaller than"));
}

TEST_F(TwinOfLinux, KnowsAGroupThatIsNotMountedAndOneWithoutItsDisk) {
  _machine.AddGroup("ready", false);
  EXPECT_FALSE(Described().groups.at(0).mounted);
  const auto report = [this](const std::string& old, const std::string& now) {
    std::string& text = _machine.results.of["pvs"].output;
    text.replace(text.find(old), old.size(), now);
  };
  report(R"("pv_name":"/dev/sdb")", R"("pv_name":"[unknown]")");
  _machine.tree.Remove("sys/class/block/sdb");
  LinuxMachine machine(_machine.Host());
  const HostState real = Host::ReadHostState(*machine.MakeProvider(), machine.GetInventory());
  ASSERT_EQ(real.groups.at(0).disks.capacityDisks.at(0).deviceName, "") << "it has left";
  const HostState twin = StateOf(OtxCtl::Sim::ParseHostDescription(machine.TakeTwin().description));
  EXPECT_EQ(twin.disks, real.disks);
  EXPECT_EQ(twin.groups.at(0).disks, real.groups.at(0).disks);
}

TEST_F(TwinOfLinux, HasAnotherGenerationWhenAnythingChanges) {
  std::set<std::string> seen = {Generation()};
  EXPECT_EQ(Generation(), *seen.begin()) << "nothing has changed";
  const auto expectAnother = [&](const char* what) { EXPECT_TRUE(seen.insert(Generation()).second) << what; };
  _machine.tree.AddScsiDisk("sdh", {.worldWideName = "naa.8", .serial = "S8"});
  expectAnother("a disk has come");
  _machine.tree.Mount(_machine.tree.NumberOf("sdh"), "/dev/sdh", "/data");
  expectAnother("a disk has been mounted");
  _machine.AddGroup("ready", false);
  expectAnother("a group has been unmounted");
  _machine.settings.faultDomain = "rack-8";
  expectAnother("another fault domain");
  _machine.settings.capacityFlash.clear();
  expectAnother("a disk lost its mark");
}

TEST_F(TwinOfLinux, IsTakenWithoutAnythingThatWrites) {
  Take();
  for (const auto& command : _machine.results.commands) {
    EXPECT_THAT(command.at(1), testing::AnyOf("pvs", "lvs"));
  }
  EXPECT_THAT(_machine.results.commands, testing::SizeIs(2)) << "one look serves all of it";
}

TEST_F(TwinOfLinux, IsNotTakenOfAMachineThatCannotBeLookedAt) {
  _machine.tree.Remove("sys/class/block");
  EXPECT_THROW(Take(), HostCtl::Lib::HostCtlException);
}

}  // namespace
}  // namespace Machines
