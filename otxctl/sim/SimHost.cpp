#include "otxctl/sim/SimHost.h"

#include <algorithm>
#include <memory>
#include <nlohmann/json.hpp>
#include <utility>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/TaskScope.h"
#include "otxctl/provider/NicRecords.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Sim {
namespace {

using HostCtl::Kova::DiskMapping;
using HostCtl::Kova::DiskResult;
using HostCtl::Kova::FormatContext;
using HostCtl::Kova::KovaClusterInfoDetailed;
using HostCtl::Kova::KovaOtxNicConfig;
using HostCtl::Kova::RemovalOptions;
using HostCtl::Lib::HostCtlException;
using Guard = std::lock_guard<std::mutex>;

HostDescription Checked(HostDescription host) {
  CheckHostDescription(host);
  return host;
}

void Report(int percent, const std::string& step) {
  if (const TaskScope* const task = TaskScope::Current()) {
    // Names come from requests and may hold anything.
    task->ReportProgress(percent, Tessa::Sanitize(step));
  }
}

// How much of the request is done when `done` of its groups are.
int PercentOf(std::int64_t done, std::int64_t groups) {
  return groups <= 0 ? 0 : static_cast<int>(std::clamp<std::int64_t>(100 * done / groups, 0, 100));
}

}  // namespace

SimHost::SimHost(HostDescription host) : _rules(Checked(std::move(host))) {}

void SimHost::SetSaver(Saver saver) {
  const Guard guard(_mutex);
  _saver = std::move(saver);
}

void SimHost::SetWaiter(Fault::Waiter waiter) {
  const Guard guard(_mutex);
  _waiter = std::move(waiter);
}

void SimHost::SetListener(Listener listener) {
  const Guard guard(_mutex);
  _listener = std::move(listener);
}

HostDescription SimHost::Snapshot() const {
  const Guard guard(_mutex);
  return _rules.Host();
}

void SimHost::Change(const nlohmann::json& set, const nlohmann::json& disk) {
  Change([&set, &disk](HostDescription& host) { ApplyChange(host, set, disk); });
}

void SimHost::Change(const std::function<void(HostDescription&)>& edit) {
  Commit([&edit](SimRules& rules) {
    HostDescription changed = rules.Host();
    edit(changed);
    if (changed == rules.Host()) {
      return false;
    }
    rules = SimRules(Checked(std::move(changed)));
    return true;
  });
}

void SimHost::Enter(std::string_view operation) {
  Fault::FaultEffect effect;
  Fault::Waiter waiter;
  {
    const Guard guard(_mutex);
    effect = Fault::EffectOf(_rules.Host().faults, operation, _counter.Next(operation));
    waiter = _waiter;
  }
  Fault::ApplyEffect(effect, waiter);
}

template <typename Look>
auto SimHost::Read(std::string_view operation, Look look) {
  Enter(operation);
  const Guard guard(_mutex);
  return look(std::as_const(_rules));
}

template <typename ChangeRules>
void SimHost::Mutate(std::string_view operation, ChangeRules change) {
  Enter(operation);
  try {
    Commit(change);
  } catch (const HostCtlException&) {
    throw;
  } catch (const std::exception& failure) {
    throw HostCtlException(std::string("simulated kernel: the change was dropped: ") + failure.what());
  }
}

template <typename ChangeRules>
void SimHost::Commit(ChangeRules change) {
  Listener listener;
  {
    const Guard guard(_mutex);
    if (_saver) {
      // Saving may fail, so the change is made on a copy. Saving costs as much as copying anyway.
      SimRules next = _rules;
      if (!change(next)) {
        return;
      }
      _saver(next.Host());
      _rules = std::move(next);
    } else if (!change(_rules)) {
      return;
    }
    listener = _listener;
  }
  if (listener) {
    listener();
  }
}

// The flag is the kernel's; a simulated one has no use for it.
void SimHost::QueryDisks(const std::vector<std::string>& names, std::vector<DiskResult>& results, bool) {
  Read("QueryDisks", [&](const SimRules& rules) { rules.QueryDisks(names, results); });
}

