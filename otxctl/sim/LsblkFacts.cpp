#include "otxctl/sim/LsblkFacts.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <optional>
#include <string_view>
#include <unordered_map>
#include <unordered_set>
#include <utility>

#include "otxctl/disks/DiskNames.h"
#include "otxctl/disks/SignatureWords.h"
#include "otxctl/sim/HostDescriptionError.h"
#include "otxctl/sim/LsblkConnection.h"
#include "otxctl/sim/LsblkStack.h"

namespace OtxCtl::Sim {
namespace {

using Disks::Attachment;
using Disks::Connection;
using Disks::DiskFacts;
using Disks::DiskIdentity;
using Disks::Fact;
using Disks::IsRunning;
using Texts = std::vector<std::string>;

// Kinds of device that stand by themselves. Every other kind stands on one that the capture has to show.
constexpr std::array<std::string_view, 17> groundKinds = {
    "disk",    "loop",    "rom",     "tape",      "changer", "printer", "processor", "worm", "comm",
    "scanner", "mo-disk", "optical", "enclosure", "zbc",     "no-lun",  "rbc",       "osd"};
constexpr std::string_view multipathMember = "mpath_member";

template <std::size_t count>
bool Contains(const std::array<std::string_view, count>& table, std::string_view word) {
  return std::find(table.begin(), table.end(), word) != table.end();
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
  explicit Capture(const std::vector<LsblkDevice>& devices) : _devices(devices), _stack(devices) {}

  CapturedDisks Disks() {
    for (const LsblkDevice& device : _devices) {
      CheckPlace(device);
      CheckSight(device);
    }
    if (const LsblkDevice* const lost = _stack.FindInCircle()) {
      Refuse(*lost, lost->name + " stands on itself, or on what does");
    }
    CapturedDisks disks;
    for (const LsblkDevice& device : _devices) {
      if (device.parents.empty()) {
        AddGroundDevice(device, disks);
      } else if (device.type == "disk") {
        disks.leftOut.push_back({device.name, "stands on " + device.parents.front()});
      }
    }
    return disks;
  }

 private:
  void CheckPlace(const LsblkDevice& device) const {
    for (const std::string& parent : device.parents) {
      if (_stack.Find(parent) == nullptr) {
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
                              (device.type == "disk" && device.parents.empty() && IsVirtual(device));
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
      const LsblkDevice* const found = _stack.Find(parent);
      return found != nullptr && !found->partitionTable.empty();
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
    for (const LsblkDevice* const above : _stack.On(device)) {
      if (IsMultipath(*above) && _maps.insert(above).second) {
        CheckColumns(*above);
        disks.disks.push_back({above, FactsOfMap(*above)});
      }
    }
    disks.disks.push_back({&device, FactsOfDisk(device)});
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

  // A disk may be a path of many multipath devices.
  const DiskFacts& FactsOfDisk(const LsblkDevice& device) {
    const auto [known, isNew] = _facts.try_emplace(&device);
    DiskFacts& facts = known->second;
    if (!isNew) {
      return facts;
    }
    facts.kernelName = device.name;
    facts.identity =
        DiskIdentity{Disks::WorldWideName(device.worldWideName), device.vendor, device.model, device.serial};
    facts.connection = ConnectionOf(device);
    facts.multipathMap = std::string();
    for (const LsblkDevice* const above : _stack.On(device)) {
      if (IsMultipath(*above)) {
        facts.multipathMap = _stack.MapName(*above);
      }
    }
    FillOwnFacts(device, facts);
    return facts;
  }

  // The disk that several paths lead to: it is what the paths say, and used as it says itself, or one of
  // them.
  DiskFacts FactsOfMap(const LsblkDevice& map) {
    const DiskFacts& first = FactsOfDisk(*_stack.Find(map.parents.front()));
    DiskFacts facts;
    facts.identity = first.identity;
    facts.connection = first.connection;
    facts.kernelName = _stack.MapName(map);
    facts.multipathMap = std::string();
    FillOwnFacts(map, facts);
    bool isAnyRunning = false;
    for (const std::string& parent : map.parents) {
      const LsblkDevice& device = *_stack.Find(parent);
      const DiskFacts& path = FactsOfDisk(device);
      facts.identity = SameIdentity(facts.identity, path.identity, map);
      facts.connection = Worse(facts.connection, path.connection);
      AddWorseOf(device, facts);
      AddUseOf(device, path, facts);
      isAnyRunning = isAnyRunning || IsRunning(device.state);
    }
    if (!isAnyRunning && IsRunning(map.state)) {
      facts.state = first.state;
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
    facts.mounts = _stack.MountsOn(device);
    facts.partitions = _stack.PartitionsOn(device);
    facts.holders = _stack.HoldersOf(device);
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
    if (path.fileSystem != multipathMember) {
      facts.signatures = Both(facts.signatures.Get(), SignaturesOf(path));
    }
    if (facts.partitionTable.Get().empty()) {
      facts.partitionTable = path.partitionTable;
    }
  }

  // Whoever uses a path past the multipath device uses the disk. What stands on that is seen there.
  static void AddUseOf(const LsblkDevice& device, const DiskFacts& path, DiskFacts& facts) {
    facts.mounts = Both(facts.mounts.Get(), device.mounts);
    facts.partitions = std::max(facts.partitions.Get(), path.partitions.Get());
    facts.holders = Both(facts.holders.Get(), path.holders.Get());
  }

  // Of very many, some: one is enough.
  static Texts Both(Texts texts, const Texts& others) {
    constexpr std::size_t most = 8;
    for (const std::string& other : others) {
      if (texts.size() < most && std::find(texts.begin(), texts.end(), other) == texts.end()) {
        texts.push_back(other);
      }
    }
    return texts;
  }

  const std::vector<LsblkDevice>& _devices;
  const LsblkStack _stack;
  std::unordered_map<const LsblkDevice*, DiskFacts> _facts;
  std::unordered_set<const LsblkDevice*> _maps;
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
