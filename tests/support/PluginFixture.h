// The host fixture with the plug-in's own objects in it: for tests that link the plug-in's objects, never
// for those that open the module.
#pragma once

#include "kova/agentd/KovaLibManager.h"
#include "kova/agentd/KovaManagerImpl.h"
#include "kova/agentd/util/KovaUtil.h"
#include "tests/support/HostFixture.h"

namespace TestSupport {

class PluginFixture : public HostFixture {
 protected:
  // The plug-in's statics go first: they refer to the host's doubles.
  ~PluginFixture() override {
    Kovasvc::_kovaManagerImpl.Reset();
    Kovasvc::Util::KovaUtil::_session.Reset();
    Kovasvc::Util::KovaUtil::_logger.Reset();
  }

  // A manager that writes to the fixture's logger; what making it left in the timeline is forgotten.
  Tessa::Ref<Kovasvc::KovaManagerImpl> MakeManager() {
    Tessa::Ref<Tessa::Service::Logger> logger = _logger;
    auto manager = Tessa::MakeRef<Kovasvc::KovaManagerImpl>(logger);
    _timeline.Take();
    return manager;
  }

  // The disks in the inventory, and the kernel's records of them.
  void SetHost(const std::vector<Tessa::Ref<Nox::Host::ScsiDisk>>& disks,
               const std::vector<HostCtl::Kova::DiskResult>& records) {
    _storage->SetDisks(disks);
    _kernel.records = records;
  }
};

}  // namespace TestSupport
