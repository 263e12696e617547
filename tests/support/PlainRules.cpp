#include "tests/support/PlainRules.h"

#include <algorithm>
#include <map>
#include <utility>

#include "tessa/Throwable.h"

namespace TestSupport {

using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskState;
using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;
using Tessa::Ref;
using KernelGroup = HostCtl::Kova::DiskMapping;
using KernelRecord = HostCtl::Kova::DiskResult;

namespace {

const std::string& Name(const ScsiDisk* disk) {
  if (disk == nullptr) {
    Tessa::NotInitializedException::ThrowNotInitialized();
  }
  return disk->GetCanonicalName();
}

bool Flag(const ScsiDisk* disk) {
  if (disk == nullptr) {
    Tessa::NotInitializedException::ThrowOptionalNotSet();
  }
  return disk->GetSsd();
}

void AppendNames(const DiskMapping& mapping, std::vector<std::string>& names) {
  names.push_back(Name(mapping.GetSsd().Get()));
  for (const ScsiDisk* disk : *mapping.GetNonSsd()) {
    names.push_back(Name(disk));
  }
  std::erase(names, "");
}

// SSDs, and how many capacity disks each has.
using Tally = std::vector<std::pair<ScsiDisk*, int>>;

// Sorted anew for every disk, keeping the order of equals; one list per SSD object.
std::vector<std::string> Deal(Tally tally, const Disks& capacity, bool& groupsFull) {
  std::vector<ScsiDisk*> order;
  std::map<ScsiDisk*, std::string> plan;
  for (const Ref<ScsiDisk>& disk : capacity) {
    if (tally.empty()) {
      break;
    }
    std::vector<std::pair<ScsiDisk*, int>*> sorted;
    for (auto& entry : tally) {
      sorted.push_back(&entry);
    }
    std::stable_sort(sorted.begin(), sorted.end(),
                     [](const auto* left, const auto* right) { return left->second < right->second; });
    if (sorted.front()->second >= 7) {
      groupsFull = true;
      break;
    }
    ScsiDisk* const ssd = sorted.front()->first;
    if (!plan.contains(ssd)) {
      order.push_back(ssd);
      plan[ssd] = DiskText(ssd) + ":";
    }
    plan[ssd] += " " + DiskText(disk.Get());
    ++sorted.front()->second;
  }
  std::vector<std::string> texts;
  for (ScsiDisk* const ssd : order) {
    texts.push_back(plan[ssd]);
  }
  return texts;
}

}  // namespace

std::vector<KernelGroup> PlainRules::AllGroups() const {
  if (_host.kernelFails) {
    return {};
  }
  std::vector<KernelGroup> groups = _host.mounted;
  groups.insert(groups.end(), _host.unmounted.begin(), _host.unmounted.end());
  return groups;
}

Ref<ScsiDisk> PlainRules::Find(const std::string& name) const {
  for (const Ref<ScsiDisk>& disk : _host.Inventory()) {
    if (Name(disk.Get()) == name) {
      return disk;
    }
  }
  return nullptr;
}

std::vector<std::string> PlainRules::Hybrid(const Disks& candidates, bool allFlash,
                                            bool& limitReached) const {
  const std::vector<KernelGroup> groups = AllGroups();
  Tally tally;
  Disks capacity;
  bool tooManySsds = false;
  for (const Ref<ScsiDisk>& disk : candidates) {
    if (!Flag(disk.Get())) {
      capacity.push_back(disk);
    } else if (tally.size() + groups.size() <= 4) {
      tally.emplace_back(disk.Get(), 0);
    } else {
      tooManySsds = true;
    }
  }
  if (tally.empty()) {
    for (const KernelGroup& group : groups) {
      if (group.allFlash == allFlash && !group.thirdFlag) {
        if (const Ref<ScsiDisk> ssd = Find(group.ssd.deviceName)) {
          tally.emplace_back(ssd.Get(), static_cast<int>(group.capacityDisks.size()));
        }
      }
    }
  }
  bool groupsFull = false;
  const std::vector<std::string> plan = Deal(tally, capacity, groupsFull);
  limitReached = !capacity.empty() && plan.empty() && (tooManySsds || groupsFull);
  return plan;
}

std::vector<std::string> PlainRules::AllFlash(std::vector<std::string>& taken, bool& limitReached) const {
  std::vector<std::string> names;
  for (const Ref<ScsiDisk>& disk : _host.Candidates()) {
    names.push_back(Name(disk.Get()));
  }
  Disks flash;
  for (const KernelRecord& record : _host.records) {
    const bool isNamed = std::find(names.begin(), names.end(), record.name) != names.end();
    if (isNamed && record.state == DiskState::Eligible && (record.isSsd || record.capacityFlash)) {
      if (const Ref<ScsiDisk> disk = Find(record.name)) {
        AScsiDisk copy(record.name);
        copy.Ssd(record.capacityFlash ? std::optional<bool>(false)
                 : disk->HasSsd()     ? std::optional<bool>(disk->GetSsd())
                                      : std::nullopt);
        flash.push_back(copy);
      }
    }
  }
  if (flash.empty()) {
    return {};
  }
  for (const Ref<ScsiDisk>& disk : flash) {
    if (!Flag(disk.Get())) {
      taken.push_back(Name(disk.Get()));
    }
  }
  const std::vector<std::string> plan = Hybrid(flash, true, limitReached);
  for (const std::string& group : plan) {
    taken.push_back(group.substr(0, group.find(':')));
  }
  return plan;
}

Disks PlainRules::Remaining(const std::vector<std::string>& taken) const {
  Disks remaining;
  for (const Ref<ScsiDisk>& disk : _host.Candidates()) {
    if (std::find(taken.begin(), taken.end(), Name(disk.Get())) == taken.end()) {
      remaining.push_back(disk);
    }
  }
  return remaining;
}

std::vector<std::string> PlainRules::NotMounted() const {
  std::vector<std::string> ssds;
  for (const Ref<ScsiDisk>& disk : _host.Candidates()) {
    if (Flag(disk.Get())) {
      ssds.push_back(Name(disk.Get()));
    }
  }
  std::vector<std::string> notMounted;
  for (const KernelRecord& record : _host.records) {
    if (std::find(ssds.begin(), ssds.end(), record.name) != ssds.end() && record.isSsd &&
        record.reason == DiskReason::GroupNotMounted) {
      notMounted.push_back(record.name);
    }
  }
  std::vector<std::string> plan;
  for (const KernelGroup& group : notMounted.empty() ? std::vector<KernelGroup>() : AllGroups()) {
    if (std::find(notMounted.begin(), notMounted.end(), group.ssd.deviceName) != notMounted.end()) {
      std::string text = DiskText(Find(group.ssd.deviceName).Get()) + ":";
      for (const HostCtl::Kova::DiskName& disk : group.capacityDisks) {
        text += " " + DiskText(Find(disk.deviceName).Get());
      }
      plan.push_back(text);
    }
  }
  return plan;
}

bool PlainRules::Exists(const DiskMapping& mapping) const {
  const std::string ssd = Name(mapping.GetSsd().Get());
  std::vector<std::string> requested;
  for (const ScsiDisk* disk : *mapping.GetNonSsd()) {
    requested.push_back(Name(disk));
  }
  for (const KernelGroup& group :
       requested.empty() || _host.kernelFails ? std::vector<KernelGroup>() : _host.mounted) {
    bool matches = group.ssd.deviceName == ssd && group.capacityDisks.size() == requested.size();
    for (const HostCtl::Kova::DiskName& disk : group.capacityDisks) {
      const std::string name = disk.deviceName.empty() ? "kova:" + disk.kovaUuid : disk.deviceName;
      matches = matches && std::find(requested.begin(), requested.end(), name) != requested.end();
    }
    if (matches) {
      return true;
    }
  }
  return false;
}

std::string PlainRules::Validate(const std::vector<Ref<DiskMapping>>& mappings) {
  std::vector<std::string> names;
  for (const Ref<DiskMapping>& mapping : mappings) {
    AppendNames(*mapping, names);
    std::sort(names.begin(), names.end());  // the whole list after each group
  }
  if (names.size() < 2) {
    return "too few";
  }
  for (std::size_t index = 1; index < names.size(); ++index) {
    if (names[index - 1] == names[index]) {
      return "twice " + names[index];
    }
  }
  return "passes";
}

}  // namespace TestSupport
