#include "kovactl/replay/ReplayTexts.h"

#include <unordered_map>

#include "nox/Host.h"
#include "nox/Kova.h"
#include "nox/StorageSystem.h"
#include "orbis/Soap.h"
#include "orbis/TypeDescriptor.h"
#include "tessa/App.h"

namespace Kovactl {
namespace {

using Nox::Host::ScsiDisk;
using Nox::Kova::Host::DiskMapping;
using Tessa::MakeRef;
using Tessa::Ref;

std::string ToSoap(const Orbis::Any& object) {
  std::string text;
  Orbis::SerializeObjectToSoap(object, nullptr, text);
  return text;
}

// The inventory's disks by name, as they are now.
class DiskIndex {
 public:
  DiskIndex() {
    Ref<Nox::Host::StorageSystem> storageSystem;
    Tessa::Service::TryLookupObject("storageSystem", storageSystem);
    if (storageSystem) {
      storageSystem->GetStorageDeviceInfo(_info);
    }
    if (!_info || !_info->GetScsiLun()) {
      return;
    }
    for (Nox::Host::ScsiLun* unit : *_info->GetScsiLun()) {
      auto* const disk = dynamic_cast<ScsiDisk*>(unit);
      if (disk != nullptr && disk->HasCanonicalName()) {
        _disks.emplace(disk->GetCanonicalName(), disk);
      }
    }
  }

  // The disk to hand on: the inventory's for one that is given by name.
  Ref<ScsiDisk> Resolve(ScsiDisk* disk) const {
    if (dynamic_cast<const NamedDisk*>(disk) == nullptr) {
      return Ref<ScsiDisk>(disk);
    }
    const auto found = _disks.find(disk->GetCanonicalName());
    return Ref<ScsiDisk>(found != _disks.end() ? found->second : disk);
  }

 private:
  Ref<Nox::Host::StorageDeviceInfo> _info;  // owns the disks
  std::unordered_map<std::string, ScsiDisk*> _disks;
};

Ref<Orbis::DataArray<ScsiDisk>> Resolve(const Orbis::DataArray<ScsiDisk>& disks, const DiskIndex& index) {
  const auto resolved = MakeRef<Orbis::DataArray<ScsiDisk>>();
  for (ScsiDisk* disk : disks) {
    resolved->Append(index.Resolve(disk));
  }
  return resolved;
}

std::string MappingText(const DiskMapping& given, const DiskIndex& index) {
  const auto mapping = MakeRef<DiskMapping>();
  mapping->SetSsd(index.Resolve(given.GetSsd().Get()));
  if (given.GetNonSsd()) {
    mapping->SetNonSsd(Resolve(*given.GetNonSsd(), index));
  }
  return ToSoap(*mapping);
}

void AddTextsOf(const Orbis::Any* value, const DiskIndex& index, std::vector<std::string>& texts) {
  if (const auto* const mapping = dynamic_cast<const DiskMapping*>(value)) {
    texts.push_back(MappingText(*mapping, index));
  } else if (const auto* const mappings = dynamic_cast<const Orbis::DataArray<DiskMapping>*>(value)) {
    for (const DiskMapping* one : *mappings) {
      texts.push_back(MappingText(*one, index));
    }
  } else if (const auto* const disks = dynamic_cast<const Orbis::DataArray<ScsiDisk>*>(value)) {
    for (ScsiDisk* disk : *disks) {
      texts.push_back(ToSoap(*index.Resolve(disk)));
    }
  }
}

}  // namespace

void AddTexts(ReplayRequest& request) {
  if (!request.parameters) {
    return;
  }
  const DiskIndex index;
  for (const Orbis::FieldDescriptor* field : request.parameters->GetType().fields) {
    if (field->kind == Orbis::FieldKind::Object && field->get(*request.parameters) != nullptr) {
      AddTextsOf(field->get(*request.parameters), index, request.arguments.texts);
    }
  }
}

}  // namespace Kovactl
