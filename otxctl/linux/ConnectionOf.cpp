#include "otxctl/linux/ConnectionOf.h"

#include <algorithm>
#include <array>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "tessa/text/Escape.h"

namespace OtxCtl::Linux {
namespace {

using Disks::Attachment;
using Disks::Connection;
using Disks::Fact;
using Chain = std::vector<Ancestor>;
using Link = Fact<Connection>;

// Whether a table lists the name.
template <std::size_t size>
bool IsIn(const std::array<std::string_view, size>& names, std::string_view name) {
  return std::find(names.begin(), names.end(), name) != names.end();
}

// Buses of machines.
constexpr std::array<std::string_view, 19> buses = {
    "pci",      "pci_express", "platform", "acpi",          "virtio", "vmbus", "xen",
    "ccw",      "css",         "vio",      "mmc_host",      "mmc",    "usb",   "amba",
    "firewire", "ieee1394",    "memstick", "memstick_host", "pcmcia"};
// What stands between a disk and the bus.
constexpr std::array<std::string_view, 3> betweenBusAndDisk = {"block", "scsi", "nvme"};
constexpr std::array<std::string_view, 6> pluggableBuses = {"usb",    "firewire", "ieee1394",
                                                            "pcmcia", "mmc",      "memstick"};

// Beginnings of names of devices without hardware here that reach hardware elsewhere.
constexpr std::array<std::string_view, 5> networkDisks = {"nbd", "rbd", "drbd", "etherd!", "rnbd"};

struct ScsiTransport {
  std::string_view folder;  // below a host whose disks come by it
  std::string_view name;
  Attachment attachment;
};
constexpr std::array<ScsiTransport, 5> scsiTransports = {{{"iscsi_host", "iscsi", Attachment::Remote},
                                                          {"fc_host", "fc", Attachment::Remote},
                                                          {"srp_host", "srp", Attachment::Remote},
                                                          {"sas_host", "sas", Attachment::Machine},
                                                          {"spi_host", "spi", Attachment::Machine}}};

bool HasSubsystem(const Chain& chain, std::string_view subsystem) {
  return std::any_of(chain.begin(), chain.end(),
                     [&](const Ancestor& ancestor) { return ancestor.subsystem == subsystem; });
}

bool BeginsWith(std::string_view text, std::string_view beginning) {
  return text.substr(0, beginning.size()) == beginning;
}

// "host0", but not "hostess".
bool IsNumbered(std::string_view name, std::string_view word) {
  return BeginsWith(name, word) && ParseNumber(name.substr(word.size())).has_value();
}

// "block:scsi:pci", each once
std::string InWords(const Chain& chain) {
  std::string words;
  std::string_view last;
  for (const Ancestor& ancestor : chain) {
    if (ancestor.subsystem != last) {
      words += (words.empty() ? "" : ":") + ancestor.subsystem;
    }
    last = ancestor.subsystem;
  }
  return Tessa::Abbreviate(words);
}

Link Unknown(const BlockDevice& device, const std::string& why) {
  return Link::Unknown("what " + device.name + " hangs on: " + why);
}

// Of a controller of NVMe.
Link NvmeConnection(const Fact<std::string>& transport) {
  if (!transport.IsKnown()) {
    return Link::Unknown(transport.WhyUnknown());
  }
  const std::string& word = transport.Get();
  if (word == "pcie") {
    return {Connection{Attachment::Machine, "nvme"}};
  }
  if (word == "tcp" || word == "rdma" || word == "fc") {
    return {Connection{Attachment::Remote, "nvme by " + word}};
  }
  if (word == "loop") {
    return {Connection{Attachment::Virtual, "nvme by loop"}};
  }
  return Link::Unknown("a transport of NVMe that is not known: " + Tessa::Quote(word));
}

// The worst of two: what is unknown may be anything.
void Worsen(Link& all, const Link& one) {
  if (all.IsKnown() && (!one.IsKnown() || one.Get().attachment != Attachment::Machine)) {
    all = one;
  }
}

// A disk that several controllers lead to hangs on no one of them, but on what they have in common.
Link NvmeSubsystemConnection(const SysfsReader& reader, const BlockDevice& device,
                             const std::string& subsystem) {
  const auto names = reader.Folder(subsystem);
  if (!names.IsKnown() || !names.Get()) {
    return names.IsKnown() ? Unknown(device, "its subsystem of NVMe is gone")
                           : Link::Unknown(names.WhyUnknown());
  }
  Link worst = Unknown(device, "no controller leads to it");
  bool isFirst = true;
  for (const std::string& name : *names.Get()) {
    if (!IsNumbered(name, "nvme")) {
      continue;
    }
    const Link one = NvmeConnection(reader.RequiredText(subsystem + "/" + name + "/transport"));
    if (std::exchange(isFirst, false)) {
      worst = one;
    } else {
      Worsen(worst, one);
    }
  }
  return worst;
}

Link VirtualConnection(const SysfsReader& reader, const BlockDevice& device, const Chain& chain) {
  for (const Ancestor& ancestor : chain) {
    if (ancestor.subsystem == "nvme-subsystem") {
      return NvmeSubsystemConnection(reader, device, ancestor.path);
    }
    if (ancestor.subsystem == "nvme") {
      const Link link = NvmeConnection(reader.RequiredText(ancestor.path + "/transport"));
      // Nothing inside of the machine is found here.
      return link.IsKnown() && link.Get().attachment == Attachment::Machine
                 ? Unknown(device, "a device without hardware that says it is a device of PCI")
                 : link;
    }
  }
  for (const std::string_view name : networkDisks) {
    if (BeginsWith(device.name, name)) {
      return {Connection{Attachment::Remote, std::string(name.substr(0, name.find('!')))}};
    }
  }
  return {Connection{Attachment::Virtual, {}}};
}

// How a SCSI host reaches its disks, if it says so.
Link ScsiConnection(const SysfsReader& reader, const std::string& host) {
  for (const ScsiTransport& transport : scsiTransports) {
    const Fact<bool> exists = reader.Exists(host + "/" + std::string(transport.folder));
    if (!exists.IsKnown()) {
      return Link::Unknown(exists.WhyUnknown());
    }
    if (exists.Get()) {
      return {Connection{transport.attachment, std::string(transport.name)}};
    }
  }
  // "/devices/pci0000:00/0000:00:1f.2/ata1/host0"
  if (!IsNumbered(LastName(ParentPath(host)), "ata")) {
    return {Connection{}};
  }
  const std::string name(LastName(host));
  const Fact<std::string> driver = TextOrEmpty(reader.Text(host + "/scsi_host/" + name + "/proc_name"));
  const bool isSerial = driver.IsKnown() && (driver.Get() == "ahci" || BeginsWith(driver.Get(), "sata_"));
  return {Connection{Attachment::Machine, isSerial ? "sata" : "ata"}};
}

// The links between disk and bus, from the disk on; the first that is not inside of the machine counts.
Link ControllerConnection(const SysfsReader& reader, const Chain& chain) {
  Link all = Connection{};
  for (const Ancestor& ancestor : chain) {
    const bool isHost = ancestor.subsystem == "scsi" && IsNumbered(LastName(ancestor.path), "host");
    if (!isHost && ancestor.subsystem != "nvme") {
      continue;
    }
    const Link link = isHost ? ScsiConnection(reader, ancestor.path)
                             : NvmeConnection(reader.RequiredText(ancestor.path + "/transport"));
    if (!link.IsKnown() || link.Get().attachment != Attachment::Machine || !link.Get().transport.empty()) {
      return link;
    }
  }
  if (!HasSubsystem(chain, "scsi") && HasSubsystem(chain, "virtio")) {
    return {Connection{Attachment::Machine, "virtio"}};
  }
  return all;
}

// A positive rule: a bus must be there, and nothing that is not understood.
Link BusConnection(const BlockDevice& device, const Chain& chain, const Link& controller) {
  const auto isBus = [](const Ancestor& ancestor) { return IsIn(buses, ancestor.subsystem); };
  const auto isUnderstood = [&](const Ancestor& ancestor) {
    return isBus(ancestor) || IsIn(betweenBusAndDisk, ancestor.subsystem);
  };
  const bool isHardware =
      std::any_of(chain.begin(), chain.end(), isBus) && std::all_of(chain.begin(), chain.end(), isUnderstood);
  return isHardware ? controller : Unknown(device, "no bus of a machine that is known: " + InWords(chain));
}

}  // namespace

Link ConnectionOf(const SysfsReader& reader, const BlockDevice& device) {
  if (!device.chain.IsKnown()) {
    return Link::Unknown(device.chain.WhyUnknown());
  }
  const Chain& chain = device.chain.Get();
  if (HasSubsystem(chain, "usb")) {
    return {Connection{Attachment::Usb, "usb"}};
  }
  if (HasSubsystem(chain, "rbd")) {
    return {Connection{Attachment::Remote, "rbd"}};
  }
  const Link controller = ControllerConnection(reader, chain);
  if (controller.IsKnown() && controller.Get().attachment == Attachment::Remote) {
    return controller;
  }
  if (device.IsVirtual()) {
    return VirtualConnection(reader, device, chain);
  }
  if (HasSubsystem(chain, "firewire") || HasSubsystem(chain, "ieee1394")) {
    return {Connection{Attachment::FireWire, "sbp"}};
  }
  if (HasSubsystem(chain, "mmc") || HasSubsystem(chain, "mmc_host") || HasSubsystem(chain, "memstick")) {
    return {Connection{Attachment::MemoryCard, "mmc"}};
  }
  return BusConnection(device, chain, controller);
}

Fact<bool> IsHotPlug(const SysfsReader& reader, const BlockDevice& device) {
  if (!device.chain.IsKnown()) {
    return Fact<bool>::Unknown(device.chain.WhyUnknown());
  }
  for (const Ancestor& ancestor : device.chain.Get()) {
    if (IsIn(pluggableBuses, ancestor.subsystem)) {
      return {true};
    }
    if (ancestor.subsystem == "pci") {
      const Fact<std::string> removable = TextOrEmpty(reader.Text(ancestor.path + "/removable"));
      if (!removable.IsKnown()) {
        return Fact<bool>::Unknown(removable.WhyUnknown());
      }
      if (removable.Get() == "removable") {
        return {true};
      }
    }
  }
  return {false};
}

}  // namespace OtxCtl::Linux
