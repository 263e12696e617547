#include "otxctl/linux/DeviceStack.h"

#include <algorithm>
#include <cstddef>
#include <unordered_set>

#include "otxctl/linux/DeviceKind.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Linux {
namespace {

using Disks::Fact;
using Texts = DeviceStack::Texts;

constexpr std::size_t mostTexts = 8;     // that are told of one disk
constexpr std::size_t mostDevices = 64;  // that are looked at for mounts: one is enough to rule a disk out

}  // namespace

DeviceStack::DeviceStack(const BlockDevices& devices, const MountTable& mounts)
    : _devices(devices), _mounts(mounts) {}

Fact<Texts> DeviceStack::HoldersOf(const BlockDevice& device) const {
  if (!device.holders.IsKnown()) {
    return Fact<Texts>::Unknown(device.holders.WhyUnknown());
  }
  const BlockDevice* const map = MultipathMapOf(_devices, device);
  Texts words;
  std::size_t more = 0;
  for (const std::string& name : device.holders.Get()) {
    const BlockDevice* const holder = _devices.ByName(name);
    if (holder != nullptr && (holder == map || IsMappedPartition(*holder))) {
      continue;
    }
    if (words.size() == mostTexts) {
      ++more;
      continue;
    }
    words.push_back(holder == nullptr ? Tessa::Sanitize(name) : InWords(*holder));
  }
  if (more > 0) {
    words.push_back(std::to_string(more) + " more");
  }
  return {std::move(words)};
}

std::vector<const BlockDevice*> DeviceStack::DirectlyOn(const BlockDevice& device) const {
  std::vector<const BlockDevice*> above = _devices.PartitionsOf(device);
  if (device.holders.IsKnown()) {
    for (const std::string& name : device.holders.Get()) {
      const BlockDevice* const holder = _devices.ByName(name);
      if (holder != nullptr && above.size() < mostDevices) {
        above.push_back(holder);
      }
    }
  }
  return above;
}

Fact<Texts> DeviceStack::MountsOn(const BlockDevice& device) const {
  const Fact<Texts> own = _mounts.MountsOf(device);
  if (!own.IsKnown()) {
    return own;
  }
  Texts mounts = own.Get();
  std::vector<const BlockDevice*> above = {&device};
  std::unordered_set<const BlockDevice*> seen = {
      &device};  // a device may stand on itself, if the tree says so
  for (std::size_t i = 0; i < above.size() && i < mostDevices; ++i) {
    for (const BlockDevice* const next : DirectlyOn(*above[i])) {
      if (!seen.insert(next).second) {
        continue;
      }
      above.push_back(next);
      const Fact<Texts> places = _mounts.MountsOf(*next);
      if (!places.IsKnown()) {
        return places;
      }
      const bool isNamed = next->mapping && next->mapping->name.IsKnown();
      for (const std::string& place : places.Get()) {
        if (mounts.size() < mostTexts) {
          mounts.push_back(place + " (" + (isNamed ? next->mapping->name.Get() : next->name) + ")");
        }
      }
    }
  }
  return {std::move(mounts)};
}

bool DeviceStack::IsClaimed(const BlockDevice& device) const {
  const auto hasHolders = [](const BlockDevice& one) {
    return one.holders.IsKnown() && !one.holders.Get().empty();
  };
  const std::vector<const BlockDevice*>& partitions = _devices.PartitionsOf(device);
  const bool isHeld =
      hasHolders(device) || std::any_of(partitions.begin(), partitions.end(),
                                        [&](const BlockDevice* one) { return hasHolders(*one); });
  const Fact<Texts> mounts = MountsOn(device);
  return isHeld || (mounts.IsKnown() && !mounts.Get().empty());
}

const BlockDevice* MultipathMapOf(const BlockDevices& devices, const BlockDevice& device) {
  if (!device.holders.IsKnown()) {
    return nullptr;
  }
  for (const std::string& name : device.holders.Get()) {
    const BlockDevice* const holder = devices.ByName(name);
    if (holder != nullptr && IsMultipathMap(*holder)) {
      return holder;
    }
  }
  return nullptr;
}

Fact<std::int32_t> CountPartitions(const BlockDevices& devices, const BlockDevice& device) {
  if (devices.HasUnreadPartitions(device)) {
    return Fact<std::int32_t>::Unknown("how many partitions " + device.name + " has: not all could be read");
  }
  std::size_t count = devices.PartitionsOf(device).size();
  if (!device.holders.IsKnown()) {
    return Fact<std::int32_t>::Unknown(device.holders.WhyUnknown());
  }
  for (const std::string& name : device.holders.Get()) {
    const BlockDevice* const holder = devices.ByName(name);
    count += holder != nullptr && IsMappedPartition(*holder) ? 1 : 0;
  }
  return {static_cast<std::int32_t>(count)};
}

}  // namespace OtxCtl::Linux
