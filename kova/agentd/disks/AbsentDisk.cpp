#include "kova/agentd/disks/AbsentDisk.h"

#include "nox/Host.h"

namespace Kovasvc {
namespace {

constexpr std::size_t uuidLength = 36;

const std::string& Prefix() {
  static const std::string prefix = "kova:";
  return prefix;
}

}  // namespace

bool IsPDLDiskInput(const std::string& diskName) {
  return diskName.compare(0, Prefix().size(), Prefix()) == 0;
}

void PDLDiskToKovaUuid(const std::string& diskName, std::string& uuid) {
  if (IsPDLDiskInput(diskName) && diskName.size() == Prefix().size() + uuidLength) {
    uuid = diskName.substr(Prefix().size());
  } else {
    uuid.clear();
  }
}

void GeneratePDLScsiDisk(const std::string& kovaUuid, bool ssd, Tessa::Ref<Nox::Host::ScsiDisk>& disk) {
  using Nox::Host::ScsiDisk;
  const auto absent = Tessa::MakeRef<ScsiDisk>();
  absent->SetDeviceName("unknown");
  absent->SetDeviceType("unknown");
  absent->SetLunType(ScsiDisk::SCSILUNTYPE_UNKNOWN);
  absent->SetOperationalState(
      Tessa::MakeRef<Orbis::TextList>(std::vector<std::string>{ScsiDisk::STATE_ERROR}));
  absent->SetCapacity(Tessa::MakeRef<Nox::Host::DiskDimensions::Lba>());
  absent->SetSsd(ssd);
  absent->SetCanonicalName(Prefix() + kovaUuid);
  absent->SetUuid(kovaUuid);
  absent->SetDisplayName("Absent KOVA Disk (KOVA UUID:" + kovaUuid + ")");
  disk = absent;
}

}  // namespace Kovasvc
