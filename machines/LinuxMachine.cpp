#include "machines/LinuxMachine.h"

#include <fstream>
#include <system_error>
#include <utility>

#include "kova/agentd/include/HostCtlException.h"
#include "machines/HostSettingsFile.h"
#include "machines/LinuxInventory.h"
#include "nox/Host.h"
#include "otxctl/linux/BlkidProbe.h"
#include "otxctl/linux/LinuxProvider.h"
#include "tessa/Logger.h"

namespace Machines {

using OtxCtl::Linux::LinuxHost;
using OtxCtl::Linux::LinuxSnapshot;
using Tessa::Service::LogLevel;

namespace {

void Log(LogLevel level, const char* format, const std::string& argument) {
  Tessa::Service::LogInternal(Tessa::Service::GetDefaultLogger(), level, format, argument);
}

std::string ReadMachineId() {
  std::string id;
  std::ifstream file("/etc/machine-id");
  file >> id;
  return id;
}

std::shared_ptr<LinuxHost> HostOfThisSystem(const std::string& settingsFile) {
  ReadHostSettings(settingsFile);  // a mistake in it is told when the program starts
  auto commands = std::make_unique<OtxCtl::Linux::SystemCommands>();
  OtxCtl::Linux::LinuxHostOptions options;
  options.volumeManager = commands->Has("/usr/sbin/lvm") ? "/usr/sbin/lvm" : "/sbin/lvm";
  options.machineId = ReadMachineId();
  options.readSettings = [settingsFile] { return ReadHostSettings(settingsFile); };
  return std::make_shared<LinuxHost>(std::move(options), std::make_unique<OtxCtl::Linux::BlkidProbe>(),
                                     std::move(commands));
}

}  // namespace

LinuxMachine::LinuxMachine(const std::string& settingsFile) : LinuxMachine(HostOfThisSystem(settingsFile)) {
  try {
    _events.emplace([this] { Follow(); });
  } catch (const std::system_error& failed) {
    Log(LogLevel::Warning,
        "The kernel cannot be listened to: disks that come or go are seen when somebody asks (%1)",
        failed.what());
  }
}

LinuxMachine::LinuxMachine(std::shared_ptr<LinuxHost> host) : _host(std::move(host)) {
  _host->SetListener([this] { TellListener(); });
}

// Providers, and with them the host, may live on.
LinuxMachine::~LinuxMachine() {
  _events.reset();
  _host->SetListener({});
}

std::unique_ptr<HostCtl::Kova::KovaInfo> LinuxMachine::MakeProvider() {
  return std::make_unique<OtxCtl::Linux::LinuxProvider>(_host);
}

Tessa::Ref<Nox::Host::StorageDeviceInfo> LinuxMachine::GetInventory() {
  auto seen = _host->Last();
  if (seen == nullptr) {
    Follow();
    seen = _host->Last();
  }
  return seen == nullptr ? nullptr : DescribeInventory(*seen);
}

void LinuxMachine::SetListener(Listener listener) {
  const std::lock_guard guard(_listening);
  _listener = std::move(listener);
}

std::shared_ptr<void> LinuxMachine::HoldLook() {
  return std::make_shared<LinuxHost::OneLook>();
}

void LinuxMachine::Follow() {
  try {
    _host->Look();
  } catch (const HostCtl::Lib::HostCtlException& failed) {
    Log(LogLevel::Warning, "This machine cannot be looked at: %1", failed.Describe());
  }
}

void LinuxMachine::TellListener() {
  const std::lock_guard guard(_listening);
  if (_listener) {
    _listener();
  }
}

}  // namespace Machines
