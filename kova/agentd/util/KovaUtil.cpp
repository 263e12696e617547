#include "kova/agentd/util/KovaUtil.h"

#include <utility>

#include "nox/Host.h"
#include "nox/StorageSystem.h"
#include "orbis/Types.h"
#include "tessa/App.h"
#include "tessa/Authorize.h"

namespace Kovasvc::Util {

using Orbis::DataArray;
using Orbis::Fault::SystemError;
using Tessa::MakeRef;
using Tessa::Ref;

namespace {

[[noreturn]] void ThrowSystemError(const char* reason) {
  throw SystemError::Exception(MakeRef<SystemError>(reason));
}

}  // namespace

SessionImpl::SessionImpl() : LockableObjectImpl("KovaSession") {}
SessionImpl::~SessionImpl() = default;

KovaUtil::KovaUtil(Ref<Tessa::Service::Logger>& logger) {
  _logger = logger;
}
KovaUtil::~KovaUtil() {
  _logger.Reset();
}

void KovaUtil::GetSession(Ref<Tessa::Session>& session) {
  if (!_session) {
    const Ref<SessionImpl> made = MakeRef<SessionImpl>();
    Tessa::Service::App* const app = Tessa::Service::GetApp();
    if (app == nullptr) {
      ThrowSystemError("Failed to get application instance.");
    }
    app->RegisterSession(made);
    const auto authorization = Tessa::Authorize::AuthorizeManager::GetInstance();
    if (!authorization) {
      ThrowSystemError("Failed to get authorized instance.");
    }
    authorization->AddConnection(made, "System", Ref<Tessa::System::AuthTokenHelper>(), true);
    _session = made;
  }
  session = _session;
}

void KovaUtil::GetDisksFromAgentd(Ref<DataArray<Nox::Host::ScsiDisk>>& disks) {
  Ref<Nox::Host::StorageSystem> storageSystem;
  Tessa::Service::TryLookupObject("storageSystem", storageSystem);
  if (!storageSystem) {
    ThrowSystemError("Failed to lookup STORAGE_SYSTEM_MO.");
  }
  Ref<Nox::Host::StorageDeviceInfo> info;
  storageSystem->GetStorageDeviceInfo(info);
  Ref<DataArray<Nox::Host::ScsiDisk>> found;
  EnumScsiDiskDevice(info.Get(), found);
  disks = std::move(found);
}

Ref<DataArray<Nox::Host::ScsiDisk>> InventoryOrNone(Tessa::Service::Logger& logger) {
  Ref<DataArray<Nox::Host::ScsiDisk>> inventory;
  try {
    KovaUtil::GetDisksFromAgentd(inventory);
  } catch (const SystemError::Exception& exception) {
    LogInternal(logger, Tessa::Service::LogLevel::Warning, "GetDisksFromAgentd error %1",
                ReasonOf(exception));
  }
  return inventory;
}

const std::string& ReasonOf(const SystemError::Exception& exception) {
  return static_cast<const SystemError&>(*exception.GetFault()).GetReason();
}

void EnumScsiDiskDevice(Nox::Host::StorageDeviceInfo* info, Ref<DataArray<Nox::Host::ScsiDisk>>& disks) {
  const Ref<DataArray<Nox::Host::ScsiDisk>> found = MakeRef<DataArray<Nox::Host::ScsiDisk>>();
  if (info != nullptr && info->GetScsiLun()) {
    found->Reserve(info->GetScsiLun()->Size());
    for (Nox::Host::ScsiLun* unit : *info->GetScsiLun()) {
      if (auto* const disk = dynamic_cast<Nox::Host::ScsiDisk*>(unit)) {
        found->Append(disk);
      }
    }
  }
  disks = found;
}

}  // namespace Kovasvc::Util
