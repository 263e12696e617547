// Finding disks of the agent's inventory by canonical name.
#pragma once

#include <cstddef>
#include <memory_resource>
#include <string>
#include <string_view>
#include <unordered_map>

#include "nox/Fwd.h"
#include "orbis/DataArray.h"
#include "tessa/Ref.h"

namespace Kovasvc {

class NameList;

// An array of disks for many look-ups by name: one walk in all instead of one for each name. The array must
// stay as it is meanwhile; a null one counts as empty.
class DiskInventory {
 public:
  explicit DiskInventory(Tessa::Ref<Orbis::DataArray<Nox::Host::ScsiDisk>> disks);
  // For look-ups of these names only; cheaper when they are few, or stand in front.
  DiskInventory(Tessa::Ref<Orbis::DataArray<Nox::Host::ScsiDisk>> disks, NameList& names);
  ~DiskInventory();

 private:
  friend void GetScsiDiskFromArray(std::string_view canonicalName, const DiskInventory& disks,
                                   Tessa::Ref<Nox::Host::ScsiDisk>& disk);

  // `most`: names that are wanted at most. The walk ends when it has as many, like a search at its match.
  template <class IsWanted>
  void Index(std::size_t most, IsWanted isWanted);

  Tessa::Ref<Orbis::DataArray<Nox::Host::ScsiDisk>> _disks;
  // Entries side by side in memory, and all freed at once.
  std::pmr::monotonic_buffer_resource _memory;
  // Those before the first unnamed one, as far as they are wanted.
  std::pmr::unordered_map<std::string_view, Nox::Host::ScsiDisk*> _named{&_memory};
  bool _endsUnnamed = false;  // a walk that finds nothing meets a disk without a name
};

// Stores a reference to the disk of that name in `disk`, or leaves it as it was. Answers as a walk from the
// first disk to the match would: a disk without a canonical name (or a null) that stands before it throws
// Tessa::NotInitializedException.
void GetScsiDiskFromArray(std::string_view canonicalName, const DiskInventory& disks,
                          Tessa::Ref<Nox::Host::ScsiDisk>& disk);

}  // namespace Kovasvc
