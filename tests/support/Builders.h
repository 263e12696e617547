// Disks, kernel records and disk groups with sensible defaults, to be named where a test cares:
//
//   AScsiDisk("naa.1").Ssd()          a flash disk of the inventory
//   ARecord("naa.1").Ineligible(DiskReason::Usb)
//
// A builder is used once and converts to what it builds.
#pragma once

#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "kova/agentd/include/KovaRecords.h"
#include "nox/Host.h"
#include "nox/Kova.h"
#include "orbis/Types.h"

namespace TestSupport {

// A disk of the agent's inventory: a local HDD of 1 TiB, all optional identification set.
class AScsiDisk {
 public:
  explicit AScsiDisk(const std::string& name) : _disk(Tessa::MakeRef<Nox::Host::ScsiDisk>()) {
    _disk->SetDeviceName(name);
    _disk->SetDeviceType("disk");
    _disk->SetUuid("uuid of " + name);
    _disk->SetCanonicalName(name);
    _disk->SetDisplayName("Disk " + name);
    _disk->SetLunType(Nox::Host::ScsiLun::SCSILUNTYPE_DISK);
    _disk->SetOperationalState(
        Tessa::MakeRef<Orbis::TextList>(std::vector<std::string>{Nox::Host::ScsiLun::STATE_OK}));
    const auto capacity = Tessa::MakeRef<Nox::Host::DiskDimensions::Lba>();
    capacity->SetBlockSize(512);
    capacity->SetBlock(std::int64_t{1} << 31);
    _disk->SetCapacity(capacity);
    _disk->SetSsd(false);
    _disk->SetLocal(true);
  }

  AScsiDisk& Named(const std::string& canonicalName) {
    _disk->SetCanonicalName(canonicalName);
    return *this;
  }
  AScsiDisk& Unnamed() {
    _disk->SetCanonicalName(std::nullopt);
    return *this;
  }
  AScsiDisk& Ssd(std::optional<bool> ssd = true) {
    _disk->SetSsd(ssd);
    return *this;
  }
  // What results do not carry: durable name, alternate names, standard inquiry data.
  AScsiDisk& WithInquiryData() {
    const auto name = Tessa::MakeRef<Nox::Host::DurableName>();
    name->SetAuthority("t10");
    name->SetIdentifier("durable");
    _disk->SetDurableName(name);
    const auto names = Tessa::MakeRef<Orbis::DataArray<Nox::Host::DurableName>>();
    names->Append(name);
    _disk->SetAlternateName(names);
    _disk->SetStandardInquiry(Tessa::MakeRef<Orbis::Binary>(Orbis::Bytes{1, 2, 3}));
    return *this;
  }

  operator Tessa::Ref<Nox::Host::ScsiDisk>() const { return _disk; }
  operator Tessa::Ref<Nox::Host::ScsiLun>() const { return _disk; }
  Tessa::Ref<Nox::Host::ScsiDisk> Build() const { return _disk; }

 private:
  Tessa::Ref<Nox::Host::ScsiDisk> _disk;
};

// The kernel's record of an eligible HDD that the service does not use.
class ARecord {
 public:
  explicit ARecord(const std::string& name) {
    _record.name = name;
    _record.state = HostCtl::Kova::DiskState::Eligible;
  }

  ARecord& State(HostCtl::Kova::DiskState state) {
    _record.state = state;
    return *this;
  }
  ARecord& Reason(HostCtl::Kova::DiskReason reason) {
    _record.reason = reason;
    return *this;
  }
  ARecord& Ineligible(HostCtl::Kova::DiskReason reason) {
    return State(HostCtl::Kova::DiskState::Ineligible).Reason(reason);
  }
  ARecord& InUse(const std::string& kovaUuid, std::uint8_t formatVersion = 3) {
    _record.formatVersion = formatVersion;
    return State(HostCtl::Kova::DiskState::InUse).Uuid(kovaUuid);
  }
  ARecord& Uuid(const std::string& kovaUuid) {
    _record.kovaUuid = kovaUuid;
    return *this;
  }
  ARecord& Ssd(bool ssd = true) {
    _record.isSsd = ssd;
    return *this;
  }
  ARecord& CapacityFlash() {
    _record.capacityFlash = true;
    return *this;
  }
  ARecord& Absent() {
    _record.isPdl = true;
    return *this;
  }

  operator HostCtl::Kova::DiskResult() const { return _record; }

 private:
  HostCtl::Kova::DiskResult _record;
};

// A mounted hybrid group as the kernel reports it.
class AGroup {
 public:
  AGroup(const std::string& ssd, const std::vector<std::string>& capacityDisks) {
    _group.ssd.deviceName = ssd;
    _group.formatVersion = 3;
    for (const std::string& disk : capacityDisks) {
      _group.capacityDisks.push_back({.deviceName = disk, .kovaUuid = {}});
    }
  }

  AGroup& AllFlash() {
    _group.allFlash = true;
    return *this;
  }
  AGroup& ThirdFlag() {
    _group.thirdFlag = true;
    return *this;
  }

  operator HostCtl::Kova::DiskMapping() const { return _group; }

 private:
  HostCtl::Kova::DiskMapping _group;
};

// The inventory as the marshalling gets it. Entries may be null.
inline Tessa::Ref<Orbis::DataArray<Nox::Host::ScsiDisk>> AnInventory(
    const std::vector<Tessa::Ref<Nox::Host::ScsiDisk>>& disks) {
  const auto inventory = Tessa::MakeRef<Orbis::DataArray<Nox::Host::ScsiDisk>>();
  for (const Tessa::Ref<Nox::Host::ScsiDisk>& disk : disks) {
    inventory->Append(disk);
  }
  return inventory;
}

// A disk group of a request.
inline Tessa::Ref<Nox::Kova::Host::DiskMapping> AMapping(
    const Tessa::Ref<Nox::Host::ScsiDisk>& ssd, const std::vector<Tessa::Ref<Nox::Host::ScsiDisk>>& nonSsd) {
  const auto mapping = Tessa::MakeRef<Nox::Kova::Host::DiskMapping>();
  mapping->SetSsd(ssd);
  mapping->SetNonSsd(AnInventory(nonSsd));
  return mapping;
}

// Gives the fault messages with these keys.
template <class Fault>
Tessa::Ref<Fault> WithMessages(Tessa::Ref<Fault> fault, const std::vector<std::string>& keys) {
  for (const std::string& key : keys) {
    const auto message = Tessa::MakeRef<Orbis::LocalizableMessage>();
    message->SetKey(key);
    fault->GetFaultMessage()->Append(message);
  }
  return fault;
}

}  // namespace TestSupport
