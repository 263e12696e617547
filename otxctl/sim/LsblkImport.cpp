#include "otxctl/sim/LsblkImport.h"

#include <algorithm>
#include <array>
#include <limits>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "otxctl/sim/LsblkDevice.h"

namespace OtxCtl::Sim {
namespace {

constexpr std::size_t kLongestName = 200;
constexpr std::int32_t kUsualBlockSize = 512;

// Kernel names of devices that lsblk calls disks, though no disk stands behind them.
constexpr std::array<std::string_view, 7> kNoDisks = {"zram", "loop", "ram", "sr", "fd", "dm-", "md"};

// Where the kernel names the way to a disk that is not in this machine.
constexpr std::array<std::string_view, 6> kRemoteTransports = {"iscsi", "fc", "fcoe", "rbd", "nbd", "aoe"};
constexpr std::array<std::string_view, 5> kRemoteSubsystems = {"iscsi", "fc_host", "rbd", "nvme-fabrics",
                                                               "nbd"};

bool StartsWith(std::string_view text, std::string_view start) {
  return text.substr(0, start.size()) == start;
}

template <std::size_t Count>
bool Contains(const std::array<std::string_view, Count>& table, std::string_view word) {
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

// Only letters, digits and a few marks; runs of anything else become one underscore.
std::string NamePart(std::string_view text, bool toLower = false) {
  std::string part;
  for (const char character : text) {
    const bool isLetter = (character >= 'a' && character <= 'z') || (character >= 'A' && character <= 'Z');
    const bool isDigit = character >= '0' && character <= '9';
    if (isLetter || isDigit || character == '.' || character == '-' || character == ':') {
      const bool isUpper = character >= 'A' && character <= 'Z';
      part += toLower && isUpper ? static_cast<char>(character - 'A' + 'a') : character;
    } else if (!part.empty() && part.back() != '_') {
      part += '_';
    }
  }
  while (!part.empty() && part.back() == '_') {
    part.pop_back();
  }
  return part.substr(0, kLongestName);
}

std::string WorldWideName(std::string_view wwn) {
  if (StartsWith(wwn, "0x") || StartsWith(wwn, "0X")) {
    const std::string digits = NamePart(wwn.substr(2), true);
    return digits.empty() ? digits : "naa." + digits;
  }
  return NamePart(wwn, true);
}

// Without a serial number two disks of one kind would get the same name.
std::string DescriptiveName(const LsblkDevice& device) {
  const std::string serial = NamePart(device.serial);
  if (serial.empty()) {
    return {};
  }
  std::string name = "t10.";
  for (const std::string* const text : {&device.vendor, &device.model}) {
    const std::string part = NamePart(*text);
    name += part.empty() ? part : part + "_";
  }
  return (name + serial).substr(0, kLongestName);
}

std::string CanonicalName(const LsblkDevice& device) {
  const std::string worldWide = WorldWideName(device.wwn);
  if (!worldWide.empty()) {
    return worldWide;
  }
  const std::string descriptive = DescriptiveName(device);
  if (!descriptive.empty()) {
    return descriptive;
  }
  const std::string kernel = NamePart(device.name);
  return "path." + (kernel.empty() ? "disk" : kernel);
}

// Hands out each name once: the second disk of a name gets ".2" behind it, and so on.
class UniqueNames {
 public:
  std::string Take(const std::string& name) {
    std::string unique = name;
    while (!_taken.insert(unique).second) {
      unique = name + "." + std::to_string(++_count.try_emplace(name, 1).first->second);
    }
    return unique;
  }

 private:
  std::unordered_set<std::string> _taken;
  std::unordered_map<std::string, std::uint64_t> _count;
};

bool IsWholeDisk(const LsblkDevice& device) {
  const bool isNoDisk = std::any_of(kNoDisks.begin(), kNoDisks.end(),
                                    [&](std::string_view start) { return StartsWith(device.name, start); });
  return device.type == "disk" && device.parent.empty() && device.bytes > 0 && !isNoDisk;
}

bool IsLocal(const LsblkDevice& device) {
  const bool isRemote =
      Contains(kRemoteTransports, device.transport) || StartsWith(device.name, "nbd") ||
      StartsWith(device.name, "rbd") ||
      AnyWord(device.subsystems, [](std::string_view word) { return Contains(kRemoteSubsystems, word); });
  return !isRemote;
}

std::optional<std::string> TransportOf(const LsblkDevice& device) {
  const bool isUsb = AnyWord(device.subsystems, [](std::string_view word) { return word == "usb"; });
  if (isUsb) {
    return "usb";
  }
  return device.transport.empty() ? std::nullopt : std::optional<std::string>(device.transport);
}

// What stands on each device.
struct Users {
  std::int32_t partitions = 0;
  bool hasOthers = false;
};

std::unordered_map<std::string, Users> UsersByDevice(const std::vector<LsblkDevice>& devices) {
  std::unordered_map<std::string, Users> users;
  for (const LsblkDevice& device : devices) {
    if (device.parent.empty()) {
      continue;
    }
    Users& ofParent = users[device.parent];
    if (device.type == "part") {
      ++ofParent.partitions;
    } else {
      ofParent.hasOthers = true;
    }
  }
  return users;
}

// A description has one number for all that keeps a disk from being offered because someone else uses it. An
// empty partition table alone (no partition in it) keeps no one's data.
std::int32_t PartitionsOf(const LsblkDevice& device, const Users& users) {
  const bool isUsedWhole = users.hasOthers || device.isMounted || !device.fileSystem.empty();
  return users.partitions == 0 && isUsedWhole ? 1 : users.partitions;
}

std::string DisplayName(const LsblkDevice& device) {
  std::string what = device.vendor;
  if (!device.model.empty()) {
    what += (what.empty() ? "" : " ") + device.model;
  }
  return (what.empty() ? "Disk" : what) + " (" + device.name + ")";
}

HostDisk ToHostDisk(const LsblkDevice& device, const Users& users, UniqueNames& names) {
  HostDisk disk;
  disk.name = names.Take(CanonicalName(device));
  disk.ssd = !device.isRotational;
  disk.bytes = device.bytes;
  const bool isUsable = device.blockSize > 0 && device.blockSize <= std::numeric_limits<std::int32_t>::max();
  disk.blockSize = isUsable ? static_cast<std::int32_t>(device.blockSize) : kUsualBlockSize;
  disk.transport = TransportOf(device);
  disk.local = IsLocal(device);
  disk.partitions = PartitionsOf(device, users);
  disk.vendor = device.vendor;
  disk.model = device.model;
  disk.serial = device.serial;
  disk.displayName = DisplayName(device);
  if (device.isReadOnly) {
    disk.verdict = HostVerdict{2, 0};
  }
  return disk;
}

}  // namespace

HostDescription ImportLsblk(std::string_view lsblkJson, const LsblkImportOptions& options) {
  const std::vector<LsblkDevice> devices = ReadLsblk(lsblkJson);
  const std::unordered_map<std::string, Users> users = UsersByDevice(devices);
  HostDescription host;
  host.name = options.hostName;
  host.minimumDiskBytes = options.minimumDiskBytes;
  UniqueNames names;
  for (const LsblkDevice& device : devices) {
    if (IsWholeDisk(device)) {
      const auto found = users.find(device.name);
      host.disks.push_back(ToHostDisk(device, found == users.end() ? Users{} : found->second, names));
    }
  }
  CheckHostDescription(host);
  return host;
}

}  // namespace OtxCtl::Sim
