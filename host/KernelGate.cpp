// The part of the gate that asks the kernel.

#include <algorithm>
#include <unordered_map>

#include "host/Gate.h"
#include "host/KnownDisks.h"
#include "host/Refusal.h"
#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/include/KovaInfo.h"
#include "nox/Host.h"
#include "nox/Kova.h"

namespace Host::Gate {

using Orbis::Fault::SystemError;
using Tessa::MakeRef;
using DiskRecord = HostCtl::Kova::DiskResult;
using GroupRecord = HostCtl::Kova::DiskMapping;

namespace {

using Positions = std::unordered_map<std::string, std::size_t>;

// Which of the flash disks belong to groups that are not mounted, as the kernel says; and where each stands.
Positions CacheDisksUnmounted(const DiskList& disks, HostCtl::Kova::KovaInfo& kernel) {
  Positions flash;
  std::vector<std::string> names;
  for (std::size_t i = 0; i < disks.Size(); ++i) {
    if (disks[i]->GetSsd() && flash.emplace(disks[i]->GetCanonicalName(), i).second) {
      names.push_back(disks[i]->GetCanonicalName());
    }
  }
  if (names.empty()) {
    return {};  // a query without names would answer for every disk of the host
  }
  std::vector<DiskRecord> records;
  kernel.QueryDisks(names, records, true);
  Positions unmounted;
  for (const DiskRecord& record : records) {
    const auto at = flash.find(record.name);
    if (record.isSsd && record.reason == HostCtl::Kova::DiskReason::GroupNotMounted && at != flash.end()) {
      unmounted.insert(*at);
    }
  }
  return unmounted;
}

// How requests name one of the kernel's disks when the inventory lacks it; empty when it does not.
std::string NameIfMissing(const HostCtl::Kova::DiskName& disk, const KnownDisks& known) {
  if (disk.deviceName.empty()) {
    return AbsentName(disk.kovaUuid);
  }
  return known.Find(disk.deviceName) ? std::string() : disk.deviceName;
}

// The first of the group's disks that the inventory lacks; empty when all are there.
std::string MissingMember(const GroupRecord& group, const KnownDisks& known) {
  std::string missing = NameIfMissing(group.ssd, known);
  for (auto disk = group.capacityDisks.begin(); missing.empty() && disk != group.capacityDisks.end();
       ++disk) {
    missing = NameIfMissing(*disk, known);
  }
  return missing;
}

[[noreturn]] void RefuseBrokenGroup(const std::string& place, const std::string& ssd,
                                    const std::string& missing) {
  Refuse(place, "'" + ssd + "' heads a disk group that is not mounted and lacks its disk '" + missing +
                    "'; bring that disk back, or remove it from the group first");
}

bool IsCalled(const DiskRecord& record, const std::string& name) {
  return record.name.empty() && AbsentName(record.kovaUuid) == name;
}

bool IsInGroup(const DiskRecord& record) {
  return record.state == HostCtl::Kova::DiskState::InUse ||
         record.reason == HostCtl::Kova::DiskReason::GroupNotMounted;
}

bool IsCalled(const HostCtl::Kova::DiskName& disk, const std::string& name) {
  return disk.deviceName.empty() && AbsentName(disk.kovaUuid) == name;
}

// How many absent disks are called that. Groups may hold disks that are not among the records, so whichever
// way finds more of them counts.
std::ptrdiff_t CountCalled(const std::string& name, const std::vector<DiskRecord>& records,
                           const std::vector<GroupRecord>& groups) {
  const auto isCalled = [&name](const auto& disk) { return IsCalled(disk, name); };
  const auto isLoose = [&name](const auto& record) { return IsCalled(record, name) && !IsInGroup(record); };
  std::ptrdiff_t ofGroups = std::count_if(records.begin(), records.end(), isLoose);
  for (const GroupRecord& group : groups) {
    ofGroups += isCalled(group.ssd) ? 1 : 0;
    ofGroups += std::count_if(group.capacityDisks.begin(), group.capacityDisks.end(), isCalled);
  }
  return std::max(std::count_if(records.begin(), records.end(), isCalled), ofGroups);
}

// Runs what asks the kernel. When the kernel fails, that is a SystemError with both texts.
template <class Work>
void AskOrFail(const char* what, Work ask) {
  try {
    ask();
  } catch (const HostCtl::Lib::HostCtlException& failed) {
    throw SystemError::Exception(MakeRef<SystemError>(what + failed.Describe()));
  }
}

}  // namespace

void RequireWholeGroups(const DiskList& disks, const KnownDisks& known, HostCtl::Kova::KovaInfo& kernel) {
  AskOrFail("Whether the disks belong to groups that lack a disk could not be found out: ", [&] {
    const Positions unmounted = CacheDisksUnmounted(disks, kernel);
    if (unmounted.empty()) {
      return;
    }
    std::vector<GroupRecord> groups;
    kernel.GetDiskMappings(groups, true);
    for (const GroupRecord& group : groups) {
      const auto at = unmounted.find(group.ssd.deviceName);
      const std::string missing = at == unmounted.end() ? std::string() : MissingMember(group, known);
      if (!missing.empty()) {
        RefuseBrokenGroup(Indexed("disks", at->second), at->first, missing);
      }
    }
  });
}

void RequireAnswers(HostCtl::Kova::KovaInfo& kernel) {
  AskOrFail("Nothing is formatted, for the kernel could not be asked about its disks: ", [&] {
    kernel.RefreshKovaInfo();
    std::vector<DiskRecord> records;
    kernel.QueryDisks({}, records, true);
  });
}

void RequireGroupIfAbsent(const Nox::Kova::Host::DiskMapping& mapping, HostCtl::Kova::KovaInfo& kernel) {
  const std::string& name = mapping.GetSsd()->GetCanonicalName();
  if (!HasAbsentPrefix(name)) {
    return;
  }
  AskOrFail("The disk groups of the host could not be found out: ", [&] {
    std::vector<GroupRecord> groups;
    kernel.GetDiskMappings(groups, true);
    const auto isHead = [&name](const GroupRecord& group) { return IsCalled(group.ssd, name); };
    if (std::none_of(groups.begin(), groups.end(), isHead)) {
      Refuse("mapping.ssd", "no disk group of this host has the absent cache disk '" + name + "'");
    }
  });
}

void RequireOneIfAbsent(const std::string& place, const std::string& name, HostCtl::Kova::KovaInfo& kernel) {
  if (!HasAbsentPrefix(name)) {
    return;
  }
  AskOrFail("Which disks have left the host could not be found out: ", [&] {
    std::vector<DiskRecord> records;
    kernel.QueryDisks({}, records, true);
    std::vector<GroupRecord> groups;
    kernel.GetDiskMappings(groups, true);
    if (CountCalled(name, records, groups) > 1) {
      Refuse(place, "more than one disk that has left this host is called '" + name +
                        "'; bring the one that is meant back, and name it by its own name");
    }
  });
}

}  // namespace Host::Gate
