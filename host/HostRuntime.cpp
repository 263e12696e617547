#include "host/HostRuntime.h"

#include <utility>

#include "host/CautiousProvider.h"
#include "host/HostError.h"
#include "nox/Host.h"
#include "otxctl/ProviderFactory.h"
#include "otxctl/fault/CallRecorder.h"
#include "otxctl/fault/RecordingProvider.h"
#include "otxctl/sim/DefaultHost.h"
#include "otxctl/sim/SimProvider.h"
#include "tessa/Logger.h"

namespace Host {

using OtxCtl::Sim::HostDescription;
using OtxCtl::Sim::SimHost;

namespace {

constexpr const char* storageSystemName = "storageSystem";

std::unique_ptr<HostCtl::Kova::KovaInfo> MakeProvider(const std::shared_ptr<SimHost>& host,
                                                      const RuntimeOptions& options) {
  std::unique_ptr<HostCtl::Kova::KovaInfo> provider = std::make_unique<OtxCtl::Sim::SimProvider>(host);
  if (options.recorder != nullptr) {
    provider = std::make_unique<OtxCtl::Fault::RecordingProvider>(std::move(provider), options.recorder);
  }
  if (!options.bare) {
    provider = std::make_unique<CautiousProvider>(std::move(provider));
  }
  return provider;
}

HostDescription DescribedHost(const RuntimeOptions& options) {
  if (options.hostText) {
    return OtxCtl::Sim::ParseHostDescription(*options.hostText);
  }
  return options.hostFile.empty() ? OtxCtl::Sim::DefaultHost() : OtxCtl::Sim::LoadHostFile(options.hostFile);
}

}  // namespace

HostRuntime& HostRuntime::Start(const RuntimeOptions& options) {
  static HostRuntime* const runtime = new HostRuntime(options);
  return *runtime;
}

HostRuntime::HostRuntime(const RuntimeOptions& options) : _inventory(Tessa::MakeRef<Inventory>()) {
  _hooks = OpenPlugin(options.pluginFile.empty() ? FindPlugin() : options.pluginFile);
  LoadHost(options);
  Install(options);
  if (_hooks.init() != 1) {
    Uninstall();
    throw HostError("the plug-in could not be initialised");
  }
}

void HostRuntime::Install(const RuntimeOptions& options) {
  PublishInventory();
  _host->SetListener([this] { PublishInventory(); });
  Tessa::Service::SetApp(&_app);
  Tessa::Authorize::AuthorizeManager::SetInstance(Tessa::MakeRef<LocalAuthorization>());
  OtxCtl::Kova::SetProviderFactory([host = _host, options] { return MakeProvider(host, options); });
}

void HostRuntime::Uninstall() noexcept {
  OtxCtl::Kova::SetProviderFactory({});
  Tessa::Authorize::AuthorizeManager::SetInstance(nullptr);
  Tessa::Service::SetApp(nullptr);
  _host->SetListener({});
  _host->SetSaver({});
}

void HostRuntime::LoadHost(const RuntimeOptions& options) {
  if (options.save && (options.hostFile.empty() || options.hostText)) {
    throw HostError("--save needs a host of your own: name its file with --host");
  }
  if (options.save) {
    _writer.emplace(options.hostFile,
                    options.syncFolder);  // before reading: nobody else may write from here on
  }
  _host = std::make_shared<SimHost>(DescribedHost(options));
  if (_writer) {
    _host->SetSaver([this](const HostDescription& changed) { Save(changed); });
  }
}

void HostRuntime::Save(const HostDescription& changed) const {
  if (const std::optional<std::string> warning = _writer->Save(changed)) {
    Tessa::Service::LogInternal(Tessa::Service::GetDefaultLogger(), Tessa::Service::LogLevel::Warning, "%1",
                                *warning);
  }
}

void HostRuntime::PublishInventory() {
  const HostDescription host = _host->Snapshot();
  _inventory->Replace(DescribeInventory(host));
  const bool present = host.storageSystem == OtxCtl::Sim::StorageSystem::Present;
  _app.SetObject(storageSystemName, present ? _inventory : nullptr);
}

}  // namespace Host
