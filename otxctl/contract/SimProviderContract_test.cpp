// The contract, kept by the simulated host: bare, saved after each change, behind a recorder, held to what
// providers may throw, and with disks that have other names, in another order and among others.
#include <algorithm>

#include "otxctl/contract/ProviderContract.h"
#include "otxctl/contract/RenamingProvider.h"
#include "otxctl/fault/RecordingProvider.h"
#include "otxctl/provider/StrictProvider.h"
#include "otxctl/sim/SimProvider.h"

namespace OtxCtl::Contract {
namespace {

class SimulatedHost : public ContractHost {
 public:
  explicit SimulatedHost(const Sim::HostDescription& host) : _host(std::make_shared<Sim::SimHost>(host)) {}

  std::unique_ptr<HostCtl::Kova::KovaInfo> NewProvider() override {
    return std::make_unique<Sim::SimProvider>(_host);
  }

  Sim::SimHost& Host() { return *_host; }

 private:
  std::shared_ptr<Sim::SimHost> _host;
};

class RecordedHost : public ContractHost {
 public:
  explicit RecordedHost(const Sim::HostDescription& host) : _host(host) {}

  std::unique_ptr<HostCtl::Kova::KovaInfo> NewProvider() override {
    return std::make_unique<Fault::RecordingProvider>(_host.NewProvider(), _recorder);
  }

 private:
  SimulatedHost _host;
  std::shared_ptr<Fault::CallRecorder> _recorder = std::make_shared<Fault::CallRecorder>();
};

class StrictHost : public ContractHost {
 public:
  explicit StrictHost(const Sim::HostDescription& host) : _host(host) {}

  std::unique_ptr<HostCtl::Kova::KovaInfo> NewProvider() override {
    return std::make_unique<Provider::StrictProvider>(_host.NewProvider());
  }

 private:
  SimulatedHost _host;
};

std::string RealName(const std::string& given) {
  return "real." + given;
}

// As the real host has it: other names, the last disk first, and one that the description knows nothing of.
Sim::HostDescription Disguised(Sim::HostDescription host) {
  for (Sim::HostDisk& disk : host.disks) {
    disk.name = RealName(disk.name);
  }
  std::reverse(host.disks.begin(), host.disks.end());
  Sim::HostDisk other;
  other.name = "other";
  host.disks.insert(host.disks.begin() + static_cast<std::ptrdiff_t>(host.disks.size() / 2), other);
  for (Sim::HostGroup& group : host.groups) {
    group.ssd = RealName(group.ssd);
    std::transform(group.capacity.begin(), group.capacity.end(), group.capacity.begin(), &RealName);
  }
  return host;
}

class RenamedHost : public ContractHost {
 public:
  explicit RenamedHost(const Sim::HostDescription& host) : _host(Disguised(host)) {
    std::vector<RenamedDisk> disks;
    for (const Sim::HostDisk& disk : host.disks) {
      disks.push_back({disk.name, RealName(disk.name), disk.kovaUuid});
    }
    std::vector<std::string> order;
    for (const Sim::HostDisk& disk : _host.Host().Snapshot().disks) {
      order.push_back(disk.name);
    }
    _names = std::make_shared<const DiskNames>(std::move(disks), order);
  }

  std::unique_ptr<HostCtl::Kova::KovaInfo> NewProvider() override {
    return std::make_unique<RenamingProvider>(_host.NewProvider(), _names);
  }

 private:
  SimulatedHost _host;
  std::shared_ptr<const DiskNames> _names;
};

ContractSubject Bare() {
  return {"Bare", [](const Sim::HostDescription& host) { return std::make_unique<SimulatedHost>(host); }, {}};
}

// With a saver the host takes another road through a change: on a copy.
ContractSubject Saved() {
  return {"Saved",
          [](const Sim::HostDescription& description) {
            auto host = std::make_unique<SimulatedHost>(description);
            host->Host().SetSaver(
                [](const Sim::HostDescription& changed) { Sim::CheckHostDescription(changed); });
            return host;
          },
          {}};
}

ContractSubject Recorded() {
  return {
      "Recorded", [](const Sim::HostDescription& host) { return std::make_unique<RecordedHost>(host); }, {}};
}

ContractSubject Strict() {
  return {"Strict", [](const Sim::HostDescription& host) { return std::make_unique<StrictHost>(host); }, {}};
}

ContractSubject Renamed() {
  return {
      "Renamed", [](const Sim::HostDescription& host) { return std::make_unique<RenamedHost>(host); }, {}};
}

INSTANTIATE_TEST_SUITE_P(Simulated, ProviderContract,
                         testing::Values(Bare(), Saved(), Recorded(), Strict(), Renamed()), SubjectName);

// What is not as the contract has it stays so under other names.
TEST(DiskNames, LeavesRecordsThatTheHostHasDisordered) {
  const DiskNames names({{"a", "1", "uuid"}, {"b", "2", ""}, {"c", "3", ""}}, {"3", "2", "1"});
  const auto order = [&names](const std::vector<HostCtl::Kova::DiskName>& disks) {
    std::vector<HostCtl::Kova::DiskResult> records;
    for (const HostCtl::Kova::DiskName& disk : disks) {
      records.emplace_back().name = disk.deviceName;
      records.back().kovaUuid = disk.kovaUuid;
    }
    names.Order(records);
    std::string inOrder;
    for (const HostCtl::Kova::DiskResult& record : records) {
      inOrder += record.name.empty() ? "-" : record.name;
    }
    return inOrder;
  };
  EXPECT_EQ(order({{"c", ""}, {"b", ""}, {"", "uuid"}}), "-bc");
  EXPECT_EQ(order({{"b", ""}, {"c", ""}, {"", "uuid"}}), "bc-");
  EXPECT_EQ(order({{"", "uuid"}, {"c", ""}, {"b", ""}}), "-cb");
}

}  // namespace
}  // namespace OtxCtl::Contract
