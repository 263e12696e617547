#include "otxctl/sim/LsblkFacts.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <optional>
#include <string_view>
#include <unordered_map>
#include <utility>

#include "otxctl/disks/DiskNames.h"
#include "otxctl/disks/SignatureWords.h"
#include "otxctl/sim/HostDescriptionError.h"
#include "otxctl/sim/LsblkConnection.h"

namespace OtxCtl::Sim {
namespace {

using Disks::Attachment;
using Disks::Connection;
using Disks::DiskFacts;
using Disks::DiskIdentity;
using Disks::Fact;
using Texts = std::vector<std::string>;

// Kinds of device that stand by themselves. Every other kind stands on one that the capture has to show.
constexpr std::array<std::string_view, 15> groundKinds = {
    "disk", "loop",    "rom",     "tape",    "changer",   "printer", "processor", "worm",
    "comm", "scanner", "mo-disk", "optical", "enclosure", "zbc",     "no-lun"};
constexpr std::string_view multipath = "mpath";
constexpr std::string_view multipathMember = "mpath_member";

template <std::size_t count>
bool Contains(const std::array<std::string_view, count>& table, std::string_view word) {
  return std::find(table.begin(), table.end(), word) != table.end();
}

bool IsPartition(const LsblkDevice& device) {
  return device.type == "part";
}

[[noreturn]] void Refuse(const LsblkDevice& device, const std::string& why) {
  throw HostDescriptionError(device.path + ": " + why + "; run: " + lsblkCommand +
                             " as root, on the machine itself");
}

// What the capture says, or, for lsblk's null, why nobody knows.
template <typename Value>
Fact<Value> Told(const LsblkDevice& device, const std::optional<Value>& value, const char* column) {
  return value ? Fact<Value>(*value)
               : Fact<Value>::Unknown("the capture has no " + std::string(column) + " of " + device.name);
}

class Capture {
 public:
  explicit Capture(const std::vector<LsblkDevice>& devices) : _devices(devices) {
    for (const LsblkDevice& device : devices) {
      _deviceOf.emplace(device.kernelName, &device);
    }
    for (const LsblkDevice& device : devices) {
      for (const std::string& parent : device.parents) {
        _standOn[parent].push_back(&device);
      }
    }
  }

  CapturedDisks Disks() {
    CapturedDisks disks;
    for (const LsblkDevice& device : _devices) {
      CheckPlace(device);
      CheckSight(device);
      if (device.parents.empty()) {
        AddGroundDevice(device, disks);
      }
    }
    return disks;
  }

 private:
  const std::vector<const LsblkDevice*>& DevicesOn(const LsblkDevice& device) const {
    static const std::vector<const LsblkDevice*> none;
    const auto found = _standOn.find(device.kernelName);
    return found == _standOn.end() ? none : found->second;
  }

  void CheckPlace(const LsblkDevice& device) const {
    for (const std::string& parent : device.parents) {
      if (_deviceOf.count(parent) == 0) {
        Refuse(device, device.name + " stands on " + parent + ", which the capture does not show");
      }
    }
    if (device.parents.empty() && !Contains(groundKinds, device.type)) {
      Refuse(device, device.name + " is of type " + device.type +
                         ", but the capture does not show what it stands on");
    }
  }

  // lsblk without udev's data shows partitions and mounts, for these it has from the kernel, but nothing of
  // what is on a disk. Then every disk looks free.
  void CheckSight(const LsblkDevice& device) const {
    const bool isKernelsOwn = device.type == "loop" || device.type == "rom" || device.type == "dm" ||
                              (device.type == "disk" && IsVirtual(device));
    if (!isKernelsOwn && !device.mounts.empty() && device.fileSystem.empty()) {
      Refuse(device, device.name + " is mounted at " + device.mounts.front() +
                         ", but lsblk saw no file system on it: it had no data of udev");
    }
    if (IsPartition(device) && device.partitionTable.empty() && !HasTable(device)) {
      Refuse(device,
             device.name + " is a partition, but lsblk saw no partition table: it had no data of udev");
    }
  }

  bool HasTable(const LsblkDevice& partition) const {
    return std::any_of(partition.parents.begin(), partition.parents.end(), [this](const std::string& parent) {
      const auto found = _deviceOf.find(parent);
      return found != _deviceOf.end() && !found->second->partitionTable.empty();
    });
  }

