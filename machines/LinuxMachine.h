// The machine that the program runs on: its real disks.
#pragma once

#include <memory>
#include <mutex>
#include <optional>
#include <string>

#include "host/Machine.h"
#include "machines/Machines.h"
#include "otxctl/linux/GroupChanges.h"
#include "otxctl/linux/LinuxHost.h"
#include "otxctl/linux/UeventListener.h"

namespace Machines {

// Threads: as Host::Machine says. Has one of its own, on which the machine is looked at again whenever the
// kernel tells that disks have come, gone or changed.
class LinuxMachine final : public Host::Machine {
 public:
  // Of the running system. Throws Host::HostError for settings that cannot be used, and if it is to be alone
  // and is not; a machine that cannot be looked at is no error, and lists nothing until it can.
  explicit LinuxMachine(const MachineOptions& options);
  // Of a host that somebody else has made; null: nothing of it can be changed. Follows no change by itself.
  explicit LinuxMachine(std::shared_ptr<OtxCtl::Linux::LinuxHost> host,
                        std::shared_ptr<OtxCtl::Linux::GroupChanges> changes = nullptr);
  ~LinuxMachine() override;
  LinuxMachine(const LinuxMachine&) = delete;
  LinuxMachine& operator=(const LinuxMachine&) = delete;

  std::unique_ptr<HostCtl::Kova::KovaInfo> MakeProvider() override;
  Tessa::Ref<Nox::Host::StorageDeviceInfo> GetInventory() override;
  void SetListener(Listener listener) override;
  std::shared_ptr<void> HoldLook() override;
  Host::Twin TakeTwin() override;
  std::vector<Host::DataVolume> GetDataVolumes() override;

 private:
  void Follow();
  void TellListener();

  const std::shared_ptr<OtxCtl::Linux::LinuxHost> _host;
  const std::shared_ptr<OtxCtl::Linux::GroupChanges> _changes;
  std::recursive_mutex _listening;  // held while the listener is called, which asks for the inventory
  Listener _listener;
  std::optional<OtxCtl::Linux::UeventListener> _events;  // the last to come, the first to go
};

}  // namespace Machines
