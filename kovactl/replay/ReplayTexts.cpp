#include "kovactl/replay/ReplayTexts.h"

#include <unordered_map>

#include "nox/Host.h"
#include "nox/Kova.h"
#include "nox/StorageSystem.h"
#include "orbis/Soap.h"
#include "tessa/App.h"

namespace Kovactl {
namespace {

using Nox::Host::ScsiDisk;
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

  Ref<ScsiDisk> Resolve(const DiskArgument& disk) const {
    const auto* const name = std::get_if<std::string>(&disk);
    return name != nullptr ? Find(*name) : std::get<Ref<ScsiDisk>>(disk);
  }

 private:
  Ref<ScsiDisk> Find(const std::string& name) const {
    if (const auto found = _disks.find(name); found != _disks.end()) {
      return Ref<ScsiDisk>(found->second);
    }
    const auto unknown = MakeRef<ScsiDisk>();
    unknown->SetCanonicalName(name);
    return unknown;
  }

  Ref<Nox::Host::StorageDeviceInfo> _info;  // owns the disks
  std::unordered_map<std::string, ScsiDisk*> _disks;
};

std::string MappingText(const MappingArgument& argument, const DiskIndex& index) {
  const auto mapping = MakeRef<Nox::Kova::Host::DiskMapping>();
  mapping->SetSsd(index.Resolve(argument.ssd));
  const auto disks = MakeRef<Orbis::DataArray<ScsiDisk>>();
  for (const DiskArgument& disk : argument.nonSsd) {
    disks->Append(index.Resolve(disk));
  }
  mapping->SetNonSsd(disks);
  return ToSoap(*mapping);
}

}  // namespace

std::vector<std::string> HookTexts(const ReplayRequest& request) {
  std::vector<std::string> texts = request.texts;
  if (request.disks.empty() && request.mappings.empty()) {
    return texts;
  }
  const DiskIndex index;
  for (const DiskArgument& disk : request.disks) {
    texts.push_back(ToSoap(*index.Resolve(disk)));
  }
  for (const MappingArgument& mapping : request.mappings) {
    texts.push_back(MappingText(mapping, index));
  }
  return texts;
}

}  // namespace Kovactl
