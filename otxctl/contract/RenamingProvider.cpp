#include "otxctl/contract/RenamingProvider.h"

#include <algorithm>
#include <utility>

#include "kova/agentd/include/HostCtlException.h"
#include "otxctl/provider/NamedException.h"

namespace OtxCtl::Contract {

using HostCtl::Kova::DiskMapping;
using HostCtl::Kova::DiskName;
using HostCtl::Kova::DiskResult;
using HostCtl::Kova::FormatContext;
using HostCtl::Kova::RemovalOptions;

DiskNames::DiskNames(std::vector<RenamedDisk> disks, const std::vector<std::string>& hostOrder)
    : _disks(std::move(disks)) {
  for (std::size_t index = 0; index < _disks.size(); ++index) {
    _byGiven.emplace(_disks[index].given, index);
    _byReal.emplace(_disks[index].real, index);
    const auto place = std::find(hostOrder.begin(), hostOrder.end(), _disks[index].real);
    _hostPlace.push_back(static_cast<std::size_t>(place - hostOrder.begin()));
  }
  _hostPlace.push_back(hostOrder.size());
}

std::string DiskNames::ToReal(const std::string& given) const {
  const auto found = _byGiven.find(given);
  return found == _byGiven.end() ? given : _disks[found->second].real;
}

std::vector<std::string> DiskNames::ToReal(const std::vector<std::string>& given) const {
  std::vector<std::string> real;
  real.reserve(given.size());
  for (const std::string& name : given) {
    real.push_back(ToReal(name));
  }
  return real;
}

std::optional<std::string> DiskNames::ToGiven(const std::string& real) const {
  const auto found = _byReal.find(real);
  return found == _byReal.end() ? std::nullopt : std::optional(_disks[found->second].given);
}

// Its place in the description; of no disk of that, the one behind the last.
std::size_t DiskNames::Find(const DiskResult& record) const {
  const auto found = std::find_if(_disks.begin(), _disks.end(), [&record](const RenamedDisk& disk) {
    return record.name.empty() ? !record.kovaUuid.empty() && disk.kovaUuid == record.kovaUuid
                               : disk.given == record.name;
  });
  return static_cast<std::size_t>(found - _disks.begin());
}

void DiskNames::Order(std::vector<DiskResult>& records) const {
  const auto comesFirst = [this](const DiskResult& one, const DiskResult& other) {
    return _hostPlace[Find(one)] < _hostPlace[Find(other)];
  };
  if (!std::is_sorted(records.begin(), records.end(), comesFirst)) {
    return;
  }
  std::stable_sort(records.begin(), records.end(), [this](const DiskResult& one, const DiskResult& other) {
    return Find(one) < Find(other);
  });
}

RenamingProvider::RenamingProvider(std::shared_ptr<HostCtl::Kova::KovaInfo> target,
                                   std::shared_ptr<const DiskNames> names)
    : ForwardingProvider(std::move(target)), _names(std::move(names)) {}

void RenamingProvider::AroundCall(const Provider::ProviderCall&, const Forward& forward) {
  try {
    forward();
  } catch (const HostCtl::Lib::KovaStorageException& refusal) {
    const auto given = _names->ToGiven(refusal.GetDiskName());
    if (!given) {
      throw;
    }
    Provider::ThrowNamed(Provider::ExceptionName(refusal), refusal.Describe(), *given);
  }
}

void RenamingProvider::QueryDisks(const std::vector<std::string>& names, std::vector<DiskResult>& results,
                                  bool flag) {
  std::vector<DiskResult> found;
  ForwardingProvider::QueryDisks(_names->ToReal(names), found, flag);
  std::vector<DiskResult> shown;
  for (DiskResult& record : found) {
    // One that has left has no name on any host.
    const auto given = record.name.empty() ? std::optional<std::string>("") : _names->ToGiven(record.name);
    if (given) {
      record.name = *given;
      shown.push_back(std::move(record));
    }
  }
  _names->Order(shown);
  results.insert(results.end(), shown.begin(), shown.end());
}

void RenamingProvider::GetDiskMappings(std::vector<DiskMapping>& mappings, bool withUnmounted) {
  std::vector<DiskMapping> found;
  ForwardingProvider::GetDiskMappings(found, withUnmounted);
  const auto rename = [this](DiskName& disk) {
    disk.deviceName = _names->ToGiven(disk.deviceName).value_or(disk.deviceName);
  };
  for (DiskMapping& mapping : found) {
    rename(mapping.ssd);
    std::for_each(mapping.capacityDisks.begin(), mapping.capacityDisks.end(), rename);
    mappings.push_back(std::move(mapping));
  }
}

void RenamingProvider::FormatDiskMapping(const std::string& ssd,
                                         const std::vector<std::string>& capacityDisks,
                                         const FormatContext& context) {
  ForwardingProvider::FormatDiskMapping(_names->ToReal(ssd), _names->ToReal(capacityDisks), context);
}

void RenamingProvider::RestampDiskMapping(const std::string& ssd,
                                          const std::vector<std::string>& capacityDisks) {
  ForwardingProvider::RestampDiskMapping(_names->ToReal(ssd), _names->ToReal(capacityDisks));
}

void RenamingProvider::MountDiskMapping(const std::string& ssd, bool flag) {
  ForwardingProvider::MountDiskMapping(_names->ToReal(ssd), flag);
}

void RenamingProvider::RemoveDisk(const std::string& disk, const std::string& passThrough,
                                  const RemovalOptions& options) {
  ForwardingProvider::RemoveDisk(_names->ToReal(disk), passThrough, options);
}

void RenamingProvider::RemoveDiskMapping(const std::string& ssd, const std::string& passThrough,
                                         const RemovalOptions& options) {
  ForwardingProvider::RemoveDiskMapping(_names->ToReal(ssd), passThrough, options);
}

void RenamingProvider::UnmountDiskMapping(const std::string& ssd) {
  ForwardingProvider::UnmountDiskMapping(_names->ToReal(ssd));
}

}  // namespace OtxCtl::Contract
