#include "otxctl/linux/DeviceIdentity.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <utility>

#include "otxctl/disks/DiskNames.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Linux {
namespace {

using Disks::DiskIdentity;
using Disks::Fact;
using Text = Fact<std::string>;

// "scsi", "nvme", "virtio", ...; empty for a disk without a device.
Text KindOf(const SysfsReader& reader, const BlockDevice& device) {
  if (!device.device.IsKnown() || device.device.Get().empty()) {
    return device.device;
  }
  return TextOrEmpty(reader.LinkName(device.device.Get() + "/subsystem"));
}

bool IsNvme(const std::string& kind) {
  return kind == "nvme" || kind == "nvme-subsystem";
}

// Names of the world: of SCSI at the device, of NVMe at the disk. A disk that has none may refuse to be
// asked.
Text ReadWorldWideName(const SysfsReader& reader, const BlockDevice& device, const std::string& kind) {
  const std::string folder = kind == "scsi" ? device.device.Get() : device.path;
  const Text name = TextOrEmpty(reader.Text(folder + "/wwid", Refusal::MeansNone));
  return name.IsKnown() ? Text(Disks::WorldWideName(name.Get())) : name;
}

Text ReadScsiSerial(const SysfsReader& reader, const std::string& device) {
  const std::string path = device + "/vpd_pg80";
  const auto page = reader.Bytes(path, Refusal::MeansNone);
  if (!page.IsKnown()) {
    return Text::Unknown(page.WhyUnknown());
  }
  if (page.Get() && !page.Get()->empty()) {
    const std::optional<std::string> serial = ParseSerialPage(*page.Get());
    if (!serial || !serial->empty()) {
      return serial ? Text(*serial) : Text::Unknown(reader.Shown(path) + ": not a page of a serial number");
    }
  }
  return TextOrEmpty(reader.Text(device + "/serial", Refusal::MeansNone));
}

// What is attached by USB has the number of the USB device on the way to it.
Text ReadUsbSerial(const SysfsReader& reader, const std::string& device) {
  constexpr std::string_view usb = "/usb";
  for (std::string_view path = device; path.find(usb) != std::string_view::npos; path = ParentPath(path)) {
    const std::string folder(path);
    const Fact<bool> isUsbDevice = reader.Exists(folder + "/idVendor");
    if (!isUsbDevice.IsKnown()) {
      return Text::Unknown(isUsbDevice.WhyUnknown());
    }
    if (isUsbDevice.Get()) {
      return TextOrEmpty(reader.Text(folder + "/serial", Refusal::MeansNone));
    }
  }
  return {std::string()};
}

Text ReadSerial(const SysfsReader& reader, const BlockDevice& device, const std::string& kind) {
  if (kind == "scsi") {
    const Text serial = ReadScsiSerial(reader, device.device.Get());
    return serial.Is("") ? ReadUsbSerial(reader, device.device.Get()) : serial;
  }
  const std::string folder = kind == "virtio" || kind.empty() ? device.path : device.device.Get();
  return TextOrEmpty(reader.Text(folder + "/serial", Refusal::MeansNone));
}

// Devices of other kinds have numbers under these names, or nothing.
Text ReadVendor(const SysfsReader& reader, const BlockDevice& device, const std::string& kind) {
  return kind == "scsi" ? TextOrEmpty(reader.Text(device.device.Get() + "/vendor")) : Text(std::string());
}

Text ReadModel(const SysfsReader& reader, const BlockDevice& device, const std::string& kind) {
  if (kind == "scsi" || IsNvme(kind)) {
    return TextOrEmpty(reader.Text(device.device.Get() + "/model"));
  }
  return kind == "mmc" ? TextOrEmpty(reader.Text(device.device.Get() + "/name")) : Text(std::string());
}

// SCSI's kinds of devices, by number.
std::string KindInWords(std::int64_t type) {
  constexpr std::array<std::pair<std::int64_t, const char*>, 7> kinds = {
      {{1, "a tape drive"},
       {4, "a write-once device"},
       {5, "an optical drive"},
       {7, "an optical disk"},
       {13, "an enclosure"},
       {14, "a simple disk of another kind"},
       {20, "a zoned disk"}}};
  const auto* const kind =
      std::find_if(kinds.begin(), kinds.end(), [&](const auto& one) { return one.first == type; });
  return kind == kinds.end() ? "a SCSI device of kind " + std::to_string(type) : kind->second;
}

}  // namespace

std::optional<std::string> ParseSerialPage(std::string_view page) {
  constexpr std::size_t headerSize = 4;
  constexpr char serialNumberPage = '\x80';
  const auto byteAt = [&](std::size_t index) { return static_cast<unsigned char>(page[index]); };
  if (page.size() < headerSize || page[1] != serialNumberPage) {
    return std::nullopt;
  }
  const std::size_t length = std::size_t{byteAt(2)} << 8U | byteAt(3);
  if (length > page.size() - headerSize) {
    return std::nullopt;
  }
  return Tessa::Sanitize(page.substr(headerSize, length));
}

Fact<DiskIdentity> IdentityOf(const SysfsReader& reader, const BlockDevice& device) {
  const Text kind = KindOf(reader, device);
  if (!kind.IsKnown()) {
    return Fact<DiskIdentity>::Unknown(kind.WhyUnknown());
  }
  const Text name = ReadWorldWideName(reader, device, kind.Get());
  const Text vendor = ReadVendor(reader, device, kind.Get());
  const Text model = ReadModel(reader, device, kind.Get());
  const Text serial = ReadSerial(reader, device, kind.Get());
  for (const Text* const fact : {&name, &vendor, &model, &serial}) {
    if (!fact->IsKnown()) {
      return Fact<DiskIdentity>::Unknown(fact->WhyUnknown());
    }
  }
  return {DiskIdentity{name.Get(), vendor.Get(), model.Get(), serial.Get()}};
}

Text StateOf(const SysfsReader& reader, const BlockDevice& device) {
  const Text kind = KindOf(reader, device);
  if (!kind.IsKnown()) {
    return kind;
  }
  if (kind.Get() == "scsi" || kind.Get() == "nvme") {
    return reader.RequiredText(device.device.Get() + "/state");
  }
  return {std::string()};
}

Text WhyNoDisk(const SysfsReader& reader, const BlockDevice& device) {
  const Text kind = KindOf(reader, device);
  if (!kind.IsKnown() || kind.Get() != "scsi") {
    return kind.IsKnown() ? Text(std::string()) : kind;
  }
  const Fact<std::int64_t> type = reader.RequiredNumber(device.device.Get() + "/type");
  if (!type.IsKnown()) {
    return Text::Unknown(type.WhyUnknown());
  }
  return {type.Get() == 0 ? std::string() : KindInWords(type.Get())};
}

}  // namespace OtxCtl::Linux
