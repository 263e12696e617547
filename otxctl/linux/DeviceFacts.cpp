#include "otxctl/linux/DeviceFacts.h"

#include <cstdint>
#include <utility>
#include <vector>

#include "otxctl/linux/ConnectionOf.h"
#include "otxctl/linux/DeviceIdentity.h"
#include "otxctl/linux/DeviceKind.h"
#include "otxctl/linux/DeviceStack.h"

namespace OtxCtl::Linux {
namespace {

using Disks::Connection;
using Disks::DiskFacts;
using Disks::DiskIdentity;
using Disks::Fact;
using Disks::IsRunning;

Fact<bool> IsFlash(const BlockDevice& device) {
  return device.isRotational.IsKnown() ? Fact<bool>(!device.isRotational.Get()) : device.isRotational;
}

// Who cannot tell the size of blocks cannot tell the capacity either, in the end.
Fact<std::int64_t> Capacity(const BlockDevice& device) {
  return device.blockSize.IsKnown() ? device.bytes : device.blockSize;
}

Fact<std::string> MapNameOf(const BlockDevices& devices, const BlockDevice& device) {
  if (!device.holders.IsKnown()) {
    return Fact<std::string>::Unknown(device.holders.WhyUnknown());
  }
  const BlockDevice* const map = MultipathMapOf(devices, device);
  return {map == nullptr ? std::string() : KernelNameOf(devices, *map)};
}

// What the device itself tells, of disks and multipath devices alike.
DiskFacts OwnFacts(const BlockDevices& devices, const BlockDevice& device) {
  DiskFacts facts;
  facts.kernelName = KernelNameOf(devices, device);
  facts.bytes = Capacity(device);
  facts.isFlash = IsFlash(device);
  facts.isReadOnly = device.isReadOnly;
  facts.isRemovable = device.isRemovable;
  facts.zones = device.zones;
  facts.partitions = CountPartitions(devices, device);
  facts.multipathMap = MapNameOf(devices, device);
  return facts;
}

void AddHardwareFacts(const SysfsReader& reader, const BlockDevice& device, DiskFacts& facts) {
  facts.identity = IdentityOf(reader, device);
  facts.connection = ConnectionOf(reader, device);
  facts.isHotPlug = IsHotPlug(reader, device);
  facts.state = StateOf(reader, device);
}

// Unknown, unless all paths are disks.
Fact<std::vector<DiskFacts>> PathsOf(const SysfsReader& reader, const BlockDevices& devices,
                                     const BlockDevice& map) {
  using Paths = Fact<std::vector<DiskFacts>>;
  if (!map.slaves.IsKnown() || map.slaves.Get().empty()) {
    return Paths::Unknown(map.slaves.IsKnown() ? map.name + " has no path" : map.slaves.WhyUnknown());
  }
  std::vector<DiskFacts> paths;
  for (const std::string& name : map.slaves.Get()) {
    const BlockDevice* const path = devices.ByName(name);
    if (path == nullptr || !path->IsWhole() || path->mapping) {
      return Paths::Unknown("what " + map.name + " leads to: one of its paths is no disk");
    }
    paths.push_back(OwnFacts(devices, *path));
    AddHardwareFacts(reader, *path, paths.back());
  }
  return {std::move(paths)};
}

// True once one is; false only if all are.
Fact<bool> Either(const Fact<bool>& one, const Fact<bool>& other) {
  if (one.Is(true) || other.Is(true)) {
    return {true};
  }
  return one.IsKnown() ? other : one;
}

Fact<std::int32_t> More(const Fact<std::int32_t>& one, const Fact<std::int32_t>& other) {
  const bool isMore = one.IsKnown() && (!other.IsKnown() || other.Get() > one.Get());
  return isMore ? other : one;
}

Fact<Connection> Worst(const Fact<Connection>& one, const Fact<Connection>& other) {
  const bool isLocal = one.IsKnown() && one.Get().attachment == Disks::Attachment::Machine;
  return isLocal ? other : one;
}

Fact<DiskIdentity> Common(const Fact<DiskIdentity>& one, const Fact<DiskIdentity>& other,
                          const std::string& map) {
  if (!one.IsKnown() || !other.IsKnown()) {
    return one.IsKnown() ? other : one;
  }
  const bool isSame = one.Get().worldWideName == other.Get().worldWideName &&
                      one.Get().serial == other.Get().serial && one.Get().model == other.Get().model;
  return isSame ? one
                : Fact<DiskIdentity>::Unknown("which disk " + map + " is: its paths lead to different ones");
}

// One path that runs is enough.
Fact<std::string> Best(const Fact<std::string>& one, const Fact<std::string>& other) {
  const bool isGood = one.IsKnown() && IsRunning(one.Get());
  return isGood ? one : other;
}

Fact<std::string> MapState(const BlockDevice& map, const Fact<std::string>& ofPaths) {
  const Fact<bool>& isSuspended = map.mapping->isSuspended;
  if (!isSuspended.IsKnown()) {
    return Fact<std::string>::Unknown(isSuspended.WhyUnknown());
  }
  return isSuspended.Get() ? Fact<std::string>(std::string("suspended")) : ofPaths;
}

void AddPathFacts(const SysfsReader& reader, const BlockDevices& devices, const BlockDevice& map,
                  DiskFacts& facts) {
  const Fact<std::vector<DiskFacts>> paths = PathsOf(reader, devices, map);
  if (!paths.IsKnown()) {
    facts.identity = Fact<DiskIdentity>::Unknown(paths.WhyUnknown());
    facts.connection = Fact<Connection>::Unknown(paths.WhyUnknown());
    facts.isHotPlug = Fact<bool>::Unknown(paths.WhyUnknown());
    facts.state = Fact<std::string>::Unknown(paths.WhyUnknown());
    return;
  }
  const DiskFacts& first = paths.Get().front();
  facts.identity = first.identity;
  facts.connection = first.connection;
  facts.isHotPlug = first.isHotPlug;
  facts.state = first.state;
  for (const DiskFacts& path : paths.Get()) {
    facts.identity = Common(facts.identity, path.identity, map.name);
    facts.connection = Worst(facts.connection, path.connection);
    facts.isHotPlug = Either(facts.isHotPlug, path.isHotPlug);
    facts.isReadOnly = Either(facts.isReadOnly, path.isReadOnly);
    facts.isRemovable = Either(facts.isRemovable, path.isRemovable);
    facts.state = Best(facts.state, path.state);
    facts.partitions = More(facts.partitions, path.partitions);
  }
  facts.state = MapState(map, facts.state);
}

}  // namespace

std::string KernelNameOf(const BlockDevices& devices, const BlockDevice& device) {
  if (!IsMultipathMap(device) || !device.mapping->name.IsKnown()) {
    return device.name;
  }
  const std::string& name = device.mapping->name.Get();
  return name.empty() || devices.ByName(name) != nullptr ? device.name : name;
}

DiskFacts FactsOf(const SysfsReader& reader, const BlockDevices& devices, const BlockDevice& device) {
  DiskFacts facts = OwnFacts(devices, device);
  if (IsMultipathMap(device)) {
    AddPathFacts(reader, devices, device, facts);
  } else {
    AddHardwareFacts(reader, device, facts);
  }
  return facts;
}

bool IsReadable(const DiskFacts& facts) {
  return facts.state.IsKnown() && IsRunning(facts.state.Get());
}

}  // namespace OtxCtl::Linux
