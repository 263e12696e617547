#include "otxctl/sim/LsblkConnection.h"

#include <algorithm>
#include <array>
#include <string_view>

namespace OtxCtl::Sim {
namespace {

using Disks::Attachment;
using Disks::Connection;
using Disks::Fact;

// Buses inside a machine, as the kernel calls them, and ways that end at one.
constexpr std::array<std::string_view, 12> buses = {"pci", "platform", "acpi", "amba", "virtio", "vmbus",
                                                    "xen", "vio",      "ccw",  "css",  "pnp",    "of"};
constexpr std::array<std::string_view, 9> localTransports = {"ata",  "sata", "pata", "sas",   "spi",
                                                             "nvme", "pcie", "ufs",  "virtio"};

constexpr std::array<std::string_view, 9> remoteTransports = {"iscsi", "fc",  "fcoe", "srp", "rbd",
                                                              "nbd",   "aoe", "tcp",  "rdma"};
constexpr std::array<std::string_view, 9> remoteSubsystems = {
    "iscsi", "iscsi_session", "iscsi_host", "fc", "fc_host", "rbd", "nbd", "aoe", "nvme-fabrics"};

template <std::size_t count>
bool Contains(const std::array<std::string_view, count>& table, std::string_view word) {
  return std::find(table.begin(), table.end(), word) != table.end();
}

// Whether one of the words between the colons fulfils the condition.
template <typename Condition>
bool AnyWord(std::string_view words, Condition condition) {
  while (true) {
    const std::size_t colon = words.find(':');
    if (condition(words.substr(0, colon))) {
      return true;
    }
    if (colon == std::string_view::npos) {
      return false;
    }
    words.remove_prefix(colon + 1);
  }
}

bool HangsOn(const LsblkDevice& device, std::string_view subsystem) {
  return AnyWord(device.subsystems, [subsystem](std::string_view word) { return word == subsystem; });
}

}  // namespace

Fact<Connection> ConnectionOf(const LsblkDevice& device) {
  const std::string& transport = device.transport;
  if (transport == "usb" || HangsOn(device, "usb")) {
    return Connection{Attachment::Usb, "usb"};
  }
  if (transport == "sbp" || HangsOn(device, "ieee1394") || HangsOn(device, "firewire")) {
    return Connection{Attachment::FireWire, transport};
  }
  if (transport == "mmc" || HangsOn(device, "mmc") || HangsOn(device, "mmc_host")) {
    return Connection{Attachment::MemoryCard, transport};
  }
  const bool isRemote =
      Contains(remoteTransports, transport) ||
      AnyWord(device.subsystems, [](std::string_view word) { return Contains(remoteSubsystems, word); });
  if (isRemote) {
    return Connection{Attachment::Remote, transport};
  }
  if (device.subsystems.empty()) {
    return Fact<Connection>::Unknown("the capture has no SUBSYSTEMS of " + device.name);
  }
  if (!AnyWord(device.subsystems, [](std::string_view word) { return Contains(buses, word); })) {
    return Fact<Connection>::Unknown("what " + device.name + " is attached to (" + device.subsystems + ")");
  }
  if (!transport.empty() && !Contains(localTransports, transport)) {
    return Fact<Connection>::Unknown("whether " + transport + " is a way to a local disk");
  }
  return Connection{Attachment::Machine, transport};
}

bool IsVirtual(const LsblkDevice& device) {
  return device.subsystems == "block" && device.transport.empty();
}

}  // namespace OtxCtl::Sim
