#include "tests/integration/SequenceDraw.h"

#include <algorithm>
#include <array>
#include <ostream>
#include <random>

#include "otxctl/sim/HostBuilder.h"

namespace Integration {

using OtxCtl::Sim::HostBuilder;
using OtxCtl::Sim::HostDescription;
using OtxCtl::Sim::HostDisk;
using OtxCtl::Sim::HostGroup;
using OtxCtl::Sim::HostVerdict;
using Names = std::vector<std::string>;

namespace {

constexpr std::array<const char*, 10> eventNames = {"leaves",
                                                    "returns",
                                                    "is partitioned",
                                                    "is cleaned",
                                                    "is listed no more",
                                                    "is listed",
                                                    "is tagged for capacity",
                                                    "is tagged no more",
                                                    "switches the automatic mode",
                                                    "holds its group back"};

bool ShareADisk(const NamedGroup& left, const NamedGroup& right) {
  Names all = left.capacity;
  all.push_back(left.ssd);
  const auto isAmongAll = [&](const std::string& disk) {
    return std::find(all.begin(), all.end(), disk) != all.end();
  };
  return isAmongAll(right.ssd) || std::any_of(right.capacity.begin(), right.capacity.end(), isAmongAll);
}

}  // namespace

void Apply(const HostChange& change, HostDescription& host) {
  for (HostDisk& disk : host.disks) {
    if (disk.name != change.disk) {
      continue;
    }
    switch (change.event) {
      case Event::DiskLeaves:
      case Event::DiskReturns:
        disk.absent = change.event == Event::DiskLeaves;
        break;
      case Event::Partitioned:
      case Event::Cleaned:
        disk.partitions = change.event == Event::Partitioned ? 2 : 0;
        break;
      case Event::Unlisted:
      case Event::Listed:
        disk.inInventory = change.event == Event::Listed;
        break;
      case Event::Tagged:
      case Event::Untagged:
        disk.capacityFlash = change.event == Event::Tagged;
        break;
      case Event::AutoMode:
        host.autoMode = !host.autoMode;
        break;
      case Event::Busy:
        for (HostGroup& group : host.groups) {
          group.busy = group.ssd == disk.name ? !group.busy : group.busy;
        }
        break;
    }
  }
}

std::ostream& operator<<(std::ostream& out, const Step& step) {
  if (step.change) {
    out << "(" << step.change->disk << " " << eventNames[static_cast<std::size_t>(step.change->event)]
        << ") ";
  }
  out << step.request;
  if (step.fault) {
    out << " (call " << step.fault->call << " of " << step.fault->operation << " throws "
        << step.fault->exception.name << ")";
  }
  return out;
}

HostDescription SequenceDraw::Host() {
  HostBuilder host;
  host.Edit([](HostDescription& description) { description.name = "model"; });
  Names ssds;
  Names others;
  const int disks = Chance(4) ? 24 : 4 + Below(12);
  for (int number = 1; number <= disks; ++number) {
    const std::string name = "d" + std::to_string(number);
    const bool ssd = Chance(3);
    const bool tagged = Chance(4) && (ssd || Chance(6));
    const bool usb = Chance(20);
    // Eligible, but too small; eligible, but of an unmounted group; ineligible for no reason; in use by
    // nobody.
    constexpr std::array<HostVerdict, 4> odd = {{{1, 5}, {1, 6}, {2, 0}, {0, 0}}};
    const bool isOdd = Chance(20);
    host.WithDisk(name, ssd, [&](HostDisk& disk) {
      disk.capacityFlash = tagged;
      disk.partitions = Chance(15) ? 1 : 0;
      disk.transport = usb ? std::optional<std::string>("usb") : std::nullopt;
      disk.verdict = isOdd ? std::optional<HostVerdict>(Pick(odd)) : std::nullopt;
    });
    (ssd && !tagged ? ssds : others).push_back(name);
  }
  for (int groups = Chance(3) ? 5 : Below(3); groups > 0 && !ssds.empty() && !others.empty(); --groups) {
    Names capacity;
    for (int left = 1 + Below(Chance(4) ? 7 : 3); left > 0 && !others.empty(); --left) {
      capacity.push_back(others.back());
      others.pop_back();
    }
    const bool mounted = !Chance(3);
    const bool allFlash = Chance(4);
    host.WithGroup(ssds.back(), capacity, [&](HostGroup& group) {
      group.mounted = mounted;
      group.allFlash = allFlash;
    });
    ssds.pop_back();
  }
  // As long as those that the kernel gives.
  return host
      .Edit([](HostDescription& description) {
        for (std::size_t index = 0; index < description.disks.size(); ++index) {
          if (!description.disks[index].kovaUuid.empty()) {
            const std::string number = std::to_string(100 + index);
            description.disks[index].kovaUuid = "00000000-0000-0000-0000-000000000" + number;
          }
        }
      })
      .Build();
}

Step SequenceDraw::Next(const HostModel& model) {
  Step step;
  HostModel changed = model;
  if (Chance(4)) {
    step.change = Change(model.Host());
    changed.Change([&](HostDescription& host) { Apply(*step.change, host); });
  }
  if (Chance(5)) {
    step.fault = Fault();
  }
  step.request = AnyRequest(changed);
  return step;
}

HostChange SequenceDraw::Change(const HostDescription& host) {
  const HostDisk& disk = Pick(host.disks);
  const bool isMember = std::any_of(host.groups.begin(), host.groups.end(), [&](const HostGroup& group) {
    return group.ssd == disk.name ||
           std::find(group.capacity.begin(), group.capacity.end(), disk.name) != group.capacity.end();
  });
  switch (Below(8)) {
    case 0:
    case 1:
    case 2:
      return {disk.absent ? Event::DiskReturns : Event::DiskLeaves, disk.name};
    case 3:
      return {disk.partitions > 0 || isMember ? Event::Cleaned : Event::Partitioned, disk.name};
    case 4:
      return {disk.inInventory && Chance(2) ? Event::Unlisted : Event::Listed, disk.name};
    case 5:
      return {disk.capacityFlash ? Event::Untagged
              : disk.ssd         ? Event::Tagged
                                 : Event::DiskReturns,
              disk.name};
    case 6:
      return {host.autoMode || Chance(3) ? Event::AutoMode : Event::DiskReturns, disk.name};
    default:
      return {Event::Busy, disk.name};
  }
}

InjectedFault SequenceDraw::Fault() {
  static const Names operations = {"RefreshKovaInfo",
                                   "QueryDisks",
                                   "GetDiskMappings",
                                   "FormatDiskMapping",
                                   "FormatDiskMapping",
                                   "RestampDiskMapping",
                                   "MountDiskMapping",
                                   "RestampDiskMappingByUuid",
                                   "RemoveDisk",
                                   "RemoveDiskMapping",
                                   "RemoveDiskByUuid",
                                   "UnmountDiskMapping",
                                   "ClaimUnmountedDiskgroups"};
  return {Pick(operations), Chance(2) ? 1 : 1 + Below(4), Pick(kernelExceptions)};
}

Names SequenceDraw::SomeDisks(const HostModel& model, int oneIn) {
  Names names;
  for (const HostDisk& disk : model.Host().disks) {
    if (oneIn == 1 || Chance(oneIn)) {
      names.push_back(model.RequestName(disk.name));
    }
  }
  std::shuffle(names.begin(), names.end(), _random);
  if (!names.empty() && Chance(10)) {
    names.insert(names.begin() + Below(names.size() + 1), Pick(names));  // one twice, now and then neighbours
  }
  if (Chance(12)) {
    names.push_back("nobody");
  }
  return names;
}

NamedGroup SequenceDraw::NewGroup(const HostModel& model) {
  Names ssds;
  Names others;
  for (const HostDisk& disk : model.Host().disks) {
    (disk.ssd && !disk.capacityFlash ? ssds : others).push_back(model.RequestName(disk.name));
  }
  std::shuffle(others.begin(), others.end(), _random);
  const int count = Chance(12) ? Below(10) : 1 + Below(3);
  others.resize(std::min(others.size(), static_cast<std::size_t>(count)));
  const std::string ssd = ssds.empty() || Chance(12) ? Pick(model.Host().disks).name : Pick(ssds);
  return {ssd, others};
}

NamedGroup SequenceDraw::KnownGroup(const HostModel& model) {
  if (model.Host().groups.empty() || Chance(8)) {
    return NewGroup(model);
  }
  const HostGroup& known = Pick(model.Host().groups);
  NamedGroup group = {model.RequestName(known.ssd), {}};
  for (const std::string& disk : known.capacity) {
    group.capacity.push_back(model.RequestName(disk));
  }
  if (Chance(10)) {
    group.capacity.pop_back();
  }
  std::shuffle(group.capacity.begin(), group.capacity.end(), _random);
  return group;
}

Request SequenceDraw::AnyRequest(const HostModel& model) {
  const auto groups = [&](auto draw) {
    std::vector<NamedGroup> drawn;
    for (int left = Chance(20) ? 0 : 1 + Below(3); left > 0; --left) {
      const NamedGroup group = (this->*draw)(model);
      const bool isShared = std::any_of(drawn.begin(), drawn.end(),
                                        [&](const NamedGroup& other) { return ShareADisk(group, other); });
      if (!isShared || Chance(10)) {
        drawn.push_back(group);
      }
    }
    return drawn;
  };
  switch (Below(16)) {
    case 0:
    case 1:
    case 2:
      return {Operation::AddDisks, SomeDisks(model, 1 + Below(3)), {}};
    case 3:
      return {Operation::AddAllEligibleDisks, {}, {}};
    case 4:
    case 5:
    case 6:
      return {Operation::InitializeDisks, {}, groups(&SequenceDraw::NewGroup)};
    case 7:
      return {Operation::InitializeDisks, {}, groups(&SequenceDraw::KnownGroup)};
    case 8:
    case 9:
      return {Operation::RemoveDisk,
              {Chance(15) ? "kova:short" : model.RequestName(Pick(model.Host().disks).name)},
              {}};
    case 10:
    case 11:
      return {Operation::RemoveDiskMapping, {}, {KnownGroup(model)}};
    case 12:
    case 13:
      return {Operation::UnmountDiskMapping, {}, groups(&SequenceDraw::KnownGroup)};
    case 14:
      return {Operation::ClaimUnmountedDiskgroup, {}, {}};
    default:
      return {Operation::QueryDisksForKova, Chance(2) ? Names() : SomeDisks(model, 3), {}};
  }
}

}  // namespace Integration
