#include "tests/lab/contract/RealHost.h"

#include <algorithm>
#include <chrono>
#include <fstream>
#include <map>
#include <stdexcept>
#include <utility>

#include "otxctl/contract/RenamingProvider.h"
#include "otxctl/linux/BlkidProbe.h"
#include "otxctl/linux/Commands.h"
#include "otxctl/linux/DiskLocks.h"
#include "otxctl/linux/GroupChanges.h"
#include "otxctl/linux/GroupNames.h"
#include "otxctl/linux/LinuxHost.h"
#include "otxctl/linux/LinuxProvider.h"

namespace Lab {
namespace {

using HostCtl::Kova::DiskMapping;
using HostCtl::Kova::DiskName;
using OtxCtl::Contract::ContractHost;
using OtxCtl::Contract::DiskNames;
using OtxCtl::Contract::RenamedDisk;
using OtxCtl::Contract::RenamingProvider;
using OtxCtl::Linux::HostSettings;
using OtxCtl::Linux::LinuxHost;
using OtxCtl::Linux::LinuxProvider;
using OtxCtl::Linux::LinuxSnapshot;
using OtxCtl::Linux::ScannedDisk;
using OtxCtl::Sim::HostDescription;
using OtxCtl::Sim::HostDisk;
using OtxCtl::Sim::HostGroup;

// This machine, as a program that has just been started sees it.
class RealMachine {
 public:
  explicit RealMachine(const HostSettings& settings = {}) : _host(MakeHost(settings)) {
    OtxCtl::Linux::ChangeTools tools;
    tools.commands = std::make_unique<OtxCtl::Linux::SystemCommands>(std::chrono::minutes(10));
    tools.locks = std::make_unique<OtxCtl::Linux::DeviceFileLocks>(_host->GetOptions().paths);
    _changes = std::make_shared<OtxCtl::Linux::GroupChanges>(_host, std::move(tools));
  }

  std::shared_ptr<const LinuxSnapshot> Look() const { return _host->Look(); }
  std::shared_ptr<LinuxProvider> MakeProvider() const {
    return std::make_shared<LinuxProvider>(_host, _changes);
  }

 private:
  static std::shared_ptr<LinuxHost> MakeHost(const HostSettings& settings) {
    OtxCtl::Linux::LinuxHostOptions options;
    std::ifstream("/etc/machine-id") >> options.machineId;
    options.stateFolder = LabMachine::stateFolder;
    options.readSettings = [settings] { return settings; };
    return std::make_shared<LinuxHost>(std::move(options), std::make_unique<OtxCtl::Linux::BlkidProbe>(),
                                       std::make_unique<OtxCtl::Linux::SystemCommands>());
  }

  std::shared_ptr<LinuxHost> _host;
  std::shared_ptr<OtxCtl::Linux::GroupChanges> _changes;
};

// Parts of a description that no real disk can be made to show.
void RefuseTheImpossible(const HostDescription& host) {
  bool isPossible = host.otherLuns.empty() && host.faults.empty() &&
                    host.storageSystem == OtxCtl::Sim::StorageSystem::Present;
  for (const HostDisk& disk : host.disks) {
    isPossible = isPossible && !disk.verdict && disk.inInventory && disk.inKernel;
  }
  for (const HostGroup& group : host.groups) {
    isPossible =
        isPossible && !group.allFlash && !group.busy && group.formatVersion == HostGroup().formatVersion;
  }
  if (!isPossible) {
    throw std::runtime_error("this description cannot be followed by real disks");
  }
}

std::string KindOf(const HostDisk& disk, std::int64_t minimumBytes) {
  if (!disk.local) {
    return "remote";
  }
  if (disk.transport) {
    return *disk.transport;
  }
  if (disk.bytes < minimumBytes) {
    return "tiny";
  }
  return disk.ssd ? "flash" : "hdd";
}

class HostMaker {
 public:
  HostMaker(const LabMachine& machine, const HostDescription& host)
      : _machine(machine), _host(host), _seen(RealMachine().Look()) {}

  std::unique_ptr<ContractHost> Make();

 private:
  void ChooseDisks();
  const ScannedDisk& TakeDisk(const std::string& kind);
  const ScannedDisk& RealDisk(const std::string& given) const { return *_realOf.at(given); }
  void MakePartitions();
  void MakeGroup(const HostGroup& group);
  void TakeDisksAway();
  HostSettings Settings() const;

