#include "host/Gate.h"

#include <unordered_map>

#include "host/KnownDisks.h"
#include "host/Refusal.h"
#include "host/Text.h"
#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/include/KovaInfo.h"
#include "nox/Kova.h"
#include "orbis/Engine.h"

namespace Host::Gate {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;
using Orbis::Fault::SystemError;
using Tessa::MakeRef;
using Tessa::Ref;

namespace {

void CheckName(const std::string& place, const std::string& name) {
  if (name.empty()) {
    Refuse(place, "the name of a disk is empty");
  }
  if (name.size() > longestName) {
    Refuse(place, "a name of more than " + std::to_string(longestName) + " bytes");
  }
  if (!IsClean(name)) {
    Refuse(place, "the name '" + Printable(name) + "' holds control characters or is not UTF-8");
  }
}

void CheckOption(const std::string& property, const std::string& text) {
  if (text.size() > longestOption) {
    Refuse(property, "a text of more than " + std::to_string(longestOption) + " bytes");
  }
  if (!IsClean(text)) {
    Refuse(property, "the text '" + Printable(text) + "' holds control characters or is not UTF-8");
  }
}

// What is done with a disk that the inventory does not know, whatever flag it brings.
enum class Unknown {
  Refused,
  RefusedUnlessAbsent,  // "kova:UUID" is let in
  LetIn,
};

// A disk that takes the place of the given one: the inventory's, or the same with its flag set.
Ref<ScsiDisk> AdmitDisk(const std::string& place, const ScsiDisk* disk, const KnownDisks& known,
                        Unknown unknown, bool isCacheDisk) {
  if (disk == nullptr) {
    Refuse(place, "there is no disk");
  }
  if (!disk->HasCanonicalName()) {
    Refuse(place, "the disk has no canonical name");
  }
  const std::string& name = disk->GetCanonicalName();
  CheckName(place, name);
  if (Ref<ScsiDisk> found = known.Find(name)) {
    return found;
  }
  const bool isLetIn = unknown == Unknown::LetIn || (unknown != Unknown::Refused && IsAbsentName(name));
  if (!isLetIn) {
    Refuse(place, "this host has no disk '" + name + "'");
  }
  const auto copy = MakeRef<ScsiDisk>(*disk);
  copy->SetSsd(disk->HasSsd() ? disk->GetSsd() : isCacheDisk);
  return copy;
}

Ref<DiskList> AdmitList(const std::string& place, const DiskList* disks, std::size_t most,
                        const KnownDisks& known, Unknown unknown) {
  const auto admitted = MakeRef<DiskList>();
  const std::size_t count = disks == nullptr ? 0 : disks->Size();
  if (count > most) {
    Refuse(place, "more than " + std::to_string(most) + " disks");
  }
  admitted->Reserve(count);
  for (std::size_t i = 0; i < count; ++i) {
    admitted->Append(AdmitDisk(Indexed(place, i), (*disks)[i], known, unknown, false));
  }
  return admitted;
}

Ref<DiskMapping> AdmitMapping(const std::string& place, const DiskMapping* mapping, const KnownDisks& known,
                              Unknown unknown) {
  if (mapping == nullptr) {
    Refuse(place, "there is no disk group");
  }
  const auto admitted = MakeRef<DiskMapping>();
  admitted->SetSsd(AdmitDisk(place + ".ssd", mapping->GetSsd().Get(), known, unknown, true));
  admitted->SetNonSsd(
      AdmitList(place + ".nonSsd", mapping->GetNonSsd().Get(), mostDisksOfGroup, known, unknown));
  return admitted;
}

Ref<MappingList> AdmitMappings(const MappingList& mappings, const KnownDisks& known, Unknown unknown) {
  if (mappings.Size() > mostMappings) {
    Refuse("mappings", "more than " + std::to_string(mostMappings) + " disk groups");
  }
  const auto admitted = MakeRef<MappingList>();
  std::size_t disks = 0;
  for (std::size_t i = 0; i < mappings.Size(); ++i) {
    admitted->Append(AdmitMapping(Indexed("mappings", i), mappings[i], known, unknown));
    disks += 1 + (*admitted)[i]->GetNonSsd()->Size();
    if (disks > mostNames) {
      Refuse("mappings", "more than " + std::to_string(mostNames) + " disks");
    }
  }
  return admitted;
}

using Positions = std::unordered_map<std::string, std::size_t>;

// Which of the flash disks belong to groups that are not mounted, as the kernel says; and where each stands.
Positions CacheDisksOffline(const DiskList& disks, HostCtl::Kova::KovaInfo& kernel) {
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
  std::vector<HostCtl::Kova::DiskResult> records;
  kernel.QueryDisks(names, records, true);
  Positions offline;
  for (const HostCtl::Kova::DiskResult& record : records) {
    const auto at = flash.find(record.name);
    if (record.isSsd && record.reason == HostCtl::Kova::DiskReason::GroupNotMounted && at != flash.end()) {
      offline.insert(*at);
    }
  }
  return offline;
}

// How requests name one of the kernel's disks when the inventory lacks it; empty when it does not.
std::string NameIfMissing(const HostCtl::Kova::DiskName& disk, const KnownDisks& known) {
  if (disk.deviceName.empty()) {
    return AbsentName(disk.kovaUuid);
  }
  return known.Find(disk.deviceName) ? std::string() : disk.deviceName;
}

// The first of the group's disks that the inventory lacks; empty when all are there.
std::string MissingMember(const HostCtl::Kova::DiskMapping& group, const KnownDisks& known) {
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

}  // namespace

void CheckNames(const std::string& property, const std::vector<std::string>& names) {
  if (names.size() > mostNames) {
    Refuse(property, "more than " + std::to_string(mostNames) + " names");
  }
  for (std::size_t i = 0; i < names.size(); ++i) {
    CheckName(Indexed(property, i), names[i]);
  }
}

void CheckRemoval(const std::string& disk, const RemovalArguments& arguments) {
  CheckName("disk", disk);
  CheckRemovalArguments(arguments);
}

void CheckRemovalArguments(const RemovalArguments& arguments) {
  CheckOption("passThrough", arguments.passThrough);
  CheckOption("optionText", arguments.optionText);
}

Ref<DiskList> AdmitDisks(const DiskList& disks, const KnownDisks& known) {
  return AdmitList("disks", &disks, mostNames, known, Unknown::Refused);
}

Ref<MappingList> AdmitNewGroups(const MappingList& mappings, const KnownDisks& known) {
  return AdmitMappings(mappings, known, Unknown::RefusedUnlessAbsent);
}

Ref<MappingList> AdmitGroups(const MappingList& mappings, const KnownDisks& known) {
  return AdmitMappings(mappings, known, Unknown::LetIn);
}

Ref<DiskMapping> AdmitGroup(const DiskMapping& mapping, const KnownDisks& known) {
  return AdmitMapping("mapping", &mapping, known, Unknown::LetIn);
}

void RefuseChange(const std::string& error) {
  RefuseWith(error.substr(0, error.find(": ")), error);
}

void DemandWholeGroups(const DiskList& disks, const KnownDisks& known, HostCtl::Kova::KovaInfo& kernel) {
  try {
    const Positions offline = CacheDisksOffline(disks, kernel);
    if (offline.empty()) {
      return;
    }
    std::vector<HostCtl::Kova::DiskMapping> groups;
    kernel.GetDiskMappings(groups, true);
    for (const HostCtl::Kova::DiskMapping& group : groups) {
      const auto at = offline.find(group.ssd.deviceName);
      const std::string missing = at == offline.end() ? std::string() : MissingMember(group, known);
      if (!missing.empty()) {
        RefuseBrokenGroup(Indexed("disks", at->second), at->first, missing);
      }
    }
  } catch (const HostCtl::Lib::HostCtlException& failed) {
    throw SystemError::Exception(MakeRef<SystemError>(
        "Whether the disks belong to groups that lack a disk could not be found out: " + failed.Describe()));
  }
}

}  // namespace Host::Gate
