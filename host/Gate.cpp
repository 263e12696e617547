#include "host/Gate.h"

#include "host/KnownDisks.h"
#include "host/Refusal.h"
#include "host/Simulation.h"
#include "nox/Kova.h"
#include "orbis/Engine.h"
#include "tessa/text/Escape.h"

namespace Host::Gate {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;
using Orbis::Fault::SystemError;
using Tessa::MakeRef;
using Tessa::Ref;

namespace {

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
  if (!isLetIn && !known.IsThere()) {
    throw SystemError::Exception(
        MakeRef<SystemError>("The disks of the host could not be read: the agent has no inventory."));
  }
  if (!isLetIn) {
    Refuse(place, "this host has no disk '" + name + "'");
  }
  const auto copy = MakeRef<ScsiDisk>();  // nothing else of an unknown disk is believed
  copy->SetCanonicalName(name);
  copy->SetSsd(disk->HasSsd() ? disk->GetSsd() : isCacheDisk);
  return copy;
}

Ref<DiskList> AdmitList(const std::string& place, const DiskList* disks, std::size_t most,
                        const KnownDisks& known, Unknown unknown) {
  const auto admitted = MakeRef<DiskList>();
  const std::size_t count = disks == nullptr ? 0 : disks->Size();
  CheckCount(place, count, most, "disks");
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
  CheckCount("mappings", mappings.Size(), mostMappings, "disk groups");
  const auto admitted = MakeRef<MappingList>();
  std::size_t disks = 0;
  for (std::size_t i = 0; i < mappings.Size(); ++i) {
    admitted->Append(AdmitMapping(Indexed("mappings", i), mappings[i], known, unknown));
    disks += 1 + (*admitted)[i]->GetNonSsd()->Size();
    CheckCount("mappings", disks, mostNames, "disks");
  }
  return admitted;
}

}  // namespace

void CheckCount(const std::string& place, std::size_t count, std::size_t most, const char* what) {
  if (count > most) {
    Refuse(place, "more than " + std::to_string(most) + " " + what);
  }
}

void CheckLength(const std::string& place, const std::string& name) {
  if (name.size() > longestName) {
    Refuse(place, "a name of more than " + std::to_string(longestName) + " bytes");
  }
}

void CheckName(const std::string& place, const std::string& name) {
  if (name.empty()) {
    Refuse(place, "the name of a disk is empty");
  }
  CheckLength(place, name);
  if (!Tessa::IsPrintable(name)) {
    Refuse(place, "the name '" + Tessa::Escape(name) + "' holds control characters or is not UTF-8");
  }
}

void CheckOption(const std::string& property, const std::string& text) {
  if (text.size() > longestOption) {
    Refuse(property, "a text of more than " + std::to_string(longestOption) + " bytes");
  }
  if (!Tessa::IsPrintable(text)) {
    Refuse(property, "the text '" + Tessa::Escape(text) + "' holds control characters or is not UTF-8");
  }
}

void CheckNames(const std::string& property, const std::vector<std::string>& names) {
  CheckCount(property, names.size(), mostNames, "names");
  for (std::size_t i = 0; i < names.size(); ++i) {
    CheckName(Indexed(property, i), names[i]);
  }
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

Ref<DiskMapping> AdmitGroup(const DiskMapping* mapping, const KnownDisks& known) {
  return AdmitMapping("mapping", mapping, known, Unknown::LetIn);
}

void CheckHostChange(const Simulation& simulation, std::string_view change) {
  try {
    simulation.CheckChange(change);
  } catch (const ChangeRefused& refused) {
    RefuseChange(refused.what());
  }
}

void RefuseChange(const std::string& error) {
  RefuseWith(error.substr(0, error.find(": ")), error);
}

}  // namespace Host::Gate
