#include "otxctl/linux/DevicePlace.h"

#include <algorithm>
#include <array>
#include <optional>
#include <string_view>
#include <vector>

namespace OtxCtl::Linux {
namespace {

constexpr std::array<std::string_view, 6> buses = {"platform", "acpi", "vmbus", "xen", "ccw", "vio"};
constexpr std::string_view hostWord = "host";

std::optional<std::int64_t> HostNumber(std::string_view name) {
  return name.substr(0, hostWord.size()) == hostWord ? ParseNumber(name.substr(hostWord.size()))
                                                     : std::nullopt;
}

// "0" of the first host of a controller, whatever number it has in the machine.
std::string HostOrdinal(const SysfsReader& reader, const std::string& host) {
  const std::int64_t own = HostNumber(LastName(host)).value_or(0);
  std::int64_t first = own;
  const auto names = reader.Folder(std::string(ParentPath(host)));
  if (names.IsKnown() && names.Get()) {
    for (const std::string& name : *names.Get()) {
      first = std::min(first, HostNumber(name).value_or(first));
    }
  }
  return std::to_string(own - first);
}

// "0:1:2" of "5:0:1:2"; empty of anything else.
std::string_view BehindHost(std::string_view address) {
  const std::size_t colon = address.find(':');
  const bool isAddress = std::count(address.begin(), address.end(), ':') == 3 &&
                         ParseNumber(address.substr(0, colon)).has_value();
  return isAddress ? address.substr(colon + 1) : std::string_view();
}

// "ata-2" of ".../ata5/host4", by the port of the controller; else the host's part of a SCSI address.
std::string ScsiPlace(const SysfsReader& reader, const std::string& host, std::string_view address) {
  const std::string above(ParentPath(host));
  const std::string port = above + "/ata_port/" + std::string(LastName(above)) + "/port_no";
  const auto number = TextOrEmpty(reader.Text(port));
  if (number.IsKnown() && !number.Get().empty()) {
    return "-ata-" + number.Get() + "-scsi-0:" + std::string(address);
  }
  return "-scsi-" + HostOrdinal(reader, host) + ":" + std::string(address);
}

std::string NvmePlace(const SysfsReader& reader, const BlockDevice& device) {
  const auto space = TextOrEmpty(reader.Text(device.path + "/nsid"));
  const bool isTold = space.IsKnown() && !space.Get().empty();
  return "-nvme-" + (isTold ? space.Get() : device.name.substr(device.name.rfind('n') + 1));
}

// Ports on the way, without the number of the bus: "1.4:1.0" of "2-1.4:1.0".
std::string UsbPlace(std::string_view interface) {
  return "-usb-" + std::string(interface.substr(std::min(interface.find('-') + 1, interface.size())));
}

}  // namespace

std::string PlaceOf(const SysfsReader& reader, const BlockDevice& device) {
  std::string place;
  std::string host;
  if (!device.chain.IsKnown()) {
    return device.name;
  }
  const std::vector<Ancestor>& chain = device.chain.Get();
  for (auto at = chain.rbegin(); at != chain.rend(); ++at) {
    const std::string_view name = LastName(at->path);
    const std::string& subsystem = at->subsystem;
    if (subsystem == "pci" ||
        (place.empty() && std::find(buses.begin(), buses.end(), subsystem) != buses.end())) {
      place = subsystem + "-" + std::string(name);
    } else if (subsystem == "usb" && name.find(':') != std::string_view::npos) {
      place += UsbPlace(name);
    } else if (subsystem == "nvme" || subsystem == "nvme-subsystem") {
      place += NvmePlace(reader, device);
    } else if (subsystem == "scsi" && HostNumber(name)) {
      host = at->path;
    } else if (subsystem == "scsi" && !BehindHost(name).empty() && !host.empty()) {
      place += ScsiPlace(reader, host, BehindHost(name));
    }
  }
  return place.empty() ? device.name : place;
}

}  // namespace OtxCtl::Linux
