// The runtime round the real plug-in. There is one runtime in a process, so every test has a process of its
// own.

#include "host/HostRuntime.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdio>
#include <functional>
#include <nlohmann/json.hpp>

#include "host/HostError.h"
#include "host/KovaService.h"
#include "host/LogSink.h"
#include "host/testing/OwnProcess.h"
#include "host/testing/Requests.h"
#include "machines/SimulatedMachine.h"
#include "nox/Kova.h"
#include "nox/StorageSystem.h"
#include "orbis/Json.h"
#include "orbis/Soap.h"
#include "otxctl/fault/CallRecorder.h"
#include "otxctl/provider/ForwardingProvider.h"
#include "otxctl/sim/HostBuilder.h"
#include "tessa/Panic.h"

namespace Host {
namespace {

namespace Op = Nox::Operation;
using Nox::Kova::Host::DiskResult;
using OtxCtl::Sim::AHost;
using OtxCtl::Sim::HostBuilder;
using OtxCtl::Sim::HostDescription;
using OtxCtl::Sim::SimHost;
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

class HostRuntimeTest : public testing::Test {
 protected:
  // Options for a simulated machine, whose host is then at hand.
  RuntimeOptions On(const HostBuilder& host) {
    _host = std::make_shared<SimHost>(host.Build());
    RuntimeOptions options;
    options.makeMachine = [host = _host] { return std::make_unique<Machines::SimulatedMachine>(host); };
    options.pluginFile = KOVA_PLUGIN;
    return options;
  }

  std::shared_ptr<SimHost> _host;
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

TEST_F(HostRuntimeTest, ServesTheMachineThatItIsGiven) {
  const auto options = On(AHost().WithSsd("naa.1").WithDisk(
      "naa.2", false, [](OtxCtl::Sim::HostDisk& disk) { disk.partitions = 1; }));
  InOwnProcess([&options] {
    EXPECT_THAT(Disks(HostRuntime::Start(options)), ElementsAre("naa.1 eligible", "naa.2 ineligible"));
  });
}

TEST_F(HostRuntimeTest, IsTheSameWhoeverStartsItLater) {
  const auto options = On(AHost().WithSsd("naa.1"));
  InOwnProcess([&options] {
    HostRuntime& first = HostRuntime::Start(options);
    EXPECT_EQ(&HostRuntime::Start(RuntimeOptions()), &first);
  });
}

// What a machine must have, and no more.
class PlainMachine final : public Machine {
 public:
  std::unique_ptr<HostCtl::Kova::KovaInfo> MakeProvider() override {
    return std::make_unique<OtxCtl::Provider::ForwardingProvider>();
  }
  Ref<Nox::Host::StorageDeviceInfo> GetInventory() override {
    auto info = Tessa::MakeRef<Nox::Host::StorageDeviceInfo>();
    info->SetScsiLun(Tessa::MakeRef<Orbis::DataArray<Nox::Host::ScsiLun>>());
    return info;
  }
  void SetListener(Listener) override {}
  Twin TakeTwin() override { return {"as-it-was", "{}"}; }
};

TEST_F(HostRuntimeTest, ServesAMachineThatIsNotSimulated) {
  RuntimeOptions options;
  options.makeMachine = [] { return std::make_unique<PlainMachine>(); };
  options.pluginFile = KOVA_PLUGIN;
  InOwnProcess([&options] {
    HostRuntime& runtime = HostRuntime::Start(options);
    EXPECT_EQ(runtime.GetSimulation(), nullptr);
    EXPECT_THAT(Disks(runtime), ElementsAre());
    const KovaService service(runtime.Hooks(), &runtime.GetMachine());
    EXPECT_NO_THROW(service.CheckHostChange("no change"));
    EXPECT_THROW(service.DescribeHost(), HostError);
  });
}

// A machine whose disks others change, too.
class LivingMachine final : public Machine {
 public:
  explicit LivingMachine(std::shared_ptr<SimHost> host) : _machine(std::move(host)) {}

  std::unique_ptr<HostCtl::Kova::KovaInfo> MakeProvider() override { return _machine.MakeProvider(); }
  Ref<Nox::Host::StorageDeviceInfo> GetInventory() override { return _machine.GetInventory(); }
  void SetListener(Listener listener) override { _machine.SetListener(std::move(listener)); }
  Twin TakeTwin() override { return _machine.TakeTwin(); }
  std::vector<DataVolume> GetDataVolumes() override { return volumes; }
  std::shared_ptr<void> HoldLook() override {
    ++looksHeld;
    return nullptr;
  }

  int looksHeld = 0;
  std::vector<DataVolume> volumes;