  void AddGroundDevice(const LsblkDevice& device, CapturedDisks& disks) {
    if (device.type != "disk") {
      disks.leftOut.push_back({device.name, "no disk, but of type " + device.type});
      return;
    }
    CheckColumns(device);
    if (IsVirtual(device)) {
      disks.leftOut.push_back({device.name, "a virtual device: attached to no hardware"});
      return;
    }
    if (device.bytes == 0) {
      disks.leftOut.push_back({device.name, "without a medium"});
      return;
    }
    for (const LsblkDevice* const above : DevicesOn(device)) {
      if (above->type == multipath && std::find(_maps.begin(), _maps.end(), above) == _maps.end()) {
        CheckColumns(*above);
        _maps.push_back(above);
        disks.disks.push_back({above, FactsOfMap(*above)});
      }
    }
    disks.disks.push_back({&device, FactsOf(device)});
  }

  static void CheckColumns(const LsblkDevice& device) {
    if (device.missingColumns.empty()) {
      return;
    }
    std::string columns;
    for (const std::string& column : device.missingColumns) {
      columns += (columns.empty() ? "" : ", ") + column;
    }
    throw HostDescriptionError(device.path + ": the capture has no column " + columns +
                               "; run: " + lsblkCommand + " (of util-linux 2.33 or newer)");
  }

  DiskFacts FactsOf(const LsblkDevice& device) const {
    DiskFacts facts;
    facts.kernelName = device.name;
    facts.identity =
        DiskIdentity{Disks::WorldWideName(device.worldWideName), device.vendor, device.model, device.serial};
    facts.connection = ConnectionOf(device);
    facts.multipathMap = std::string();
    for (const LsblkDevice* const above : DevicesOn(device)) {
      if (above->type == multipath) {
        facts.multipathMap = above->name;
      }
    }
    FillOwnFacts(device, facts);
    return facts;
  }

  // The disk that several paths lead to: it is what the paths say, and used as it says itself.
  DiskFacts FactsOfMap(const LsblkDevice& map) const {
    DiskFacts facts;
    bool isFirst = true;
    for (const std::string& parent : map.parents) {
      const DiskFacts path = FactsOf(*_deviceOf.at(parent));
      facts.identity = isFirst ? path.identity : SameIdentity(facts.identity, path.identity, map);
      facts.connection = isFirst ? path.connection : Worse(facts.connection, path.connection);
      isFirst = false;
    }
    facts.kernelName = map.name;
    facts.multipathMap = std::string();
    FillOwnFacts(map, facts);
    for (const std::string& parent : map.parents) {
      AddWorseOf(*_deviceOf.at(parent), facts);
    }
    return facts;
  }

  void FillOwnFacts(const LsblkDevice& device, DiskFacts& facts) const {
    facts.bytes = Told(device, device.bytes, "SIZE");
    facts.isFlash =
        device.isRotational ? Fact<bool>(!*device.isRotational) : Told(device, device.isRotational, "ROTA");
    facts.isReadOnly = Told(device, device.isReadOnly, "RO");
    facts.isRemovable = Told(device, device.isRemovable, "RM");
    facts.isHotPlug = Told(device, device.isHotPlug, "HOTPLUG");
    facts.state = device.state;
    facts.zones = device.zones;
    facts.signatures = SignaturesOf(device);
    facts.partitionTable = device.partitionTable;
    facts.mounts = MountsOf(device);
    std::int32_t partitions = 0;
    Texts holders;
    for (const LsblkDevice* const above : DevicesOn(device)) {
      if (IsPartition(*above)) {
        ++partitions;
      } else if (above->type != multipath) {
        holders.push_back(above->name + " (" + above->type + ")");
      }
    }
    facts.partitions = partitions;
    facts.holders = std::move(holders);
  }

