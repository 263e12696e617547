// The service's changing operations before hooks that only listen: what reaches the plug-in, and what does
// not.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>

#include "host/AgentApp.h"
#include "host/HostError.h"
#include "host/Inventory.h"
#include "host/KovaService.h"
#include "host/testing/Requests.h"
#include "machines/SimulatedInventory.h"
#include "machines/SimulatedMachine.h"
#include "orbis/Soap.h"
#include "otxctl/ProviderFactory.h"
#include "otxctl/TaskScope.h"
#include "otxctl/sim/HostBuilder.h"
#include "otxctl/sim/SimProvider.h"

namespace Host {
namespace {

using namespace Host::Testing;
using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;
using OtxCtl::Sim::AHost;
using OtxCtl::Sim::HostDescription;
using OtxCtl::Sim::SimHost;
using Tessa::MakeRef;
using Tessa::Ref;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::StartsWith;

// What the hooks were called with, one line per call.
std::vector<std::string> heard;
// What the next hooks say.
std::string saidFault;
std::string saidResult;

std::string Show(const ScsiDisk& disk) {
  return disk.GetCanonicalName() + (disk.GetSsd() ? "!" : "");
}

std::string Show(const DiskMapping& mapping) {
  std::string text = Show(*mapping.GetSsd()) + "<";
  if (mapping.GetNonSsd()) {
    for (const ScsiDisk* disk : *mapping.GetNonSsd()) {
      text += Show(*disk);
    }
  }
  return text + ">";
}

template <class Item>
std::string ShowText(const std::string& text) {
  Ref<Orbis::Any> value;
  Orbis::DeserializeSoapToObject(text, value, nullptr, &Item::StaticType());
  return Show(dynamic_cast<const Item&>(*value));
}

template <class Item>
std::string ShowTexts(const Kovasvc::Texts& texts) {
  std::string shown;
  for (const std::string& text : texts) {
    shown += " " + ShowText<Item>(text);
  }
  return shown;
}

void Say(std::string& fault, std::string& result) {
  fault += saidFault;
  result += saidResult;
}

PluginHooks Listeners() {
  PluginHooks hooks{};
  hooks.addDisks = [](const Kovasvc::Texts& disks, const std::string& tag, std::string& fault,
                      std::string& result) {
    heard.push_back("add" + ShowTexts<ScsiDisk>(disks) + " #" + tag);
    Say(fault, result);
  };
  hooks.initializeDisks = [](const Kovasvc::Texts& mappings, const std::string& tag, std::string& fault,
                             std::string& result) {
    heard.push_back("init" + ShowTexts<DiskMapping>(mappings) + " #" + tag);
    Say(fault, result);
  };
  hooks.unmountDiskMapping = [](const Kovasvc::Texts& mappings, const std::string& tag, std::string& fault,
                                std::string& result) {
    heard.push_back("unmount" + ShowTexts<DiskMapping>(mappings) + " #" + tag);
    Say(fault, result);
  };
  hooks.addAllEligibleDisks = [](const std::string& tag, std::string& fault, std::string& result) {
    heard.push_back("add all #" + tag);
    Say(fault, result);
  };
  hooks.removeDisks = [](const std::string& disk, const std::string& passThrough, const std::string& text,
                         int first, int second, std::string& fault) {
    heard.push_back("remove " + disk + " " + passThrough + " " + text + " " + std::to_string(first) + " " +
                    std::to_string(second));
    fault += saidFault;
  };
  hooks.removeDiskMapping = [](const std::string& mapping, const std::string& passThrough,
                               const std::string& text, int first, int second, std::string& fault) {
    heard.push_back("remove group " + ShowText<DiskMapping>(mapping) + " " + passThrough + " " + text + " " +
                    std::to_string(first) + " " + std::to_string(second));
    fault += saidFault;
  };
  hooks.claimUnmountedDiskgroup = [] { heard.emplace_back("claim"); };
  hooks.getStorageInfo = [](std::string&) { heard.emplace_back("storage info"); };
  return hooks;
}

class KovaServiceChanges : public testing::Test {
 protected:
  KovaServiceChanges() {
    heard.clear();
    saidFault.clear();
    saidResult.clear();
    _inventory->Replace(Machines::DescribeInventory(_host->Snapshot()));
    _app.SetObject("storageSystem", _inventory);
    Tessa::Service::SetApp(&_app);
    OtxCtl::Kova::SetProviderFactory(
        [host = _host] { return std::make_unique<OtxCtl::Sim::SimProvider>(host); });
  }
  ~KovaServiceChanges() override {
    OtxCtl::Kova::SetProviderFactory({});
    Tessa::Service::SetApp(nullptr);
  }

