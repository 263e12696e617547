#include "otxctl/disks/DiskTwins.h"

#include <array>

namespace OtxCtl::Disks {
namespace {

constexpr std::size_t mostNamed = 3;  // twins that are named; of more, the number is told

// A zero byte stands in neither text.
std::string SerialKey(const std::string& model, const std::string& serial) {
  return model + '\0' + serial;
}

std::string PathsInWords(std::size_t paths) {
  constexpr std::array<const char*, 3> words = {"two", "three", "four"};
  return (paths - 2 < words.size() ? words[paths - 2] : std::to_string(paths)) + std::string(" paths");
}

}  // namespace

DiskTwins::DiskTwins(const std::vector<DiskFacts>& disks) : _disks(disks) {
  FindDevices();
  for (std::size_t index = 0; index < disks.size(); ++index) {
    if (!disks[index].identity.IsKnown()) {
      _unidentified.push_back(index);
      continue;
    }
    const DiskIdentity& identity = disks[index].identity.Get();
    const bool isNamed = !identity.worldWideName.empty();
    if (isNamed) {
      Add(index, _byName[identity.worldWideName]);
    }
    if (!identity.serial.empty()) {
      AddSerial(index, isNamed);
    }
  }
}

void DiskTwins::AddSerial(std::size_t index, bool isNamed) {
  const DiskIdentity& identity = _disks[index].identity.Get();
  SameSerial& same = _bySerial[SerialKey(identity.model, identity.serial)];
  Add(index, isNamed ? same.named : same.unnamed);
  if (!identity.model.empty()) {
    SameSerial& any = _ofAnyModel[identity.serial];
    Add(index, isNamed ? any.named : any.unnamed);
  }
}

void DiskTwins::FindDevices() {
  std::unordered_map<std::string, std::size_t> maps;
  for (const DiskFacts& disk : _disks) {
    if (disk.multipathMap.IsKnown() && !disk.multipathMap.Get().empty()) {
      maps.try_emplace(disk.multipathMap.Get(), _disks.size() + maps.size());
    }
  }
  for (std::size_t index = 0; index < _disks.size(); ++index) {
    const DiskFacts& disk = _disks[index];
    const bool isPath = disk.multipathMap.IsKnown() && !disk.multipathMap.Get().empty();
    const auto map = maps.find(isPath ? disk.multipathMap.Get() : disk.kernelName);
    _deviceOf.push_back(map == maps.end() ? index : map->second);
  }
}

// All paths of a device come to the same list, and count once there.
void DiskTwins::Add(std::size_t index, Devices& devices) {
  if (_listed.emplace(&devices, _deviceOf[index]).second) {
    devices.push_back(index);
  }
}

std::string DiskTwins::NameOf(std::size_t index) const {
  return _disks[index].canonicalName + " (" + _disks[index].kernelName + ")";
}

// Lists of devices that are the disk itself or its twins. The device of the disk itself is in one of them.
std::vector<const DiskTwins::Devices*> DiskTwins::LikeIt(std::size_t index) const {
  const DiskIdentity& identity = _disks[index].identity.Get();
  const bool isNamed = !identity.worldWideName.empty();
  std::vector<const Devices*> all;
  const auto addSame = [&](const std::unordered_map<std::string, SameSerial>& serials,
                           const std::string& key) {
    const auto found = serials.find(key);
    if (found != serials.end()) {
      if (!isNamed) {
        all.push_back(&found->second.named);
      }
      all.push_back(&found->second.unnamed);
    }
  };
  if (isNamed) {
    all.push_back(&_byName.at(identity.worldWideName));
  }
  if (!identity.serial.empty()) {
    addSame(_bySerial, SerialKey(identity.model, identity.serial));
    identity.model.empty() ? addSame(_ofAnyModel, identity.serial)
                           : addSame(_bySerial, SerialKey("", identity.serial));
  }
  return all;
}

std::string DiskTwins::WordsFor(std::size_t index) const {
  for (std::size_t i = 0; i < _unidentified.size() && i < 2; ++i) {
    if (_unidentified[i] != index) {
      return "nobody knows whether it is the same disk as " + NameOf(_unidentified[i]);
    }
  }
  if (!_disks[index].identity.IsKnown()) {
    return {};
  }
  std::string words;
  std::size_t told = 0;
  std::size_t others = 0;
  for (const Devices* const devices : LikeIt(index)) {
    others += devices->size();
    for (std::size_t i = 0; i < devices->size() && told < mostNamed; ++i) {
      const std::size_t other = (*devices)[i];
      if (_deviceOf[other] != _deviceOf[index]) {
        words += (told++ == 0 ? "" : ", ") + NameOf(other);
      }
    }
  }
  if (told == 0) {
    return {};
  }
  // The device of the disk itself is among them.
  return "same disk as " + words + (others - 1 > told ? ", ..." : "") + ": " + PathsInWords(others);
}

}  // namespace OtxCtl::Disks
