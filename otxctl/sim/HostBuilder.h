// Host descriptions in a line or two, for tests and benchmarks.
//
//   AHost().WithSsd("naa.1").WithHdds({"naa.2", "naa.3"}).WithGroup("naa.1", {"naa.2"}).Build()
#pragma once

#include <algorithm>
#include <functional>
#include <string>
#include <utility>
#include <vector>

#include "otxctl/sim/HostDescription.h"

namespace OtxCtl::Sim {

class HostBuilder {
 public:
  static constexpr std::int64_t diskBytes = std::int64_t{1} << 40;

  // A disk that is eligible unless `edit` makes it something else.
  HostBuilder& WithDisk(const std::string& name, bool ssd, const std::function<void(HostDisk&)>& edit = {}) {
    HostDisk& disk = _host.disks.emplace_back();
    disk.name = name;
    disk.ssd = ssd;
    disk.bytes = diskBytes;
    if (edit) {
      edit(disk);
    }
    return *this;
  }
  HostBuilder& WithSsd(const std::string& name) { return WithDisk(name, true); }
  HostBuilder& WithHdd(const std::string& name) { return WithDisk(name, false); }
  HostBuilder& WithHdds(const std::vector<std::string>& names) {
    for (const std::string& name : names) {
      WithHdd(name);
    }
    return *this;
  }
  HostBuilder& WithCapacityFlash(const std::string& name) {
    return WithDisk(name, true, [](HostDisk& disk) { disk.capacityFlash = true; });
  }

  // A mounted group of disks that were added before; each gets the KOVA UUID "uuid-of-NAME".
  HostBuilder& WithGroup(const std::string& ssd, const std::vector<std::string>& capacity,
                         const std::function<void(HostGroup&)>& edit = {}) {
    HostGroup& group = _host.groups.emplace_back();
    group.ssd = ssd;
    group.capacity = capacity;
    if (edit) {
      edit(group);
    }
    for (HostDisk& disk : _host.disks) {
      const bool isMember =
          disk.name == ssd || std::find(capacity.begin(), capacity.end(), disk.name) != capacity.end();
      if (isMember) {
        disk.kovaUuid = "uuid-of-" + disk.name;
        disk.formatVersion = group.formatVersion;
      }
    }
    return *this;
  }
  HostBuilder& WithUnmountedGroup(const std::string& ssd, const std::vector<std::string>& capacity) {
    return WithGroup(ssd, capacity, [](HostGroup& group) { group.mounted = false; });
  }

  // The device of a disk that was added before has left.
  HostBuilder& Without(const std::string& name) {
    return Edit([&name](HostDescription& host) {
      for (HostDisk& disk : host.disks) {
        disk.absent = disk.absent || disk.name == name;
      }
    });
  }

  HostBuilder& Edit(const std::function<void(HostDescription&)>& edit) {
    edit(_host);
    return *this;
  }

  HostDescription Build() const { return _host; }

 private:
  HostDescription _host;
};

inline HostBuilder AHost() {
  return {};
}

}  // namespace OtxCtl::Sim
