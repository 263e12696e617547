#include "otxctl/contract/ProviderContract.h"

namespace OtxCtl::Contract {

using HostCtl::Kova::DiskMapping;
using HostCtl::Kova::DiskResult;

std::string SubjectName(const testing::TestParamInfo<ContractSubject>& info) {
  return info.param.name;
}

void PrintTo(const ContractSubject& subject, std::ostream* out) {
  *out << subject.name;
}

std::vector<std::string> NamesOf(const DiskMapping& group) {
  std::vector<std::string> names = {group.ssd.deviceName};
  for (const HostCtl::Kova::DiskName& disk : group.capacityDisks) {
    names.push_back(disk.deviceName);
  }
  return names;
}

void ProviderContract::Start(const Sim::HostBuilder& host) {
  _provider.reset();
  _host = GetParam().makeHost(host.Build());
  _provider = _host->NewProvider();
}

HostState ProviderContract::State() {
  return {Query(), Groups()};
}

std::vector<DiskResult> ProviderContract::Query(const Names& names) {
  std::vector<DiskResult> records;
  Provider().QueryDisks(names, records, false);
  return records;
}

DiskResult ProviderContract::RecordOf(const std::string& disk) {
  const std::vector<DiskResult> records = Query({disk});
  EXPECT_EQ(records.size(), 1U) << "records of " << disk;
  return records.empty() ? DiskResult() : records.front();
}

std::vector<DiskMapping> ProviderContract::Groups(bool withUnmounted) {
  std::vector<DiskMapping> groups;
  Provider().GetDiskMappings(groups, withUnmounted);
  return groups;
}

void ProviderContract::Format(const std::string& ssd, const Names& capacity) {
  Provider().FormatDiskMapping(ssd, capacity, {"tag", 1, 0});
}

}  // namespace OtxCtl::Contract
