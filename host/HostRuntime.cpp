#include "host/HostRuntime.h"

#include <utility>

#include "host/CautiousProvider.h"
#include "host/HostError.h"
#include "kova/agentd/include/KovaInfo.h"
#include "nox/Host.h"
#include "otxctl/ProviderFactory.h"
#include "otxctl/fault/CallRecorder.h"
#include "otxctl/fault/RecordingProvider.h"

namespace Host {

namespace {

constexpr const char* storageSystemName = "storageSystem";

std::unique_ptr<HostCtl::Kova::KovaInfo> MakeProvider(Machine& machine, const RuntimeOptions& options) {
  std::unique_ptr<HostCtl::Kova::KovaInfo> provider = machine.MakeProvider();
  if (options.recorder != nullptr) {
    provider = std::make_unique<OtxCtl::Fault::RecordingProvider>(std::move(provider), options.recorder);
  }
  if (!options.bare) {
    provider = std::make_unique<CautiousProvider>(std::move(provider));
  }
  return provider;
}

}  // namespace

HostRuntime& HostRuntime::Start(const RuntimeOptions& options) {
  static HostRuntime* const runtime = new HostRuntime(options);
  return *runtime;
}

HostRuntime::HostRuntime(const RuntimeOptions& options) : _inventory(Tessa::MakeRef<Inventory>()) {
  _hooks = OpenPlugin(options.pluginFile.empty() ? FindPlugin() : options.pluginFile);
  _machine = options.makeMachine();
  Install(options);
  if (_hooks.init() != 1) {
    Uninstall();
    throw HostError("the plug-in could not be initialised");
  }
}

void HostRuntime::Install(const RuntimeOptions& options) {
  PublishInventory();
  _machine->SetListener([this] { PublishInventory(); });
  Tessa::Service::SetApp(&_app);
  Tessa::Authorize::AuthorizeManager::SetInstance(Tessa::MakeRef<LocalAuthorization>());
  OtxCtl::Kova::SetProviderFactory([machine = _machine, options] { return MakeProvider(*machine, options); });
}

void HostRuntime::Uninstall() noexcept {
  OtxCtl::Kova::SetProviderFactory({});
  Tessa::Authorize::AuthorizeManager::SetInstance(nullptr);
  Tessa::Service::SetApp(nullptr);
  _machine->SetListener({});
}

void HostRuntime::PublishInventory() {
  const auto info = _machine->GetInventory();
  if (info) {
    _inventory->Replace(info);
  }
  _app.SetObject(storageSystemName, info ? _inventory : nullptr);
}

}  // namespace Host
