#include "otxctl/linux/LinuxProvider.h"

#include <unordered_map>
#include <unordered_set>
#include <utility>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/provider/NicRecords.h"

namespace OtxCtl::Linux {
namespace {

using HostCtl::Kova::DiskMapping;
using HostCtl::Kova::DiskName;
using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskResult;
using HostCtl::Kova::DiskState;

constexpr std::uint8_t groupFormatVersion = 3;

DiskName NameOf(const GroupMember& member) {
  return {member.canonicalName, member.kovaUuid};
}

DiskResult RecordOfAbsent(const GroupMember& member, const DiskGroup& group) {
  DiskResult record;
  record.kovaUuid = member.kovaUuid;
  record.state = group.isMounted ? DiskState::InUse : DiskState::Ineligible;
  record.reason = group.isMounted ? DiskReason::None : DiskReason::GroupNotMounted;
  record.isSsd = member.isFlash;
  record.isPdl = true;
  record.formatVersion = groupFormatVersion;
  return record;
}

// `uuid`: of a member; empty: it is none.
DiskResult RecordOf(const LinuxSnapshot& seen, std::size_t index, const std::string& uuid) {
  const Disks::DiskFacts& facts = seen.disks[index].facts;
  DiskResult record;
  record.name = facts.canonicalName;
  record.state = seen.verdicts[index].state;
  record.reason = seen.verdicts[index].reason;
  record.isSsd = facts.isFlash.Is(true);
  record.capacityFlash = record.isSsd && seen.settings.capacityFlash.count(record.name) > 0;
  record.kovaUuid = uuid;
  record.formatVersion = uuid.empty() ? 0 : groupFormatVersion;
  return record;
}

// The members of all groups: of those that are there, the UUIDs by canonical name; of those that are not, the
// records, at their place. They have none in the kernel's order any more: they stand behind the member before
// them in their group, or before the first one that is there.
struct Members {
  std::unordered_map<std::string, std::string> uuidOf;
  std::unordered_map<std::string, std::vector<DiskResult>> before;
  std::unordered_map<std::string, std::vector<DiskResult>> behind;
  std::vector<DiskResult> alone;  // of groups of which no disk is there

  explicit Members(const std::vector<DiskGroup>& groups) {
    for (const DiskGroup& group : groups) {
      std::string last;
      std::vector<DiskResult> first;
      Add(group.cache, group, last, first);
      for (const GroupMember& member : group.capacity) {
        Add(member, group, last, first);
      }
      alone.insert(alone.end(), first.begin(), first.end());
    }
  }

 private:
  // `last`: the member that is there and was added last; `first`: those added before there was any.
  void Add(const GroupMember& member, const DiskGroup& group, std::string& last,
           std::vector<DiskResult>& first) {
    if (!member.canonicalName.empty()) {
      last = member.canonicalName;
      uuidOf.emplace(last, member.kovaUuid);
      before[last] = std::exchange(first, {});
    } else {
      (last.empty() ? first : behind[last]).push_back(RecordOfAbsent(member, group));
    }
  }
};

}  // namespace

void LinuxProvider::QueryDisks(const std::vector<std::string>& names, std::vector<DiskResult>& results,
                               bool) {
  const auto seen = _host->Current();
  Members members(seen->groups);
  const std::unordered_set<std::string> wanted(names.begin(), names.end());
  const auto isWanted = [&wanted](const std::string& name) {
    return wanted.empty() || wanted.count(name) > 0;
  };
  const auto addAbsent = [&](const std::vector<DiskResult>& absent) {
    if (isWanted("")) {
      results.insert(results.end(), absent.begin(), absent.end());
    }
  };
  for (std::size_t index = 0; index < seen->disks.size(); ++index) {
    const std::string& name = seen->disks[index].facts.canonicalName;
    addAbsent(members.before[name]);
    if (isWanted(name)) {
      results.push_back(RecordOf(*seen, index, members.uuidOf[name]));
    }
    addAbsent(members.behind[name]);
  }
  addAbsent(members.alone);
}

void LinuxProvider::GetDiskMappings(std::vector<DiskMapping>& mappings, bool withUnmounted) {
  for (const DiskGroup& group : _host->Current()->groups) {
    if (!group.isMounted && !withUnmounted) {
      continue;
    }
    DiskMapping& mapping = mappings.emplace_back();
    mapping.ssd = NameOf(group.cache);
    for (const GroupMember& member : group.capacity) {
      mapping.capacityDisks.push_back(NameOf(member));
    }
    mapping.formatVersion = groupFormatVersion;
    mapping.allFlash = group.isAllFlash;
    mapping.thirdFlag = !group.isMounted;
  }
}

GroupChanges& LinuxProvider::Changes() const {
  if (_changes == nullptr) {
    throw HostCtl::Lib::HostCtlException(
        "the disks of this machine can only be looked at: nothing was changed");
  }
  return *_changes;
}

void LinuxProvider::FormatDiskMapping(const std::string& ssd, const std::vector<std::string>& capacityDisks,
                                      const HostCtl::Kova::FormatContext&) {
  Changes().Format(ssd, capacityDisks);
}

void LinuxProvider::RestampDiskMapping(const std::string& ssd, const std::vector<std::string>&) {
  Changes().Restamp(ssd);
}

void LinuxProvider::MountDiskMapping(const std::string& ssd, bool) {
  Changes().Mount(ssd);
}

void LinuxProvider::RestampDiskMappingByUuid(const std::string& kovaUuid) {
  Changes().RestampByUuid(kovaUuid);
}

void LinuxProvider::RemoveDisk(const std::string& disk, const std::string&,
                               const HostCtl::Kova::RemovalOptions& options) {
  Changes().RemoveDisk(disk, options);
}

void LinuxProvider::RemoveDiskMapping(const std::string& ssd, const std::string&,
                                      const HostCtl::Kova::RemovalOptions& options) {
  Changes().RemoveGroup(ssd, options);
}

void LinuxProvider::UnmountDiskMapping(const std::string& ssd) {
  Changes().Unmount(ssd);
}

void LinuxProvider::RemoveDiskByUuid(const std::string& kovaUuid, const std::string&) {
  Changes().RemoveByUuid(kovaUuid);
}

bool LinuxProvider::IsAutoModeEnabled() {
  return _host->ReadSettings().isAutoMode;
}

std::vector<HostCtl::Kova::KovaOtxNicConfig*> LinuxProvider::GetKovaOtxNicConfigs() {
  return Provider::MakeNicRecords(_host->ReadSettings().nics);
}

void LinuxProvider::GetClusterInfoDetailed(HostCtl::Kova::KovaClusterInfoDetailed& info) {
  const HostSettings settings = _host->ReadSettings();
  info = {};
  info.enabled = settings.isInCluster;
  info.clusterUuid = settings.clusterUuid;
  info.nodeUuid = settings.nodeUuid;
}

std::string LinuxProvider::GetFaultDomainName() {
  return _host->ReadSettings().faultDomain;
}

void LinuxProvider::ClaimUnmountedDiskgroups() {
  Changes().Claim();
}

void LinuxProvider::RefreshKovaInfo() {
  _host->Look();
}

}  // namespace OtxCtl::Linux
