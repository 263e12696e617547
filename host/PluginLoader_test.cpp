#include "host/PluginLoader.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdio>
#include <fstream>

#include "host/HostError.h"

namespace Host {
namespace {

using testing::AllOf;
using testing::HasSubstr;

std::string WhyNot(const std::string& path) {
  try {
    OpenPlugin(path);
    return "it was opened";
  } catch (const HostError& refused) {
    return refused.what();
  }
}

TEST(PluginLoader, FindsEveryEntryPointOfThePlugin) {
  const PluginHooks hooks = OpenPlugin(KOVA_PLUGIN);
  EXPECT_NE(hooks.init, nullptr);
  EXPECT_NE(hooks.addDisks, nullptr);
  EXPECT_NE(hooks.initializeDisks, nullptr);
  EXPECT_NE(hooks.removeDisks, nullptr);
  EXPECT_NE(hooks.removeDiskMapping, nullptr);
  EXPECT_NE(hooks.queryDisksForKova, nullptr);
  EXPECT_NE(hooks.addAllEligibleDisks, nullptr);
  EXPECT_NE(hooks.unmountDiskMapping, nullptr);
  EXPECT_NE(hooks.getStorageInfo, nullptr);
  EXPECT_NE(hooks.getConfigInfo, nullptr);
  EXPECT_NE(hooks.claimUnmountedDiskgroup, nullptr);
}

TEST(PluginLoader, NamesAFileThatIsMissing) {
  EXPECT_THAT(WhyNot("/no/such/plugin.so"),
              AllOf(HasSubstr("/no/such/plugin.so"), HasSubstr("No such file")));
}

TEST(PluginLoader, NamesAFileThatIsNoLibrary) {
  const std::string path = testing::TempDir() + "no-library.so";
  std::ofstream(path) << "just a text, and long enough to be looked at as the head of a library file";
  EXPECT_THAT(WhyNot(path), AllOf(HasSubstr(path), HasSubstr("cannot open the plug-in")));
  std::remove(path.c_str());
}

TEST(PluginLoader, NamesALibraryWithoutTheEntryPointsAndWhatItLacks) {
  EXPECT_THAT(WhyNot(KOVA_OTHER_LIBRARY), AllOf(HasSubstr(KOVA_OTHER_LIBRARY), HasSubstr("InitKovaPlugin")));
}

TEST(PluginLoader, TakesABareNameForAFileOfTheWorkingFolder) {
  // Otherwise the system's library of that name would be opened.
  EXPECT_THAT(WhyNot("libc.so.6"), HasSubstr("No such file"));
}

TEST(PluginLoader, FindsThePluginInTheFolderOfLibrariesBesideThatOfTheProgram) {
  EXPECT_EQ(FindPlugin(), KOVA_PLUGIN);
}

}  // namespace
}  // namespace Host
