// The one manager of the process, and its making. Internal to the plug-in.
#pragma once

#include "kova/agentd/include/KovaHooks.h"
#include "tessa/Logger.h"
#include "tessa/Ref.h"

namespace Kovasvc {

class KovaManagerImpl;

// What panics name as their source. A label, like the lines that they name: neither follows today's files, so
// that panics of any build can be told apart alike.
inline constexpr const char* sourcePath = "kova/agentd/KovaLibManager";

// The manager behind all hooks; null until InitKovaPlugin has made it. Not guarded: it is written before
// the first hook is called. A test may put a manager of its own here.
// NOLINTNEXTLINE(readability-identifier-naming): panics name it so
extern Tessa::Ref<KovaManagerImpl> _kovaManagerImpl;

// Makes the manager; panics when there is one already. Throws what its construction throws, and there is
// no manager then.
void CreateKovaManager(Tessa::Ref<Tessa::Service::Logger>& logger);

}  // namespace Kovasvc

// The entry points, declared here so that their definitions are held to the types that host programs call
// them by.
#define KOVA_EXPORT extern "C" __attribute__((visibility("default")))

KOVA_EXPORT Kovasvc::InitKovaPluginFn InitKovaPlugin;
KOVA_EXPORT Kovasvc::AddDisksFn AddDisksHookFn;
KOVA_EXPORT Kovasvc::InitializeDisksFn InitializeDisksHookFn;
KOVA_EXPORT Kovasvc::RemoveDisksFn RemoveDisksHookFn;
KOVA_EXPORT Kovasvc::RemoveDiskMappingFn RemoveDiskMappingHookFn;
KOVA_EXPORT Kovasvc::QueryDisksForKovaFn QueryDisksForKovaHookFn;
KOVA_EXPORT Kovasvc::AddAllEligibleDisksFn AddAllEligibleDisksHookFn;
KOVA_EXPORT Kovasvc::UnmountDiskMappingFn UnmountDiskMappingHookFn;
KOVA_EXPORT Kovasvc::GetStorageInfoFn GetStorageInfoHookFn;
KOVA_EXPORT Kovasvc::GetConfigInfoFn GetConfigInfoHookFn;
KOVA_EXPORT Kovasvc::ClaimUnmountedDiskgroupFn ClaimUnmountedDiskgroupHookFn;
