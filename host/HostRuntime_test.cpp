// The runtime round the real plug-in. There is one runtime in a process, so every test has a process of its
// own.

#include "host/HostRuntime.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <functional>
#include <nlohmann/json.hpp>

#include "host/HostError.h"
#include "host/KovaService.h"
#include "host/LogSink.h"
#include "host/testing/OwnProcess.h"
#include "host/testing/Requests.h"
#include "nox/Kova.h"
#include "nox/StorageSystem.h"
#include "orbis/Soap.h"
#include "otxctl/fault/CallRecorder.h"
#include "otxctl/sim/HostBuilder.h"
#include "tessa/Panic.h"

namespace Host {
namespace {

namespace Op = Nox::Operation;
using Nox::Kova::Host::DiskResult;
using OtxCtl::Sim::AHost;
using OtxCtl::Sim::HostBuilder;
using OtxCtl::Sim::HostDescription;
using Tessa::Ref;
using testing::ElementsAre;
using testing::HasSubstr;

constexpr int panicStatus = 70;

[[noreturn]] void EndOverPanic(const char* text) {
  std::fprintf(stderr, "panic: %s\n", text);
  _exit(panicStatus);
}

// A program's own start, then the body, in a process that nobody shares.
void InOwnProcess(const std::function<void()>& body, int status = 0,
                  const std::string& onStandardError = "") {
  Testing::InOwnProcess(
      [&body] {
        Tessa::Service::SetDefaultLogger(MakeConsoleLogger(Tessa::Service::LogLevel::Warning));
        Tessa::SetPanicHandler(&EndOverPanic);
        body();
      },
      status, onStandardError);
}

// A host in a file that goes with the test.
class HostRuntimeTest : public testing::Test {
 protected:
  ~HostRuntimeTest() override {
    for (const char* ending : {"", ".lock"}) {
      std::remove((_file + ending).c_str());
    }
  }

  RuntimeOptions On(const HostBuilder& host) const {
    std::ofstream(_file) << WriteHostDescription(host.Build());
    RuntimeOptions options;
    options.hostFile = _file;
    options.pluginFile = KOVA_PLUGIN;
    return options;
  }

  static RuntimeOptions OnExampleHost() {
    RuntimeOptions options;
    options.pluginFile = KOVA_PLUGIN;
    return options;
  }

