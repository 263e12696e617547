#include "machines/LinuxInventory.h"

#include <string>
#include <vector>

#include "machines/InventoryUnits.h"
#include "nox/Host.h"
#include "orbis/Types.h"
#include "otxctl/linux/LinuxHost.h"

namespace Machines {
namespace {

using HostCtl::Kova::DiskState;
using Nox::Host::ScsiDisk;
using Nox::Host::ScsiLun;
using OtxCtl::Disks::Attachment;
using OtxCtl::Disks::DiskFacts;
using OtxCtl::Disks::DiskIdentity;
using OtxCtl::Disks::DiskVerdict;
using OtxCtl::Disks::IsRunning;
using OtxCtl::Linux::ScannedDisk;
using Tessa::MakeRef;
using Tessa::Ref;

void SetIdentity(ScsiDisk& disk, const DiskFacts& facts) {
  const DiskIdentity identity = facts.identity.IsKnown() ? facts.identity.Get() : DiskIdentity();
  disk.SetVendor(UnlessEmpty(identity.vendor));
  disk.SetModel(UnlessEmpty(identity.model));
  disk.SetSerialNumber(UnlessEmpty(identity.serial));
  const std::size_t dot = identity.worldWideName.find('.');
  if (dot != std::string::npos) {
    const auto name = MakeRef<Nox::Host::DurableName>();
    name->SetAuthority(identity.worldWideName.substr(0, dot));
    name->SetIdentifier(identity.worldWideName.substr(dot + 1));
    disk.SetDurableName(name);
  }
}

void SetConnection(ScsiDisk& disk, const DiskFacts& facts) {
  if (facts.connection.IsKnown()) {
    disk.SetLocal(facts.connection.Get().attachment != Attachment::Remote);
    disk.SetTransport(UnlessEmpty(facts.connection.Get().transport));
  }
}

Ref<ScsiDisk> ToDisk(const ScannedDisk& scanned, const DiskVerdict& verdict) {
  const DiskFacts& facts = scanned.facts;
  const auto disk = MakeRef<ScsiDisk>();
  SetUnit(*disk, facts.canonicalName, scanned.deviceNode, ScsiLun::SCSILUNTYPE_DISK);
  if (!facts.state.IsKnown() || !IsRunning(facts.state.Get())) {
    disk->SetOperationalState(MakeRef<Orbis::TextList>(std::vector<std::string>{ScsiLun::STATE_OFF}));
  }
  disk->SetDisplayName(scanned.displayName);
  SetIdentity(*disk, facts);
  SetConnection(*disk, facts);
  disk->GetCapacity()->SetBlockSize(scanned.blockSize);
  disk->GetCapacity()->SetBlock(facts.bytes.IsKnown() ? facts.bytes.Get() / scanned.blockSize : 0);
  disk->SetSsd(facts.isFlash.Is(true));
  disk->SetDetail(UnlessEmpty(verdict.detail));
  return disk;
}

}  // namespace

Ref<Nox::Host::StorageDeviceInfo> DescribeInventory(const OtxCtl::Linux::LinuxSnapshot& seen) {
  const auto units = MakeRef<Orbis::DataArray<ScsiLun>>();
  for (std::size_t index = 0; index < seen.disks.size(); ++index) {
    units->Append(ToDisk(seen.disks[index], seen.verdicts[index]));
  }
  const auto info = MakeRef<Nox::Host::StorageDeviceInfo>();
  info->SetScsiLun(units);
  return info;
}

}  // namespace Machines