  std::shared_ptr<SimHost> _host = std::make_shared<SimHost>(
      AHost().WithSsd("naa.1").WithHdds({"naa.2", "naa.3"}).WithUnmountedGroup("naa.1", {"naa.3"}).Build());
  Ref<Inventory> _inventory = MakeRef<Inventory>();
  AgentApp _app;
  Machines::SimulatedMachine _machine{_host};
  const KovaService _service{Listeners(), &_machine};
};

TEST_F(KovaServiceChanges, HandsDisksDownAsTheInventoryKnowsThem) {
  EXPECT_EQ(
      OutcomeText(_service.Change(Op::AddDisks(Disks({ADisk("naa.1"), ADisk("naa.2", true)}))).fault.Get()),
      "done");
  EXPECT_THAT(heard, ElementsAre("add naa.1! naa.2 #"));
}

TEST_F(KovaServiceChanges, HandsGroupsDownAsTheInventoryKnowsThem) {
  const auto mappings = Mappings({MappingOf("naa.1", {"naa.2"}), MappingOf("naa.3", {})});
  _service.Change(Op::InitializeDisks(mappings));
  _service.Change(Op::UnmountDiskMapping(mappings));
  EXPECT_THAT(heard, ElementsAre("init naa.1!<naa.2> naa.3<> #", "unmount naa.1!<naa.2> naa.3<> #"));
}

TEST_F(KovaServiceChanges, HandsNoGroupDownThatGrowsBeyondWhatThePluginReads) {
  _host->Change([](HostDescription& host) { host.disks[1].alternateName.resize(27); });
  _inventory->Replace(Machines::DescribeInventory(_host->Snapshot()));
  static std::size_t bytes;
  PluginHooks hooks = Listeners();
  hooks.unmountDiskMapping = [](const Kovasvc::Texts& texts, const std::string&, std::string&, std::string&) {
    bytes = texts.front().size();
  };
  const KovaService service(hooks);
  const auto unmount = [&](std::size_t disks) {
    return service.Change(
        Op::UnmountDiskMapping(Mappings({MappingOf("naa.2", std::vector<std::string>(disks, "naa.2"))})));
  };
  EXPECT_THAT(OutcomeText(unmount(99'000).fault.Get()), StartsWith("mappings[0].nonSsd | "));
  EXPECT_EQ(bytes, 0u) << "the hook is not called";
  EXPECT_EQ(OutcomeText(unmount(1000).fault.Get()), "done");
  EXPECT_LT(bytes, 1'000'000u) << "names that no answer shows are not handed down";
}

TEST_F(KovaServiceChanges, HandsRemovalsDownWithAllThatBelongsToThem) {
  _service.Change(WithOptions(Op::RemoveDisk("naa.2"), {"p", "o", -1, 2}));
  _service.Change(WithOptions(Op::RemoveDiskMapping(MappingOf("naa.1", {"naa.9"})), {"q", "r", 3, -4}));
  EXPECT_THAT(heard, ElementsAre("remove naa.2 p o -1 2", "remove group naa.1!<naa.9> q r 3 -4"));
}

TEST_F(KovaServiceChanges, TakesTheTasksIdForTheRequestTag) {
  const OtxCtl::TaskScope task("task-7", {});
  _service.Change(Op::AddDisks(DisksNamed({"naa.2"})));
  _service.Change(Op::InitializeDisks(Mappings({})));
  _service.Change(Op::UnmountDiskMapping(Mappings({})));
  _service.Change(Op::AddAllEligibleDisks());
  EXPECT_THAT(heard, ElementsAre("add naa.2 #task-7", "init #task-7", "unmount #task-7", "add all #task-7"));
}

TEST_F(KovaServiceChanges, HandsUpResultAndFault) {
  Orbis::DataArray<Nox::Kova::Host::DiskMapResult> results;
  Orbis::SerializeObjectToSoap(results, nullptr, saidResult);
  Orbis::SerializeObjectToSoap(Orbis::Fault::SystemError("half of it failed"), nullptr, saidFault);
  for (const Answer& answer :
       {_service.Change(Op::AddDisks(Disks({}))), _service.Change(Op::AddAllEligibleDisks()),
        _service.Change(Op::InitializeDisks(Mappings({}))),
        _service.Change(Op::UnmountDiskMapping(Mappings({})))}) {
    EXPECT_TRUE(answer.result);
    EXPECT_EQ(OutcomeText(answer.fault.Get()), "half of it failed");
  }
  EXPECT_EQ(OutcomeText(_service.Change(Op::RemoveDisk("naa.2")).fault.Get()), "half of it failed");
  EXPECT_EQ(OutcomeText(_service.Change(Op::RemoveDiskMapping(MappingOf("naa.1", {}))).fault.Get()),
            "half of it failed");
}

TEST_F(KovaServiceChanges, AnswersWithNothingWhenThePluginSaysNothing) {
  for (const Answer& answer :
       {_service.Change(Op::AddAllEligibleDisks()), _service.Change(Op::ClaimUnmountedDiskgroup()),
        _service.Change(Op::RemoveDisk("naa.2"))}) {
    EXPECT_FALSE(answer.result);
    EXPECT_FALSE(answer.fault);
  }
  EXPECT_THAT(heard, ElementsAre("add all #", "claim", "remove naa.2   0 0"));
}

TEST_F(KovaServiceChanges, CallsNoHookForWhatTheGateRefuses) {
  _host->Change([](HostDescription& host) { host.disks[2].absent = true; });
  _inventory->Replace(Machines::DescribeInventory(_host->Snapshot()));
  for (const auto& [answer, told] : std::vector<std::pair<Answer, const char*>>{
           {_service.Change(Op::AddDisks(DisksNamed({"naa.9"}))), "disks[0] | "},
           {_service.Change(Op::AddDisks(DisksNamed({"naa.2", "naa.1"}))), "disks[1] | "},
           {_service.Change(Op::InitializeDisks(Mappings({nullptr}))), "mappings[0] | "},
           {_service.Change(Op::InitializeDisks(Mappings({MappingOf("naa.1", {"naa.9"})}))),
            "mappings[0].nonSsd[0] | "},
           {_service.Change(Op::UnmountDiskMapping(Mappings({MappingOf("", {})}))), "mappings[0].ssd | "},
           {_service.Change(Op::RemoveDisk("")), "disk | "},
           {_service.Change(WithOptions(Op::RemoveDisk("naa.2"), {"\n", "", 0, 0})), "passThrough | "},
           {_service.Change(Op::RemoveDiskMapping(MappingOf("", {}))), "mapping.ssd | "},
           {_service.Change(WithOptions(Op::RemoveDiskMapping(MappingOf("naa.1", {})), {"", "\n", 0, 0})),
            "optionText | "}}) {
    EXPECT_FALSE(answer.result);
    EXPECT_THAT(OutcomeText(answer.fault.Get()), StartsWith(told));
  }
  EXPECT_THAT(heard, IsEmpty());
}

TEST_F(KovaServiceChanges, MakesNoGroupWhileTheKernelCannotBeAsked) {
  for (const char* operation : {"RefreshKovaInfo", "QueryDisks"}) {
    _host->Change([operation](HostDescription& host) {
      host.faults = {
          {.operation = operation, .exception = "HostCtlException", .message = "busy", .disk = {}}};
    });
    const Answer answer = _service.Change(Op::InitializeDisks(Mappings({MappingOf("naa.1", {"naa.2"})})));
    EXPECT_THAT(OutcomeText(answer.fault.Get()), HasSubstr("busy")) << operation;
  }
  EXPECT_THAT(heard, IsEmpty());
}

TEST_F(KovaServiceChanges, RemovesAGroupByAnAbsentDiskOnlyIfThatIsItsCacheDisk) {
  _host->Change([](HostDescription& host) { host.disks[0].absent = host.disks[2].absent = true; });
  _inventory->Replace(Machines::DescribeInventory(_host->Snapshot()));
  for (const char* name : {"kova:uuid-of-naa.3", "kova:01234567-89ab-cdef-0123-456789abcdef", "kova:"}) {
    const Answer answer = _service.Change(Op::RemoveDiskMapping(MappingOf(name, {})));
    EXPECT_THAT(OutcomeText(answer.fault.Get()), StartsWith("mapping.ssd | ")) << name;
  }
  EXPECT_THAT(heard, IsEmpty());
  EXPECT_EQ(
      OutcomeText(_service.Change(Op::RemoveDiskMapping(MappingOf("kova:uuid-of-naa.1", {}))).fault.Get()),
      "done");
  EXPECT_THAT(heard, ElementsAre("remove group kova:uuid-of-naa.1!<>   0 0"));
}

// Copies of a disk bear its UUID. Of those that have left the kernel would take out any.
TEST_F(KovaServiceChanges, RemovesNoAbsentDiskThatCouldBeAnother) {
  _host->Change([](HostDescription& host) {
    for (OtxCtl::Sim::HostDisk& disk : host.disks) {
      disk.kovaUuid = "same";
      disk.absent = true;
    }
    host.disks[1].absent = false;
  });
  const std::string both = "kova:same";
  EXPECT_THAT(OutcomeText(_service.Change(Op::RemoveDisk(both)).fault.Get()),
              StartsWith("disk | disk: more than one disk"));
  EXPECT_THAT(OutcomeText(_service.Change(Op::RemoveDiskMapping(MappingOf(both, {}))).fault.Get()),
              StartsWith("mapping.ssd | mapping.ssd: more than one disk"));
  _host->Change([](HostDescription& host) { host.disks[0].inKernel = host.disks[2].inKernel = false; });
  EXPECT_THAT(OutcomeText(_service.Change(Op::RemoveDisk(both)).fault.Get()), StartsWith("disk | "))
      << "both in their group, which is all that the kernel knows of them";
  _host->Change([](HostDescription& host) {
    host.disks[1].absent = true;
    host.disks[2].absent = false;
  });
  EXPECT_THAT(OutcomeText(_service.Change(Op::RemoveDisk(both)).fault.Get()), StartsWith("disk | "))
      << "one in a group and one in none";
  EXPECT_THAT(heard, IsEmpty());
  _host->Change([](HostDescription& host) { host.disks[1].absent = false; });
  _service.Change(Op::RemoveDisk(both));
  _service.Change(Op::RemoveDiskMapping(MappingOf(both, {})));
  EXPECT_EQ(heard.size(), 2u) << "one is absent: disks that are there have names of their own";
}

TEST_F(KovaServiceChanges, RemovesNoAbsentDiskWhileTheKernelCannotBeAsked) {
  for (const char* operation : {"GetDiskMappings", "QueryDisks"}) {
    _host->Change([operation](HostDescription& host) {
      host.faults = {
          {.operation = operation, .exception = "HostCtlException", .message = "busy", .disk = {}}};
    });
    EXPECT_THAT(OutcomeText(_service.Change(Op::RemoveDisk("kova:uuid-of-naa.3")).fault.Get()),
                HasSubstr("busy"));
  }
  EXPECT_THAT(heard, IsEmpty());
  _service.Change(Op::RemoveDisk("naa.3"));
  EXPECT_EQ(heard.size(), 1u) << "nothing is asked about disks that are called by their own names";
}

TEST_F(KovaServiceChanges, AnswersAnExceptionOfAHookByASystemErrorWithItsText) {
  PluginHooks hooks = Listeners();
  hooks.addAllEligibleDisks = [](const std::string&, std::string&, std::string&) {
    throw std::runtime_error("the kernel is gone");
  };
  EXPECT_EQ(OutcomeText(KovaService(hooks).Change(Op::AddAllEligibleDisks()).fault.Get()),
            "the kernel is gone");
}

TEST_F(KovaServiceChanges, AnswersWithoutAProviderByASystemError) {
  OtxCtl::Kova::SetProviderFactory({});
  EXPECT_THAT(OutcomeText(_service.Change(Op::AddDisks(DisksNamed({"naa.1"}))).fault.Get()),
              HasSubstr("No kernel provider"));
  EXPECT_THAT(heard, IsEmpty());
}

TEST_F(KovaServiceChanges, GroupsAreThoseOfStorageInfoAndTheUnmountedOnes) {
  PluginHooks hooks = Listeners();
  hooks.getStorageInfo = [](std::string& result) {
    Nox::Kova::Host::ConfigInfo::StorageInfo info;
    info.SetAutoClaim(true);
    Orbis::SerializeObjectToSoap(info, nullptr, result);
  };
  const KovaService service(hooks);
  Answer answer = service.Query(Op::GetDiskGroups());
  const auto* info = dynamic_cast<const Nox::Kova::Host::ConfigInfo::StorageInfo*>(answer.result.Get());
  ASSERT_NE(info, nullptr);
  EXPECT_FALSE(answer.fault);
  EXPECT_TRUE(info->GetAutoClaim());
  ASSERT_EQ(info->GetDiskMapInfo()->Size(), 1u);
  EXPECT_EQ(Show(*(*info->GetDiskMapInfo())[0]->GetMapping()), "naa.1!<naa.3>");

  _host->Change([](HostDescription& host) {
    host.faults = {
        {.operation = "GetDiskMappings", .exception = "HostCtlException", .message = "busy", .disk = {}}};
  });
  answer = service.Query(Op::GetDiskGroups());
  EXPECT_TRUE(answer.result) << "what could be read is answered";
  EXPECT_EQ(OutcomeText(answer.fault.Get()), "busy");
}

TEST_F(KovaServiceChanges, DescribesTheHostAsAFileWould) {
  EXPECT_EQ(OtxCtl::Sim::ParseHostDescription(_service.DescribeHost()), _host->Snapshot());
}

TEST_F(KovaServiceChanges, ChangesTheHostAndThenRefreshesThePlugin) {
  const Answer answer = _service.ChangeHost(R"({"disk": {"name": "naa.2", "absent": true}})");
  EXPECT_EQ(OutcomeText(answer.fault.Get()), "done");
  EXPECT_FALSE(answer.result);
  EXPECT_TRUE(_host->Snapshot().disks[1].absent);
  EXPECT_THAT(heard, ElementsAre("storage info"));
}

TEST_F(KovaServiceChanges, RefusesAChangeThatTheHostWouldNotAccept) {
  const HostDescription before = _host->Snapshot();
  for (const auto& [change, told] : std::vector<std::pair<std::string, const char*>>{
           {R"({"disk": {"name": "naa.2", "ssd": 1}})", "disks[1].ssd | disks[1].ssd: "},
           {R"({"disk": {"name": "naa.9"}})", "disk.name | "},
           {R"({"autoMode": true})", "autoMode | "},
           {"[]", "document | "},
           {"", "line 1"}}) {
    EXPECT_THAT(OutcomeText(_service.ChangeHost(change).fault.Get()), StartsWith(told));
  }
  EXPECT_EQ(_host->Snapshot(), before);
  EXPECT_THAT(heard, IsEmpty());
}

TEST_F(KovaServiceChanges, AnswersAChangeThatCannotBeSavedByASystemError) {
  _host->SetSaver([](const HostDescription&) { throw std::runtime_error("no room"); });
  EXPECT_EQ(OutcomeText(_service.ChangeHost(R"({"set": {"autoMode": true}})").fault.Get()), "no room");
  EXPECT_FALSE(_host->Snapshot().autoMode);
}

TEST_F(KovaServiceChanges, TellsTheTwinOfItsMachineWithoutThePlugin) {
  const Answer answer = _service.Query(Nox::Operation::GetTwin());
  const auto* const twin = dynamic_cast<const Nox::Kova::Host::Twin*>(answer.result.Get());
  ASSERT_NE(twin, nullptr);
  EXPECT_EQ(OtxCtl::Sim::ParseHostDescription(twin->GetDescription()), _host->Snapshot());
  EXPECT_EQ(twin->GetGeneration().size(), 16U);
  EXPECT_THAT(heard, IsEmpty());
}

TEST_F(KovaServiceChanges, SaysThatAHostOfWhichTheMachineIsNotKnownHasNoTwin) {
  const Answer answer = KovaService(Listeners()).Query(Nox::Operation::GetTwin());
  EXPECT_FALSE(answer.result);
  EXPECT_THAT(OutcomeText(answer.fault.Get()), HasSubstr("nobody knows the machine"));
}

TEST_F(KovaServiceChanges, SaysThatAHostWhichIsNotSimulatedHasNoDescription) {
  const KovaService service(Listeners());
  EXPECT_THROW(service.DescribeHost(), HostError);
  EXPECT_THROW(service.ChangeHost("{}"), HostError);
}

}  // namespace
}  // namespace Host
