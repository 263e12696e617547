#include "tests/integration/Outcome.h"

#include <memory>

#include "host/AgentApp.h"
#include "host/Inventory.h"
#include "host/LogSink.h"
#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/disks/DiskQuery.h"
#include "kova/agentd/marshal/DiskResultMarshal.h"
#include "kova/agentd/util/KovaUtil.h"
#include "machines/SimulatedInventory.h"
#include "nox/Kova.h"
#include "orbis/Soap.h"
#include "otxctl/ProviderFactory.h"
#include "otxctl/sim/SimProvider.h"
#include "tessa/App.h"

namespace Integration {
namespace {

using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskState;
using Nox::Host::ScsiDisk;
using Nox::Kova::Host::ConfigInfo;
using Nox::Kova::Host::DiskMapInfo;
using Nox::Kova::Host::DiskMapping;
using Orbis::DataArray;
using OtxCtl::Sim::HostDescription;
using OtxCtl::Sim::SimHost;
using Tessa::MakeRef;
using Tessa::Ref;

std::string NameOf(const ScsiDisk* disk) {
  return disk == nullptr ? "(missing)" : disk->GetCanonicalName();
}

std::string Describe(const DiskMapping& mapping) {
  std::string text = NameOf(mapping.GetSsd().Get()) + ":";
  for (const ScsiDisk* disk : *mapping.GetNonSsd()) {
    text += " " + NameOf(disk);
  }
  return text + "\n";
}

// One line per group, each behind the same words.
std::string Describe(const std::string& what, const Ref<DataArray<DiskMapping>>& mappings) {
  std::string text;
  if (mappings) {
    for (const DiskMapping* mapping : *mappings) {
      text += what + " " + Describe(*mapping);
    }
  }
  return text.empty() ? "no " + what + "\n" : text;
}

template <class T>
Ref<T> Read(const std::string& text) {
  Ref<Orbis::Any> value;
  Orbis::DeserializeSoapToObject(text, value, nullptr, &T::StaticType());
  return Ref<T>(static_cast<T*>(value.Get()));
}

std::string DescribeStorage(Kovasvc::KovaManagerImpl& manager) {
  std::string soap;
  manager.GetStorageInfo(soap);
  const auto info = Read<ConfigInfo::StorageInfo>(soap);
  std::string text = std::string("claims disks on its own: ") + (info->GetAutoClaim() ? "yes" : "no") + "\n";
  if (!info->GetDiskMapInfo()) {
    return text + "no group\n";
  }
  for (const DiskMapInfo* group : *info->GetDiskMapInfo()) {
    text += std::string(group->GetMounted() ? "mounted" : "unmounted") + " group " +
            Describe(*group->GetMapping());
  }
  return text;
}

std::string DescribeConfig(Kovasvc::KovaManagerImpl& manager) {
  std::string soap;
  manager.GetConfigInfo(soap);
  const auto config = Read<ConfigInfo>(soap);
  std::string text = std::string("enabled: ") + (config->GetEnabled() ? "yes" : "no") + "\n";
  text += "cluster: " + config->GetClusterInfo()->GetClusterUuid() + "\n";
  text += "node: " + config->GetClusterInfo()->GetNodeUuid() + "\n";
  text += "fault domain: " + config->GetFaultDomainInfo()->GetName() + "\n";
  if (config->GetNetworkInfo()->GetPort()) {
    for (const ConfigInfo::NetworkInfo::PortConfig* port : *config->GetNetworkInfo()->GetPort()) {
      text += "interface " + port->GetInterfaceName() + ": " + port->GetIpConfig()->GetMasterGroup() + " " +
              port->GetIpConfig()->GetAgentGroup() + "\n";
    }
  }
  return text;
}

// The disks that the kernel calls eligible without a reason against it, as planning sees them.
Ref<DataArray<ScsiDisk>> EligibleDisks(SimHost& host, Tessa::Service::Logger& logger) {
  std::vector<HostCtl::Kova::DiskResult> records;
  host.QueryDisks({}, records, true);
  std::erase_if(records, [](const HostCtl::Kova::DiskResult& record) {
    return record.state != DiskState::Eligible || record.reason != DiskReason::None;
  });
  Ref<DataArray<Nox::Kova::Host::DiskResult>> results;
  Kovasvc::MarshalHostCtlDiskResults(logger, records, results, false);
  const auto disks = MakeRef<DataArray<ScsiDisk>>();
  for (const Nox::Kova::Host::DiskResult* result : *results) {
    disks->Append(result->GetDisk());
  }
  return disks;
}

std::string DescribePlan(Kovasvc::KovaManagerImpl& manager, SimHost& host, Tessa::Service::Logger& logger) {
  manager.RefreshKovaDiskCache();
  const Ref<DataArray<ScsiDisk>> eligible = EligibleDisks(host, logger);
  Ref<DataArray<DiskMapping>> allFlash;
  Ref<DataArray<ScsiDisk>> remaining;
  bool allFlashLimit = false;
  manager.AllFlashDiskMappingSwitch(eligible.Get(), allFlash, remaining, allFlashLimit);
  Ref<DataArray<DiskMapping>> hybrid;
  bool hybridLimit = false;
  manager.ComputeDiskMappings(remaining.Get(), false, hybrid, hybridLimit);
  Ref<DataArray<ScsiDisk>> inventory;
  Kovasvc::Util::KovaUtil::GetDisksFromAgentd(inventory);
  auto unmounted = MakeRef<DataArray<DiskMapping>>();
  manager.ComputeNotMountedDiskMappings(inventory.Get(), unmounted);
  return Describe("all-flash group", allFlash) + Describe("hybrid group", hybrid) +
         Describe("group to mount again", unmounted) +
         "limit for all-flash groups: " + (allFlashLimit ? "reached" : "not reached") +
         "\nlimit for hybrid groups: " + (hybridLimit ? "reached" : "not reached") + "\n";
}

}  // namespace

std::string OutcomeOf(const HostDescription& description) {
  const auto host = std::make_shared<SimHost>(description);
  const auto inventory = MakeRef<Host::Inventory>();
  inventory->Replace(Machines::DescribeInventory(description));
  Host::AgentApp app;
  app.SetObject("storageSystem", inventory);
  Tessa::Service::SetApp(&app);
  OtxCtl::Kova::SetProviderFactory([host] { return std::make_unique<OtxCtl::Sim::SimProvider>(host); });
  auto logger = Host::MakeConsoleLogger(Tessa::Service::LogLevel::None);
  auto manager = MakeRef<Kovasvc::KovaManagerImpl>(logger);
  const std::string outcome = "-- storage\n" + DescribeStorage(*manager) + "-- configuration\n" +
                              DescribeConfig(*manager) + "-- plan\n" + DescribePlan(*manager, *host, *logger);
  manager.Reset();
  OtxCtl::Kova::SetProviderFactory({});
  Tessa::Service::SetApp(nullptr);
  return outcome;
}

}  // namespace Integration
