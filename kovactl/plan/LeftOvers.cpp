#include "kovactl/plan/LeftOvers.h"

#include <algorithm>
#include <array>
#include <map>
#include <optional>

#include "kova/agentd/planning/pure/AddPlan.h"
#include "kovactl/Table.h"
#include "kovactl/Words.h"
#include "machines/SimulatedInventory.h"
#include "nox/Host.h"
#include "nox/Kova.h"
#include "nox/Operations.h"
#include "otxctl/sim/SimRules.h"

namespace Kovactl {
namespace {

using Kovasvc::Planning::LeftOver;
using Nox::Kova::Host::DiskResult;
using OtxCtl::Sim::HostDescription;
using Names = std::vector<std::string>;
using NameSet = std::set<std::string>;

// The names of the disks that the host's agent lists.
NameSet Listed(const HostDescription& host) {
  NameSet names;
  const auto inventory = Machines::DescribeInventory(host);
  for (const Nox::Host::ScsiLun* unit : *inventory->GetScsiLun()) {
    if (const auto* disk = dynamic_cast<const Nox::Host::ScsiDisk*>(unit)) {
      names.insert(NameOf(*disk));
    }
  }
  return names;
}

using KernelGroups = std::vector<HostCtl::Kova::DiskMapping>;
using KernelRecords = std::vector<HostCtl::Kova::DiskResult>;

// The names stay the kernel's.
std::vector<Kovasvc::Planning::HostGroup> GroupsOf(const KernelGroups& kernelGroups, const NameSet& listed) {
  std::vector<Kovasvc::Planning::HostGroup> groups;
  groups.reserve(kernelGroups.size());
  for (const HostCtl::Kova::DiskMapping& group : kernelGroups) {
    groups.push_back({.allFlash = group.allFlash,
                      .heldBack = group.thirdFlag,
                      .capacityDisks = group.capacityDisks.size(),
                      .cacheDisk = group.ssd.deviceName,
                      .cacheListed = listed.count(group.ssd.deviceName) != 0});
  }
  return groups;
}

// In which of the groups each disk is.
std::map<std::string, std::size_t> GroupPerDisk(const KernelGroups& kernelGroups) {
  std::map<std::string, std::size_t> groups;
  for (std::size_t position = 0; position < kernelGroups.size(); ++position) {
    groups.emplace(kernelGroups[position].ssd.deviceName, position);
    for (const HostCtl::Kova::DiskName& disk : kernelGroups[position].capacityDisks) {
      groups.emplace(disk.deviceName, position);
    }
  }
  return groups;
}

// Only the addition of every eligible disk minds a reason beside the state. The names stay the records'.
std::vector<Kovasvc::Planning::OfferedDisk> OfferedOf(const KernelRecords& records, bool areNamed,
                                                      const KernelGroups& kernelGroups,
                                                      const NameSet& listed) {
  const std::map<std::string, std::size_t> groups = GroupPerDisk(kernelGroups);
  std::vector<Kovasvc::Planning::OfferedDisk> disks;
  disks.reserve(records.size());
  for (const HostCtl::Kova::DiskResult& record : records) {
    const bool isFree = areNamed || record.reason == HostCtl::Kova::DiskReason::None;
    const auto group = groups.find(record.name);
    disks.push_back({.name = record.name,
                     .eligible = record.state == HostCtl::Kova::DiskState::Eligible && isFree &&
                                 listed.count(record.name) != 0,
                     .isSsd = record.isSsd,
                     .capacityFlash = record.capacityFlash,
                     .unmounted = record.reason == HostCtl::Kova::DiskReason::GroupNotMounted,
                     .group = group == groups.end() ? std::nullopt : std::optional(group->second)});
  }
  return disks;
}

using Reasons = std::map<std::string, std::optional<LeftOver>>;  // nothing: planning would use the disk

// What planning says of each offered disk that the kernel knows.
Reasons AskPlanning(const HostDescription& host, const Names& offered) {
  const OtxCtl::Sim::SimRules kernel(host);
  const NameSet listed = Listed(host);
  KernelRecords records;
  kernel.QueryDisks(offered, records);
  KernelGroups kernelGroups;
  kernel.GetDiskMappings(kernelGroups, true);
  const auto disks = OfferedOf(records, !offered.empty(), kernelGroups, listed);
  const auto groups = GroupsOf(kernelGroups, listed);
  const auto plan =
      offered.empty() ? Kovasvc::Planning::PlanAddition(disks, groups)
                      : Kovasvc::Planning::PlanNamedAddition(disks, groups, {offered.begin(), offered.end()});
  Reasons reasons;
  for (std::size_t i = 0; i < records.size(); ++i) {
    reasons.emplace(records[i].name, plan.leftOver[i]);
  }
  return reasons;
}

const char* WordFor(LeftOver reason) {
  constexpr std::array<const char*, 5> words = {"notEligible", "noCacheDisk", "noCapacityDisk", "groupsFull",
                                                "tooManyGroups"};
  return words.at(static_cast<std::size_t>(reason));
}

// Why a disk that the kernel offers, or does not, is in no group.
LeftOverDisk Explain(const DiskResult& verdict, const std::optional<LeftOver>& reason) {
  const std::string name = NameOf(*verdict.GetDisk());
  if (!reason) {
    return {name, "requestFailed", "the request failed before it came to this disk"};
  }
  std::string text = Kovasvc::Planning::Describe(*reason);
  if (*reason == LeftOver::NotEligible && verdict.GetState() == DiskResult::STATE_INUSE) {
    text = "in use already";
  } else if (*reason == LeftOver::NotEligible && !ReasonOf(verdict).empty()) {
    text = ReasonOf(verdict);
  }
  return {name, WordFor(*reason), text};
}

}  // namespace

std::vector<LeftOverDisk> FindLeftOvers(const Host::ManagementApi& host, const HostDescription& before,
                                        const Names& offered, const NameSet& placed) {
  const Host::Answer answer =
      host.Query(Nox::Operation::QueryDisksForKova(Tessa::MakeRef<Orbis::TextList>(offered)));
  const auto* const verdicts = dynamic_cast<const Orbis::DataArray<DiskResult>*>(answer.result.Get());
  std::vector<LeftOverDisk> leftOver;
  if (verdicts == nullptr) {
    return leftOver;
  }
  const Reasons reasons = AskPlanning(before, offered);
  for (const DiskResult* verdict : *verdicts) {
    const std::string name = NameOf(*verdict->GetDisk());
    const bool isUsed = offered.empty() && verdict->GetState() == DiskResult::STATE_INUSE;
    if (isUsed || placed.count(name) != 0) {
      continue;
    }
    const auto reason = reasons.find(name);
    leftOver.push_back(Explain(*verdict, reason == reasons.end() ? LeftOver::NotEligible : reason->second));
  }
  return leftOver;
}

std::vector<LeftOverDisk> ExplainLeftOvers(const Host::ManagementApi& host, const Names& offered) {
  const Host::Answer answer = host.Query(Nox::Operation::GetTwin());
  const auto* const twin = dynamic_cast<const Nox::Kova::Host::Twin*>(answer.result.Get());
  if (twin == nullptr) {
    return {};
  }
  return FindLeftOvers(host, OtxCtl::Sim::ParseHostDescription(twin->GetDescription()), offered, {});
}

void PrintLeftOverCounts(const std::vector<LeftOverDisk>& disks, std::ostream& out) {
  std::vector<std::pair<std::string, std::size_t>> counts;  // in the order in which the reasons come
  for (const LeftOverDisk& disk : disks) {
    const auto known = std::find_if(counts.begin(), counts.end(),
                                    [&](const auto& count) { return count.first == disk.text; });
    ++(known == counts.end() ? counts.emplace_back(disk.text, 0) : *known).second;
  }
  std::stable_sort(counts.begin(), counts.end(),
                   [](const auto& one, const auto& other) { return one.second > other.second; });
  Table table({{"LEFT OVER", Table::Align::Right}, {"WHY"}});
  for (const auto& [reason, count] : counts) {
    table.AddRow({std::to_string(count), reason});
  }
  if (!counts.empty()) {
    table.Print(out);
  }
}

void PrintLeftOverNames(const std::vector<LeftOverDisk>& disks, std::ostream& out) {
  Table table({{"DISK LEFT OVER"}, {"WHY"}});
  for (const LeftOverDisk& disk : disks) {
    table.AddRow({disk.disk, disk.text});
  }
  if (!disks.empty()) {
    table.Print(out);
  }
}

}  // namespace Kovactl
