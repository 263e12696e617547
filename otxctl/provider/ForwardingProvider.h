// A provider that hands every call on to another one, through one place: the base of every provider that
// does something around calls, whatever the operation is, and of fakes that answer only a few.
//
// Threads: safe from any thread if the target and the override of AroundCall are. Ownership: the target lives
// at least as long as its forwarding provider. Errors: what the target throws passes unchanged.
//
// A new operation of the kernel has its two lines here, and its name in OperationNames.h; nothing that
// derives from this class changes.
#pragma once

#include <functional>
#include <initializer_list>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "kova/agentd/include/KovaInfo.h"

namespace OtxCtl::Provider {

// One input of a call, as the caller gave it. It lives as long as the call.
using Input = std::variant<bool, std::reference_wrapper<const std::string>,
                           std::reference_wrapper<const std::vector<std::string>>,
                           std::reference_wrapper<const HostCtl::Kova::FormatContext>,
                           std::reference_wrapper<const HostCtl::Kova::RemovalOptions>>;

struct ProviderCall {
  std::string_view operation;     // a name of OperationNames.h
  std::span<const Input> inputs;  // in the operation's order, outputs left out
};

class ForwardingProvider : public HostCtl::Kova::KovaInfo {
 public:
  // Without a target there is nobody to answer: outputs stay as they are, and results are false and empty.
  explicit ForwardingProvider(std::shared_ptr<HostCtl::Kova::KovaInfo> target = nullptr);

  void QueryDisks(const std::vector<std::string>& names, std::vector<HostCtl::Kova::DiskResult>& results,
                  bool flag) override;
  void GetDiskMappings(std::vector<HostCtl::Kova::DiskMapping>& mappings, bool withUnmounted) override;
  void FormatDiskMapping(const std::string& ssd, const std::vector<std::string>& capacityDisks,
                         const HostCtl::Kova::FormatContext& context) override;
  void RestampDiskMapping(const std::string& ssd, const std::vector<std::string>& capacityDisks) override;
  void MountDiskMapping(const std::string& ssd, bool flag) override;
  void RestampDiskMappingByUuid(const std::string& kovaUuid) override;
  void RemoveDisk(const std::string& disk, const std::string& passThrough,
                  const HostCtl::Kova::RemovalOptions& options) override;
  void RemoveDiskMapping(const std::string& ssd, const std::string& passThrough,
                         const HostCtl::Kova::RemovalOptions& options) override;
  void UnmountDiskMapping(const std::string& ssd) override;
  void RemoveDiskByUuid(const std::string& kovaUuid, const std::string& passThrough) override;
  bool IsAutoModeEnabled() override;
  std::vector<HostCtl::Kova::KovaOtxNicConfig*> GetKovaOtxNicConfigs() override;
  void GetClusterInfoDetailed(HostCtl::Kova::KovaClusterInfoDetailed& info) override;
  std::string GetFaultDomainName() override;
  void ClaimUnmountedDiskgroups() override;
  void RefreshKovaInfo() override;

 protected:
  // Hands a call to the target and fills the caller's outputs.
  using Forward = std::function<void()>;

  // Every call passes here, on the caller's thread; this one forwards it and does nothing else. An override
  // forwards it once or not at all; a call that is not forwarded is answered as without a target.
  virtual void AroundCall(const ProviderCall& call, const Forward& forward);

 private:
  // Defined in the source, its only user.
  template <class Call>
  void Pass(std::string_view operation, std::initializer_list<Input> inputs, const Call& call);

  const std::shared_ptr<HostCtl::Kova::KovaInfo> _target;
};

}  // namespace OtxCtl::Provider
