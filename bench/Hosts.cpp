#include "bench/Hosts.h"

#include <cstdio>

#include "machines/SimulatedInventory.h"
#include "nox/Host.h"

namespace Bench {

std::string DiskName(int index) {
  char name[32];
  std::snprintf(name, sizeof name, "naa.5000c500%08x", static_cast<unsigned>(index));
  return name;
}

OtxCtl::Sim::HostDescription HostWithDisks(int count) {
  OtxCtl::Sim::HostDescription host;
  host.name = "bench";
  for (int i = 0; i < count; ++i) {
    OtxCtl::Sim::HostDisk& disk = host.disks.emplace_back();
    disk.name = DiskName(i);
    disk.ssd = i % 8 == 0;
    disk.bytes = 4'000'787'030'016;
    disk.partitions = i % 16 == 1 ? 2 : 0;
    disk.vendor = "EXAMPLE";
    disk.model = disk.ssd ? "FAST 4T" : "BIG 4T";
    disk.serial = "S" + std::to_string(i);
    disk.displayName = "Disk " + std::to_string(i);
  }
  return host;
}

Tessa::Ref<Orbis::DataArray<Nox::Host::ScsiDisk>> DisksOf(const OtxCtl::Sim::HostDescription& host) {
  const auto disks = Tessa::MakeRef<Orbis::DataArray<Nox::Host::ScsiDisk>>();
  const auto info = Machines::DescribeInventory(host);
  for (Nox::Host::ScsiLun* unit : *info->GetScsiLun()) {
    disks->Append(dynamic_cast<Nox::Host::ScsiDisk*>(unit));
  }
  return disks;
}

}  // namespace Bench