  const LabMachine& _machine;
  const HostDescription& _host;
  const std::shared_ptr<const LinuxSnapshot> _seen;
  std::map<std::string, std::size_t> _taken;  // how many, by kind
  std::map<std::string, const ScannedDisk*> _realOf;
};

const ScannedDisk& HostMaker::TakeDisk(const std::string& kind) {
  const std::vector<std::string>& serials = _machine.DisksOf(kind);
  const std::size_t number = _taken[kind]++;
  if (number >= serials.size()) {
    throw std::runtime_error("the machine has " + std::to_string(serials.size()) + " disks of the kind " +
                             kind);
  }
  for (const ScannedDisk& disk : _seen->disks) {
    const auto& identity = disk.facts.identity;
    if (identity.IsKnown() && identity.Get().serial == serials[number]) {
      return disk;
    }
  }
  throw std::runtime_error("no disk has the serial number " + serials[number]);
}

void HostMaker::ChooseDisks() {
  for (const HostDisk& disk : _host.disks) {
    _realOf[disk.name] = &TakeDisk(KindOf(disk, _host.minimumDiskBytes));
  }
}

void HostMaker::MakePartitions() {
  for (const HostDisk& disk : _host.disks) {
    if (disk.partitions > 0) {
      std::string lines = "label: gpt\\n";
      for (int number = 0; number < disk.partitions; ++number) {
        lines += "size=16MiB\\n";
      }
      Shell("printf '" + lines + "' | sfdisk -q " + RealDisk(disk.name).deviceNode + " && udevadm settle");
    }
  }
}

// The volume group's description of itself, with other UUIDs: they are written in tags, and in short in
// names.
std::string RewritingOf(const std::vector<std::pair<std::string, std::string>>& uuids) {
  std::string script;
  for (const auto& [before, after] : uuids) {
    script += "s/" + before + "/" + after + "/g;s/" + OtxCtl::Linux::DataVolumeName(before) + "/" +
              OtxCtl::Linux::DataVolumeName(after) + "/g;";
  }
  return script;
}

void HostMaker::MakeGroup(const HostGroup& group) {
  const std::string ssd = RealDisk(group.ssd).facts.canonicalName;
  std::vector<std::string> capacity;
  for (const std::string& name : group.capacity) {
    capacity.push_back(RealDisk(name).facts.canonicalName);
  }
  const auto provider = RealMachine().MakeProvider();
  provider->FormatDiskMapping(ssd, capacity, {});
  std::vector<DiskMapping> groups;
  provider->GetDiskMappings(groups, true);
  const DiskMapping& made = groups.back();
  provider->UnmountDiskMapping(ssd);
  std::vector<std::pair<std::string, std::string>> uuids;
  const auto giveUuid = [&](const std::string& given, const DiskName& disk) {
    const auto described = std::find_if(_host.disks.begin(), _host.disks.end(),
                                        [&given](const HostDisk& one) { return one.name == given; });
    uuids.emplace_back(disk.kovaUuid, described->kovaUuid);
  };
  giveUuid(group.ssd, made.ssd);
  for (std::size_t index = 0; index < group.capacity.size(); ++index) {
    giveUuid(group.capacity[index], made.capacityDisks.at(index));
  }
  Shell("set -e; name=$(lvm pvs --noheadings -o vg_name " + RealDisk(group.ssd).deviceNode +
        " | tr -d ' '); lvm vgcfgbackup -q -f /run/group $name >&2; sed -i '" + RewritingOf(uuids) +
        "' /run/group; lvm vgcfgrestore -q -y -f /run/group $name >&2");
  if (group.mounted) {
    RealMachine().MakeProvider()->MountDiskMapping(ssd, false);
  }
}

void HostMaker::TakeDisksAway() {
  std::string script = "set -e\n";
  for (const HostDisk& disk : _host.disks) {
    if (disk.absent) {
      const std::string name = RealDisk(disk.name).facts.kernelName;
      script += "echo 1 >/sys/block/" + name + "/device/delete\nwhile [ -e /sys/block/" + name +
                " ]; do sleep 0.05; done\n";
    }
  }
  Shell(script + "udevadm settle --timeout=30");
}

HostSettings HostMaker::Settings() const {
  HostSettings settings;
  settings.minimumDiskBytes = _host.minimumDiskBytes;
  settings.isAutoMode = _host.autoMode;
  settings.isInCluster = _host.cluster.enabled;
  settings.clusterUuid = _host.cluster.clusterUuid;
  settings.nodeUuid = _host.cluster.nodeUuid;
  settings.faultDomain = _host.faultDomain;
  for (const OtxCtl::Sim::HostNetwork& network : _host.networks) {
    settings.nics.push_back({network.interface, network.masterMulticastGroup, network.agentMulticastGroup});
  }
  for (const HostDisk& disk : _host.disks) {
    if (disk.capacityFlash) {
      settings.capacityFlash.insert(RealDisk(disk.name).facts.canonicalName);
    }
  }
  return settings;
}

class RealHost final : public ContractHost {
 public:
  RealHost(const HostSettings& settings, std::shared_ptr<const DiskNames> names)
      : _machine(settings), _names(std::move(names)) {}

  std::unique_ptr<HostCtl::Kova::KovaInfo> NewProvider() override {
    return std::make_unique<RenamingProvider>(_machine.MakeProvider(), _names);
  }

 private:
  const RealMachine _machine;
  const std::shared_ptr<const DiskNames> _names;
};

std::unique_ptr<ContractHost> HostMaker::Make() {
  RefuseTheImpossible(_host);
  ChooseDisks();
  MakePartitions();
  for (const HostGroup& group : _host.groups) {
    MakeGroup(group);
  }
  TakeDisksAway();
  std::vector<RenamedDisk> disks;
  for (const HostDisk& disk : _host.disks) {
    disks.push_back({disk.name, RealDisk(disk.name).facts.canonicalName, disk.kovaUuid});
  }
  std::vector<std::string> order;
  for (const ScannedDisk& disk : _seen->disks) {
    order.push_back(disk.facts.canonicalName);
  }
  return std::make_unique<RealHost>(Settings(), std::make_shared<const DiskNames>(std::move(disks), order));
}

}  // namespace

std::unique_ptr<ContractHost> MakeRealHost(const LabMachine& machine, const HostDescription& host) {
  machine.Restore();
  return HostMaker(machine, host).Make();
}

}  // namespace Lab
