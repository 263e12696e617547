// A machine that is simulated: its disks are a description in memory (otxctl/sim), read from a file and saved
// to it if asked to.
#pragma once

#include <unistd.h>

#include <mutex>
#include <optional>

#include "host/Machine.h"
#include "host/Simulation.h"
#include "machines/Machines.h"
#include "otxctl/sim/HostFile.h"
#include "otxctl/sim/SimHost.h"

namespace Machines {

// Threads: as Host::Machine says.
class SimulatedMachine final : public Host::Machine, public Host::Simulation {
 public:
  using FolderSync = OtxCtl::Sim::HostFileWriter::FolderSync;

  // Throws Host::HostError, HostFileError or HostDescriptionError. From then on nobody else can save the
  // host, if this machine does. Where `syncFolder` cannot make a saved host last, the default logger is
  // warned.
  explicit SimulatedMachine(const MachineOptions& options, FolderSync syncFolder = &fsync);
  // Of a host that somebody else has made, and saves if need be. Nobody else may listen to it.
  explicit SimulatedMachine(std::shared_ptr<OtxCtl::Sim::SimHost> host);
  ~SimulatedMachine() override;
  SimulatedMachine(const SimulatedMachine&) = delete;
  SimulatedMachine& operator=(const SimulatedMachine&) = delete;

  std::unique_ptr<HostCtl::Kova::KovaInfo> MakeProvider() override;
  // Null while the host is described as one whose storage system is missing.
  Tessa::Ref<Nox::Host::StorageDeviceInfo> GetInventory() override;
  void SetListener(Listener listener) override;
  // The faults that the machine has on demand are the twin's as well; taking it counts as no call.
  Host::Twin TakeTwin() override;
  Host::Simulation* GetSimulation() noexcept override { return this; }

  std::string Describe() const override;
  void CheckChange(std::string_view change) const override;
  void Change(std::string_view change) override;

  OtxCtl::Sim::SimHost& SimulatedHost() noexcept { return *_host; }

 private:
  void Save(const OtxCtl::Sim::HostDescription& changed) const;
  void TellListener();

  std::optional<OtxCtl::Sim::HostFileWriter> _writer;
  const std::shared_ptr<OtxCtl::Sim::SimHost> _host;
  std::mutex _listening;  // held while the listener is called
  Listener _listener;
};

}  // namespace Machines