  const std::string _file = testing::TempDir() + "host-runtime-" + std::to_string(getpid()) + ".json";
};

// "NAME STATE" of each disk of an answer.
std::vector<std::string> DisksOf(const Answer& answer) {
  std::vector<std::string> disks;
  const auto* const results = dynamic_cast<const Orbis::DataArray<DiskResult>*>(answer.result.Get());
  if (results == nullptr) {
    return {"no result"};
  }
  for (const DiskResult* disk : *results) {
    disks.push_back(disk->GetDisk()->GetCanonicalName() + " " + disk->GetState());
  }
  return disks;
}

std::vector<std::string> Disks(const HostRuntime& runtime) {
  return DisksOf(KovaService(runtime.Hooks()).Query(Op::QueryDisksForKova()));
}

template <class Error>
std::string WhyNotStarted(const RuntimeOptions& options) {
  try {
    HostRuntime::Start(options);
    return "it was started";
  } catch (const Error& refused) {
    return refused.what();
  }
}

TEST_F(HostRuntimeTest, ServesTheExampleHostWhenNoneIsNamed) {
  InOwnProcess([] {
    const auto disks = Disks(HostRuntime::Start(OnExampleHost()));
    EXPECT_EQ(disks.size(), 12u);
    EXPECT_EQ(disks.front(), "naa.5000c50000000100 eligible");
  });
}

TEST_F(HostRuntimeTest, ServesTheHostOfAFile) {
  const auto options = On(AHost().WithSsd("naa.1").WithDisk(
      "naa.2", false, [](OtxCtl::Sim::HostDisk& disk) { disk.partitions = 1; }));
  InOwnProcess([&options] {
    EXPECT_THAT(Disks(HostRuntime::Start(options)), ElementsAre("naa.1 eligible", "naa.2 ineligible"));
  });
}

TEST_F(HostRuntimeTest, ServesTheHostOfAText) {
  auto options = OnExampleHost();
  options.hostText = WriteHostDescription(AHost().WithSsd("naa.1").Build());
  InOwnProcess(
      [&options] { EXPECT_THAT(Disks(HostRuntime::Start(options)), ElementsAre("naa.1 eligible")); });
  options.hostText = R"({"disks": [{"name": "naa.1", "ssd": 1, "bytes": 1}]})";
  InOwnProcess([&options] {
    EXPECT_THAT(WhyNotStarted<OtxCtl::Sim::HostDescriptionError>(options), HasSubstr("disks[0].ssd"));
  });
}

TEST_F(HostRuntimeTest, DoesNotSaveTheHostOfAText) {
  auto options = On(AHost().WithSsd("naa.1"));
  options.hostText = WriteHostDescription(AHost().WithSsd("naa.2").Build());
  options.save = true;
  InOwnProcess([&options] { EXPECT_THAT(WhyNotStarted<HostError>(options), HasSubstr("--save")); });
}

TEST_F(HostRuntimeTest, IsTheSameWhoeverStartsItLater) {
  InOwnProcess([] {
    HostRuntime& first = HostRuntime::Start(OnExampleHost());
    EXPECT_EQ(&HostRuntime::Start(RuntimeOptions()), &first);
  });
}

TEST_F(HostRuntimeTest, RegistersTheInventoryAndKeepsItInLineWithTheHost) {
  const auto options = On(AHost().WithSsd("naa.1").WithHdd("naa.2"));
  InOwnProcess([&options] {
    HostRuntime& runtime = HostRuntime::Start(options);
    const auto count = [] {
      Ref<Nox::Host::StorageSystem> storageSystem;
      Tessa::Service::TryLookupObject("storageSystem", storageSystem);
      Ref<Nox::Host::StorageDeviceInfo> info;
      storageSystem->GetStorageDeviceInfo(info);
      return info->GetScsiLun()->Size();
    };
    EXPECT_EQ(count(), 2u);
    runtime.SimulatedHost().Change([](HostDescription& host) { host.disks[1].absent = true; });
    EXPECT_EQ(count(), 1u);
  });
}

TEST_F(HostRuntimeTest, WithoutAStorageSystemAQueryIsASystemError) {
  const auto options = On(AHost().WithSsd("naa.1").Edit(
      [](HostDescription& host) { host.storageSystem = OtxCtl::Sim::StorageSystem::Missing; }));
  InOwnProcess([&options] {
    HostRuntime& runtime = HostRuntime::Start(options);
    const Answer answer = KovaService(runtime.Hooks()).Query(Op::QueryDisksForKova());
    EXPECT_FALSE(answer.result);
    EXPECT_NE(dynamic_cast<const Orbis::Fault::SystemError*>(answer.fault.Get()), nullptr);

    // The object comes, and with it the answer.
    runtime.SimulatedHost().Change(nlohmann::json{{"storageSystem", "present"}}, nullptr);
    EXPECT_THAT(Disks(runtime), ElementsAre("naa.1 eligible"));
  });
}

HostBuilder AHostWhoseQueryThrows(const std::string& exception, int call) {
  return AHost().WithSsd("naa.1").Edit([&](HostDescription& host) {
    host.faults = {
        {.operation = "QueryDisks", .call = call, .exception = exception, .message = "no luck", .disk = {}}};
  });
}

TEST_F(HostRuntimeTest, AProviderThatFailsOnceShowsNoDisksAndThenAll) {
  const auto options = On(AHostWhoseQueryThrows("HostCtlException", 1));
  InOwnProcess([&options] {
    HostRuntime& runtime = HostRuntime::Start(options);
    EXPECT_THAT(Disks(runtime), ElementsAre());
    EXPECT_THAT(Disks(runtime), ElementsAre("naa.1 eligible"));
  });
}

TEST_F(HostRuntimeTest, AProviderThatThrowsWhatItMustNotHasFailedLikeAnyOther) {
  const auto options = On(AHostWhoseQueryThrows("std::runtime_error", 1));
  InOwnProcess([&options] {
    HostRuntime& runtime = HostRuntime::Start(options);
    EXPECT_THAT(Disks(runtime), ElementsAre());
    EXPECT_THAT(Disks(runtime), ElementsAre("naa.1 eligible"));
  });
}

TEST_F(HostRuntimeTest, ABareProviderThatThrowsWhatItMustNotEndsTheProcess) {
  auto options = On(AHostWhoseQueryThrows("std::runtime_error", 0));
  options.bare = true;
  InOwnProcess([&options] { Disks(HostRuntime::Start(options)); }, panicStatus, "panic: no luck");
}

TEST_F(HostRuntimeTest, RecordsTheCallsOfTheProvider) {
  auto options = On(AHost().WithSsd("naa.1"));
  options.recorder = std::make_shared<OtxCtl::Fault::CallRecorder>();
  InOwnProcess([&options] {
    Disks(HostRuntime::Start(options));
    std::vector<std::string> calls;
    for (const auto& call : options.recorder->Calls()) {
      calls.push_back(call.operation + call.arguments.dump());
    }
    EXPECT_THAT(calls, ElementsAre("RefreshKovaInfo[]", "QueryDisks[[],true]"));
  });
}

// The gate's own question is the first call, the plug-in's the second.
TEST_F(HostRuntimeTest, MakesNoGroupOfADiskThatTheKernelCouldNotTellAbout) {
  auto host =
      AHost().WithSsd("naa.1").WithDisk("naa.2", false, [](auto& disk) { disk.local = false; }).Build();
  host.faults = {
      {.operation = "QueryDisks", .call = 2, .exception = "HostCtlException", .message = {}, .disk = {}}};
  RuntimeOptions options;
  options.hostText = WriteHostDescription(host);
  options.pluginFile = KOVA_PLUGIN;
  InOwnProcess([&options] {
    HostRuntime& runtime = HostRuntime::Start(options);
    const KovaService service(runtime.Hooks(), &runtime.SimulatedHost());
    const Answer answer =
        service.Change(Op::InitializeDisks(Testing::Mappings({Testing::MappingOf("naa.1", {"naa.2"})})));
    EXPECT_TRUE(answer.fault);
    EXPECT_TRUE(runtime.SimulatedHost().Snapshot().groups.empty());
  });
}

TEST_F(HostRuntimeTest, SavesEveryChangeIfAskedTo) {
  auto options = On(AHost().WithSsd("naa.1"));
  options.save = true;
  InOwnProcess([&options] {
    HostRuntime::Start(options).SimulatedHost().Change([](HostDescription& host) { host.name = "changed"; });
    EXPECT_EQ(OtxCtl::Sim::LoadHostFile(options.hostFile).name, "changed");
  });
}

// File and memory are one, whatever the folder does once the file is in its place.
TEST_F(HostRuntimeTest, WarnsOfAChangeThatMayNotLastAndKeepsIt) {
  auto options = On(AHost().WithSsd("naa.1").WithHdd("naa.2"));
  options.save = true;
  options.syncFolder = [](int) {
    errno = EIO;
    return -1;
  };
  InOwnProcess(
      [&options] {
        HostRuntime& runtime = HostRuntime::Start(options);
        const KovaService service(runtime.Hooks(), &runtime.SimulatedHost());
        EXPECT_FALSE(service.Change(Op::AddAllEligibleDisks()).fault);
        EXPECT_EQ(runtime.SimulatedHost().Snapshot().groups.size(), 1u);
        EXPECT_EQ(OtxCtl::Sim::LoadHostFile(options.hostFile), runtime.SimulatedHost().Snapshot());
        FlushLogs();
      },
      0, "may not last a power cut: Input/output error");
}

TEST_F(HostRuntimeTest, LeavesTheFileAloneUnlessAskedTo) {
  const auto options = On(AHost().WithSsd("naa.1"));
  InOwnProcess([&options] {
    HostRuntime::Start(options).SimulatedHost().Change([](HostDescription& host) { host.name = "changed"; });
    EXPECT_EQ(OtxCtl::Sim::LoadHostFile(options.hostFile).name, "");
    EXPECT_FALSE(std::filesystem::exists(options.hostFile + ".lock"));
  });
}

TEST_F(HostRuntimeTest, RefusesToSaveAHostThatAnotherProgramSaves) {
  auto options = On(AHost().WithSsd("naa.1"));
  options.save = true;
  const OtxCtl::Sim::HostFileWriter other(options.hostFile);
  InOwnProcess([&options] {
    EXPECT_THAT(WhyNotStarted<OtxCtl::Sim::HostFileError>(options), HasSubstr(options.hostFile));
  });
}

TEST_F(HostRuntimeTest, RefusesToSaveTheExampleHost) {
  auto options = OnExampleHost();
  options.save = true;
  InOwnProcess([&options] { EXPECT_THAT(WhyNotStarted<HostError>(options), HasSubstr("--save")); });
}

TEST_F(HostRuntimeTest, NamesAHostFileThatIsMissingOrBroken) {
  auto options = On(AHost().WithSsd("naa.1"));
  std::ofstream(_file) << R"({"disks": [{"name": "naa.1", "ssd": 1, "bytes": 1}]})";
  InOwnProcess([&options] {
    EXPECT_THAT(WhyNotStarted<OtxCtl::Sim::HostFileError>(options),
                testing::AllOf(HasSubstr(options.hostFile), HasSubstr("disks[0].ssd")));
    options.hostFile = "/no/such/host.json";
    EXPECT_THAT(WhyNotStarted<OtxCtl::Sim::HostFileError>(options), HasSubstr("/no/such/host.json"));
  });
}

TEST_F(HostRuntimeTest, APluginThatCannotBeInitialisedLeavesNothingBehind) {
  auto options = On(AHost().WithSsd("naa.1"));
  InOwnProcess([&options] {
    options.pluginFile = KOVA_DEAF_PLUGIN;
    EXPECT_THAT(WhyNotStarted<HostError>(options), HasSubstr("initialised"));
    EXPECT_EQ(Tessa::Service::GetApp(), nullptr);
    EXPECT_FALSE(Tessa::Authorize::AuthorizeManager::GetInstance());

    options.pluginFile = KOVA_PLUGIN;
    EXPECT_THAT(Disks(HostRuntime::Start(options)), ElementsAre("naa.1 eligible"));
  });
}

// The whole way through the gate and the real plug-in, and back.
std::string ToldBy(const Answer& answer) {
  return Testing::Told(answer.fault.Get());
}

TEST_F(HostRuntimeTest, AddsUnmountsClaimsAndRemovesOnTheSimulatedHost) {
  const auto options = On(AHost().WithSsd("naa.1").WithHdds({"naa.2", "naa.3"}));
  InOwnProcess([&options] {
    HostRuntime& runtime = HostRuntime::Start(options);
    const KovaService service(runtime.Hooks(), &runtime.SimulatedHost());
    const auto groups = [&runtime] { return runtime.SimulatedHost().Snapshot().groups; };
    EXPECT_EQ(ToldBy(service.Change(Op::AddDisks(Testing::DisksNamed({"naa.1", "naa.2", "naa.3"})))), "done");
    ASSERT_EQ(groups().size(), 1u);
    EXPECT_EQ(ToldBy(service.Change(Op::RemoveDisk("naa.3"))), "done");
    const auto group = Testing::MappingOf("naa.1", {"naa.2"});
    EXPECT_EQ(ToldBy(service.Change(Op::UnmountDiskMapping(Testing::Mappings({group})))), "done");
    EXPECT_FALSE(groups()[0].mounted);
    EXPECT_EQ(ToldBy(service.Change(Op::ClaimUnmountedDiskgroup())), "done");
    EXPECT_TRUE(groups()[0].mounted);
    EXPECT_EQ(ToldBy(service.Change(Op::RemoveDiskMapping(group))), "done");
    EXPECT_TRUE(groups().empty());
    EXPECT_EQ(ToldBy(service.Change(Op::InitializeDisks(Testing::Mappings({group})))), "done");
    EXPECT_EQ(groups().size(), 1u);
  });
}

TEST_F(HostRuntimeTest, RefusesTheCacheDiskOfABrokenGroupThatWouldEndThePlugin) {
  const auto options = On(AHost()
                              .WithSsd("naa.1")
                              .WithHdds({"naa.2", "naa.3", "naa.4"})
                              .WithUnmountedGroup("naa.1", {"naa.2", "naa.3"})
                              .Without("naa.3"));
  InOwnProcess([&options] {
    HostRuntime& runtime = HostRuntime::Start(options);
    const KovaService service(runtime.Hooks(), &runtime.SimulatedHost());
    EXPECT_THAT(ToldBy(service.Change(Op::AddDisks(Testing::DisksNamed({"naa.1", "naa.4"})))),
                HasSubstr("'kova:uuid-of-naa.3'"));
    EXPECT_EQ(ToldBy(service.ChangeHost(R"({"disk": {"name": "naa.3", "absent": false}})")), "done");
    EXPECT_EQ(ToldBy(service.Change(Op::AddDisks(Testing::DisksNamed({"naa.1"})))), "done");
    EXPECT_TRUE(runtime.SimulatedHost().Snapshot().groups[0].mounted);
  });
}

TEST_F(HostRuntimeTest, WithoutTheGateThatRequestEndsTheProcess) {
  const auto options =
      On(AHost().WithSsd("naa.1").WithHdd("naa.2").WithUnmountedGroup("naa.1", {"naa.2"}).Without("naa.2"));
  InOwnProcess(
      [&options] {
        const HostRuntime& runtime = HostRuntime::Start(options);
        std::string disk;
        std::string fault;
        std::string result;
        Orbis::SerializeObjectToSoap(*Testing::ADisk("naa.1", true), nullptr, disk);
        runtime.Hooks().addDisks({disk}, "", fault, result);
      },
      panicStatus, "panic: Not initialized");
}

TEST_F(HostRuntimeTest, AChangeOfTheHostIsSeenByTheNextRequest) {
  const auto options = On(AHost().WithSsd("naa.1").WithHdd("naa.2"));
  InOwnProcess([&options] {
    HostRuntime& runtime = HostRuntime::Start(options);
    const KovaService service(runtime.Hooks(), &runtime.SimulatedHost());
    EXPECT_THAT(Disks(runtime), ElementsAre("naa.1 eligible", "naa.2 eligible"));
    EXPECT_EQ(ToldBy(service.ChangeHost(R"({"disk": {"name": "naa.2", "partitions": 1}})")), "done");
    EXPECT_THAT(Disks(runtime), ElementsAre("naa.1 eligible", "naa.2 ineligible"));
  });
}

}  // namespace
}  // namespace Host
