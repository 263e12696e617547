#include "tests/support/RandomHosts.h"

#include <algorithm>

namespace TestSupport {

using HostCtl::Kova::DiskMapping;
using HostCtl::Kova::DiskReason;
using HostCtl::Kova::DiskResult;
using HostCtl::Kova::DiskState;
using Nox::Host::ScsiDisk;
using Tessa::Ref;

namespace {

Disks Pick(const RandomHost& host, const std::vector<int>& positions) {
  Disks disks;
  for (const int position : positions) {
    disks.push_back(host.pool[static_cast<std::size_t>(position)]);
  }
  return disks;
}

std::string FlaggedText(const Ref<ScsiDisk>& disk) {
  std::string text = DiskText(disk.Get());
  if (disk) {
    text += !disk->HasSsd() ? "?" : disk->GetSsd() ? "*" : "";
  }
  return text;
}

std::string KernelText(const HostCtl::Kova::DiskMapping& group) {
  std::string text =
      group.ssd.deviceName + (group.allFlash ? " flash" : "") + (group.thirdFlag ? " busy" : "") + ":";
  for (const HostCtl::Kova::DiskName& disk : group.capacityDisks) {
    text += " " + disk.deviceName + "/" + disk.kovaUuid;
  }
  return text;
}

}  // namespace

Disks RandomHost::Candidates() const {
  return Pick(*this, candidates);
}

Disks RandomHost::Inventory() const {
  Disks disks = Pick(*this, inventory);
  std::erase(disks, Ref<ScsiDisk>());
  return disks;
}

std::ostream& operator<<(std::ostream& out, const RandomHost& host) {
  const auto write = [&](const char* title, const std::vector<int>& disks) {
    out << title;
    for (const int disk : disks) {
      out << " #" << disk << "=" << FlaggedText(host.pool[static_cast<std::size_t>(disk)]);
    }
  };
  write("inventory", host.inventory);
  write("\ncandidates", host.candidates);
  out << "\nrecords";
  for (const HostCtl::Kova::DiskResult& record : host.records) {
    out << " " << record.name << (record.isSsd ? "*" : "") << (record.capacityFlash ? "c" : "") << "/"
        << static_cast<int>(record.state) << "/" << static_cast<int>(record.reason);
  }
  for (const HostCtl::Kova::DiskMapping& group : host.mounted) {
    out << "\nmounted " << KernelText(group);
  }
  for (const HostCtl::Kova::DiskMapping& group : host.unmounted) {
    out << "\nunmounted " << KernelText(group);
  }
  return out << "\nall flash " << host.allFlash << ", kernel fails " << host.kernelFails;
}

RandomHost HostDraw::Next() {
  RandomHost host;
  _oddities = Chance(3);
  const int disks = 2 + Below(24);
  for (int disk = 0; disk < disks; ++disk) {
    host.pool.push_back(Disk(disk));
  }
  host.inventory = Positions(disks, Below(disks + 1));
  host.candidates = Positions(disks, Chance(2) ? disks : Below(disks + 1));
  for (int left = Below(12); left > 0; --left) {
    host.records.push_back(Record(host));
  }
  for (int left = Below(7); left > 0; --left) {
    (Chance(3) ? host.unmounted : host.mounted).push_back(Group(host));
  }
  host.allFlash = Chance(2);
  host.kernelFails = Chance(8);
  return host;
}

Ref<ScsiDisk> HostDraw::Disk(int number) {
  if (Odd(40)) {
    return nullptr;
  }
  AScsiDisk disk(Chance(2) ? "n" + std::to_string(number) : Name());
  if (Odd(20)) {
    disk.Unnamed();
  }
  disk.Ssd(Odd(40) ? std::optional<bool>() : std::optional<bool>(Chance(3)));
  return disk;
}

std::vector<int> HostDraw::Positions(int disks, int count) {
  std::vector<int> all;
  for (int position = 0; position < disks; ++position) {
    all.push_back(position);
  }
  std::shuffle(all.begin(), all.end(), _random);
  all.resize(static_cast<std::size_t>(count));
  if (count > 0 && Odd(2)) {
    all.push_back(all.front());  // one object twice
  }
  return all;
}

// Mostly a disk of the host, and now and then one that nobody knows.
std::string HostDraw::NameIn(const RandomHost& host) {
  const Ref<ScsiDisk>& disk = host.pool[static_cast<std::size_t>(Below(static_cast<int>(host.pool.size())))];
  return disk && disk->HasCanonicalName() && !Chance(4) ? disk->GetCanonicalName() : Name();
}

DiskResult HostDraw::Record(const RandomHost& host) {
  DiskResult record = ARecord(NameIn(host));
  record.state = Chance(3) ? DiskState::Ineligible : DiskState::Eligible;
  record.reason = Chance(3) ? DiskReason::GroupNotMounted : DiskReason::None;
  record.isSsd = !Chance(3);
  record.capacityFlash = Chance(3);
  return record;
}

DiskMapping HostDraw::Group(const RandomHost& host) {
  const bool isOfRecord = !host.records.empty() && Chance(2);
  DiskMapping group = AGroup(
      isOfRecord ? host.records[static_cast<std::size_t>(Below(static_cast<int>(host.records.size())))].name
                 : NameIn(host),
      {});
  const int disks = Chance(2) ? Below(4) : Below(9);
  for (int left = disks; left > 0; --left) {
    group.capacityDisks.push_back({.deviceName = Name(), .kovaUuid = std::to_string(Below(3))});
  }
  group.allFlash = Chance(2);
  group.thirdFlag = Chance(4);
  return group;
}

}  // namespace TestSupport
