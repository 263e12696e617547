#include "host/RequestBounds.h"

#include "host/Gate.h"
#include "host/Refusal.h"
#include "nox/Host.h"
#include "nox/Kova.h"
#include "orbis/TypeDescriptor.h"

namespace Host {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;
using Orbis::FieldDescriptor;
using Orbis::FieldKind;
using Orbis::Presence;
using Tessa::MakeRef;
using Tessa::Ref;

namespace {

// Each of these makes a copy with nothing in it that is not looked at. Nulls stay: the gate refuses them.
Ref<ScsiDisk> Trimmed(const std::string& place, const ScsiDisk* disk) {
  if (disk == nullptr) {
    return nullptr;
  }
  const auto trimmed = MakeRef<ScsiDisk>();
  if (disk->HasCanonicalName()) {
    Gate::CheckLength(place, disk->GetCanonicalName());
    trimmed->SetCanonicalName(disk->GetCanonicalName());
  }
  if (disk->HasSsd()) {
    trimmed->SetSsd(disk->GetSsd());
  }
  return trimmed;
}

Ref<DiskList> Trimmed(const std::string& place, const DiskList* disks, std::size_t most) {
  const auto trimmed = MakeRef<DiskList>();
  const std::size_t count = disks == nullptr ? 0 : disks->Size();
  Gate::CheckCount(place, count, most, "disks");
  trimmed->Reserve(count);
  for (std::size_t i = 0; i < count; ++i) {
    trimmed->Append(Trimmed(Indexed(place, i), (*disks)[i]));
  }
  return trimmed;
}

Ref<DiskMapping> Trimmed(const std::string& place, const DiskMapping* mapping) {
  if (mapping == nullptr) {
    return nullptr;
  }
  const auto trimmed = MakeRef<DiskMapping>();
  trimmed->SetSsd(Trimmed(place + ".ssd", mapping->GetSsd().Get()));
  trimmed->SetNonSsd(Trimmed(place + ".nonSsd", mapping->GetNonSsd().Get(), Gate::mostDisksOfGroup));
  return trimmed;
}

Ref<MappingList> Trimmed(const std::string& place, const MappingList& mappings) {
  Gate::CheckCount(place, mappings.Size(), Gate::mostMappings, "disk groups");
  const auto trimmed = MakeRef<MappingList>();
  std::size_t disks = 0;
  for (std::size_t i = 0; i < mappings.Size(); ++i) {
    const Ref<DiskMapping> mapping = Trimmed(Indexed(place, i), mappings[i]);
    disks += mapping ? 1 + mapping->GetNonSsd()->Size() : 0;
    Gate::CheckCount(place, disks, Gate::mostNames, "disks");
    trimmed->Append(mapping);
  }
  return trimmed;
}

Ref<Orbis::Any> TrimmedObject(const std::string& place, const Orbis::Any* value) {
  if (const auto* const disks = dynamic_cast<const DiskList*>(value)) {
    return Trimmed(place, disks, Gate::mostNames);
  }
  if (const auto* const mappings = dynamic_cast<const MappingList*>(value)) {
    return Trimmed(place, *mappings);
  }
  return Trimmed(place, dynamic_cast<const DiskMapping*>(value));
}

void CheckText(const FieldDescriptor& field, const std::string& text) {
  const std::string place(field.name);
  if (field.presence == Presence::Required) {
    Gate::CheckLength(place, text);
  } else {
    Gate::CheckOption(place, text);
  }
}

const std::string* TextIn(const FieldDescriptor& field, const Orbis::DataObject& object) {
  return field.kind == FieldKind::String ? static_cast<const std::string*>(field.read(object)) : nullptr;
}

std::size_t WeightOfDisk(const ScsiDisk* disk) {
  const bool isNamed = disk != nullptr && disk->HasCanonicalName();
  return sizeof(ScsiDisk) + (isNamed ? disk->GetCanonicalName().size() : 0);
}

std::size_t WeightOfDisks(const DiskList* disks) {
  std::size_t weight = 0;
  for (std::size_t i = 0; disks != nullptr && i < disks->Size(); ++i) {
    weight += WeightOfDisk((*disks)[i]);
  }
  return weight;
}

std::size_t WeightOfMapping(const DiskMapping* mapping) {
  return mapping == nullptr
             ? 0
             : WeightOfDisk(mapping->GetSsd().Get()) + WeightOfDisks(mapping->GetNonSsd().Get());
}

std::size_t WeightOfObject(const Orbis::Any* value) {
  if (const auto* const mappings = dynamic_cast<const MappingList*>(value)) {
    std::size_t weight = 0;
    for (const DiskMapping* mapping : *mappings) {
      weight += WeightOfMapping(mapping);
    }
    return weight;
  }
  return WeightOfDisks(dynamic_cast<const DiskList*>(value)) +
         WeightOfMapping(dynamic_cast<const DiskMapping*>(value));
}

}  // namespace

void BoundRequest(Orbis::DataObject& request) {
  for (const FieldDescriptor* field : request.GetType().fields) {
    if (const std::string* const text = TextIn(*field, request)) {
      CheckText(*field, *text);
    } else if (field->kind == FieldKind::Strings) {
      const auto* const names = static_cast<const Orbis::TextList*>(field->get(request));
      Gate::CheckNames(std::string(field->name),
                       names == nullptr ? std::vector<std::string>() : names->Items());
    } else if (field->kind == FieldKind::Object && field->get(request) != nullptr) {
      field->assign(request, TrimmedObject(std::string(field->name), field->get(request)));
    }
  }
}

std::size_t WeightOf(const Orbis::DataObject& request) {
  std::size_t weight = 0;
  for (const FieldDescriptor* field : request.GetType().fields) {
    const std::string* const text = TextIn(*field, request);
    weight += text == nullptr ? 0 : text->size();
    weight += field->kind == FieldKind::Object ? WeightOfObject(field->get(request)) : 0;
  }
  return weight;
}

}  // namespace Host
