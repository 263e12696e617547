// The plug-in, opened at run time.
#pragma once

#include <string>

#include "kova/agentd/include/KovaHooks.h"

namespace Host {

// The plug-in's entry points. They stay good until the process ends: the plug-in is never closed.
struct PluginHooks {
  Kovasvc::InitKovaPluginFn* init;
  Kovasvc::AddDisksFn* addDisks;
  Kovasvc::InitializeDisksFn* initializeDisks;
  Kovasvc::RemoveDisksFn* removeDisks;
  Kovasvc::RemoveDiskMappingFn* removeDiskMapping;
  Kovasvc::QueryDisksForKovaFn* queryDisksForKova;
  Kovasvc::AddAllEligibleDisksFn* addAllEligibleDisks;
  Kovasvc::UnmountDiskMappingFn* unmountDiskMapping;
  Kovasvc::GetStorageInfoFn* getStorageInfo;
  Kovasvc::GetConfigInfoFn* getConfigInfo;
  Kovasvc::ClaimUnmountedDiskgroupFn* claimUnmountedDiskgroup;
};

// Opens the library and finds every entry point; does not initialise it. Throws HostError that names the
// file and what is wrong with it.
PluginHooks OpenPlugin(const std::string& path);

// Where the plug-in stands when nobody says otherwise: beside the running program, in ../lib or a folder
// of libraries, as built or as installed. Throws HostError that lists where it was looked for.
std::string FindPlugin();

}  // namespace Host
