#include "kovactl/plan/Plan.h"

#include <algorithm>
#include <array>
#include <map>

#include "host/KnownDisks.h"
#include "kovactl/DiskGroups.h"
#include "kovactl/GroupResults.h"

namespace Kovactl {
namespace {

using OtxCtl::Sim::HostDescription;
using OtxCtl::Sim::HostGroup;
using Fate = PlannedGroup::Fate;
using Names = std::vector<std::string>;

const HostGroup* Find(const HostDescription& host, const std::string& ssd) {
  const auto found = std::find_if(host.groups.begin(), host.groups.end(),
                                  [&ssd](const HostGroup& group) { return group.ssd == ssd; });
  return found == host.groups.end() ? nullptr : &*found;
}

// The names that only the first list holds, in its order.
Names Without(const Names& names, const Names& others) {
  Names rest;
  std::copy_if(names.begin(), names.end(), std::back_inserter(rest), [&others](const std::string& name) {
    return std::find(others.begin(), others.end(), name) == others.end();
  });
  return rest;
}

void Note(Fate fate, const HostGroup& group, const Names& capacity, std::vector<PlannedGroup>& changes) {
  changes.push_back({.fate = fate, .ssd = group.ssd, .capacity = capacity, .allFlash = group.allFlash});
}

// One group may differ in more than one way.
void Compare(const HostGroup& before, const HostGroup& after, std::vector<PlannedGroup>& changes) {
  if (before.mounted != after.mounted) {
    Note(after.mounted ? Fate::Mounted : Fate::Unmounted, after, after.capacity, changes);
  }
  if (const Names come = Without(after.capacity, before.capacity); !come.empty()) {
    Note(Fate::Extended, after, come, changes);
  }
  if (const Names gone = Without(before.capacity, after.capacity); !gone.empty()) {
    Note(Fate::Reduced, after, gone, changes);
  }
}

// Calls disks that have left what the host's answers call them.
void RenameAbsent(const HostDescription& host, std::vector<PlannedGroup>& changes) {
  std::map<std::string, std::string> names;
  for (const OtxCtl::Sim::HostDisk& disk : host.disks) {
    if (disk.absent) {
      names.emplace(disk.name, Host::AbsentName(disk.kovaUuid));
    }
  }
  const auto rename = [&names](std::string& name) {
    const auto found = names.find(name);
    name = found == names.end() ? name : found->second;
  };
  for (PlannedGroup& group : changes) {
    rename(group.ssd);
    std::for_each(group.capacity.begin(), group.capacity.end(), rename);
  }
}

}  // namespace

std::string WordFor(Fate fate) {
  constexpr std::array<const char*, 7> words = {"made",      "extended", "reduced", "removed",
                                                "unmounted", "mounted",  "failed"};
  return words.at(static_cast<std::size_t>(fate));
}

std::vector<PlannedGroup> CompareGroups(const HostDescription& before, const HostDescription& after) {
  std::vector<PlannedGroup> changes;
  for (const HostGroup& group : before.groups) {
    if (const HostGroup* const now = Find(after, group.ssd)) {
      Compare(group, *now, changes);
    } else {
      Note(Fate::Removed, group, group.capacity, changes);
    }
  }
  for (const HostGroup& group : after.groups) {
    if (Find(before, group.ssd) == nullptr) {
      Note(Fate::Made, group, group.capacity, changes);
    }
  }
  RenameAbsent(before, changes);
  return changes;
}

std::vector<PlannedGroup> FailedGroups(const Host::Answer& answer) {
  std::vector<PlannedGroup> failed;
  const auto* const results = dynamic_cast<const GroupResults*>(answer.result.Get());
  if (results == nullptr) {
    return failed;
  }
  for (const Nox::Kova::Host::DiskMapResult* group : *results) {
    if (!group->GetError()) {
      continue;
    }
    Names disks = DisksOf(*group->GetMapping());
    const std::string ssd = CacheDiskOf(*group->GetMapping());
    disks.erase(disks.begin(), disks.begin() + (group->GetMapping()->GetSsd() ? 1 : 0));
    failed.push_back({.fate = Fate::Failed, .ssd = ssd, .capacity = disks, .fault = group->GetError()});
  }
  return failed;
}

}  // namespace Kovactl
