// The plug-in's manager over a simulated host, for benchmarks.
#pragma once

#include <memory>

#include "bench/CountDisks.h"
#include "bench/Hosts.h"
#include "host/AgentApp.h"
#include "host/Inventory.h"
#include "host/LogSink.h"
#include "kova/agentd/KovaManagerImpl.h"
#include "machines/SimulatedInventory.h"
#include "nox/Host.h"
#include "otxctl/ProviderFactory.h"
#include "otxctl/sim/SimProvider.h"
#include "tessa/App.h"

namespace Bench {

// One at a time: it installs itself as the process's application and provider.
class ManagerFixture {
 public:
  explicit ManagerFixture(const OtxCtl::Sim::HostDescription& description)
      : _host(std::make_shared<OtxCtl::Sim::SimHost>(description)) {
    const auto inventory = Tessa::MakeRef<Host::Inventory>();
    inventory->Replace(Machines::DescribeInventory(description));
    _app.SetObject("storageSystem", inventory);
    Tessa::Service::SetApp(&_app);
    OtxCtl::Kova::SetProviderFactory(
        [host = _host] { return std::make_unique<OtxCtl::Sim::SimProvider>(host); });
    auto logger = Host::MakeConsoleLogger(Tessa::Service::LogLevel::Warning);
    _manager = Tessa::MakeRef<Kovasvc::KovaManagerImpl>(logger);
  }
  ~ManagerFixture() {
    _manager.Reset();
    OtxCtl::Kova::SetProviderFactory({});
    Tessa::Service::SetApp(nullptr);
  }
  ManagerFixture(const ManagerFixture&) = delete;
  ManagerFixture& operator=(const ManagerFixture&) = delete;

  Kovasvc::KovaManagerImpl& Manager() { return *_manager; }
  // The kernel, past the manager.
  OtxCtl::Sim::SimHost& Kernel() { return *_host; }

 private:
  std::shared_ptr<OtxCtl::Sim::SimHost> _host;
  Host::AgentApp _app;
  Tessa::Ref<Kovasvc::KovaManagerImpl> _manager;
};

}  // namespace Bench
