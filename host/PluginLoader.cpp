#include "host/PluginLoader.h"

#include <dlfcn.h>

#include <filesystem>

#include "host/HostError.h"

namespace Host {
namespace {

constexpr const char* pluginFile = "kova-agentd.so";

template <class Function>
void Find(void* library, const std::string& path, const char* name, Function*& function) {
  void* const symbol = dlsym(library, name);
  if (symbol == nullptr) {
    throw HostError("plug-in " + path + " has no entry point " + name);
  }
  function = reinterpret_cast<Function*>(symbol);
}

}  // namespace

PluginHooks OpenPlugin(const std::string& path) {
  // Never unloaded: objects that it made may live as long as the process.
  // A path, whatever it looks like: a bare name would be searched for among the system's libraries.
  const std::filesystem::path file = std::filesystem::absolute(path);
  void* const library = dlopen(file.c_str(), RTLD_NOW | RTLD_LOCAL | RTLD_NODELETE);
  if (library == nullptr) {
    throw HostError("cannot open the plug-in " + path + ": " + std::string(dlerror()));
  }
  PluginHooks hooks{};
  Find(library, path, "InitKovaPlugin", hooks.init);
  Find(library, path, "AddDisksHookFn", hooks.addDisks);
  Find(library, path, "InitializeDisksHookFn", hooks.initializeDisks);
  Find(library, path, "RemoveDisksHookFn", hooks.removeDisks);
  Find(library, path, "RemoveDiskMappingHookFn", hooks.removeDiskMapping);
  Find(library, path, "QueryDisksForKovaHookFn", hooks.queryDisksForKova);
  Find(library, path, "AddAllEligibleDisksHookFn", hooks.addAllEligibleDisks);
  Find(library, path, "UnmountDiskMappingHookFn", hooks.unmountDiskMapping);
  Find(library, path, "GetStorageInfoHookFn", hooks.getStorageInfo);
  Find(library, path, "GetConfigInfoHookFn", hooks.getConfigInfo);
  Find(library, path, "ClaimUnmountedDiskgroupHookFn", hooks.claimUnmountedDiskgroup);
  return hooks;
}

std::string FindPlugin() {
  std::error_code error;
  const std::filesystem::path program = std::filesystem::read_symlink("/proc/self/exe", error);
  std::string places;
  for (const char* folder : {"../lib", KOVA_LIBRARY_FOLDER, "."}) {
    const std::filesystem::path place = (program.parent_path() / folder / pluginFile).lexically_normal();
    if (std::filesystem::exists(place, error)) {
      return place.string();
    }
    places += (places.empty() ? "" : ", ") + place.string();
  }
  throw HostError("the plug-in is not where it should be; looked for " + places + " (name it with --plugin)");
}

}  // namespace Host
