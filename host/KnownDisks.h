// The disks that the agent's inventory lists, by canonical name, as they were at one moment.
//
// Threads: any, but a snapshot belongs to one at a time; its objects are only read.
#pragma once

#include <string>
#include <string_view>
#include <unordered_map>

#include "nox/Fwd.h"
#include "tessa/Ref.h"

namespace Host {

class KnownDisks {
 public:
  // What the managed object "storageSystem" lists now; nothing while there is no such object.
  static KnownDisks Now();

  // Units that are no disks, nulls and disks without a name are passed over. Null: no disks.
  explicit KnownDisks(Tessa::Ref<Nox::Host::StorageDeviceInfo> info);
  ~KnownDisks();
  KnownDisks(KnownDisks&&) noexcept;

  // Whether there was an inventory at all, if only an empty one.
  bool IsThere() const noexcept;

  // The inventory's disk, not to be changed; or null. It comes without what no answer shows and what may make
  // it large: durable name, alternate names and standard inquiry.
  Tessa::Ref<Nox::Host::ScsiDisk> Find(std::string_view canonicalName) const;

 private:
  struct Entry;

  Tessa::Ref<Nox::Host::StorageDeviceInfo> _info;  // keeps the names and the disks
  mutable std::unordered_map<std::string_view, Entry> _named;
};

// A disk that has left the host but that the kernel remembers has no name any more. Requests and results
// call it "kova:" and its KOVA UUID of 36 characters.
bool IsAbsentName(std::string_view canonicalName);
// Whether it begins like one; the plug-in takes that for enough.
bool HasAbsentPrefix(std::string_view canonicalName);
std::string AbsentName(const std::string& kovaUuid);

// The object that stands for such a disk.
Tessa::Ref<Nox::Host::ScsiDisk> AbsentDisk(const std::string& kovaUuid, bool ssd);

}  // namespace Host