 private:
  Machines::SimulatedMachine _machine;
};

TEST_F(HostRuntimeTest, OfAMachineThatChangesByItselfEachQuestionSeesItsDisksAsTheyAre) {
  auto options = On(AHost().WithSsd("naa.1"));
  options.makeMachine = [host = _host] { return std::make_unique<LivingMachine>(host); };
  InOwnProcess([this, &options] {
    HostRuntime& runtime = HostRuntime::Start(options);
    const KovaService service(runtime.Hooks(), &runtime.GetMachine());
    EXPECT_THAT(DisksOf(service.Query(Op::QueryDisksForKova())), ElementsAre("naa.1 eligible"));
    _host->Change([](OtxCtl::Sim::HostDescription& host) { host.disks[0].partitions = 1; });
    EXPECT_THAT(Disks(runtime), ElementsAre("naa.1 eligible")) << "what the plug-in alone would say";
    EXPECT_THAT(DisksOf(service.Query(Op::QueryDisksForKova())), ElementsAre("naa.1 ineligible"));
    service.Query(Op::GetConfigInfo());
    EXPECT_EQ(static_cast<LivingMachine&>(runtime.GetMachine()).looksHeld, 2) << "one for each about disks";
  });
}

TEST_F(HostRuntimeTest, AChangeOfAMachineThatChangesByItselfSeesItsDisksAsTheyAre) {
  auto options = On(AHost().WithSsd("naa.1").WithHdd("naa.2"));
  options.makeMachine = [host = _host] { return std::make_unique<LivingMachine>(host); };
  InOwnProcess([this, &options] {
    HostRuntime& runtime = HostRuntime::Start(options);
    const KovaService service(runtime.Hooks(), &runtime.GetMachine());
    service.Query(Op::QueryDisksForKova());
    _host->Change([](OtxCtl::Sim::HostDescription& host) { host.disks[0].verdict = {2, 4}; });
    service.Change(Op::AddAllEligibleDisks());
    EXPECT_THAT(_host->Snapshot().groups, testing::IsEmpty());
  });
}

// The groups in a JSON text.
std::string GroupsText(const KovaService& service) {
  std::string text;
  const Answer answer = service.Query(Op::GetDiskGroups());
  EXPECT_FALSE(answer.fault);
  Orbis::WriteJson(*answer.result.Get(), text);
  return text;
}

TEST_F(HostRuntimeTest, ShowsTheDataVolumesOfItsMachineWithTheGroupsMountedOrNot) {
  auto options = On(AHost()
                        .WithSsd("naa.1")
                        .WithHdd("naa.2")
                        .WithSsd("naa.3")
                        .WithHdd("naa.4")
                        .WithGroup("naa.1", {"naa.2"})
                        .WithUnmountedGroup("naa.3", {"naa.4"}));
  options.makeMachine = [host = _host] { return std::make_unique<LivingMachine>(host); };
  InOwnProcess([&options] {
    HostRuntime& runtime = HostRuntime::Start(options);
    auto& machine = static_cast<LivingMachine&>(runtime.GetMachine());
    const KovaService service(runtime.Hooks(), &machine);
    const std::string before = GroupsText(service);
    EXPECT_THAT(before, testing::Not(HasSubstr("olume")));
    machine.volumes = {{"naa.2", "/dev/vg/d2", 4096, "cached"}, {"naa.4", "/dev/vg/d4", 8192, "inactive"}};
    const std::string shown = GroupsText(service);
    EXPECT_THAT(shown,
                HasSubstr(R"("disk":"naa.2","path":"/dev/vg/d2","bytes":4096,"cacheState":"cached"})"));
    EXPECT_THAT(shown,
                HasSubstr(R"("disk":"naa.4","path":"/dev/vg/d4","bytes":8192,"cacheState":"inactive"})"));
    machine.volumes.clear();
    EXPECT_EQ(GroupsText(service), before);
  });
}

TEST_F(HostRuntimeTest, MakesNoMachineWithoutAPlugin) {
  RuntimeOptions options;
  options.pluginFile = "/no/such/plugin.so";
  options.makeMachine = []() -> std::unique_ptr<Machine> { throw std::logic_error("made too early"); };
  InOwnProcess(
      [&options] { EXPECT_THAT(WhyNotStarted<HostError>(options), HasSubstr("/no/such/plugin.so")); });
}

TEST_F(HostRuntimeTest, LetsTheMachinesOwnRefusalThroughAndMayBeStartedAgain) {
  auto options = On(AHost().WithSsd("naa.1"));
  InOwnProcess([&options] {
    const auto make = std::exchange(options.makeMachine, []() -> std::unique_ptr<Machine> {
      throw std::domain_error("no such machine");
    });
    EXPECT_EQ(WhyNotStarted<std::domain_error>(options), "no such machine");
    options.makeMachine = make;
    EXPECT_THAT(Disks(HostRuntime::Start(options)), ElementsAre("naa.1 eligible"));
  });
}

TEST_F(HostRuntimeTest, RegistersTheInventoryAndKeepsItInLineWithTheHost) {
  const auto options = On(AHost().WithSsd("naa.1").WithHdd("naa.2"));
  InOwnProcess([&options, this] {
    HostRuntime::Start(options);
    const auto count = [] {
      Ref<Nox::Host::StorageSystem> storageSystem;
      Tessa::Service::TryLookupObject("storageSystem", storageSystem);
      Ref<Nox::Host::StorageDeviceInfo> info;
      storageSystem->GetStorageDeviceInfo(info);
      return info->GetScsiLun()->Size();
    };
    EXPECT_EQ(count(), 2u);
    _host->Change([](HostDescription& host) { host.disks[1].absent = true; });
    EXPECT_EQ(count(), 1u);
  });
}

TEST_F(HostRuntimeTest, WithoutAStorageSystemAQueryIsASystemError) {
  const auto options = On(AHost().WithSsd("naa.1").Edit(
      [](HostDescription& host) { host.storageSystem = OtxCtl::Sim::StorageSystem::Missing; }));
  InOwnProcess([&options, this] {
    HostRuntime& runtime = HostRuntime::Start(options);
    const Answer answer = KovaService(runtime.Hooks()).Query(Op::QueryDisksForKova());
    EXPECT_FALSE(answer.result);
    EXPECT_NE(dynamic_cast<const Orbis::Fault::SystemError*>(answer.fault.Get()), nullptr);

    // The object comes, and with it the answer.
    _host->Change(nlohmann::json{{"storageSystem", "present"}}, nullptr);
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
  const auto options = On(AHost()
                              .WithSsd("naa.1")
                              .WithDisk("naa.2", false, [](auto& disk) { disk.local = false; })
                              .Edit([](HostDescription& host) {
                                host.faults = {{.operation = "QueryDisks",
                                                .call = 2,
                                                .exception = "HostCtlException",
                                                .message = {},
                                                .disk = {}}};
                              }));
  InOwnProcess([&options, this] {
    HostRuntime& runtime = HostRuntime::Start(options);
    const KovaService service(runtime.Hooks(), &runtime.GetMachine());
    const Answer answer =
        service.Change(Op::InitializeDisks(Testing::Mappings({Testing::MappingOf("naa.1", {"naa.2"})})));
    EXPECT_TRUE(answer.fault);
    EXPECT_TRUE(_host->Snapshot().groups.empty());
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
  return Testing::OutcomeText(answer.fault.Get());
}

TEST_F(HostRuntimeTest, AddsUnmountsClaimsAndRemovesOnTheSimulatedHost) {
  const auto options = On(AHost().WithSsd("naa.1").WithHdds({"naa.2", "naa.3"}));
  InOwnProcess([&options, this] {
    HostRuntime& runtime = HostRuntime::Start(options);
    const KovaService service(runtime.Hooks(), &runtime.GetMachine());
    const auto groups = [this] { return _host->Snapshot().groups; };
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
  InOwnProcess([&options, this] {
    HostRuntime& runtime = HostRuntime::Start(options);
    const KovaService service(runtime.Hooks(), &runtime.GetMachine());
    EXPECT_THAT(ToldBy(service.Change(Op::AddDisks(Testing::DisksNamed({"naa.1", "naa.4"})))),
                HasSubstr("'kova:uuid-of-naa.3'"));
    EXPECT_EQ(ToldBy(service.ChangeHost(R"({"disk": {"name": "naa.3", "absent": false}})")), "done");
    EXPECT_EQ(ToldBy(service.Change(Op::AddDisks(Testing::DisksNamed({"naa.1"})))), "done");
    EXPECT_TRUE(_host->Snapshot().groups[0].mounted);
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
    const KovaService service(runtime.Hooks(), &runtime.GetMachine());
    EXPECT_THAT(Disks(runtime), ElementsAre("naa.1 eligible", "naa.2 eligible"));
    EXPECT_EQ(ToldBy(service.ChangeHost(R"({"disk": {"name": "naa.2", "partitions": 1}})")), "done");
    EXPECT_THAT(Disks(runtime), ElementsAre("naa.1 eligible", "naa.2 ineligible"));
  });
}

}  // namespace
}  // namespace Host
