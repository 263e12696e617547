#include "kova/agentd/include/KovaPlugin.h"

#include <exception>
#include <memory>
#include <mutex>
#include <string>
#include <utility>

#include "kova/agentd/include/HostCtlException.h"
#include "kova/agentd/include/KovaInfo.h"
#include "otxctl/ProviderFactory.h"

namespace OtxCtl::Kova {
namespace {

using HostCtl::Lib::HostCtlException;

struct InstalledFactory {
  std::mutex mutex;
  std::shared_ptr<const ProviderFactory> factory;
};

// Never destroyed: a plug-in that is torn down at exit may still ask for a provider.
InstalledFactory& Installed() {
  static auto* const installed = new InstalledFactory;
  return *installed;
}

std::shared_ptr<const ProviderFactory> CurrentFactory() {
  InstalledFactory& installed = Installed();
  const std::lock_guard<std::mutex> guard(installed.mutex);
  return installed.factory;
}

// The plug-in expects exceptions of one family only, whatever the factory is made of.
std::unique_ptr<HostCtl::Kova::KovaInfo> Make(const ProviderFactory& factory) {
  try {
    return factory();
  } catch (const HostCtlException&) {
    throw;
  } catch (const std::exception& failure) {
    throw HostCtlException(std::string("The kernel provider could not be made: ") + failure.what());
  }
}

}  // namespace

void SetProviderFactory(ProviderFactory factory) {
  std::shared_ptr<const ProviderFactory> next;
  if (factory) {
    next = std::make_shared<const ProviderFactory>(std::move(factory));
  }
  InstalledFactory& installed = Installed();
  const std::lock_guard<std::mutex> guard(installed.mutex);
  installed.factory.swap(next);
}

// The factory runs outside the lock, so it may take its time, or install another one.
HostCtl::Kova::KovaInfo* KovaPluginImpl::GetKovaInfo() {
  const std::shared_ptr<const ProviderFactory> factory = CurrentFactory();
  if (!factory) {
    throw HostCtlException(
        "No kernel provider: the host program must call OtxCtl::Kova::SetProviderFactory before it "
        "initializes the plug-in");
  }
  std::unique_ptr<HostCtl::Kova::KovaInfo> provider = Make(*factory);
  if (!provider) {
    throw HostCtlException("No kernel provider: the installed provider factory returned none");
  }
  return provider.release();
}

}  // namespace OtxCtl::Kova