void SimHost::GetDiskMappings(std::vector<DiskMapping>& mappings, bool withUnmounted) {
  Read("GetDiskMappings", [&](const SimRules& rules) { rules.GetDiskMappings(mappings, withUnmounted); });
}

void SimHost::FormatDiskMapping(const std::string& ssd, const std::vector<std::string>& capacityDisks,
                                const FormatContext& context) {
  const std::int64_t before = context.mappingIndex;
  Report(PercentOf(before, context.mappingCount), "formatting the disk group of " + ssd);
  Mutate("FormatDiskMapping", [&](SimRules& rules) { return rules.FormatDiskMapping(ssd, capacityDisks); });
  Report(PercentOf(before + 1, context.mappingCount), "formatted the disk group of " + ssd);
}

void SimHost::RestampDiskMapping(const std::string& ssd, const std::vector<std::string>&) {
  Mutate("RestampDiskMapping", [&](SimRules& rules) { return rules.RestampDiskMapping(ssd); });
}

void SimHost::MountDiskMapping(const std::string& ssd, bool) {
  Mutate("MountDiskMapping", [&](SimRules& rules) { return rules.MountDiskMapping(ssd); });
}

void SimHost::RestampDiskMappingByUuid(const std::string& kovaUuid) {
  Mutate("RestampDiskMappingByUuid",
         [&](SimRules& rules) { return rules.RestampDiskMappingByUuid(kovaUuid); });
}

void SimHost::RemoveDisk(const std::string& disk, const std::string&, const RemovalOptions&) {
  Report(0, "removing disk " + disk);
  Mutate("RemoveDisk", [&](SimRules& rules) { return rules.RemoveDisk(disk); });
  Report(100, "removed disk " + disk);
}

void SimHost::RemoveDiskMapping(const std::string& ssd, const std::string&, const RemovalOptions&) {
  Report(0, "removing the disk group of " + ssd);
  Mutate("RemoveDiskMapping", [&](SimRules& rules) { return rules.RemoveDiskMapping(ssd); });
  Report(100, "removed the disk group of " + ssd);
}

void SimHost::UnmountDiskMapping(const std::string& ssd) {
  Mutate("UnmountDiskMapping", [&](SimRules& rules) { return rules.UnmountDiskMapping(ssd); });
}

void SimHost::RemoveDiskByUuid(const std::string& kovaUuid, const std::string&) {
  Report(0, "removing absent disk " + kovaUuid);
  Mutate("RemoveDiskByUuid", [&](SimRules& rules) { return rules.RemoveDiskByUuid(kovaUuid); });
  Report(100, "removed absent disk " + kovaUuid);
}

bool SimHost::IsAutoModeEnabled() {
  return Read("IsAutoModeEnabled", [](const SimRules& rules) { return rules.Host().autoMode; });
}

std::vector<KovaOtxNicConfig*> SimHost::GetKovaOtxNicConfigs() {
  return Read("GetKovaOtxNicConfigs", [](const SimRules& rules) {
    std::vector<Provider::NicGroups> nics;
    for (const HostNetwork& network : rules.Host().networks) {
      nics.push_back({network.interface, network.masterMulticastGroup, network.agentMulticastGroup});
    }
    return Provider::MakeNicRecords(nics);
  });
}

void SimHost::GetClusterInfoDetailed(KovaClusterInfoDetailed& info) {
  Read("GetClusterInfoDetailed", [&info](const SimRules& rules) {
    const HostCluster& cluster = rules.Host().cluster;
    info = KovaClusterInfoDetailed();
    info.enabled = cluster.enabled;
    info.clusterUuid = cluster.clusterUuid;
    info.nodeUuid = cluster.nodeUuid;
  });
}

std::string SimHost::GetFaultDomainName() {
  return Read("GetFaultDomainName", [](const SimRules& rules) { return rules.Host().faultDomain; });
}

void SimHost::ClaimUnmountedDiskgroups() {
  Mutate("ClaimUnmountedDiskgroups", [](SimRules& rules) { return rules.ClaimUnmountedDiskgroups(); });
}

// What is in memory is never out of date; only the fault rules have a say.
void SimHost::RefreshKovaInfo() {
  Enter("RefreshKovaInfo");
}

}  // namespace OtxCtl::Sim
