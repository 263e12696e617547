#include "host/RequestBounds.h"

#include "host/Gate.h"
#include "host/Refusal.h"
#include "nox/Host.h"
#include "nox/Kova.h"

namespace Host {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;
using Tessa::MakeRef;
using Tessa::Ref;

namespace {

Ref<ScsiDisk> LeanDisk(const std::string& place, const ScsiDisk* disk) {
  if (disk == nullptr) {
    return nullptr;
  }
  const auto lean = MakeRef<ScsiDisk>();
  if (disk->HasCanonicalName()) {
    Gate::CheckLength(place, disk->GetCanonicalName());
    lean->SetCanonicalName(disk->GetCanonicalName());
  }
  if (disk->HasSsd()) {
    lean->SetSsd(disk->GetSsd());
  }
  return lean;
}

Ref<DiskList> LeanList(const std::string& place, const DiskList* disks, std::size_t most) {
  const auto lean = MakeRef<DiskList>();
  const std::size_t count = disks == nullptr ? 0 : disks->Size();
  Gate::CheckCount(place, count, most, "disks");
  lean->Reserve(count);
  for (std::size_t i = 0; i < count; ++i) {
    lean->Append(LeanDisk(Indexed(place, i), (*disks)[i]));
  }
  return lean;
}

Ref<DiskMapping> LeanMapping(const std::string& place, const DiskMapping* mapping) {
  if (mapping == nullptr) {
    return nullptr;
  }
  const auto lean = MakeRef<DiskMapping>();
  lean->SetSsd(LeanDisk(place + ".ssd", mapping->GetSsd().Get()));
  lean->SetNonSsd(LeanList(place + ".nonSsd", mapping->GetNonSsd().Get(), Gate::mostDisksOfGroup));
  return lean;
}

std::size_t WeightOfDisk(const ScsiDisk* disk) {
  const bool isNamed = disk != nullptr && disk->HasCanonicalName();
  return sizeof(ScsiDisk) + (isNamed ? disk->GetCanonicalName().size() : 0);
}

}  // namespace

Ref<DiskList> Lean(const std::string& property, const DiskList& disks) {
  return LeanList(property, &disks, Gate::mostNames);
}

Ref<MappingList> Lean(const MappingList& mappings) {
  Gate::CheckCount("mappings", mappings.Size(), Gate::mostMappings, "disk groups");
  const auto lean = MakeRef<MappingList>();
  std::size_t disks = 0;
  for (std::size_t i = 0; i < mappings.Size(); ++i) {
    const Ref<DiskMapping> mapping = LeanMapping(Indexed("mappings", i), mappings[i]);
    disks += mapping ? 1 + mapping->GetNonSsd()->Size() : 0;
    Gate::CheckCount("mappings", disks, Gate::mostNames, "disks");
    lean->Append(mapping);
  }
  return lean;
}

Ref<DiskMapping> Lean(const DiskMapping& mapping) {
  return LeanMapping("mapping", &mapping);
}

std::size_t WeightOf(const DiskList& disks) {
  std::size_t weight = 0;
  for (const ScsiDisk* disk : disks) {
    weight += WeightOfDisk(disk);
  }
  return weight;
}

std::size_t WeightOf(const DiskMapping& mapping) {
  const Ref<DiskList>& disks = mapping.GetNonSsd();
  return WeightOfDisk(mapping.GetSsd().Get()) + (disks ? WeightOf(*disks) : 0);
}

std::size_t WeightOf(const MappingList& mappings) {
  std::size_t weight = 0;
  for (const DiskMapping* mapping : mappings) {
    weight += mapping == nullptr ? 0 : WeightOf(*mapping);
  }
  return weight;
}

}  // namespace Host
