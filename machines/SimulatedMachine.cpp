#include "machines/SimulatedMachine.h"

#include <chrono>
#include <utility>

#include "host/Generation.h"
#include "host/HostError.h"
#include "host/HostState.h"
#include "machines/SimulatedInventory.h"
#include "nox/Host.h"
#include "otxctl/sim/DefaultHost.h"
#include "otxctl/sim/SimProvider.h"
#include "tessa/Logger.h"

namespace Machines {

using OtxCtl::Sim::HostDescription;
using OtxCtl::Sim::HostDescriptionError;
using OtxCtl::Sim::HostFileWriter;
using OtxCtl::Sim::SimHost;

namespace {

// Made before the file is read: nobody else may write it from then on.
std::optional<HostFileWriter> WriterFor(const MachineOptions& options,
                                        SimulatedMachine::FolderSync syncFolder) {
  if (options.save && (options.host.empty() || options.description)) {
    throw Host::HostError("--save needs a host of your own: name its file with --host");
  }
  return options.save ? std::optional<HostFileWriter>(std::in_place, options.host, syncFolder) : std::nullopt;
}

HostDescription DescribedHost(const MachineOptions& options) {
  if (options.description) {
    return OtxCtl::Sim::ParseHostDescription(*options.description);
  }
  return options.host.empty() ? OtxCtl::Sim::DefaultHost() : OtxCtl::Sim::LoadHostFile(options.host);
}

Tessa::Ref<Nox::Host::StorageDeviceInfo> InventoryOf(const HostDescription& host) {
  const bool isPresent = host.storageSystem == OtxCtl::Sim::StorageSystem::Present;
  return isPresent ? DescribeInventory(host) : nullptr;
}

}  // namespace

SimulatedMachine::SimulatedMachine(const MachineOptions& options, FolderSync syncFolder)
    : _writer(WriterFor(options, syncFolder)), _host(std::make_shared<SimHost>(DescribedHost(options))) {
  _host->SetListener([this] { TellListener(); });
  if (_writer) {
    _host->SetSaver([this](const HostDescription& changed) { Save(changed); });
  }
  if (!options.waitForFaults) {
    _host->SetWaiter([](std::chrono::milliseconds) {});
  }
}

SimulatedMachine::SimulatedMachine(std::shared_ptr<SimHost> host) : _host(std::move(host)) {
  _host->SetListener([this] { TellListener(); });
}

// Providers, and with them the host, may live on.
SimulatedMachine::~SimulatedMachine() {
  _host->SetListener({});
  if (_writer) {
    _host->SetSaver({});
  }
}

std::unique_ptr<HostCtl::Kova::KovaInfo> SimulatedMachine::MakeProvider() {
  return std::make_unique<OtxCtl::Sim::SimProvider>(_host);
}

Tessa::Ref<Nox::Host::StorageDeviceInfo> SimulatedMachine::GetInventory() {
  return InventoryOf(_host->Snapshot());
}

Host::Twin SimulatedMachine::TakeTwin() {
  const HostDescription now = _host->Snapshot();
  HostDescription faultless = now;
  faultless.faults.clear();
  OtxCtl::Sim::SimProvider provider(std::make_shared<SimHost>(faultless));
  return {.generation = Host::GenerationOf(Host::ReadHostState(provider, InventoryOf(now))),
          .description = WriteHostDescription(now)};
}

void SimulatedMachine::SetListener(Listener listener) {
  const std::lock_guard guard(_listening);
  _listener = std::move(listener);
}

void SimulatedMachine::TellListener() {
  const std::lock_guard guard(_listening);
  if (_listener) {
    _listener();
  }
}

std::string SimulatedMachine::Describe() const {
  return WriteHostDescription(_host->Snapshot());
}

void SimulatedMachine::CheckChange(std::string_view change) const {
  try {
    OtxCtl::Sim::CheckChange(change);
  } catch (const HostDescriptionError& refused) {
    throw Host::ChangeRefused(refused.what());
  }
}

void SimulatedMachine::Change(std::string_view change) {
  try {
    _host->Change([change](HostDescription& host) { ApplyChange(host, change); });
  } catch (const HostDescriptionError& refused) {
    throw Host::ChangeRefused(refused.what());
  }
}

void SimulatedMachine::Save(const HostDescription& changed) const {
  if (const std::optional<std::string> warning = _writer->Save(changed)) {
    Tessa::Service::LogInternal(Tessa::Service::GetDefaultLogger(), Tessa::Service::LogLevel::Warning, "%1",
                                *warning);
  }
}

}  // namespace Machines
