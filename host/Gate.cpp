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

void AdmitEach(const std::string& place, DiskList& disks, std::size_t most, const KnownDisks& known,
               Unknown unknown) {
  CheckCount(place, disks.Size(), most, "disks");
  for (std::size_t i = 0; i < disks.Size(); ++i) {
    disks.Replace(i, AdmitDisk(Indexed(place, i), disks[i], known, unknown, false));
  }
}

// How many disks it has.
std::size_t AdmitMapping(const std::string& place, DiskMapping* mapping, const KnownDisks& known,
                         Unknown unknown) {
  if (mapping == nullptr) {
    Refuse(place, "there is no disk group");
  }
  mapping->SetSsd(AdmitDisk(place + ".ssd", mapping->GetSsd().Get(), known, unknown, true));
  const Ref<DiskList> capacityDisks = mapping->GetNonSsd();
  if (!capacityDisks) {
    return 1;
  }
  AdmitEach(place + ".nonSsd", *capacityDisks, mostDisksOfGroup, known, unknown);
  return 1 + capacityDisks->Size();
}

void AdmitMappings(const MappingList& mappings, const KnownDisks& known, Unknown unknown) {
  CheckCount("mappings", mappings.Size(), mostMappings, "disk groups");
  std::size_t disks = 0;
  for (std::size_t i = 0; i < mappings.Size(); ++i) {
    disks += AdmitMapping(Indexed("mappings", i), mappings[i], known, unknown);
    CheckCount("mappings", disks, mostNames, "disks");
  }
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

void AdmitDisks(DiskList& disks, const KnownDisks& known) {
  AdmitEach("disks", disks, mostNames, known, Unknown::Refused);
}

void AdmitNewGroups(MappingList& mappings, const KnownDisks& known) {
  AdmitMappings(mappings, known, Unknown::RefusedUnlessAbsent);
}

void AdmitGroups(MappingList& mappings, const KnownDisks& known) {
  AdmitMappings(mappings, known, Unknown::LetIn);
}

void AdmitGroup(DiskMapping* mapping, const KnownDisks& known) {
  AdmitMapping("mapping", mapping, known, Unknown::LetIn);
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
