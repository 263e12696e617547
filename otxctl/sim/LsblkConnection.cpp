#include "otxctl/sim/LsblkConnection.h"

#include <algorithm>
#include <array>
#include <string_view>

namespace OtxCtl::Sim {
namespace {

using Disks::Attachment;
using Disks::Connection;
using Disks::Fact;

// Buses inside a machine, as the kernel calls them.
constexpr std::array<std::string_view, 13> buses = {"pci",    "pci_express", "platform", "acpi", "amba",
                                                    "virtio", "vmbus",       "xen",      "vio",  "ccw",
                                                    "css",    "pnp",         "of"};
// What stands between a disk and its bus. Anything else there may be a network: who comes by InfiniBand hangs
// on a card of PCI in the end.
constexpr std::array<std::string_view, 3> betweenBusAndDisk = {"block", "scsi", "nvme"};
// Ways that end at a bus of the machine.
constexpr std::array<std::string_view, 9> localTransports = {"ata",  "sata", "pata", "sas",   "spi",
                                                             "nvme", "pcie", "ufs",  "virtio"};

constexpr std::array<std::string_view, 9> remoteTransports = {"iscsi", "fc",  "fcoe", "srp", "rbd",
                                                              "nbd",   "aoe", "tcp",  "rdma"};
constexpr std::array<std::string_view, 11> remoteSubsystems = {
    "iscsi", "iscsi_session", "iscsi_host",  "fc",           "fc_host",       "rbd",
    "nbd",   "aoe",           "rnbd-client", "nvme-fabrics", "infiniband_srp"};
constexpr std::array<std::string_view, 4> cardSubsystems = {"mmc", "mmc_host", "memstick", "memstick_host"};

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

template <std::size_t count>
bool HangsOnAny(const LsblkDevice& device, const std::array<std::string_view, count>& subsystems) {
  return AnyWord(device.subsystems,
                 [&subsystems](std::string_view word) { return Contains(subsystems, word); });
}

// A positive rule: a bus must be there, and nothing that is not understood.
bool IsInMachine(const LsblkDevice& device) {
  const bool isStrange = AnyWord(device.subsystems, [](std::string_view word) {
    return !Contains(buses, word) && !Contains(betweenBusAndDisk, word);
  });
  return !isStrange && HangsOnAny(device, buses);
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
  if (transport == "mmc" || HangsOnAny(device, cardSubsystems)) {
    return Connection{Attachment::MemoryCard, transport};
  }
  if (Contains(remoteTransports, transport) || HangsOnAny(device, remoteSubsystems)) {
    return Connection{Attachment::Remote, transport};
  }
  if (device.subsystems.empty()) {
    return Fact<Connection>::Unknown("the capture has no SUBSYSTEMS of " + device.name);
  }
  if (!IsInMachine(device)) {
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
