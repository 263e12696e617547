#include "machines/LinuxMachine.h"

#include <chrono>
#include <fstream>
#include <system_error>
#include <utility>

#include "host/Generation.h"
#include "host/HostError.h"
#include "host/HostState.h"
#include "kova/agentd/include/HostCtlException.h"
#include "machines/HostSettingsFile.h"
#include "machines/LinuxInventory.h"
#include "machines/LinuxVolumes.h"
#include "machines/Twin.h"
#include "nox/Host.h"
#include "otxctl/linux/BlkidProbe.h"
#include "otxctl/linux/LinuxProvider.h"
#include "tessa/Logger.h"

namespace Machines {

using OtxCtl::Linux::GroupChanges;
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

constexpr const char* stateFolder = "/var/lib/kova";
constexpr const char* lockFile = "/run/kova/disks.lock";

// A volume manager that has not ended after this time is asked to, and told of.
constexpr std::chrono::minutes changeLimit(10);

std::shared_ptr<LinuxHost> HostOfThisSystem(const std::string& settingsFile) {
  ReadHostSettings(settingsFile);  // a mistake in it is told when the program starts
  auto commands = std::make_unique<OtxCtl::Linux::SystemCommands>();
  OtxCtl::Linux::LinuxHostOptions options;
  options.volumeManager = commands->Has("/usr/sbin/lvm") ? "/usr/sbin/lvm" : "/sbin/lvm";
  options.machineId = ReadMachineId();
  options.readSettings = [settingsFile] { return ReadHostSettings(settingsFile); };
  options.stateFolder = stateFolder;
  return std::make_shared<LinuxHost>(std::move(options), std::make_unique<OtxCtl::Linux::BlkidProbe>(),
                                     std::move(commands));
}

std::shared_ptr<GroupChanges> ChangesOf(const std::shared_ptr<LinuxHost>& host,
                                        const MachineOptions& options) {
  OtxCtl::Linux::ChangeTools tools;
  tools.commands = std::make_unique<OtxCtl::Linux::SystemCommands>(changeLimit);
  tools.locks = std::make_unique<OtxCtl::Linux::DeviceFileLocks>(host->GetOptions().paths);
  tools.lockFile = lockFile;
  tools.log = [](const std::string& line) { Log(LogLevel::Info, "%1", line); };
  if (options.dryRun) {
    tools.dryRun = [print = options.dryRun](const std::vector<std::string>& command) {
      print(OtxCtl::Linux::InWords(command));
    };
  }
  auto changes = std::make_shared<GroupChanges>(host, std::move(tools));
  if (options.alone) {
    try {
      changes->KeepOthersOut();
    } catch (const HostCtl::Lib::HostCtlException& refused) {
      throw Host::HostError(refused.Describe());
    }
  }
  return changes;
}

}  // namespace

LinuxMachine::LinuxMachine(const MachineOptions& options)
    : _host(HostOfThisSystem(options.settings)), _changes(ChangesOf(_host, options)) {
  _host->SetListener([this] { TellListener(); });
  try {
    _events.emplace([this] { Follow(); });
  } catch (const std::system_error& failed) {
    Log(LogLevel::Warning,
        "The kernel cannot be listened to: disks that come or go are seen when somebody asks (%1)",
        failed.what());
  }
}

LinuxMachine::LinuxMachine(std::shared_ptr<LinuxHost> host, std::shared_ptr<GroupChanges> changes)
    : _host(std::move(host)), _changes(std::move(changes)) {
  _host->SetListener([this] { TellListener(); });
}

// Providers, and with them the host, may live on.
LinuxMachine::~LinuxMachine() {
  _events.reset();
  _host->SetListener({});
}

std::unique_ptr<HostCtl::Kova::KovaInfo> LinuxMachine::MakeProvider() {
  return std::make_unique<OtxCtl::Linux::LinuxProvider>(_host, _changes);
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

Host::Twin LinuxMachine::TakeTwin() {
  const LinuxHost::OneLook look;
  const auto seen = _host->Look();
  const Host::HostState state = Host::ReadHostState(*MakeProvider(), DescribeInventory(*seen));
  return {.generation = Host::GenerationOf(state), .description = WriteHostDescription(DescribeTwin(state))};
}

std::vector<Host::DataVolume> LinuxMachine::GetDataVolumes() {
  return DescribeVolumes(*_host->Current());
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
