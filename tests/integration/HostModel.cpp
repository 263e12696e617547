#include "tests/integration/HostModel.h"

#include <algorithm>
#include <sstream>

#include "tests/support/PlainRules.h"

namespace Integration {

using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskState;
using OtxCtl::Sim::HostDescription;
using OtxCtl::Sim::HostDisk;
using OtxCtl::Sim::HostGroup;
using Tessa::Ref;
using TestSupport::AScsiDisk;
using TestSupport::Disks;
using TestSupport::PlainRules;
using TestSupport::RandomHost;
using Names = std::vector<std::string>;

namespace {

const std::string lostMark = "kova:";

bool Contains(const Names& names, const std::string& name) {
  return std::find(names.begin(), names.end(), name) != names.end();
}
bool IsLost(const std::string& name) {
  return name.starts_with(lostMark);
}
std::string UuidIn(const std::string& name) {
  return name.size() == lostMark.size() + 36 ? name.substr(lostMark.size()) : "";
}

std::string Text(const NamedGroup& group) {
  std::ostringstream text;
  text << group;
  return text.str();
}
NamedGroup ParseGroup(const std::string& text) {
  NamedGroup group;
  std::istringstream words(text);
  words >> group.ssd;
  group.ssd.pop_back();
  for (std::string disk; words >> disk;) {
    group.capacity.push_back(disk);
  }
  return group;
}

// All faults of a request in one.
std::string Combined(const Names& faults) {
  return faults.empty() ? "" : faults.size() == 1 ? faults.front() : "KovaFault";
}

// What is told when a name is its neighbour's; empty when none is.
std::string RepeatedName(const Names& names) {
  Names kept = names;
  kept.erase(std::unique(kept.begin(), kept.end()), kept.end());
  return kept.size() == names.size() ? "" : names[kept.size()];
}

const char* StateText(DiskState state) {
  return state == DiskState::InUse ? "inUse" : state == DiskState::Eligible ? "eligible" : "ineligible";
}

// Why the disk of the record must not be used; empty when nothing speaks against it.
std::string FaultOf(const HostCtl::Kova::DiskResult& record) {
  if (record.state != DiskState::Ineligible) {
    return "";
  }
  switch (record.reason) {
    case DiskReason::NonLocal:
      return "DiskIsNonLocal " + record.name;
    case DiskReason::HasPartitions:
    case DiskReason::HasForeignPartitions:
      return "DiskHasPartitions " + record.name;
    case DiskReason::Usb:
      return "DiskIsUSB " + record.name;
    case DiskReason::TooSmall:
      return "DiskTooSmall " + record.name;
    case DiskReason::None:
    case DiskReason::GroupNotMounted:
      break;
  }
  return "";
}

// Cuts the kernel's words out of a text; a result's list of disks may follow them.
void CutKernelsWords(std::string& text) {
  const std::size_t begin = text.find("simulated kernel: ");
  if (begin != std::string::npos) {
    const std::size_t end = std::min(text.find(" | ", begin), text.size());
    text.replace(begin, end - begin, kernelWords);
  }
}

Answer PanicAnswer(const std::string& text) {
  Answer answer;
  answer.ended = text;
  return answer;
}
Answer FaultAnswer(const std::string& fault) {
  Answer answer;
  answer.fault = fault;
  return answer;
}

}  // namespace

Answer WithoutTheKernelsWords(Answer answer) {
  CutKernelsWords(answer.fault);
  for (std::string& result : answer.results) {
    CutKernelsWords(result);
  }
  return answer;
}

std::string HostModel::RequestName(const std::string& disk) const {
  const HostDisk* const found = Find(disk);
  return found != nullptr && found->absent ? lostMark + found->kovaUuid : disk;
}

void HostModel::Change(const std::function<void(HostDescription&)>& edit) {
  edit(_host);
  Forget();
}

Answer HostModel::Run(const Request& request, const std::optional<InjectedFault>& fault) {
  _fault = fault;
  _calls.clear();
  switch (request.operation) {
    case Operation::AddDisks:
      return Add(request.disks);
    case Operation::AddAllEligibleDisks:
      return AddAll();
    case Operation::InitializeDisks: {
      Refresh();
      const Answer answer = Initialize(request.groups);
      Forget();
      return answer;
    }
    case Operation::RemoveDisk:
      return Remove(request.disks.at(0));
    case Operation::RemoveDiskMapping:
      return RemoveGroup(request.groups.at(0));
    case Operation::UnmountDiskMapping:
      return Unmount(request.groups);
    case Operation::ClaimUnmountedDiskgroup:
      return Claim();
    case Operation::QueryDisksForKova:
      return Query(request.disks);
    case Operation::GetStorageInfo:
    case Operation::GetConfigInfo:
      break;
  }
  return PanicAnswer("the model knows nothing of this operation");
}

// ---- additions

Answer HostModel::Add(const Names& names) {
  Refresh();
  RandomHost planning = PlanningHost(Candidates(names));
  Names taken;
  bool allFlashLimit = false;
  bool hybridLimit = false;
  const Names allFlash = PlanAllFlash(planning, taken, allFlashLimit);
  const Names remaining =
      TestSupport::DiskTexts(*TestSupport::AnInventory(PlainRules(planning).Remaining(taken)));
  if (const std::string repeated = RepeatedName(remaining); !repeated.empty()) {
    return FaultAnswer("DuplicateDisks " + repeated);
  }
  Names plan = PlanHybrid(planning, remaining.empty() ? Disks() : Offered(remaining, false), hybridLimit);
  for (const Names& more : {PlanNotMounted(planning), allFlash}) {
    plan.insert(plan.end(), more.begin(), more.end());
  }
  std::vector<NamedGroup> groups;
  for (const std::string& group : plan) {
    if (group.find("null") != std::string::npos) {
      return PanicAnswer("Not initialized");
    }
    groups.push_back(ParseGroup(group));
  }
  Answer answer;
  if (groups.empty() && (allFlashLimit || hybridLimit)) {
    answer = FaultAnswer(std::string("KovaFault [nox.agentd.kovaDiskOperation.") +
                         (allFlashLimit ? "allFlashExceed]" : "hybridExceed]"));
  } else {
    answer = Initialize(groups);
  }
  Forget();
  return answer;
}

Answer HostModel::AddAll() {
  Refresh();
  const Disks offered = Offered(std::nullopt, true);
  Answer answer;
  if (!offered.empty()) {
    RandomHost planning = PlanningHost(offered);
    Names taken;
    bool limit = false;
    const Names allFlash = PlanAllFlash(planning, taken, limit);
    Names plan = PlanHybrid(planning, PlainRules(planning).Remaining(taken), limit);
    plan.insert(plan.end(), allFlash.begin(), allFlash.end());
    std::vector<NamedGroup> groups;
    for (const std::string& group : plan) {
      groups.push_back(ParseGroup(group));
    }
    if (!groups.empty()) {
      answer = Initialize(groups);
    }
  }
  Forget();
  return answer;
}

Answer HostModel::Initialize(const std::vector<NamedGroup>& groups) {
  Answer answer;
  answer.hasResult = true;
  Names all;
  for (const NamedGroup& group : groups) {
    all.push_back(group.ssd);
    all.insert(all.end(), group.capacity.begin(), group.capacity.end());
  }
  std::sort(all.begin(), all.end());
  const auto twice = std::adjacent_find(all.begin(), all.end());
  if (all.size() < 2) {
    answer.fault = "InsufficientDisks";
  } else if (twice != all.end()) {
    answer.fault = "DuplicateDisks " + *twice;
  } else {
    Names faults;
    for (const NamedGroup& group : groups) {
      answer.results.push_back(Make(group, faults));
    }
    answer.fault = Combined(faults);
  }
  return answer;
}

std::string HostModel::Make(const NamedGroup& group, Names& faults) {
  bool isRead = false;
  if (const std::string fault = CheckGroup(group, isRead); !fault.empty()) {
    faults.push_back(fault);
    return Text(group) + " !" + fault + (isRead ? States(group) : "");
  }
  std::string text = Text(group);
  try {
    MakeOrRestamp(group);
  } catch (const KernelRefusal& refusal) {
    faults.push_back(refusal.fault);
    text += " !" + refusal.fault;
  }
  Forget();
  Refresh();
  return text + States(group);
}

// Names that stand twice are found before. `isRead` says whether the records were looked at.
std::string HostModel::CheckGroup(const NamedGroup& group, bool& isRead) const {
  if (group.capacity.empty()) {
    return "InsufficientDisks";
  }
  if (IsListed(group.ssd) && !Find(group.ssd)->ssd) {
    return "InvalidArgument";
  }
  isRead = true;
  for (const HostCtl::Kova::DiskResult& record : _records) {
    const bool isMember = record.name == group.ssd || Contains(group.capacity, record.name);
    if (isMember && IsListed(record.name) && !FaultOf(record).empty()) {
      return FaultOf(record);
    }
  }
  return "";
}

void HostModel::MakeOrRestamp(const NamedGroup& group) {
  const bool isUnmounted = std::any_of(_records.begin(), _records.end(), [&](const auto& record) {
    return record.name == group.ssd && record.reason == DiskReason::GroupNotMounted;
  });
  if (IsLost(group.ssd)) {
    RestampByUuid(UuidIn(group.ssd));
  } else if (isUnmounted) {
    Restamp(group.ssd);
    Mount(group.ssd);
  } else {
    Format(group);
  }
}

std::string HostModel::States(const NamedGroup& group) const {
  std::string text;
  for (const HostCtl::Kova::DiskResult& record : _records) {
    const bool isMember = record.name == group.ssd || Contains(group.capacity, record.name);
    if (isMember && IsListed(record.name)) {
      text += (text.empty() ? " | " : ", ") + record.name + " " + StateText(record.state);
    }
  }
  return text;
}

// ---- what takes away

Answer HostModel::Remove(const std::string& disk) {
  Refresh();
  Answer answer;
  try {
    if (IsLost(disk)) {
      TakeOutByUuid(UuidIn(disk));
    } else {
      TakeOut(disk);
    }
  } catch (const KernelRefusal& refusal) {
    answer.fault = refusal.fault;
  }
  Forget();
  return answer;
}

Answer HostModel::RemoveGroup(const NamedGroup& group) {
  Refresh();
  Answer answer;
  try {
    if (IsLost(group.ssd)) {
      TakeOutByUuid(UuidIn(group.ssd));
    } else if (!Exists(group)) {
      answer.fault = "InvalidArgument [nox.agentd.kovaDiskOperation.diskMappingNotFound]";
    } else {
      RemoveHeadedGroup(group.ssd);
    }
  } catch (const KernelRefusal& refusal) {
    answer.fault = refusal.fault;
  }
  Forget();
  return answer;
}

Answer HostModel::Unmount(const std::vector<NamedGroup>& groups) {
  Refresh();
  Answer answer;
  answer.hasResult = true;
  Names faults;
  for (const NamedGroup& group : groups) {
    std::string fault;
    if (!Exists(group)) {
      fault = "InvalidArgument";
    } else {
      try {
        Enter("UnmountDiskMapping");
        GroupOf(group.ssd)->mounted = false;
      } catch (const KernelRefusal& refusal) {
        fault = refusal.fault;
      }
    }
    answer.results.push_back(Text(group) + (fault.empty() ? "" : " !" + fault));
    if (!fault.empty()) {
      faults.push_back(fault);
    }
  }
  answer.fault = Combined(faults);
  Forget();
  return answer;
}

Answer HostModel::Claim() {
  if (!IsInjected("ClaimUnmountedDiskgroups")) {
    for (HostGroup& group : _host.groups) {
      group.mounted = true;
    }
  }
  Forget();
  return {};
}

Answer HostModel::Query(const Names& names) {
  Refresh();
  Answer answer;
  answer.hasResult = true;
  for (const HostCtl::Kova::DiskResult& record : _records) {
    if (!names.empty() && !Contains(names, record.name)) {
      continue;
    }
    if (record.isPdl && !record.kovaUuid.empty()) {
      answer.results.push_back(lostMark + record.kovaUuid + " " + StateText(record.state));
    } else if (!record.isPdl && IsListed(record.name)) {
      answer.results.push_back(record.name + " " + StateText(record.state));
    }
  }
  return answer;
}

// ---- planning

RandomHost HostModel::PlanningHost(const Disks& candidates) const {
  RandomHost planning;
  for (const HostDisk& disk : _host.disks) {
    if (IsListed(disk.name)) {
      planning.inventory.push_back(static_cast<int>(planning.pool.size()));
      planning.pool.push_back(AScsiDisk(disk.name).Ssd(disk.ssd));
    }
  }
  for (const auto& disk : candidates) {
    planning.candidates.push_back(static_cast<int>(planning.pool.size()));
    planning.pool.push_back(disk);
  }
  planning.records = _records;
  for (const HostGroup& group : _host.groups) {
    HostCtl::Kova::DiskMapping mapping;
    const auto nameOf = [this](const std::string& name) {
      const HostDisk& disk = *Find(name);
      return HostCtl::Kova::DiskName{disk.absent ? "" : disk.name, disk.kovaUuid};
    };
    mapping.ssd = nameOf(group.ssd);
    for (const std::string& disk : group.capacity) {
      mapping.capacityDisks.push_back(nameOf(disk));
    }
    mapping.allFlash = group.allFlash;
    mapping.thirdFlag = group.busy || !group.mounted;
    planning.mounted.push_back(mapping);  // planners see all groups, in the kernel's order
  }
  return planning;
}

Disks HostModel::Candidates(const Names& names) const {
  Disks disks;
  for (const std::string& name : names) {
    disks.push_back(AScsiDisk(name).Ssd(IsListed(name) && Find(name)->ssd));
  }
  return disks;
}

Disks HostModel::Offered(const std::optional<Names>& names, bool withoutReason) const {
  Disks disks;
  for (const HostCtl::Kova::DiskResult& record : _records) {
    const bool isWanted = (!names || Contains(*names, record.name)) && record.state == DiskState::Eligible &&
                          (!withoutReason || record.reason == DiskReason::None);
    if (isWanted && IsListed(record.name)) {
      disks.push_back(AScsiDisk(record.name).Ssd(Find(record.name)->ssd && !record.capacityFlash));
    }
  }
  return disks;
}

// The kernel's groups are asked for when there is flash to plan with.
Names HostModel::PlanAllFlash(RandomHost& planning, Names& taken, bool& limitReached) {
  Names candidates;
  for (const auto& disk : planning.Candidates()) {
    candidates.push_back(TestSupport::DiskText(disk.Get()));
  }
  const bool hasFlash = std::any_of(_records.begin(), _records.end(), [&](const auto& record) {
    return record.state == DiskState::Eligible && (record.isSsd || record.capacityFlash) &&
           Contains(candidates, record.name) && IsListed(record.name);
  });
  planning.kernelFails = hasFlash && IsInjected("GetDiskMappings");
  return PlainRules(planning).AllFlash(taken, limitReached);
}

Names HostModel::PlanHybrid(RandomHost& planning, const Disks& disks, bool& limitReached) {
  planning.kernelFails = IsInjected("GetDiskMappings");
  return PlainRules(planning).Hybrid(disks, false, limitReached);
}

Names HostModel::PlanNotMounted(RandomHost& planning) {
  Names ssds;
  for (const auto& disk : planning.Candidates()) {
    if (disk->GetSsd()) {
      ssds.push_back(disk->GetCanonicalName());
    }
  }
  const bool isAsked = std::any_of(_records.begin(), _records.end(), [&](const auto& record) {
    return record.isSsd && record.reason == DiskReason::GroupNotMounted && Contains(ssds, record.name);
  });
  planning.kernelFails = isAsked && IsInjected("GetDiskMappings");
  return PlainRules(planning).NotMounted();
}

}  // namespace Integration
