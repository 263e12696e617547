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

class NameSet;

// Walks the disks from the first: stores a reference to the disk of that name in `disk`, or leaves it as
// it was. A disk without a canonical name (or a null) met before the match throws
// Tessa::NotInitializedException. A null array counts as empty.
void GetScsiDiskFromArray(const std::string& canonicalName,
                          const Tessa::Ref<Orbis::DataArray<Nox::Host::ScsiDisk>>& disks,
                          Tessa::Ref<Nox::Host::ScsiDisk>& disk);

// The same answers and the same exceptions for many look-ups in one array, which must stay as it is
// meanwhile: one walk in all instead of one for each name.
class DiskInventory {
 public:
  explicit DiskInventory(Tessa::Ref<Orbis::DataArray<Nox::Host::ScsiDisk>> disks);
  // For look-ups of these names only; cheaper when they are few, or stand in front.
  DiskInventory(Tessa::Ref<Orbis::DataArray<Nox::Host::ScsiDisk>> disks, NameSet& names);
  ~DiskInventory();

  void Find(const std::string& canonicalName, Tessa::Ref<Nox::Host::ScsiDisk>& disk) const;

 private:
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

}  // namespace Kovasvc
