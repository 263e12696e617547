#include "machines/SimulatedMachine.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdio>
#include <filesystem>
#include <fstream>

#include "host/HostError.h"
#include "nox/Host.h"
#include "otxctl/sim/DefaultHost.h"
#include "otxctl/sim/HostBuilder.h"
#include "tessa/Logger.h"
#include "tests/support/RecordingLogger.h"

namespace Machines {
namespace {

using Host::ChangeRefused;
using OtxCtl::Sim::AHost;
using OtxCtl::Sim::HostBuilder;
using OtxCtl::Sim::HostDescriptionError;
using OtxCtl::Sim::HostFileError;
using testing::AllOf;
using testing::ElementsAre;
using testing::Field;
using testing::HasSubstr;
using testing::ThrowsMessage;

// A host in a file that goes with the test.
class SimulatedMachineTest : public testing::Test {
 protected:
  ~SimulatedMachineTest() override {
    for (const char* ending : {"", ".lock"}) {
      std::remove((_file + ending).c_str());
    }
  }

  MachineOptions InFile(const HostBuilder& host, bool save = false) const {
    std::ofstream(_file) << WriteHostDescription(host.Build());
    MachineOptions options;
    options.host = _file;
    options.save = save;
    return options;
  }
  std::string NameInFile() const { return OtxCtl::Sim::LoadHostFile(_file).name; }

