// A provider whose disks go by other names, so that hosts that cannot choose the names of their disks keep
// the contract with those that a description gives.
//
// Names are exchanged in both directions, in inputs, records, groups and exceptions; KOVA UUIDs are not. A
// name that is not in the table stays as it is when it goes down; a disk that is not in it is not shown.
#pragma once

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "otxctl/provider/ForwardingProvider.h"

namespace OtxCtl::Contract {

struct RenamedDisk {
  std::string given;     // by the description
  std::string real;      // on the host
  std::string kovaUuid;  // that it has from the start; what a disk that leaves is known by
};

// Never changed once made.
class DiskNames {
 public:
  // The disks of a description in its order, and the names of the host's disks in the host's.
  DiskNames(std::vector<RenamedDisk> disks, const std::vector<std::string>& hostOrder);

  // The host's name of a disk; a name that no disk was given stays.
  std::string ToReal(const std::string& given) const;
  std::vector<std::string> ToReal(const std::vector<std::string>& given) const;
  std::optional<std::string> ToGiven(const std::string& real) const;

  // Puts records that stand in the host's order into the description's. Any other order is a fault of the
  // host, which the tests are to see: records then stay as they are. Expects names that have been given.
  void Order(std::vector<HostCtl::Kova::DiskResult>& records) const;

 private:
  std::size_t Find(const HostCtl::Kova::DiskResult& record) const;

  std::vector<RenamedDisk> _disks;
  std::vector<std::size_t> _hostPlace;  // of the disks, and one more: of a disk that is none of them
  std::map<std::string, std::size_t> _byGiven;
  std::map<std::string, std::size_t> _byReal;
};

class RenamingProvider final : public Provider::ForwardingProvider {
 public:
  RenamingProvider(std::shared_ptr<HostCtl::Kova::KovaInfo> target, std::shared_ptr<const DiskNames> names);

  void QueryDisks(const std::vector<std::string>& names, std::vector<HostCtl::Kova::DiskResult>& results,
                  bool flag) override;
  void GetDiskMappings(std::vector<HostCtl::Kova::DiskMapping>& mappings, bool withUnmounted) override;
  void FormatDiskMapping(const std::string& ssd, const std::vector<std::string>& capacityDisks,
                         const HostCtl::Kova::FormatContext& context) override;
  void RestampDiskMapping(const std::string& ssd, const std::vector<std::string>& capacityDisks) override;
  void MountDiskMapping(const std::string& ssd, bool flag) override;
  void RemoveDisk(const std::string& disk, const std::string& passThrough,
                  const HostCtl::Kova::RemovalOptions& options) override;
  void RemoveDiskMapping(const std::string& ssd, const std::string& passThrough,
                         const HostCtl::Kova::RemovalOptions& options) override;
  void UnmountDiskMapping(const std::string& ssd) override;

 protected:
  // An exception that names a disk is thrown anew, of the same class, with the name that was given.
  void AroundCall(const Provider::ProviderCall& call, const Forward& forward) override;

 private:
  const std::shared_ptr<const DiskNames> _names;
};

}  // namespace OtxCtl::Contract
