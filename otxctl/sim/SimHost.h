// A simulated host: one description in memory that answers like a kernel.
//
// Threads: every member is safe under concurrent calls. Ownership: shared by the providers that show it
// (SimProvider.h) and by the program. Errors: the provider operations throw what HostCtl::Kova::KovaInfo
// allows, and what the description's fault rules say.
//
// A call goes: fault rules (counted over the life of the host; waiting holds no lock), then the rules under
// the lock, then, if anything changed, the saver, then the change becomes visible, then the listener.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include <functional>
#include <mutex>
#include <string>
#include <string_view>
#include <vector>

#include "kova/agentd/include/KovaInfo.h"
#include "otxctl/fault/FaultRules.h"
#include "otxctl/sim/HostDescription.h"
#include "otxctl/sim/SimRules.h"

namespace OtxCtl::Sim {

class SimHost final : public HostCtl::Kova::KovaInfo {
 public:
  // Makes a change last. Called with the changed host while no one else sees it; if it throws, the change is
  // dropped, and the operation fails with its text.
  using Saver = std::function<void(const HostDescription&)>;
  // Told after each change, on the thread that made it, without a lock. Must not throw.
  using Listener = std::function<void()>;

  // Throws HostDescriptionError unless the description would be accepted as a file.
  explicit SimHost(HostDescription host);

  void SetSaver(Saver saver);
  // What the delays of fault rules are waited with; sleeping, unless a program with its own idea of time says
  // otherwise.
  void SetWaiter(Fault::Waiter waiter);
  void SetListener(Listener listener);

  // A consistent copy of the host as it is now.
  HostDescription Snapshot() const;

  // Changes the host as ApplyChange does, as one step. Throws HostDescriptionError, or what the saver throws;
  // the host is then as it was.
  void Change(const nlohmann::json& set, const nlohmann::json& disk);
  // The same for a change in code.
  void Change(const std::function<void(HostDescription&)>& edit);

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

 private:
  // Counts the call and goes through its faults.
  void Enter(std::string_view operation);
  // An operation that looks at the host.
  template <typename Look>
  auto Read(std::string_view operation, Look look);
  // An operation that changes it; `change` works on SimRules and returns whether anything is different.
  template <typename ChangeRules>
  void Mutate(std::string_view operation, ChangeRules change);
  // Carries a change out in the order told above. The change itself must be all or nothing.
  template <typename ChangeRules>
  void Commit(ChangeRules change);

  mutable std::mutex _mutex;
  SimRules _rules;
  Fault::CallCounter _counter;
  Fault::Waiter _waiter = &Fault::SleepFor;
  Saver _saver;
  Listener _listener;
};

}  // namespace OtxCtl::Sim