  const std::string _file = testing::TempDir() + "simulated-machine-" + std::to_string(getpid()) + ".json";
};

MachineOptions Described(const std::string& description) {
  MachineOptions options;
  options.description = description;
  return options;
}

constexpr const char* rename = R"({"set": {"name": "changed"}})";
constexpr const char* broken = R"({"disks": [{"name": "naa.1", "ssd": 1, "bytes": 1}]})";

TEST_F(SimulatedMachineTest, IsTheExampleHostWhenNoneIsNamed) {
  EXPECT_EQ(SimulatedMachine(MachineOptions{}).Describe(), WriteHostDescription(OtxCtl::Sim::DefaultHost()));
}

TEST_F(SimulatedMachineTest, IsTheHostOfAFileOrOfAText) {
  const std::string text = WriteHostDescription(AHost().WithSsd("naa.1").Build());
  EXPECT_EQ(SimulatedMachine(Described(text)).Describe(), text);
  auto options = InFile(AHost().WithSsd("naa.2"));
  EXPECT_THAT(SimulatedMachine(options).Describe(), HasSubstr("naa.2"));
  options.description = text;
  EXPECT_EQ(SimulatedMachine(options).Describe(), text) << "instead of the file's";
}

TEST_F(SimulatedMachineTest, NamesAFileThatIsMissingOrBroken) {
  auto options = InFile(AHost());
  std::ofstream(_file) << broken;
  EXPECT_THAT([&] { MakeMachine(options); },
              ThrowsMessage<HostFileError>(AllOf(HasSubstr(_file), HasSubstr("disks[0].ssd"))));
  options.host = "/no/such/host.json";
  EXPECT_THAT([&] { MakeMachine(options); }, ThrowsMessage<HostFileError>(HasSubstr("/no/such/host.json")));
  EXPECT_THAT([&] { MakeMachine(Described(broken)); },
              ThrowsMessage<HostDescriptionError>(HasSubstr("disks[0].ssd")));
}

TEST_F(SimulatedMachineTest, SavesEveryChangeIfAskedTo) {
  SimulatedMachine machine(InFile(AHost().WithSsd("naa.1"), true));
  machine.Change(rename);
  EXPECT_EQ(NameInFile(), "changed");
}

TEST_F(SimulatedMachineTest, LeavesTheFileAloneUnlessAskedTo) {
  SimulatedMachine machine(InFile(AHost().WithSsd("naa.1")));
  machine.Change(rename);
  EXPECT_EQ(NameInFile(), "");
  EXPECT_FALSE(std::filesystem::exists(_file + ".lock"));
}

// File and memory are one, whatever the folder does once the file is in its place.
TEST_F(SimulatedMachineTest, WarnsOfAChangeThatMayNotLastAndKeepsIt) {
  const auto logger = Tessa::MakeRef<TestSupport::RecordingLogger>();
  const auto before = Tessa::Service::GetDefaultLogger();
  Tessa::Service::SetDefaultLogger(logger);
  SimulatedMachine machine(InFile(AHost().WithSsd("naa.1").WithHdd("naa.2"), true), [](int) {
    errno = EIO;
    return -1;
  });
  machine.MakeProvider()->FormatDiskMapping("naa.1", {"naa.2"}, {"", 1, 0});
  Tessa::Service::SetDefaultLogger(before);
  EXPECT_EQ(machine.SimulatedHost().Snapshot().groups.size(), 1u);
  EXPECT_EQ(OtxCtl::Sim::LoadHostFile(_file), machine.SimulatedHost().Snapshot());
  EXPECT_THAT(logger->Lines(Tessa::Service::LogLevel::Warning),
              ElementsAre(Field(&TestSupport::LogLine::arguments,
                                ElementsAre(HasSubstr("may not last a power cut: Input/output error")))));
}

TEST_F(SimulatedMachineTest, SavesNothingButAFileOfTheUsers) {
  MachineOptions example;
  example.save = true;
  EXPECT_THAT([&] { MakeMachine(example); }, ThrowsMessage<Host::HostError>(HasSubstr("--save")));
  auto described = InFile(AHost(), true);
  described.description = WriteHostDescription(AHost().Build());
  EXPECT_THAT([&] { MakeMachine(described); }, ThrowsMessage<Host::HostError>(HasSubstr("--save")));
}

TEST_F(SimulatedMachineTest, RefusesToSaveAHostThatAnotherOneSaves) {
  const auto options = InFile(AHost().WithSsd("naa.1"), true);
  {
    const SimulatedMachine first(options);
    EXPECT_THAT([&] { MakeMachine(options); }, ThrowsMessage<HostFileError>(HasSubstr(_file)));
  }
  EXPECT_NO_THROW(MakeMachine(options));
}

TEST_F(SimulatedMachineTest, TakesAChangeOrSaysWhereItIsWrong) {
  SimulatedMachine machine(std::make_shared<OtxCtl::Sim::SimHost>(AHost().WithSsd("naa.1").Build()));
  Host::Simulation& simulation = *machine.GetSimulation();
  simulation.Change(R"({"set": {"autoMode": true}, "disk": {"name": "naa.1", "partitions": 1}})");
  EXPECT_TRUE(machine.MakeProvider()->IsAutoModeEnabled());
  const std::string before = simulation.Describe();
  const auto nobody = R"({"disk": {"name": "naa.9"}})";
  EXPECT_NO_THROW(simulation.CheckChange(nobody)) << "on some host it may be a change";
  EXPECT_THAT([&] { simulation.Change(nobody); }, ThrowsMessage<ChangeRefused>(HasSubstr("disk.name: ")));
  for (const char* nonsense : {"", "[]", R"({"disk": {}})"}) {
    EXPECT_THROW(simulation.CheckChange(nonsense), ChangeRefused) << nonsense;
    EXPECT_THROW(simulation.Change(nonsense), ChangeRefused) << nonsense;
  }
  EXPECT_EQ(simulation.Describe(), before);
}

std::size_t CountOf(SimulatedMachine& machine) {
  const auto info = machine.GetInventory();
  return info ? info->GetScsiLun()->Size() : 99;
}

TEST_F(SimulatedMachineTest, TellsItsListenerOfEveryChangeWhoeverMakesIt) {
  SimulatedMachine machine(
      std::make_shared<OtxCtl::Sim::SimHost>(AHost().WithSsd("naa.1").WithHdd("naa.2").Build()));
  std::vector<std::size_t> seen;
  machine.SetListener([&] { seen.push_back(CountOf(machine)); });
  machine.Change(R"({"disk": {"name": "naa.2", "inInventory": false}})");
  machine.MakeProvider()->FormatDiskMapping("naa.1", {"naa.2"}, {"", 1, 0});
  machine.Change(R"({"set": {"storageSystem": "missing"}})");
  EXPECT_THAT(seen, ElementsAre(1, 1, 99));
  machine.SetListener({});
  machine.Change(rename);
  EXPECT_EQ(seen.size(), 3u);
}

TEST_F(SimulatedMachineTest, EveryProviderShowsTheSameDisks) {
  SimulatedMachine machine(
      std::make_shared<OtxCtl::Sim::SimHost>(AHost().WithSsd("naa.1").WithHdd("naa.2").Build()));
  machine.MakeProvider()->FormatDiskMapping("naa.1", {"naa.2"}, {"", 1, 0});
  std::vector<HostCtl::Kova::DiskMapping> groups;
  machine.MakeProvider()->GetDiskMappings(groups, false);
  EXPECT_EQ(groups.size(), 1u);
}

TEST_F(SimulatedMachineTest, WaitsForNoFaultOfACopy) {
  MachineOptions options =
      Described(R"({"disks": [], "faults": [{"operation": "RefreshKovaInfo", "delayMs": 600000}]})");
  options.waitForFaults = false;
  EXPECT_NO_THROW(MakeMachine(options)->MakeProvider()->RefreshKovaInfo());
}

}  // namespace
}  // namespace Machines
