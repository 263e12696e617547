#include "machines/SimulatedInventory.h"

#include <optional>
#include <string>
#include <vector>

#include "machines/InventoryUnits.h"
#include "nox/Host.h"
#include "orbis/Types.h"
#include "otxctl/sim/HostDescription.h"

namespace Machines {
namespace {

using Nox::Host::DurableName;
using Nox::Host::ScsiDisk;
using Nox::Host::ScsiLun;
using Nox::Host::StorageDeviceInfo;
using Orbis::DataArray;
using OtxCtl::Sim::HostDescription;
using OtxCtl::Sim::HostDisk;
using Tessa::MakeRef;
using Tessa::Ref;

Ref<DurableName> ToDurableName(const OtxCtl::Sim::DurableName& name) {
  const auto durableName = MakeRef<DurableName>();
  durableName->SetAuthority(name.authority);
  durableName->SetIdentifier(name.identifier);
  return durableName;
}

void SetIdentity(ScsiDisk& disk, const HostDisk& described) {
  disk.SetDisplayName(UnlessEmpty(described.displayName));
  disk.SetVendor(UnlessEmpty(described.vendor));
  disk.SetModel(UnlessEmpty(described.model));
  disk.SetSerialNumber(UnlessEmpty(described.serial));
  if (described.durableName) {
    disk.SetDurableName(ToDurableName(*described.durableName));
  }
  if (!described.alternateName.empty()) {
    const auto names = MakeRef<DataArray<DurableName>>();
    for (const OtxCtl::Sim::DurableName& name : described.alternateName) {
      names->Append(ToDurableName(name));
    }
    disk.SetAlternateName(names);
  }
  if (described.standardInquiry) {
    disk.SetStandardInquiry(MakeRef<Orbis::Binary>(*described.standardInquiry));
  }
}

Ref<ScsiDisk> ToDisk(const HostDisk& described) {
  const auto disk = MakeRef<ScsiDisk>();
  SetUnit(*disk, described.name, described.name, ScsiLun::SCSILUNTYPE_DISK);
  SetIdentity(*disk, described);
  disk->GetCapacity()->SetBlockSize(described.blockSize);
  disk->GetCapacity()->SetBlock(described.bytes / described.blockSize);
  disk->SetSsd(described.ssd);
  disk->SetLocal(described.local);
  disk->SetTransport(described.transport);
  disk->SetDetail(UnlessEmpty(described.detail));
  return disk;
}

}  // namespace

Ref<StorageDeviceInfo> DescribeInventory(const HostDescription& host) {
  const auto units = MakeRef<DataArray<ScsiLun>>();
  for (const HostDisk& disk : host.disks) {
    if (disk.inInventory && !disk.absent) {
      units->Append(ToDisk(disk));
    }
  }
  for (std::size_t i = 0; i < host.otherLuns.size(); ++i) {
    Ref<ScsiLun> unit;
    if (host.otherLuns[i]) {
      unit = MakeRef<ScsiLun>();
      const std::string name = *host.otherLuns[i] + std::to_string(i);
      SetUnit(*unit, name, name, *host.otherLuns[i]);
    }
    units->Append(unit);
  }
  const auto info = MakeRef<StorageDeviceInfo>();
  info->SetScsiLun(units);
  return info;
}

}  // namespace Machines
