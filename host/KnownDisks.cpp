#include "host/KnownDisks.h"

#include <utility>

#include "nox/Host.h"
#include "nox/StorageSystem.h"
#include "tessa/App.h"

namespace Host {

using Nox::Host::ScsiDisk;
using Nox::Host::StorageDeviceInfo;
using Tessa::MakeRef;
using Tessa::Ref;

namespace {

constexpr std::string_view absentPrefix = "kova:";
constexpr std::size_t uuidLength = 36;

}  // namespace

struct KnownDisks::Entry {
  ScsiDisk* listed;     // the inventory's
  Ref<ScsiDisk> found;  // made when it is first asked for
};

KnownDisks KnownDisks::Now() {
  Ref<Nox::Host::StorageSystem> storageSystem;
  Tessa::Service::TryLookupObject("storageSystem", storageSystem);
  Ref<StorageDeviceInfo> info;
  if (storageSystem) {
    storageSystem->GetStorageDeviceInfo(info);
  }
  return KnownDisks(std::move(info));
}

KnownDisks::KnownDisks(Ref<StorageDeviceInfo> info) : _info(std::move(info)) {
  if (!_info || !_info->GetScsiLun()) {
    return;
  }
  for (Nox::Host::ScsiLun* unit : *_info->GetScsiLun()) {
    auto* const disk = dynamic_cast<ScsiDisk*>(unit);
    if (disk != nullptr && disk->HasCanonicalName()) {
      _named.emplace(disk->GetCanonicalName(), Entry{disk, nullptr});
    }
  }
}

KnownDisks::~KnownDisks() = default;
KnownDisks::KnownDisks(KnownDisks&&) noexcept = default;

bool KnownDisks::IsThere() const noexcept {
  return static_cast<bool>(_info);
}

Ref<ScsiDisk> KnownDisks::Find(std::string_view canonicalName) const {
  const auto at = _named.find(canonicalName);
  if (at == _named.end()) {
    return nullptr;
  }
  Entry& entry = at->second;
  if (!entry.found) {
    entry.found = MakeRef<ScsiDisk>(*entry.listed);
    entry.found->SetDurableName(nullptr);
    entry.found->SetAlternateName(nullptr);
    entry.found->SetStandardInquiry(nullptr);
  }
  return entry.found;
}

bool HasAbsentPrefix(std::string_view canonicalName) {
  return canonicalName.substr(0, absentPrefix.size()) == absentPrefix;
}

bool IsAbsentName(std::string_view canonicalName) {
  return canonicalName.size() == absentPrefix.size() + uuidLength && HasAbsentPrefix(canonicalName);
}

std::string AbsentName(const std::string& kovaUuid) {
  return std::string(absentPrefix) + kovaUuid;
}

Ref<ScsiDisk> AbsentDisk(const std::string& kovaUuid, bool ssd) {
  const auto disk = MakeRef<ScsiDisk>();
  disk->SetDeviceName("unknown");
  disk->SetDeviceType("unknown");
  disk->SetUuid(kovaUuid);
  disk->SetCanonicalName(AbsentName(kovaUuid));
  disk->SetDisplayName("Absent disk with KOVA UUID " + kovaUuid);
  disk->SetLunType(ScsiDisk::SCSILUNTYPE_UNKNOWN);
  disk->SetOperationalState(MakeRef<Orbis::TextList>(std::vector<std::string>{ScsiDisk::STATE_ERROR}));
  disk->SetSsd(ssd);
  return disk;
}

}  // namespace Host
