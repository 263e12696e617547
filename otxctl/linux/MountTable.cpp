#include "otxctl/linux/MountTable.h"

#include <algorithm>
#include <cstddef>
#include <filesystem>
#include <system_error>
#include <utility>

#include "otxctl/linux/BoundedFile.h"
#include "otxctl/linux/SysfsReader.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Linux {
namespace {

using Disks::Fact;
using Text = Fact<std::string>;

constexpr std::size_t longestTable = std::size_t{64} << 20U;
constexpr std::string_view devFolder = "/dev/";

// File systems on disks that have numbers of their own instead of their disk's.
bool IsOnDisksByName(const std::string& type) {
  return type == "btrfs" || type == "bcachefs";
}

bool IsDevicePath(std::string_view source) {
  return source.substr(0, devFolder.size()) == devFolder;
}

// Zero is the major number of what is no device.
bool IsAnonymous(std::string_view number) {
  return number.substr(0, 2) == "0:";
}

// The kernel's mark of a name that was taken away while the device is in use.
std::string WithoutMark(const std::string& source) {
  constexpr std::string_view deletedMark = " (deleted)";
  const bool isMarked =
      source.size() > deletedMark.size() &&
      source.compare(source.size() - deletedMark.size(), deletedMark.size(), deletedMark) == 0;
  return isMarked ? source.substr(0, source.size() - deletedMark.size()) : source;
}

// Whether both see the same file systems, as far as anybody can tell.
bool IsSameView(const std::string& proc) {
  const SysfsReader reader(proc);
  const auto own = reader.LinkName("/self/ns/mnt");
  const auto first = reader.LinkName("/1/ns/mnt");
  return own.IsKnown() && own.Get() && first.IsKnown() && first.Get() == own.Get();
}

Text Required(const std::string& path) {
  const auto text = ReadWhole(path, longestTable);
  if (!text.IsKnown()) {
    return Text::Unknown(text.WhyUnknown());
  }
  return text.Get() ? Text(*text.Get()) : Text::Unknown(Tessa::Escape(path) + ": does not exist");
}

}  // namespace

MountTable::MountTable(const SystemPaths& paths, const BlockDevices& devices)
    : _paths(paths), _devices(devices) {
  ReadMounts(_paths.proc + "/self/mountinfo");
  if (!IsSameView(_paths.proc)) {
    ReadMounts(_paths.proc + "/1/mountinfo");
  }
  ReadSwaps(_paths.proc + "/swaps");
}

void MountTable::ReadMounts(const std::string& path) {
  const Text text = Required(path);
  const auto entries =
      text.IsKnown() ? ParseMountInfo(text.Get()) : Fact<std::vector<MountEntry>>::Unknown(text.WhyUnknown());
  if (!entries.IsKnown()) {
    _whyUnknown = entries.WhyUnknown();
    return;
  }
  for (const MountEntry& entry : entries.Get()) {
    Add(entry);
  }
}

void MountTable::Add(const MountEntry& entry) {
  if (!IsAnonymous(entry.number)) {
    AddPlace(entry.number, entry.where);
    return;
  }
  const std::vector<const BlockDevice*> devices = ResolveAll(entry.source);
  for (const BlockDevice* const device : devices) {
    if (device->number.IsKnown()) {
      AddPlace(device->number.Get(), entry.where);
    }
  }
  if (devices.empty() && IsOnDisksByName(entry.type)) {
    _whyUnknown = "which disk is mounted at " + Tessa::Quote(Tessa::Sanitize(entry.where)) + ": " +
                  Tessa::Quote(Tessa::Sanitize(entry.source)) + " leads to none";
  }
}

// A kernel without swapping has no such file.
void MountTable::ReadSwaps(const std::string& path) {
  const auto text = ReadWhole(path, longestTable);
  const auto entries = text.IsKnown() ? ParseSwaps(text.Get().value_or(std::string()))
                                      : Fact<std::vector<SwapEntry>>::Unknown(text.WhyUnknown());
  if (!entries.IsKnown()) {
    _whyUnknown = entries.WhyUnknown();
    return;
  }
  for (const SwapEntry& entry : entries.Get()) {
    if (entry.isFile) {
      continue;
    }
    const BlockDevice* const device = Resolve(WithoutMark(entry.source));
    if (device == nullptr || !device->number.IsKnown()) {
      _whyUnknown =
          "which disk is swapped to: " + Tessa::Quote(Tessa::Sanitize(entry.source)) + " leads to none";
      continue;
    }
    AddPlace(device->number.Get(), "[SWAP]");
  }
}

void MountTable::AddPlace(const std::string& number, const std::string& place) {
  constexpr std::size_t enough = 8;  // containers mount one disk thousands of times
  Places& places = _places[number];
  std::string cleaned = Tessa::Sanitize(place);
  if (places.size() < enough && std::find(places.begin(), places.end(), cleaned) == places.end()) {
    places.push_back(std::move(cleaned));
  }
}

const BlockDevice* MountTable::Resolve(const std::string& node) const {
  if (!IsDevicePath(node)) {
    return nullptr;
  }
  const std::string name = node.substr(devFolder.size());
  std::error_code error;
  const std::filesystem::path folder = std::filesystem::weakly_canonical(_paths.dev, error);
  const std::filesystem::path real = std::filesystem::weakly_canonical(_paths.dev + "/" + name, error);
  std::string kernelName = error ? name : real.lexically_relative(folder).string();
  // Sysfs cannot have a slash in a name.
  std::replace(kernelName.begin(), kernelName.end(), '/', '!');
  if (const BlockDevice* const device = _devices.ByName(kernelName)) {
    return device;
  }
  constexpr std::string_view mapperFolder = "mapper/";
  return name.compare(0, mapperFolder.size(), mapperFolder) == 0
             ? _devices.ByMapping(name.substr(mapperFolder.size()))
             : nullptr;
}

// One source may name several devices: "/dev/sda:/dev/sdb". All of them, or none if one leads nowhere.
std::vector<const BlockDevice*> MountTable::ResolveAll(const std::string& source) const {
  if (const BlockDevice* const device = Resolve(source)) {
    return {device};
  }
  std::vector<const BlockDevice*> devices;
  for (std::size_t start = 0; start < source.size();) {
    const std::size_t end = std::min(source.find(":/dev/", start), source.size());
    const BlockDevice* const device = Resolve(source.substr(start, end - start));
    if (device == nullptr) {
      return {};
    }
    devices.push_back(device);
    start = end + 1;
  }
  return devices;
}

Fact<MountTable::Places> MountTable::MountsOf(const BlockDevice& device) const {
  if (!_whyUnknown.empty()) {
    return Fact<Places>::Unknown(_whyUnknown);
  }
  if (!device.number.IsKnown()) {
    return Fact<Places>::Unknown(device.number.WhyUnknown());
  }
  const auto found = _places.find(device.number.Get());
  return {found == _places.end() ? Places() : found->second};
}

}  // namespace OtxCtl::Linux
