// A plug-in that has every entry point but cannot be initialised: for tests of programs that host one.

#include "kova/agentd/include/KovaHooks.h"

#define DEAF_EXPORT extern "C" __attribute__((visibility("default")))

using Kovasvc::Texts;

DEAF_EXPORT int InitKovaPlugin() {
  return 0;
}
DEAF_EXPORT void AddDisksHookFn(const Texts&, const std::string&, std::string&, std::string&) {}
DEAF_EXPORT void InitializeDisksHookFn(const Texts&, const std::string&, std::string&, std::string&) {}
DEAF_EXPORT void RemoveDisksHookFn(const std::string&, const std::string&, const std::string&, int, int,
                                   std::string&) {}
DEAF_EXPORT void RemoveDiskMappingHookFn(const std::string&, const std::string&, const std::string&, int, int,
                                         std::string&) {}
DEAF_EXPORT void QueryDisksForKovaHookFn(Texts&, std::string&, std::string&) {}
DEAF_EXPORT void AddAllEligibleDisksHookFn(const std::string&, std::string&, std::string&) {}
DEAF_EXPORT void UnmountDiskMappingHookFn(const Texts&, const std::string&, std::string&, std::string&) {}
DEAF_EXPORT void GetStorageInfoHookFn(std::string&) {}
DEAF_EXPORT void GetConfigInfoHookFn(std::string&) {}
DEAF_EXPORT void ClaimUnmountedDiskgroupHookFn() {}
