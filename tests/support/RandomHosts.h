// Random hosts and requests for tests that compare two ways of deciding.
#pragma once

#include <ostream>
#include <random>
#include <string>
#include <vector>

#include "tests/support/Groups.h"

namespace TestSupport {

// A host and a request. Disks are positions in one pool, so that a request may name one object twice.
struct RandomHost {
  Disks pool;
  std::vector<int> inventory;
  std::vector<int> candidates;
  std::vector<HostCtl::Kova::DiskResult> records;
  std::vector<HostCtl::Kova::DiskMapping> mounted;
  std::vector<HostCtl::Kova::DiskMapping> unmounted;
  bool allFlash = false;
  bool kernelFails = false;

  // The disks of the request; some may be null.
  Disks Candidates() const;
  // The disks that come out of the agent's list: no nulls.
  Disks Inventory() const;
};

// For people: everything of the host.
std::ostream& operator<<(std::ostream& out, const RandomHost& host);

// Draws hosts. Few names, so that matches and duplicates are common; oddities (no name, no flag, no disk, one
// object twice) only in some hosts, so that others get past the first exception.
class HostDraw {
 public:
  explicit HostDraw(unsigned seed) : _random(seed) {}

  RandomHost Next();

 private:
  int Below(int limit) { return static_cast<int>(_random() % static_cast<unsigned>(limit)); }
  bool Chance(int oneIn) { return Below(oneIn) == 0; }
  bool Odd(int oneIn) { return _oddities && Chance(oneIn); }
  std::string Name() { return Odd(20) ? "" : "n" + std::to_string(Below(20)); }
  std::string NameIn(const RandomHost& host);
  Tessa::Ref<Nox::Host::ScsiDisk> Disk(int number);
  std::vector<int> Positions(int disks, int count);
  HostCtl::Kova::DiskResult Record(const RandomHost& host);
  HostCtl::Kova::DiskMapping Group(const RandomHost& host);

  std::mt19937 _random;
  bool _oddities = false;
};

// Takes entries away as long as the host still fails.
template <class Fails>
RandomHost Shortest(RandomHost host, Fails fails) {
  const auto cut = [&](auto list) {
    bool shorter = false;
    for (std::size_t index = (host.*list).size(); index-- > 0;) {
      RandomHost smaller = host;
      (smaller.*list).erase((smaller.*list).begin() + static_cast<std::ptrdiff_t>(index));
      if (fails(smaller)) {
        host = smaller;
        shorter = true;
      }
    }
    return shorter;
  };
  bool shorter = true;
  while (shorter) {
    shorter = cut(&RandomHost::candidates);
    shorter = cut(&RandomHost::inventory) || shorter;
    shorter = cut(&RandomHost::records) || shorter;
    shorter = cut(&RandomHost::mounted) || shorter;
    shorter = cut(&RandomHost::unmounted) || shorter;
  }
  return host;
}

}  // namespace TestSupport
