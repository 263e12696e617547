// Which disks of a host are one and the same disk, seen by two paths. Part of DiskJudge.
#pragma once

#include <cstddef>
#include <optional>
#include <set>
#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

#include "otxctl/disks/DiskFacts.h"

namespace OtxCtl::Disks {

// Two disks of one world wide name are the same; where one of them has none, two of the same model and serial
// number, and of the same serial number if one of them tells no model. A multipath device and its paths are
// one device, so not twins of each other. A disk of which nobody knows what identifies it may be the twin of
// any other.
class DiskTwins {
 public:
  // Keeps a reference to `disks`.
  explicit DiskTwins(const std::vector<DiskFacts>& disks);

  // "same disk as naa.1 (sdb): two paths"; empty for a disk that is surely seen once.
  std::string WordsFor(std::size_t index) const;

 private:
  // The first disk of each device, in the order of the disks.
  using Devices = std::vector<std::size_t>;
  struct SameSerial {
    Devices named;  // that have a world wide name, too
    Devices unnamed;
  };

  void FindDevices();
  void AddSerial(std::size_t index, bool isNamed);
  void Add(std::size_t index, Devices& devices);
  std::vector<const Devices*> LikeIt(std::size_t index) const;
  std::string NameOf(std::size_t index) const;

  const std::vector<DiskFacts>& _disks;
  std::vector<std::size_t> _deviceOf;  // a path has the number of its map
  std::unordered_map<std::string, Devices> _byName;
  std::unordered_map<std::string, SameSerial> _bySerial;     // and model, if it tells one
  std::unordered_map<std::string, SameSerial> _ofAnyModel;   // those that tell one, by serial number alone
  std::set<std::pair<const Devices*, std::size_t>> _listed;  // devices that stand in a list already
  Devices _unidentified;
};

}  // namespace OtxCtl::Disks
