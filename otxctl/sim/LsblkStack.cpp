#include "otxctl/sim/LsblkStack.h"

#include <algorithm>
#include <cstddef>

namespace OtxCtl::Sim {
namespace {

using Texts = std::vector<std::string>;

constexpr std::size_t mostTexts = 8;      // that are told of one disk
constexpr std::size_t mostLooked = 1000;  // devices that are looked at for mounts

}  // namespace

bool IsPartition(const LsblkDevice& device) {
  return device.type == "part";
}

bool IsMultipath(const LsblkDevice& device) {
  return device.type == "mpath";
}

LsblkStack::LsblkStack(const std::vector<LsblkDevice>& devices) : _devices(devices) {
  for (const LsblkDevice& device : devices) {
    _byKernelName.emplace(device.kernelName, &device);
    ++_called[device.kernelName];
    if (device.name != device.kernelName) {
      ++_called[device.name];
    }
    for (const std::string& parent : device.parents) {
      _standOn[parent].push_back(&device);
    }
  }
}

const LsblkDevice* LsblkStack::Find(const std::string& kernelName) const {
  const auto found = _byKernelName.find(kernelName);
  return found == _byKernelName.end() ? nullptr : found->second;
}

const std::vector<const LsblkDevice*>& LsblkStack::On(const LsblkDevice& device) const {
  static const std::vector<const LsblkDevice*> none;
  const auto found = _standOn.find(device.kernelName);
  return found == _standOn.end() ? none : found->second;
}

std::int32_t LsblkStack::PartitionsOn(const LsblkDevice& device) const {
  const auto& above = On(device);
  return static_cast<std::int32_t>(
      std::count_if(above.begin(), above.end(), [](const LsblkDevice* one) { return IsPartition(*one); }));
}

Texts LsblkStack::HoldersOf(const LsblkDevice& device) const {
  Texts holders;
  std::size_t more = 0;
  for (const LsblkDevice* const above : On(device)) {
    if (IsPartition(*above) || IsMultipath(*above)) {
      continue;
    }
    if (holders.size() < mostTexts) {
      holders.push_back(above->name + " (" + above->type + ")");
    } else {
      ++more;
    }
  }
  if (more > 0) {
    holders.push_back(std::to_string(more) + " more");
  }
  return holders;
}

Texts LsblkStack::MountsOn(const LsblkDevice& device) const {
  Texts mounts = device.mounts;
  std::vector<const LsblkDevice*> looked = {&device};
  std::unordered_set<const LsblkDevice*> seen = {&device};
  for (std::size_t at = 0; at < looked.size() && mounts.size() < mostTexts; ++at) {
    for (const LsblkDevice* const above : On(*looked[at])) {
      if (looked.size() == mostLooked) {
        break;
      }
      if (!seen.insert(above).second) {
        continue;
      }
      looked.push_back(above);
      for (const std::string& mount : above->mounts) {
        mounts.push_back(mount + " (" + above->name + ")");
      }
    }
  }
  return mounts;
}

const LsblkDevice* LsblkStack::FindInCircle() const {
  std::vector<const LsblkDevice*> reached;
  std::unordered_set<const LsblkDevice*> seen;
  for (const LsblkDevice& device : _devices) {
    if (device.parents.empty()) {
      reached.push_back(&device);
      seen.insert(&device);
    }
  }
  for (std::size_t at = 0; at < reached.size(); ++at) {
    for (const LsblkDevice* const above : On(*reached[at])) {
      if (seen.insert(above).second) {
        reached.push_back(above);
      }
    }
  }
  const auto lost = std::find_if(_devices.begin(), _devices.end(),
                                 [&seen](const LsblkDevice& device) { return seen.count(&device) == 0; });
  return lost == _devices.end() ? nullptr : &*lost;
}

const std::string& LsblkStack::MapName(const LsblkDevice& map) const {
  return _called.at(map.name) == 1 ? map.name : map.kernelName;
}

}  // namespace OtxCtl::Sim