  static Texts SignaturesOf(const LsblkDevice& device) {
    Texts signatures;
    if (!device.fileSystem.empty()) {
      signatures.push_back(Disks::SignatureInWords(device.fileSystem, device.label));
      return signatures;
    }
    // Whoever left these behind, lsblk does not know what it is.
    if (!device.label.empty()) {
      signatures.push_back("label " + device.label);
    }
    if (!device.uuid.empty()) {
      signatures.push_back("UUID " + device.uuid);
    }
    signatures.insert(signatures.end(), device.otherTraces.begin(), device.otherTraces.end());
    return signatures;
  }

  // Of the disk itself, and of whatever stands on it.
  Texts MountsOf(const LsblkDevice& device) const {
    Texts mounts = device.mounts;
    std::vector<const LsblkDevice*> waiting = DevicesOn(device);
    Texts seen;
    while (!waiting.empty() && mounts.size() < mostMounts) {
      const LsblkDevice* const above = waiting.back();
      waiting.pop_back();
      if (std::find(seen.begin(), seen.end(), above->kernelName) != seen.end()) {
        continue;
      }
      seen.push_back(above->kernelName);
      for (const std::string& mount : above->mounts) {
        mounts.push_back(mount + " (" + above->name + ")");
      }
      const auto& further = DevicesOn(*above);
      waiting.insert(waiting.end(), further.begin(), further.end());
    }
    return mounts;
  }

  static Fact<DiskIdentity> SameIdentity(const Fact<DiskIdentity>& one, const Fact<DiskIdentity>& other,
                                         const LsblkDevice& map) {
    const bool isSame = one.IsKnown() && other.IsKnown() &&
                        one.Get().worldWideName == other.Get().worldWideName &&
                        one.Get().serial == other.Get().serial;
    return isSame ? one
                  : Fact<DiskIdentity>::Unknown("the paths of " + map.name + " do not say the same of it");
  }

  static Fact<Connection> Worse(const Fact<Connection>& one, const Fact<Connection>& other) {
    const bool isOneGood = one.IsKnown() && one.Get().attachment == Attachment::Machine;
    return isOneGood ? other : one;
  }

  // What a path is, the disk behind it is too.
  static void AddWorseOf(const LsblkDevice& path, DiskFacts& facts) {
    const auto worsen = [&path](Fact<bool>& fact, const std::optional<bool>& told, const char* column) {
      if (told != false) {
        fact = Told(path, told, column);
      }
    };
    worsen(facts.isReadOnly, path.isReadOnly, "RO");
    worsen(facts.isRemovable, path.isRemovable, "RM");
    worsen(facts.isHotPlug, path.isHotPlug, "HOTPLUG");
    if (facts.zones.Get().empty() || facts.zones.Get() == "none") {
      facts.zones = path.zones;
    }
    Texts signatures = facts.signatures.Get();
    for (const std::string& signature : SignaturesOf(path)) {
      const bool isExpected = path.fileSystem == multipathMember;
      if (!isExpected && std::find(signatures.begin(), signatures.end(), signature) == signatures.end()) {
        signatures.push_back(signature);
      }
    }
    facts.signatures = std::move(signatures);
    if (facts.partitionTable.Get().empty()) {
      facts.partitionTable = path.partitionTable;
    }
  }

  static constexpr std::size_t mostMounts = 8;  // that are told of one disk

  const std::vector<LsblkDevice>& _devices;
  std::unordered_map<std::string, const LsblkDevice*> _deviceOf;
  std::unordered_map<std::string, std::vector<const LsblkDevice*>> _standOn;
  std::vector<const LsblkDevice*> _maps;
};

}  // namespace

CapturedDisks DisksOfCapture(const std::vector<LsblkDevice>& devices) {
  return Capture(devices).Disks();
}

void CheckThatHoldersAreShown(const std::vector<LsblkDevice>& devices) {
  const bool showsHolders = std::any_of(devices.begin(), devices.end(),
                                        [](const LsblkDevice& device) { return !device.parents.empty(); });
  if (showsHolders) {
    return;
  }
  for (const LsblkDevice& device : devices) {
    const bool isCarrier = !device.partitionTable.empty() || Disks::IsMemberSignature(device.fileSystem);
    if (device.type == "disk" && isCarrier && !IsVirtual(device)) {
      Refuse(device, device.name +
                         " carries other devices, but the capture shows none that stands on a "
                         "disk: was it made with -d?");
    }
  }
}

}  // namespace OtxCtl::Sim
