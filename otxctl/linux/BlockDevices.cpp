#include "otxctl/linux/BlockDevices.h"

#include <algorithm>
#include <utility>

#include "otxctl/linux/NaturalOrder.h"
#include "tessa/text/Escape.h"

namespace OtxCtl::Linux {
namespace {

using Disks::Fact;
using Names = std::vector<std::string>;

constexpr std::string_view rootOfDevices = "/devices";

std::string FolderOf(const std::string& name) {
  return "/class/block/" + name;
}

Fact<Names> NamesIn(const SysfsReader& reader, const std::string& path) {
  const auto names = reader.Folder(path);
  if (!names.IsKnown()) {
    return Fact<Names>::Unknown(names.WhyUnknown());
  }
  return names.Get() ? Fact<Names>(*names.Get())
                     : Fact<Names>::Unknown(reader.Shown(path) + ": does not exist");
}

Fact<std::int64_t> Bytes(const SysfsReader& reader, const std::string& path) {
  constexpr std::int64_t sectorSize = 512;  // in this attribute, whatever the disk's own are
  constexpr std::int64_t mostSectors = std::int64_t{1} << 53;
  const Fact<std::int64_t> sectors = reader.RequiredNumber(path);
  if (sectors.IsKnown() && sectors.Get() > mostSectors) {
    return Fact<std::int64_t>::Unknown(reader.Shown(path) + ": larger than any disk");
  }
  return sectors.IsKnown() ? Fact<std::int64_t>(sectors.Get() * sectorSize) : sectors;
}

Fact<std::int64_t> BlockSize(const SysfsReader& reader, const std::string& path) {
  constexpr std::int64_t largest = std::int64_t{1} << 30;
  const Fact<std::int64_t> size = reader.RequiredNumber(path);
  const bool isOne = size.IsKnown() && size.Get() > 0 && size.Get() <= largest;
  return !size.IsKnown() || isOne ? size
                                  : Fact<std::int64_t>::Unknown(reader.Shown(path) + ": no size of blocks");
}

Mapping ReadMapping(const SysfsReader& reader, const std::string& path) {
  return {reader.RequiredText(path + "/name"), reader.RequiredText(path + "/uuid"),
          reader.FlagOr(false, path + "/suspended")};
}

// What partitions have not, too: nobody asks it of them.
void ReadWholeDevice(const SysfsReader& reader, BlockDevice& device) {
  const std::string& path = device.path;
  device.isRemovable = reader.RequiredFlag(path + "/removable");
  device.isHidden = reader.FlagOr(false, path + "/hidden");
  device.isRotational = reader.RequiredFlag(path + "/queue/rotational");
  device.zones = TextOrEmpty(reader.Text(path + "/queue/zoned"));
  device.blockSize = BlockSize(reader, path + "/queue/logical_block_size");
  device.slaves = NamesIn(reader, path + "/slaves");
  // What cannot be looked for counts as found.
  device.isRaid = !reader.Exists(path + "/md").Is(false);
  if (!reader.Exists(path + "/dm").Is(false)) {
    device.mapping = ReadMapping(reader, path + "/dm");
  }
  device.device = TextOrEmpty(reader.RealPath(path + "/device"));
}

template <typename Map>
const BlockDevice* Find(const Map& map, const std::string& key) {
  const auto found = map.find(key);
  return found == map.end() ? nullptr : found->second;
}

}  // namespace

BlockDevices::BlockDevices(const SysfsReader& reader) {
  const Fact<Names> names = NamesIn(reader, "/class/block");
  if (!names.IsKnown()) {
    _whyIncomplete = names.WhyUnknown();
    return;
  }
  Names sorted = names.Get();
  std::sort(sorted.begin(), sorted.end(), IsNaturallyBefore);
  _all.reserve(sorted.size());
  for (const std::string& name : sorted) {
    Read(reader, name);
  }
  for (const Unreadable& unread : _notRead) {
    // "sda1" may be of "sda", "s", ...
    for (std::size_t size = 1; size < unread.name.size(); ++size) {
      _withUnread.insert(unread.name.substr(0, size));
    }
  }
  Index();
}

bool BlockDevices::HasUnreadPartitions(const BlockDevice& disk) const {
  return _withUnread.count(disk.name) > 0;
}

void BlockDevices::Read(const SysfsReader& reader, const std::string& name) {
  if (!Tessa::IsPrintable(name)) {
    _notRead.push_back({Tessa::Escape(name), "a name that cannot be shown"});
    return;
  }
  const auto path = reader.RealPath(FolderOf(name));
  if (!path.IsKnown() || !path.Get()) {
    _notRead.push_back({name, path.IsKnown() ? "went away" : "nobody knows: " + path.WhyUnknown()});
    return;
  }
  BlockDevice device;
  device.name = name;
  device.path = *path.Get();
  const Fact<bool> isPartition = reader.Exists(device.path + "/partition");
  if (!isPartition.IsKnown()) {
    _notRead.push_back({name, "nobody knows: " + isPartition.WhyUnknown()});
    return;
  }
  // First: should another disk take its place while the rest is read, that is seen by it in the end.
  device.sequence = TextOrEmpty(reader.Text(device.path + "/diskseq"));
  device.number = reader.RequiredText(device.path + "/dev");
  device.bytes = Bytes(reader, device.path + "/size");
  device.isReadOnly = reader.RequiredFlag(device.path + "/ro");
  device.holders = NamesIn(reader, device.path + "/holders");
  if (isPartition.Get()) {
    device.parent = LastName(ParentPath(device.path));
  } else {
    ReadWholeDevice(reader, device);
    device.chain = ReadChain(reader, device.path);
  }
  _all.push_back(std::move(device));
}

Fact<std::vector<Ancestor>> BlockDevices::ReadChain(const SysfsReader& reader, const std::string& path) {
  std::vector<Ancestor> chain;
  for (std::string_view at = path; at.size() > rootOfDevices.size(); at = ParentPath(at)) {
    auto [known, isNew] = _subsystems.try_emplace(std::string(at));
    if (isNew) {
      known->second = TextOrEmpty(reader.LinkName(known->first + "/subsystem"));
    }
    const Fact<std::string>& subsystem = known->second;
    if (!subsystem.IsKnown()) {
      return Fact<std::vector<Ancestor>>::Unknown(subsystem.WhyUnknown());
    }
    if (!subsystem.Get().empty()) {
      chain.push_back({known->first, Tessa::Sanitize(subsystem.Get())});
    }
  }
  return {std::move(chain)};
}

void BlockDevices::Index() {
  for (const BlockDevice& device : _all) {
    _byName.emplace(device.name, &device);
    if (device.number.IsKnown()) {
      _byNumber.emplace(device.number.Get(), &device);
    }
    if (device.mapping && device.mapping->name.IsKnown()) {
      _byMapping.emplace(device.mapping->name.Get(), &device);
    }
    if (!device.IsWhole()) {
      _partitions[device.parent].push_back(&device);
    }
  }
}

const BlockDevice* BlockDevices::ByName(const std::string& name) const {
  return Find(_byName, name);
}

const BlockDevice* BlockDevices::ByNumber(const std::string& number) const {
  return Find(_byNumber, number);
}

const BlockDevice* BlockDevices::ByMapping(const std::string& name) const {
  return Find(_byMapping, name);
}

const std::vector<const BlockDevice*>& BlockDevices::PartitionsOf(const BlockDevice& disk) const {
  static const std::vector<const BlockDevice*> none;
  const auto found = _partitions.find(disk.name);
  return found == _partitions.end() ? none : found->second;
}

std::string WhyGone(const SysfsReader& reader, const BlockDevice& device) {
  const auto path = reader.RealPath(FolderOf(device.name));
  if (!path.IsKnown() || !path.Get()) {
    return path.IsKnown() ? "went away" : "nobody knows whether it is still there: " + path.WhyUnknown();
  }
  const Fact<std::string> number = reader.RequiredText(device.path + "/dev");
  const Fact<std::string> sequence = TextOrEmpty(reader.Text(device.path + "/diskseq"));
  for (const Fact<std::string>* const fact : {&device.number, &number, &device.sequence, &sequence}) {
    if (!fact->IsKnown()) {
      return "nobody knows whether it is still there: " + fact->WhyUnknown();
    }
  }
  const bool isSame =
      *path.Get() == device.path && number.Is(device.number.Get()) && sequence.Is(device.sequence.Get());
  return isSame ? "" : "another device has taken its name";
}

}  // namespace OtxCtl::Linux
